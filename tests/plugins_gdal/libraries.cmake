# GDAL and libtiff themselves, to compare with.
find_package(GDAL REQUIRED)
find_package(PkgConfig REQUIRED)
pkg_check_modules(TIFF REQUIRED IMPORTED_TARGET libtiff-4)
target_link_libraries(vexg_plugins_gdal_tests PRIVATE GDAL::GDAL PkgConfig::TIFF)
