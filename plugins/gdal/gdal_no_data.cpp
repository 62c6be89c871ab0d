#include "gdal_no_data.h"

#include <cstdint>
#include <gdal_pam.h>

#include "gdal_pixel_value.h"

namespace lumo::gdal {
std::optional<double> ReadNoData(GDALRasterBandH band) {
  int has = FALSE;
  double value = 0;
  switch (GDALGetRasterDataType(band)) {
    case GDT_Int64:
      value = static_cast<double>(GDALGetRasterNoDataValueAsInt64(band, &has));
      break;
    case GDT_UInt64:
      value = static_cast<double>(GDALGetRasterNoDataValueAsUInt64(band, &has));
      break;
    default:
      value = GDALGetRasterNoDataValue(band, &has);
  }
  return has != FALSE ? std::optional(value) : std::nullopt;
}

bool WriteNoData(GDALRasterBandH band, double value) {
  switch (GDALGetRasterDataType(band)) {
    case GDT_Int64: {
      const auto whole = ToPixel<std::int64_t>(value);
      return !whole || GDALSetRasterNoDataValueAsInt64(band, *whole) == CE_None;
    }
    case GDT_UInt64: {
      const auto whole = ToPixel<std::uint64_t>(value);
      return !whole || GDALSetRasterNoDataValueAsUInt64(band, *whole) == CE_None;
    }
    default:
      return GDALSetRasterNoDataValue(band, value) == CE_None;
  }
}

bool WriteNoDataBeside(GDALRasterBandH band, double value) {
  // The base class keeps such values there; a driver's own operation may write into the file.
  auto* const target = dynamic_cast<GDALPamRasterBand*>(GDALRasterBand::FromHandle(band));
  if (target == nullptr) return false;
  switch (GDALGetRasterDataType(band)) {
    case GDT_Int64: {
      const auto whole = ToPixel<std::int64_t>(value);
      return !whole || target->GDALPamRasterBand::SetNoDataValueAsInt64(*whole) == CE_None;
    }
    case GDT_UInt64: {
      const auto whole = ToPixel<std::uint64_t>(value);
      return !whole || target->GDALPamRasterBand::SetNoDataValueAsUInt64(*whole) == CE_None;
    }
    default:
      return target->GDALPamRasterBand::SetNoDataValue(value) == CE_None;
  }
}

bool IsSameNumber(double a, double b) {
  return a == b || (a != a && b != b);
}

}  // namespace lumo::gdal
