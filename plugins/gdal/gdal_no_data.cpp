#include "gdal_no_data.h"

#include <cstdint>
#include <gdal_pam.h>
#include <string>

namespace lumo::gdal {
namespace {

template <typename T>
NoDataNumber Exact(T whole) {
  return {static_cast<double>(whole), std::to_string(whole)};
}

}  // namespace

std::optional<NoDataNumber> ReadNoData(GDALRasterBandH band) {
  int has = FALSE;
  NoDataNumber value;
  switch (GDALGetRasterDataType(band)) {
    case GDT_Int64:
      value = Exact(GDALGetRasterNoDataValueAsInt64(band, &has));
      break;
    case GDT_UInt64:
      value = Exact(GDALGetRasterNoDataValueAsUInt64(band, &has));
      break;
    default:
      value.number = GDALGetRasterNoDataValue(band, &has);
  }
  return has != FALSE ? std::optional(value) : std::nullopt;
}

bool WriteNoData(GDALRasterBandH band, const NoDataNumber& value) {
  switch (GDALGetRasterDataType(band)) {
    case GDT_Int64: {
      const auto whole = value.As<std::int64_t>();
      return !whole || GDALSetRasterNoDataValueAsInt64(band, *whole) == CE_None;
    }
    case GDT_UInt64: {
      const auto whole = value.As<std::uint64_t>();
      return !whole || GDALSetRasterNoDataValueAsUInt64(band, *whole) == CE_None;
    }
    default:
      return GDALSetRasterNoDataValue(band, value.number) == CE_None;
  }
}

bool WriteNoDataBeside(GDALRasterBandH band, const NoDataNumber& value) {
  // The base class keeps such values there; a driver's own operation may write into the file.
  auto* const target = dynamic_cast<GDALPamRasterBand*>(GDALRasterBand::FromHandle(band));
  if (target == nullptr) return false;
  switch (GDALGetRasterDataType(band)) {
    case GDT_Int64: {
      const auto whole = value.As<std::int64_t>();
      return !whole || target->GDALPamRasterBand::SetNoDataValueAsInt64(*whole) == CE_None;
    }
    case GDT_UInt64: {
      const auto whole = value.As<std::uint64_t>();
      return !whole || target->GDALPamRasterBand::SetNoDataValueAsUInt64(*whole) == CE_None;
    }
    default:
      return target->GDALPamRasterBand::SetNoDataValue(value.number) == CE_None;
  }
}

}  // namespace lumo::gdal
