# The units that a compiler sees, where they are not the sources.

option(VEXG_UNITE "Compile small sources several at a time" ON)

# Compiles a file of template instances (VEXG_INSTANCES, VEXG_FOR) type by type, so that no unit takes
# long and the units are built side by side. The file holds nothing but the instances.
# Usage: vexg_cut_by_type(<name of a list of sources> <file> <types that its set has: 8, 10 or 12>)
function(vexg_cut_by_type list_name file types)
  set(units ${${list_name}})
  list(REMOVE_ITEM units ${file})
  get_filename_component(name ${file} NAME_WE)
  foreach(type RANGE 1 ${types})
    set(unit ${CMAKE_CURRENT_BINARY_DIR}/${name}_${type}.cpp)
    file(CONFIGURE OUTPUT ${unit} CONTENT "#define VEXG_ONLY_TYPE ${type}\n#include \"${file}\"\n")
    list(APPEND units ${unit})
  endforeach()
  set(${list_name} ${units} PARENT_SCOPE)
endfunction()

# Has several sources compiled as one unit, which takes half the time: most of what a compiler does for a
# small source are headers and instances of templates that others need too. Names without a linkage are
# those of a unit, so they differ in the sources of a folder; with -DVEXG_UNITE=OFF, as in the preset
# "debug", each source is a unit of its own. Sources whose loops have to be fast are not for this.
# Usage: vexg_unite(<name of a list of sources> <name of units> <sources to a unit> <sources ...>)
function(vexg_unite list_name name size)
  set(units ${${list_name}})
  set(number 0)
  set(united ${ARGN})
  list(SORT united)
  while(VEXG_UNITE AND united)
    list(SUBLIST united 0 ${size} sources)
    list(REMOVE_ITEM united ${sources})
    list(REMOVE_ITEM units ${sources})
    math(EXPR number "${number} + 1")
    set(content "")
    foreach(source IN LISTS sources)
      file(RELATIVE_PATH source ${PROJECT_SOURCE_DIR} ${source})
      string(REGEX REPLACE "^(src|plugins|tests|tools/vexg)/" "" source ${source})
      string(APPEND content "#include \"${source}\"\n")
    endforeach()
    # The compiler warns of types without a linkage where they stand in another file than the unit's.
    set(content "#if !defined(__clang__)\n#pragma GCC diagnostic ignored \"-Wsubobject-linkage\"\n#endif\n${content}")
    set(unit ${CMAKE_CURRENT_BINARY_DIR}/${name}_${number}.cpp)
    file(CONFIGURE OUTPUT ${unit} CONTENT "${content}" @ONLY)
    list(APPEND units ${unit})
  endwhile()
  set(${list_name} ${units} PARENT_SCOPE)
endfunction()
