# Readers of outside text in common: Base64 (settings bytes), UTF-8
# (documents) and version texts (configuration, devices).
tav_fuzz_target(fuzz_common_text SOURCES ${CMAKE_CURRENT_LIST_DIR}/FuzzCommonText.cpp DEPS tav_common)
