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
