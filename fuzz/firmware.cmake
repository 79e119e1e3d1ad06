# Readers of firmware files: S-record text (and, checked against the plain
# walk, its merge of records), Intel hex text and the binary images.
tav_fuzz_target(fuzz_firmware_srec SOURCES ${CMAKE_CURRENT_LIST_DIR}/FuzzFirmwareSRec.cpp
  DEPS tav_firmware)
tav_fuzz_target(fuzz_firmware_srec_merge SOURCES ${CMAKE_CURRENT_LIST_DIR}/FuzzFirmwareSRecMerge.cpp
  DEPS tav_firmware)
target_include_directories(fuzz_firmware_srec_merge PRIVATE ${PROJECT_SOURCE_DIR}/tests)
tav_fuzz_target(fuzz_firmware_intel_hex SOURCES ${CMAKE_CURRENT_LIST_DIR}/FuzzFirmwareIntelHex.cpp
  DEPS tav_firmware)
tav_fuzz_target(fuzz_firmware_binary SOURCES ${CMAKE_CURRENT_LIST_DIR}/FuzzFirmwareBinary.cpp
  DEPS tav_firmware)
# The front-end: extension and link pick the reader, as in a run.
tav_fuzz_target(fuzz_firmware_front_end SOURCES ${CMAKE_CURRENT_LIST_DIR}/FuzzFirmwareFrontEnd.cpp
  DEPS tav_firmware)
