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

template class VEXG_EXPORT Raster<std::uint8_t>;
template class VEXG_EXPORT Raster<std::int8_t>;
template class VEXG_EXPORT Raster<std::uint16_t>;
template class VEXG_EXPORT Raster<std::int16_t>;
template class VEXG_EXPORT Raster<std::uint32_t>;
template class VEXG_EXPORT Raster<std::int32_t>;
template class VEXG_EXPORT Raster<float>;
template class VEXG_EXPORT Raster<double>;
template class VEXG_EXPORT Raster<std::uint64_t>;
template class VEXG_EXPORT Raster<std::int64_t>;
template class VEXG_EXPORT Raster<Complex<float>>;
template class VEXG_EXPORT Raster<Complex<double>>;

template class VEXG_EXPORT RasterView<std::uint8_t>;
template class VEXG_EXPORT RasterView<std::int8_t>;
template class VEXG_EXPORT RasterView<std::uint16_t>;
template class VEXG_EXPORT RasterView<std::int16_t>;
template class VEXG_EXPORT RasterView<std::uint32_t>;
template class VEXG_EXPORT RasterView<std::int32_t>;
template class VEXG_EXPORT RasterView<float>;
template class VEXG_EXPORT RasterView<double>;
template class VEXG_EXPORT RasterView<std::uint64_t>;
template class VEXG_EXPORT RasterView<std::int64_t>;
template class VEXG_EXPORT RasterView<Complex<float>>;
template class VEXG_EXPORT RasterView<Complex<double>>;

}  // namespace lumo
