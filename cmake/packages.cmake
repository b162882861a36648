# Debian packages made with CPack from a system-layout build (scripts/package.sh):
#   libfileindex1      the library (shlibs from its SONAME)
#   libfileindex-dev   headers, CMake package, pkg-config file
#   fileindex-tools    fileindexctl, the console and its unit, manual pages, completion
#   fileindex-sim      the simulated appliance: platform library, qira-sim, the daemon and
#                      notification stand-ins with their units
# The version is the project's; dependencies on other packages come from the shared libraries
# each package links (dpkg-shlibdeps), those between these packages are stated here.
set(FILEINDEX_MAINTAINER "libfileindex maintainers <maintainers@users.noreply.c-seed-2a25c2a9.example>")
set(FILEINDEX_PACKAGING_DIR ${CMAKE_BINARY_DIR}/packaging)

# Each package's copyright (the licence, in the machine-readable format) and changelog.
file(READ ${PROJECT_SOURCE_DIR}/LICENSE FILEINDEX_LICENSE)
string(REGEX REPLACE "\n\n" "\n.\n" FILEINDEX_LICENSE_BODY "${FILEINDEX_LICENSE}")
string(REGEX REPLACE "\n" "\n " FILEINDEX_LICENSE_BODY "${FILEINDEX_LICENSE_BODY}")
string(REGEX REPLACE "\n $" "" FILEINDEX_LICENSE_BODY "${FILEINDEX_LICENSE_BODY}")
file(WRITE ${FILEINDEX_PACKAGING_DIR}/copyright
  "Format: https://www.debian.org/doc/packaging-manuals/copyright-format/1.0/\n"
  "Upstream-Name: libfileindex\n\n"
  "Files: *\nCopyright: 2026 The libfileindex authors\nLicense: MIT\n ${FILEINDEX_LICENSE_BODY}\n")
configure_file(${PROJECT_SOURCE_DIR}/packaging/changelog.in ${FILEINDEX_PACKAGING_DIR}/changelog @ONLY)
add_custom_command(OUTPUT ${FILEINDEX_PACKAGING_DIR}/changelog.gz
  COMMAND gzip -9nc ${FILEINDEX_PACKAGING_DIR}/changelog > ${FILEINDEX_PACKAGING_DIR}/changelog.gz
  DEPENDS ${FILEINDEX_PACKAGING_DIR}/changelog VERBATIM)
add_custom_target(package-changelog ALL DEPENDS ${FILEINDEX_PACKAGING_DIR}/changelog.gz)

set(FILEINDEX_COMPONENTS runtime dev tools)
if(TARGET qira_platform_sim)
  list(APPEND FILEINDEX_COMPONENTS sim)
endif()
set(FILEINDEX_PACKAGE_runtime libfileindex1)
set(FILEINDEX_PACKAGE_dev libfileindex-dev)
set(FILEINDEX_PACKAGE_tools fileindex-tools)
set(FILEINDEX_PACKAGE_sim fileindex-sim)
foreach(component IN LISTS FILEINDEX_COMPONENTS)
  install(FILES ${FILEINDEX_PACKAGING_DIR}/copyright ${FILEINDEX_PACKAGING_DIR}/changelog.gz
    DESTINATION ${CMAKE_INSTALL_DATAROOTDIR}/doc/${FILEINDEX_PACKAGE_${component}} COMPONENT ${component})
endforeach()

# The services: systemd looks for units of Debian's packages in /lib/systemd/system.
install(FILES ${PROJECT_SOURCE_DIR}/packaging/systemd/fileindex-web.service DESTINATION /lib/systemd/system
  COMPONENT tools)
install(FILES ${PROJECT_SOURCE_DIR}/packaging/fileindex.default DESTINATION /etc/default RENAME fileindex
  COMPONENT tools)
install(FILES ${PROJECT_SOURCE_DIR}/packaging/sysusers.conf DESTINATION lib/sysusers.d
  RENAME fileindex.conf COMPONENT tools)
file(WRITE ${FILEINDEX_PACKAGING_DIR}/tools/conffiles "/etc/default/fileindex\n")
configure_file(${PROJECT_SOURCE_DIR}/packaging/tools.postinst ${FILEINDEX_PACKAGING_DIR}/tools/postinst COPYONLY)
# A package holding a shared library: its shlibs, the loader cache refreshed by dpkg's trigger,
# and maintainer scripts that do nothing else (CPack would call ldconfig from its own).
function(fileindex_library_control component library package)
  set(dir ${FILEINDEX_PACKAGING_DIR}/${component})
  file(WRITE ${dir}/shlibs "${library} ${PROJECT_VERSION_MAJOR} ${package} (>= ${PROJECT_VERSION})\n")
  file(WRITE ${dir}/triggers "activate-noawait ldconfig\n")
  foreach(script postinst postrm)
    file(WRITE ${dir}/${script} "#!/bin/sh\nset -e\nexit 0\n")
  endforeach()
  string(TOUPPER ${component} upper)
  set(CPACK_DEBIAN_${upper}_PACKAGE_CONTROL_EXTRA ${dir}/shlibs ${dir}/triggers ${dir}/postinst ${dir}/postrm
    PARENT_SCOPE)
endfunction()
fileindex_library_control(runtime libfileindex libfileindex1)
if(TARGET qira_platform_sim)
  fileindex_library_control(sim libqira_platform_sim fileindex-sim)
endif()
if(TARGET qira_platform_sim)
  install(FILES ${PROJECT_SOURCE_DIR}/packaging/systemd/fileindexd-ref.service
    ${PROJECT_SOURCE_DIR}/packaging/systemd/qiranotifyd-sim.service DESTINATION /lib/systemd/system COMPONENT sim)
endif()

set(CPACK_GENERATOR DEB)
set(CPACK_PACKAGE_NAME fileindex)
set(CPACK_PACKAGE_VERSION ${PROJECT_VERSION})
set(CPACK_PACKAGE_VENDOR "The libfileindex authors")
set(CPACK_PACKAGE_CONTACT "${FILEINDEX_MAINTAINER}")
set(CPACK_STRIP_FILES ON)
set(CPACK_COMPONENTS_ALL ${FILEINDEX_COMPONENTS})
set(CPACK_DEB_COMPONENT_INSTALL ON)
set(CPACK_DEBIAN_FILE_NAME DEB-DEFAULT)
set(CPACK_DEBIAN_PACKAGE_PRIORITY optional)
set(CPACK_DEBIAN_PACKAGE_SHLIBDEPS ON)
set(CPACK_DEBIAN_PACKAGE_SHLIBDEPS_PRIVATE_DIRS ${CMAKE_BINARY_DIR} ${CMAKE_BINARY_DIR}/platform)
set(CPACK_DEBIAN_PACKAGE_CONTROL_STRICT_PERMISSION ON)
set(FILEINDEX_SAME_VERSION "(= ${PROJECT_VERSION})")

set(CPACK_DEBIAN_RUNTIME_PACKAGE_NAME libfileindex1)
set(CPACK_DEBIAN_RUNTIME_PACKAGE_SECTION libs)
set(CPACK_COMPONENT_RUNTIME_DESCRIPTION "configuration and control of a file-indexing service
libfileindex holds the configuration and control logic of a storage
appliance's file-indexing service: what is indexed, pausing and resuming,
registration with the change-notification daemon, the indexing daemon's
commands and event queues, and the status words of the management page.")
if(TARGET qira_platform_sim)
  # Built against the simulated platform, the library needs it at run time.
  set(CPACK_DEBIAN_RUNTIME_PACKAGE_DEPENDS "fileindex-sim ${FILEINDEX_SAME_VERSION}")
endif()

set(CPACK_DEBIAN_DEV_PACKAGE_NAME libfileindex-dev)
set(CPACK_DEBIAN_DEV_PACKAGE_SECTION libdevel)
set(CPACK_DEBIAN_DEV_PACKAGE_DEPENDS "libfileindex1 ${FILEINDEX_SAME_VERSION}, libjsoncpp-dev")
set(CPACK_COMPONENT_DEV_DESCRIPTION "configuration and control of a file-indexing service - development files
The headers of libfileindex, its CMake package (find_package(fileindex))
and its pkg-config file.")

set(CPACK_DEBIAN_TOOLS_PACKAGE_NAME fileindex-tools)
set(CPACK_DEBIAN_TOOLS_PACKAGE_SECTION admin)
set(CPACK_DEBIAN_TOOLS_PACKAGE_DEPENDS "libfileindex1 ${FILEINDEX_SAME_VERSION}, systemd")
set(CPACK_DEBIAN_TOOLS_PACKAGE_CONTROL_EXTRA ${FILEINDEX_PACKAGING_DIR}/tools/conffiles
  ${FILEINDEX_PACKAGING_DIR}/tools/postinst)
set(CPACK_COMPONENT_TOOLS_DESCRIPTION "command-line tool and web console of the file-indexing service
fileindexctl changes and explains what is indexed, pauses and resumes
indexing and reports progress; fileindex-web serves the management
console (a web page and JSON API) on loopback, with a systemd unit.")

set(CPACK_DEBIAN_SIM_PACKAGE_NAME fileindex-sim)
set(CPACK_DEBIAN_SIM_PACKAGE_SECTION misc)
set(CPACK_DEBIAN_SIM_PACKAGE_DEPENDS "libfileindex1 ${FILEINDEX_SAME_VERSION}, fileindex-tools ${FILEINDEX_SAME_VERSION}")
set(CPACK_COMPONENT_SIM_DESCRIPTION "simulated storage appliance for the file-indexing service
The appliance's platform as a library whose state lives in files under a
root directory, qira-sim to set it up and inject faults, an indexing
daemon stand-in (fileindexd-ref, SQLite FTS5) and a change-notification
stand-in (qiranotifyd-sim, inotify), with systemd units for both.")

include(CPack)
