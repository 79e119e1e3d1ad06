# Readers of outside data in flash: every reply a loader gives.
tav_fuzz_target(fuzz_loader_replies SOURCES ${CMAKE_CURRENT_LIST_DIR}/FuzzLoaderReplies.cpp
  DEPS tav_flash)
