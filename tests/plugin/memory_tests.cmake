# Test files of the memory operations.
set(VORANT_PLUGIN_MEMORY_TESTS
  ${CMAKE_CURRENT_SOURCE_DIR}/MemoryTest.cpp
  # the erase planner is a pure function, built into the test as it is
  ${CMAKE_CURRENT_SOURCE_DIR}/ErasePlanTest.cpp
  ${CMAKE_SOURCE_DIR}/s/ErasePlan.cpp
)
