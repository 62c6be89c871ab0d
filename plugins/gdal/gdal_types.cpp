#include "gdal_types.h"

#include <string>

#include "gdal_common/messages.h"

namespace lumo::gdal {
namespace {

struct Row {
  unsigned code;
  GDALDataType type;
};

constexpr Row kRows[] = {
    {kDataTypeOf<std::uint8_t>, GDT_Byte},
    {kDataTypeOf<std::uint16_t>, GDT_UInt16},
    {kDataTypeOf<std::int16_t>, GDT_Int16},
    {kDataTypeOf<std::uint32_t>, GDT_UInt32},
    {kDataTypeOf<std::int32_t>, GDT_Int32},
    {kDataTypeOf<std::uint64_t>, GDT_UInt64},
    {kDataTypeOf<std::int64_t>, GDT_Int64},
    {kDataTypeOf<float>, GDT_Float32},
    {kDataTypeOf<double>, GDT_Float64},
    {kDataTypeOf<Complex<float>>, GDT_CFloat32},
    {kDataTypeOf<Complex<double>>, GDT_CFloat64},
    {kDataTypeOf<Complex<float>>, GDT_CInt16},   // 16 bits fit the 24 of a float
    {kDataTypeOf<Complex<double>>, GDT_CInt32},  // and 32 the 53 of a double
};

bool IsSignedByte(GDALRasterBandH band) {
  const char* const mark = GDALGetMetadataItem(band, "PIXELTYPE", "IMAGE_STRUCTURE");
  return GDALGetRasterDataType(band) == GDT_Byte && mark != nullptr &&
         std::string(mark) == "SIGNEDBYTE";
}

}  // namespace

PixelType PixelTypeOf(unsigned dataType) {
  if (dataType == kDataTypeOf<std::int8_t>) return {GDT_Byte, true};
  for (const Row& row : kRows) {
    if (row.code == dataType) return {row.type, false};
  }
  return {};
}

unsigned CommonDataType(GDALDatasetH dataset, const std::string& name) {
  const int bands = GDALGetRasterCount(dataset);
  int signedBytes = 0;
  GDALDataType common =
      bands > 0 ? GDALGetRasterDataType(GDALGetRasterBand(dataset, 1)) : GDT_Unknown;
  for (int i = 1; i <= bands; ++i) {
    const GDALRasterBandH band = GDALGetRasterBand(dataset, i);
    common = GDALDataTypeUnion(common, GDALGetRasterDataType(band));
    if (IsSignedByte(band)) ++signedBytes;
  }
  if (signedBytes == bands && bands > 0) return kDataTypeOf<std::int8_t>;
  if (signedBytes != 0) {
    FailWith(name, "signed bytes beside bands of another type");
    return 0;
  }
  for (const Row& row : kRows) {
    if (row.type == common) return row.code;
  }
  char** const others = GDALGetMetadata(dataset, "SUBDATASETS");
  FailWith(name, bands != 0 ? "a pixel type that can't be read"
                 : others != nullptr && *others != nullptr
                     ? "holds several rasters: name one by FILE|SUBDATASET=<number>"
                     : "holds no raster");
  return 0;
}

}  // namespace lumo::gdal
