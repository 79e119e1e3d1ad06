# Message catalogs: every <SOURCE_DIR>/<domain>/<language>.po is compiled
# with msgfmt into <OUTPUT_DIR>/<language>/LC_MESSAGES/<domain>.mo, the
# layout gettext reads at run time.
include_guard(GLOBAL)
find_program(MSGFMT msgfmt REQUIRED)

# tav_gettext_catalogs(TARGET name SOURCE_DIR dir OUTPUT_DIR dir [INSTALL])
# INSTALL also installs the catalogs under ${CMAKE_INSTALL_DATADIR}/locale.
function(tav_gettext_catalogs)
  cmake_parse_arguments(ARG "INSTALL" "TARGET;SOURCE_DIR;OUTPUT_DIR" "" ${ARGN})
  file(GLOB catalogs CONFIGURE_DEPENDS "${ARG_SOURCE_DIR}/*/*.po")
  set(outputs)
  foreach(po ${catalogs})
    get_filename_component(language ${po} NAME_WE)
    get_filename_component(domainDir ${po} DIRECTORY)
    get_filename_component(domain ${domainDir} NAME)
    set(moDir ${ARG_OUTPUT_DIR}/${language}/LC_MESSAGES)
    add_custom_command(OUTPUT ${moDir}/${domain}.mo
      COMMAND ${CMAKE_COMMAND} -E make_directory ${moDir}
      COMMAND ${MSGFMT} --check -o ${moDir}/${domain}.mo ${po}
      DEPENDS ${po}
      COMMENT "Compiling message catalog ${domain}/${language}"
      VERBATIM)
    list(APPEND outputs ${moDir}/${domain}.mo)
    if(ARG_INSTALL)
      install(FILES ${moDir}/${domain}.mo DESTINATION ${CMAKE_INSTALL_DATADIR}/locale/${language}/LC_MESSAGES)
    endif()
    # The C locale never translates, so a run without a locale uses C.UTF-8,
    # and the English texts are filed under that name as well.
    if(language STREQUAL "en")
      set(cDir ${ARG_OUTPUT_DIR}/C.UTF-8/LC_MESSAGES)
      add_custom_command(OUTPUT ${cDir}/${domain}.mo
        COMMAND ${CMAKE_COMMAND} -E make_directory ${cDir}
        COMMAND ${CMAKE_COMMAND} -E copy ${moDir}/${domain}.mo ${cDir}/${domain}.mo
        DEPENDS ${moDir}/${domain}.mo
        VERBATIM)
      list(APPEND outputs ${cDir}/${domain}.mo)
      if(ARG_INSTALL)
        install(FILES ${cDir}/${domain}.mo DESTINATION ${CMAKE_INSTALL_DATADIR}/locale/C.UTF-8/LC_MESSAGES)
      endif()
    endif()
  endforeach()
  add_custom_target(${ARG_TARGET} ALL DEPENDS ${outputs})
endfunction()
