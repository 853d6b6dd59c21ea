# Test files of the memory operations.
set(VORANT_PLUGIN_MEMORY_TESTS
  ${CMAKE_CURRENT_SOURCE_DIR}/MemoryTest.cpp
)
