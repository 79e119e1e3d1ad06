# Readers of outside data in scalar: every answer a display's scalar gives
# over its bridge, and the searches of a display's EDID.
tav_fuzz_target(fuzz_scalar_replies SOURCES ${CMAKE_CURRENT_LIST_DIR}/FuzzScalarReplies.cpp
  DEPS tav_scalar)
tav_fuzz_target(fuzz_edid_search SOURCES ${CMAKE_CURRENT_LIST_DIR}/FuzzEDIDSearch.cpp
  DEPS tav_scalar)
