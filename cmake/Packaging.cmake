# What is installed, and the packages of it: for the handset an archive with the program, its manual page and a
# README for the line; for the development host a Debian package with the simulated hub as well.
include(GNUInstallDirs)
find_program(PERL_PROGRAM perl REQUIRED)  # of Debian's base: what makes texts of texts

# A daily build leaves the texts out.
if(CMAKE_BUILD_TYPE STREQUAL "Debug")
  set(vantle_texts_always)
else()
  set(vantle_texts_always ALL)
endif()

# ---- Manual pages ----

set(manual_folder ${PROJECT_BINARY_DIR}/man)
set(manual_pages ${manual_folder}/vantle.1 ${manual_folder}/vantle-hub.1 ${manual_folder}/vantle-scenario.5)
file(GLOB guides CONFIGURE_DEPENDS ${PROJECT_SOURCE_DIR}/docs/*.md ${PROJECT_SOURCE_DIR}/docs/commands/*.md)
set(make_man ${PROJECT_SOURCE_DIR}/docs/man/make-man)
add_custom_command(
  OUTPUT ${manual_pages}
  COMMAND ${CMAKE_COMMAND} -E make_directory ${manual_folder}
  COMMAND ${PERL_PROGRAM} ${make_man} ${PROJECT_VERSION} ${PROJECT_SOURCE_DIR}/docs ${manual_folder}
  DEPENDS ${guides} ${make_man}
  VERBATIM)
add_custom_target(manual ${vantle_texts_always} DEPENDS ${manual_pages})

set(CMAKE_SKIP_INSTALL_ALL_DEPENDENCY ON)  # tests and benchmarks are not installed
set(CPACK_PACKAGE_VENDOR "vantle")
set(CPACK_PACKAGE_CONTACT "vantle maintainers <vantle@localhost>")
set(CPACK_PACKAGE_DESCRIPTION_SUMMARY "calibrates the sensors of a handset through its sensor hub")
set(CPACK_RESOURCE_FILE_LICENSE ${PROJECT_SOURCE_DIR}/LICENSE)
set(CPACK_STRIP_FILES ON)

if(VANTLE_HANDSET)
  # ---- The line's archive: three files in one folder ----

  # The table of exit statuses stands in the guide.
  file(READ ${PROJECT_SOURCE_DIR}/docs/operators-guide.md guide)
  set_property(DIRECTORY APPEND PROPERTY CMAKE_CONFIGURE_DEPENDS ${PROJECT_SOURCE_DIR}/docs/operators-guide.md)
  string(REGEX MATCH "\\| Result \\| Shell \\|[^#]*" exit_statuses "${guide}")
  string(STRIP "${exit_statuses}" exit_statuses)
  if(NOT exit_statuses)
    message(FATAL_ERROR "docs/operators-guide.md has no table of exit statuses")
  endif()
  configure_file(${PROJECT_SOURCE_DIR}/packaging/README.handset.in ${PROJECT_BINARY_DIR}/README @ONLY)

  install(TARGETS vantle DESTINATION .)
  install(FILES ${manual_folder}/vantle.1 ${PROJECT_BINARY_DIR}/README DESTINATION .)
  set(CPACK_GENERATOR TGZ)
  set(CPACK_PACKAGE_FILE_NAME vantle-${PROJECT_VERSION}-handset-${CMAKE_SYSTEM_PROCESSOR})
else()
  # ---- The development host's package ----

  install(TARGETS vantle vantle-hub DESTINATION ${CMAKE_INSTALL_BINDIR})
  find_program(GZIP_PROGRAM gzip REQUIRED)
  foreach(page IN LISTS manual_pages)
    string(REGEX MATCH "[0-9]$" section ${page})
    add_custom_command(OUTPUT ${page}.gz COMMAND ${GZIP_PROGRAM} -9nkf ${page} DEPENDS ${page} VERBATIM)
    list(APPEND packed_pages ${page}.gz)
    install(FILES ${page}.gz DESTINATION ${CMAKE_INSTALL_MANDIR}/man${section})
  endforeach()
  add_custom_target(packed_manual ${vantle_texts_always} DEPENDS ${packed_pages})

  if(CMAKE_CROSSCOMPILING)
    return()  # the programs cannot be asked for their options
  endif()
  set(completions_folder ${PROJECT_BINARY_DIR}/completions)
  set(completions ${completions_folder}/vantle.bash ${completions_folder}/_vantle)
  set(completions_source ${PROJECT_SOURCE_DIR}/completions)
  add_custom_command(
    OUTPUT ${completions}
    COMMAND ${CMAKE_COMMAND} -E make_directory ${completions_folder}
    COMMAND ${PERL_PROGRAM} ${completions_source}/make-completions $<TARGET_FILE:vantle> $<TARGET_FILE:vantle-hub>
            ${PROJECT_SOURCE_DIR}/docs/operators-guide.md ${completions_folder}
            ${completions_source}/vantle.bash.in ${completions_source}/_vantle.in
    DEPENDS vantle vantle-hub ${PROJECT_SOURCE_DIR}/docs/operators-guide.md ${completions_source}/make-completions
            ${completions_source}/vantle.bash.in ${completions_source}/_vantle.in
    VERBATIM)
  add_custom_target(completions ${vantle_texts_always} DEPENDS ${completions})

  set(bash_folder ${CMAKE_INSTALL_DATADIR}/bash-completion/completions)
  install(FILES ${completions_folder}/vantle.bash DESTINATION ${bash_folder} RENAME vantle)
  install(FILES ${completions_folder}/vantle.bash DESTINATION ${bash_folder} RENAME vantle-hub)
  install(FILES ${completions_folder}/_vantle DESTINATION ${CMAKE_INSTALL_DATADIR}/zsh/vendor-completions)
  install(FILES LICENSE DESTINATION ${CMAKE_INSTALL_DOCDIR} RENAME copyright)
  install(FILES README.md DESTINATION ${CMAKE_INSTALL_DOCDIR})
  install(DIRECTORY src/simhub/scenarios/ DESTINATION ${CMAKE_INSTALL_DOCDIR}/examples FILES_MATCHING PATTERN "*.toml")
  set(CPACK_GENERATOR DEB)
  set(CPACK_PACKAGING_INSTALL_PREFIX /usr)
  set(CPACK_DEBIAN_FILE_NAME DEB-DEFAULT)
  set(CPACK_DEBIAN_PACKAGE_SECTION electronics)
  set(CPACK_DEBIAN_PACKAGE_DESCRIPTION
    "The calibration tool as it runs on a handset, and a simulated sensor hub to
develop and try calibration procedures without one.")
  if(NOT VANTLE_STATIC)
    set(CPACK_DEBIAN_PACKAGE_SHLIBDEPS ON)
  endif()
endif()
include(CPack)
