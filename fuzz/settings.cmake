# Readers of the settings forms: each takes whole documents from outside
# (device configuration, persisted store, binary blobs).
foreach(form Xml PList JSON ASN1 Compressed)
  string(TOLOWER ${form} lower)
  tav_fuzz_target(fuzz_settings_${lower}
    SOURCES ${CMAKE_CURRENT_LIST_DIR}/settings/FuzzSettings${form}.cpp
    DEPS tav_settings)
endforeach()
