# The report descriptor is read from the device, so it is outside data.
tav_fuzz_target(fuzz_hid_report_descriptor
  SOURCES ${CMAKE_CURRENT_LIST_DIR}/FuzzHIDReportDescriptor.cpp DEPS tav_devices)
# The device configuration is a document from outside the program.
tav_fuzz_target(fuzz_device_configuration
  SOURCES ${CMAKE_CURRENT_LIST_DIR}/FuzzDeviceConfiguration.cpp DEPS tav_devices)
