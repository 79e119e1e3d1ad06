# Readers of outside data in the Linux forms: HID report descriptors.
tav_fuzz_target(fuzz_hid_report_descriptor
  SOURCES ${CMAKE_CURRENT_LIST_DIR}/FuzzHidReportDescriptor.cpp DEPS tav_platform_linux)
