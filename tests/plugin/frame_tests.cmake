# Test files of the plug-in frame, command layer, identification and status registers.
set(VORANT_PLUGIN_FRAME_TESTS
  ${CMAKE_CURRENT_SOURCE_DIR}/FrameConfigurationTest.cpp
  ${CMAKE_CURRENT_SOURCE_DIR}/FrameSpiCommandsTest.cpp
  ${CMAKE_CURRENT_SOURCE_DIR}/FrameIdentificationTest.cpp
  ${CMAKE_CURRENT_SOURCE_DIR}/FrameStatusRegisterTest.cpp
  ${CMAKE_CURRENT_SOURCE_DIR}/FrameLoadTest.cpp
)
