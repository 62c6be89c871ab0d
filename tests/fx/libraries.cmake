# GEOS, to compare with.
find_package(GEOS REQUIRED CONFIG)
target_link_libraries(vexg_fx_tests PRIVATE GEOS::geos_c)
