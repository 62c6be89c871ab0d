# Installs the build into an empty directory and builds a project outside against it, with the CMake
# package and with pkg-config.
#   cmake -DBUILD=... -DSOURCE=... -DCXX=... -P install_test.cmake
set(prefix ${BUILD}/install-test/prefix)
file(REMOVE_RECURSE ${BUILD}/install-test)

function(run)
  execute_process(COMMAND ${ARGN} OUTPUT_VARIABLE output ERROR_VARIABLE output RESULT_VARIABLE code)
  if(NOT code EQUAL 0)
    message(FATAL_ERROR "${ARGN}\n${output}")
  endif()
  set(output "${output}" PARENT_SCOPE)
endfunction()

function(expect_success program)
  run(${program})
  if(NOT output STREQUAL "Success\n")
    message(FATAL_ERROR "${program} printed ${output}")
  endif()
endfunction()

run(${CMAKE_COMMAND} --install ${BUILD} --prefix ${prefix})
run(${CMAKE_COMMAND} -G Ninja -S ${SOURCE}/tests/install/consumer -B ${BUILD}/install-test/consumer
    -DCMAKE_PREFIX_PATH=${prefix} -DCMAKE_CXX_COMPILER=${CXX} -DSOURCE=${SOURCE})
run(${CMAKE_COMMAND} --build ${BUILD}/install-test/consumer)
expect_success(${BUILD}/install-test/consumer/consumer)

file(GLOB_RECURSE package ${prefix}/*/vexg.pc)
get_filename_component(packages ${package} DIRECTORY)
get_filename_component(libraries ${packages} DIRECTORY)
set(ENV{PKG_CONFIG_PATH} ${packages})
run(pkg-config --cflags --libs vexg)
separate_arguments(flags UNIX_COMMAND "${output}")
run(${CXX} ${SOURCE}/tests/install/consumer/main.cpp -o ${BUILD}/install-test/by-pkg-config ${flags}
    -Wl,-rpath,${libraries})
expect_success(${BUILD}/install-test/by-pkg-config)

run(${prefix}/bin/vexg --version)

# The installed program finds the installed plug-ins, and one that is put beside them.
file(GLOB plugins ${prefix}/*/vexg/plugins-* ${prefix}/*/*/vexg/plugins-*)
file(COPY ${BUILD}/install-test/consumer/libvexgformat_plane.so DESTINATION ${plugins})
run(${prefix}/bin/vexg formats)
foreach(line "TIFF +raster +libvexgdal.so +yes +yes" "Plane +raster +libvexgformat_plane.so +yes +no")
  if(NOT output MATCHES "${line}")
    message(FATAL_ERROR "vexg formats has no line ${line}:\n${output}")
  endif()
endforeach()

# A program in C, which sees nothing but vexg.h, and reads and writes what the plug-ins give it.
run(pkg-config --cflags-only-I --libs vexg)
separate_arguments(flags UNIX_COMMAND "${output}")
run(${C_COMPILER} -std=c11 -Wall -Wextra -Wpedantic -Werror ${SOURCE}/tests/install/consumer/door.c
    -o ${BUILD}/install-test/door ${flags} -Wl,-rpath,${libraries})
expect_success(${BUILD}/install-test/door)

# A view and its command from outside work on a raster of the installed plug-ins.
file(WRITE ${BUILD}/install-test/mirror.xml [[<Job>
  <Command Name="open" ID="OpenRasterCommand">
    <Input ConnStr="plane:5x1"/><Output URI="$plane"/></Command>
  <Command Name="mirror" ID="ExampleMirrorCommand">
    <DependsOn Name="open"/><Input SrcURI="$plane"/><Output URI="$mirror"/></Command>
  <Command Name="stats" ID="GetBasicRasterStatsCommand">
    <DependsOn Name="mirror"/><Input URI="$mirror"/></Command>
</Job>
]])
run(${prefix}/bin/vexg --load ${BUILD}/install-test/consumer/libmirror.so run
    ${BUILD}/install-test/mirror.xml)
string(FIND "${output}" "Max=\"1:1 [4]" at)
if(at EQUAL -1)
  message(FATAL_ERROR "the mirrored plane has other statistics:\n${output}")
endif()
