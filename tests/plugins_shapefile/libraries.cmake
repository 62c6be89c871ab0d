# GDAL itself, to compare with.
find_package(GDAL REQUIRED)
target_link_libraries(vexg_plugins_shapefile_tests PRIVATE GDAL::GDAL)
