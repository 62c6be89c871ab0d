find_package(GDAL REQUIRED)
target_link_libraries(gdal_read_bench PRIVATE GDAL::GDAL)
