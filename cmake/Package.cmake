# cpack makes packages of the installed tree: `cpack -G DEB` one for this distribution, which asks for the
# libraries that it needs, and `cpack -G TGZ` the same tree for users without root, which runs wherever it is
# unpacked. The packages of the distribution's own form are made from debian/ (docs/release.md).
set(CPACK_PACKAGE_NAME vexg)
set(CPACK_PACKAGE_VENDOR vexg)
set(CPACK_PACKAGE_CONTACT "vexg maintainers <maintainers@vexg.example.org>")
set(CPACK_PACKAGE_DESCRIPTION_SUMMARY "${PROJECT_DESCRIPTION}")
set(CPACK_PACKAGE_DESCRIPTION "Statistics, pyramids, calibration, warps, segments and mosaics of satellite
and aerial images: the library libvexg with its plug-ins and headers, and the program vexg.")
set(CPACK_RESOURCE_FILE_LICENSE ${PROJECT_SOURCE_DIR}/LICENSE)
set(CPACK_GENERATOR TGZ)
set(CPACK_STRIP_FILES ON)
set(CPACK_PACKAGE_FILE_NAME
  ${CPACK_PACKAGE_NAME}-${PROJECT_VERSION}-${CMAKE_SYSTEM_NAME}-${CMAKE_SYSTEM_PROCESSOR})

set(CPACK_PACKAGING_INSTALL_PREFIX /usr)
set(CPACK_DEBIAN_FILE_NAME DEB-DEFAULT)
set(CPACK_DEBIAN_PACKAGE_SECTION science)
set(CPACK_DEBIAN_PACKAGE_SHLIBDEPS ON)
set(CPACK_DEBIAN_PACKAGE_RECOMMENDS proj-data)
# The same files in other packages; one or the other is installed.
set(library libvexg${PROJECT_VERSION_MAJOR}.${PROJECT_VERSION_MINOR})
set(CPACK_DEBIAN_PACKAGE_CONFLICTS "${library}, libvexg-dev, vexg-plugins, vexg-data, vexg-doc")
set(CPACK_DEBIAN_PACKAGE_REPLACES "${CPACK_DEBIAN_PACKAGE_CONFLICTS}")
set(CPACK_DEBIAN_PACKAGE_PROVIDES
  "${library} (= ${PROJECT_VERSION}), libvexg-dev (= ${PROJECT_VERSION}), vexg-plugins (= ${PROJECT_VERSION}), vexg-data (= ${PROJECT_VERSION})")
# The library's folder is one of the system's.
file(WRITE ${PROJECT_BINARY_DIR}/package/triggers "activate-noawait ldconfig\n")
set(CPACK_DEBIAN_PACKAGE_CONTROL_EXTRA ${PROJECT_BINARY_DIR}/package/triggers)
# A tarball has the folders of its tree below one of its own name, not below a prefix.
file(WRITE ${PROJECT_BINARY_DIR}/package/prefix.cmake
  "if(CPACK_GENERATOR STREQUAL TGZ)\n  set(CPACK_PACKAGING_INSTALL_PREFIX /)\nendif()\n")
set(CPACK_PROJECT_CONFIG_FILE ${PROJECT_BINARY_DIR}/package/prefix.cmake)
include(CPack)
