find_package(GDAL REQUIRED)
target_link_libraries(pyramid_bench PRIVATE GDAL::GDAL)
