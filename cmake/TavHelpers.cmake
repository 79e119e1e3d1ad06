# Shared build settings for every target of the project.

function(tav_target_options target)
  target_compile_options(${target} PRIVATE -Wall -Wextra)
  # GCC 12 at -O2 and above reports std::string concatenations inside its own
  # headers as overlapping copies (a known false positive of that release).
  if(CMAKE_CXX_COMPILER_ID STREQUAL "GNU" AND CMAKE_CXX_COMPILER_VERSION VERSION_LESS 13)
    target_compile_options(${target} PRIVATE -Wno-restrict)
  endif()
  if(TAV_WERROR)
    target_compile_options(${target} PRIVATE -Werror)
  endif()
endfunction()

if(TAV_SANITIZE STREQUAL "address")
  add_compile_options(-fsanitize=address,undefined -fno-omit-frame-pointer -fno-sanitize-recover=undefined)
  add_link_options(-fsanitize=address,undefined)
elseif(TAV_SANITIZE STREQUAL "fuzzer")
  # Instrument every library for coverage; the fuzz targets add the driver.
  add_compile_options(-fsanitize=fuzzer-no-link,address,undefined -fno-omit-frame-pointer
    -fsanitize-coverage-ignorelist=${CMAKE_SOURCE_DIR}/fuzz/coverage-ignore.txt)
  add_link_options(-fsanitize=address,undefined)
elseif(TAV_SANITIZE STREQUAL "thread")
  add_compile_options(-fsanitize=thread -fno-omit-frame-pointer)
  add_link_options(-fsanitize=thread)
endif()

# tav_library(NAME SOURCES... [DEPS ...]): a static library of one subsystem.
# The include root is src/, so headers are included as "common/TavLog.h".
function(tav_library name)
  cmake_parse_arguments(ARG "" "" "SOURCES;DEPS" ${ARGN})
  add_library(${name} STATIC ${ARG_SOURCES})
  target_include_directories(${name} PUBLIC ${PROJECT_SOURCE_DIR}/src)
  target_link_libraries(${name} PUBLIC ${ARG_DEPS})
  tav_target_options(${name})
endfunction()

# tav_test_suite(NAME SOURCES... [DEPS ...] [SET VAR=VALUE] [LAUNCHER SCRIPT]):
# one GoogleTest executable, registered with CTest test by test, run through
# SCRIPT when one is given. SET gives the tests one
# more environment variable (CMake 3.25's test discovery splits a property
# holding a list, so each property carries one entry).
function(tav_test_suite name)
  cmake_parse_arguments(ARG "" "SET;LAUNCHER" "SOURCES;DEPS" ${ARGN})
  add_executable(${name} ${ARG_SOURCES})
  target_include_directories(${name} PRIVATE ${PROJECT_SOURCE_DIR}/src ${PROJECT_SOURCE_DIR}/tests)
  target_link_libraries(${name} PRIVATE ${ARG_DEPS} GTest::gmock GTest::gtest GTest::gmock_main Threads::Threads)
  tav_target_options(${name})
  if(ARG_LAUNCHER)
    # Test discovery runs the tests through the emulator property.
    set_target_properties(${name} PROPERTIES CROSSCOMPILING_EMULATOR ${ARG_LAUNCHER})
  endif()
  # Sanitized builds run several times slower.
  set(timeout 120)
  if(TAV_SANITIZE)
    set(timeout 1200)
  endif()
  set(extra)
  if(ARG_SET)
    string(REGEX REPLACE "^([^=]*)=" "\\1=set:" modification "${ARG_SET}")
    set(extra ENVIRONMENT_MODIFICATION "${modification}")
  endif()
  gtest_discover_tests(${name} DISCOVERY_MODE PRE_TEST
    PROPERTIES ENVIRONMENT "TMPDIR=${CMAKE_CURRENT_BINARY_DIR}" TIMEOUT ${timeout} ${extra})
endfunction()
