# Readers of outside data in flash: every reply a loader gives.
tav_fuzz_target(fuzz_loader_replies SOURCES ${CMAKE_CURRENT_LIST_DIR}/FuzzLoaderReplies.cpp
  DEPS tav_flash)
# The I2C tunnel: every report of the USB master in front of the controller.
tav_fuzz_target(fuzz_tunnel_replies SOURCES ${CMAKE_CURRENT_LIST_DIR}/FuzzTunnelReplies.cpp
  DEPS tav_flash)
