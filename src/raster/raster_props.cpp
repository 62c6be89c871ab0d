#include "raster/raster_props.h"

#include "foundation/type_code.h"

namespace lumo {

const unsigned RasterProps::TypeCode = GloballyUniqueObjectTypeCode("RasterProps");

bool RasterProps::IsA(unsigned typeCode) const {
  return typeCode == TypeCode || Object::IsA(typeCode);
}

}  // namespace lumo
