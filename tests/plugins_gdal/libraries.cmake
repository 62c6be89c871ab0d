# GDAL itself, to compare with.
find_package(GDAL REQUIRED)
target_link_libraries(vexg_plugins_gdal_tests PRIVATE GDAL::GDAL)
