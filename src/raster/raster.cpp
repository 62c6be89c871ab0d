#include "raster/raster.h"

#include <cstdio>
#include <string>

#include "foundation/type_code.h"
#include "raster/raster_view_body.h"

namespace lumo {

const unsigned BasicRaster::TypeCode = GloballyUniqueObjectTypeCode("BasicRaster");

bool BasicRaster::IsA(unsigned typeCode) const {
  return typeCode == TypeCode || Object::IsA(typeCode);
}

URI BasicRaster::DefaultURI(const char* className) const {
  char address[32];
  std::snprintf(address, sizeof(address), "%llx",
                static_cast<unsigned long long>(reinterpret_cast<std::uintptr_t>(this)));
  return URI(String("{" + std::string(className) + "}@" + address));
}

template <typename T>
const unsigned Raster<T>::TypeCode =
    GloballyUniqueObjectTypeCode(String("Raster<" + DataTypeName(kDataTypeOf<T>).ToUTF8() + ">"));

VEXG_INSTANCES(TWELVE, Raster);
VEXG_INSTANCES(TWELVE, RasterView);

}  // namespace lumo
