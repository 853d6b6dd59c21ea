# Test files of the plug-in frame, command layer, identification and status registers.
set(VORANT_PLUGIN_FRAME_TESTS
  ${CMAKE_CURRENT_SOURCE_DIR}/FrameTest.cpp
  ${CMAKE_CURRENT_SOURCE_DIR}/FrameLoadTest.cpp
)
