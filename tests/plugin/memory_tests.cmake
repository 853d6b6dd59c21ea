# Test files of the memory operations.
set(VORANT_PLUGIN_MEMORY_TESTS
  ${CMAKE_CURRENT_SOURCE_DIR}/MemoryEraseTest.cpp
  ${CMAKE_CURRENT_SOURCE_DIR}/MemoryProgramTest.cpp
  ${CMAKE_CURRENT_SOURCE_DIR}/MemoryVerifyTest.cpp
  ${CMAKE_CURRENT_SOURCE_DIR}/MemoryBlankCheckTest.cpp
  ${CMAKE_CURRENT_SOURCE_DIR}/MemoryReadbackTest.cpp
  ${CMAKE_CURRENT_SOURCE_DIR}/MemoryProgressCountTest.cpp
)
