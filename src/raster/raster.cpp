#include "raster/raster.h"

#include <cstdio>
#include <string>

#include "foundation/type_code.h"
#include "raster/raster_view_impl.h"

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

template class Raster<std::uint8_t>;
template class Raster<std::int8_t>;
template class Raster<std::uint16_t>;
template class Raster<std::int16_t>;
template class Raster<std::uint32_t>;
template class Raster<std::int32_t>;
template class Raster<float>;
template class Raster<double>;
template class Raster<std::uint64_t>;
template class Raster<std::int64_t>;
template class Raster<Complex<float>>;
template class Raster<Complex<double>>;

template class RasterView<std::uint8_t>;
template class RasterView<std::int8_t>;
template class RasterView<std::uint16_t>;
template class RasterView<std::int16_t>;
template class RasterView<std::uint32_t>;
template class RasterView<std::int32_t>;
template class RasterView<float>;
template class RasterView<double>;
template class RasterView<std::uint64_t>;
template class RasterView<std::int64_t>;
template class RasterView<Complex<float>>;
template class RasterView<Complex<double>>;

}  // namespace lumo
