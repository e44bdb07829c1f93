# What "cmake --install" puts where, and the packages that cpack makes of it. Every path follows
# GNUInstallDirs; shells and man find their files below the share/ of any prefix that they search.
include(GNUInstallDirs)

# A manual page names the version as @PROJECT_VERSION@.
file(GLOB QEL_MANUAL_PAGES CONFIGURE_DEPENDS RELATIVE ${PROJECT_SOURCE_DIR}/docs docs/*.1)
foreach(page IN LISTS QEL_MANUAL_PAGES)
  configure_file(docs/${page} ${PROJECT_BINARY_DIR}/docs/${page} @ONLY)
  install(FILES ${PROJECT_BINARY_DIR}/docs/${page} DESTINATION ${CMAKE_INSTALL_MANDIR}/man1)
endforeach()

# Each shell loads these by their file names.
foreach(program IN LISTS QEL_PROGRAMS)
  install(FILES packaging/completions/${program}.bash
    DESTINATION ${CMAKE_INSTALL_DATADIR}/bash-completion/completions RENAME ${program})
  install(FILES packaging/completions/_${program} DESTINATION ${CMAKE_INSTALL_DATADIR}/zsh/site-functions)
  install(FILES packaging/completions/${program}.fish
    DESTINATION ${CMAKE_INSTALL_DATADIR}/fish/vendor_completions.d)
endforeach()

# In the layout of the sources, so that links between the documents hold. The README of the sources is for
# those who have them.
install(FILES packaging/installed-readme.md DESTINATION ${CMAKE_INSTALL_DOCDIR} RENAME README.md)
install(FILES CHANGELOG.md CONTRIBUTING.md DESTINATION ${CMAKE_INSTALL_DOCDIR})
install(DIRECTORY docs examples DESTINATION ${CMAKE_INSTALL_DOCDIR} USE_SOURCE_PERMISSIONS
  PATTERN "*.1" EXCLUDE
  PATTERN "__pycache__" EXCLUDE
  PATTERN ".*" EXCLUDE)

set(CPACK_GENERATOR TGZ)
set(CPACK_PACKAGE_DIRECTORY ${PROJECT_BINARY_DIR}/packages)
set(CPACK_PACKAGE_VENDOR "the maintainers of qel")
set(CPACK_PACKAGE_CONTACT "Seed d4515a06 maintainers <maintainers@users.noreply.c-seed-d4515a06.example>")
set(CPACK_PACKAGE_DESCRIPTION_SUMMARY "converter of podcasts between feeds, reference files and bundles")
set(CPACK_PACKAGE_DESCRIPTION_FILE ${PROJECT_SOURCE_DIR}/packaging/description.txt)
string(TOLOWER "${CMAKE_SYSTEM_NAME}-${CMAKE_SYSTEM_PROCESSOR}" CPACK_SYSTEM_NAME)
set(CPACK_STRIP_FILES ON)
set(CPACK_VERBATIM_VARIABLES ON)
set(CPACK_PRE_BUILD_SCRIPTS ${PROJECT_SOURCE_DIR}/packaging/arrange.cmake)
set(CPACK_QEL_COPYRIGHT ${PROJECT_SOURCE_DIR}/packaging/debian/copyright)  # for that script

set(CPACK_DEBIAN_FILE_NAME DEB-DEFAULT)
set(CPACK_DEBIAN_PACKAGE_SECTION net)
set(CPACK_DEBIAN_PACKAGE_PRIORITY optional)
set(CPACK_DEBIAN_PACKAGE_SHLIBDEPS ON)
# Loaded by the tool itself, so that it is not found among the linked ones.
set(CPACK_DEBIAN_PACKAGE_DEPENDS "libcurl4 (>= 7.85)")
# All but the first for the scripts of fleets among the examples; the last two of those for several machines.
set(CPACK_DEBIAN_PACKAGE_RECOMMENDS "ca-certificates, parallel, python3, openssh-client, rsync")
set(CPACK_DEBIAN_PACKAGE_CONTROL_STRICT_PERMISSION ON)
set(CPACK_DEBIAN_COMPRESSION_TYPE xz)

include(CPack)
