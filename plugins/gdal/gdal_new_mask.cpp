#include "gdal_new_mask.h"

#include <algorithm>
#include <cpl_conv.h>
#include <cpl_string.h>
#include <cpl_vsi.h>

#include "gdal_common/messages.h"
#include "gdal_common/setting.h"

namespace lumo::gdal {
namespace {

/// Up to this size a mask waits in memory.
constexpr double kMaxMaskBytesInMemory = 64 << 20;
constexpr unsigned char kValid = 255;

}  // namespace

NewMask::~NewMask() {
  const bool isFile = file_ != nullptr;
  file_.reset();
  if (isFile) VSIUnlink(scratch_.c_str());
}

bool NewMask::Begin() {
  if (1.0 * samples_ * lines_ <= kMaxMaskBytesInMemory) {
    bytes_.assign(std::size_t{samples_} * lines_, kValid);
    return true;
  }
  const Messages messages;
  CPLStringList options;
  options.SetNameValue("COMPRESS", "DEFLATE");
  options.SetNameValue("TILED", "YES");
  options.SetNameValue("BIGTIFF", "IF_SAFER");
  file_.reset(GDALCreate(GDALGetDriverByName("GTiff"), scratch_.c_str(), static_cast<int>(samples_),
                         static_cast<int>(lines_), 1, GDT_Byte, options.List()));
  return (file_ != nullptr &&
          GDALFillRaster(GDALGetRasterBand(file_.get(), 1), kValid, 0) == CE_None) ||
         messages.Fail(scratch_, "a mask can't be made");
}

/// Reads values of a place from the mask, or writes them there.
bool NewMask::Transfer(GDALRWFlag direction, const BlockPlace& place, unsigned char* values) {
  if (bytes_.empty()) {
    const auto at = [](unsigned number) { return static_cast<int>(number); };
    return GDALRasterIO(GDALGetRasterBand(file_.get(), 1), direction, at(place.left), at(place.top),
                        at(place.width), at(place.height), values, at(place.width),
                        at(place.height), GDT_Byte, 0, 0) == CE_None;
  }
  for (unsigned y = 0; y < place.height; ++y) {
    unsigned char* const here = &bytes_[std::size_t{place.top + y} * samples_ + place.left];
    unsigned char* const there = values + std::size_t{y} * place.width;
    if (direction == GF_Read) {
      std::copy_n(here, place.width, there);
    } else {
      std::copy_n(there, place.width, here);
    }
  }
  return true;
}

bool NewMask::Take(const BlockPlace& place, const std::vector<unsigned char>& excluded,
                   bool isWhole) {
  if (excluded.empty() && (IsEmpty() || !isWhole)) return true;
  if (IsEmpty() && !Begin()) return false;
  const Messages messages;
  std::vector<unsigned char> values(std::size_t{place.width} * place.height, kValid);
  bool done = isWhole || Transfer(GF_Read, place, values.data());
  for (std::size_t i = 0; i < excluded.size(); ++i) {
    values[i] = excluded[i] != 0 ? 0 : values[i];
  }
  done = done && Transfer(GF_Write, place, values.data());
  return (done && !messages.HasError()) || messages.Fail(scratch_, "a mask can't be written");
}

bool NewMask::Read(const BlockPlace& place, std::vector<unsigned char>& excluded) {
  excluded.clear();
  if (IsEmpty()) return true;
  const Messages messages;
  excluded.resize(std::size_t{place.width} * place.height);
  if (!Transfer(GF_Read, place, excluded.data())) {
    return messages.Fail(scratch_, "a mask can't be read");
  }
  for (unsigned char& byte : excluded) byte = byte == 0 ? 1 : 0;
  return true;
}

/// Excludes the pixels of a line that hold the no-data values of all bands.
bool NewMask::Excluded(GDALDatasetH file, int line, std::vector<unsigned char>& row) const {
  const auto width = static_cast<int>(samples_);
  std::vector<unsigned char> any(samples_), band(samples_);
  for (int i = 1; i <= GDALGetRasterCount(file); ++i) {
    GDALRasterBandH const source = GDALGetRasterBand(file, i);
    if ((GDALGetMaskFlags(source) & GMF_NODATA) == 0) return true;
    if (GDALRasterIO(GDALGetMaskBand(source), GF_Read, 0, line, width, 1, band.data(), width, 1,
                     GDT_Byte, 0, 0) != CE_None) {
      return false;
    }
    for (std::size_t x = 0; x < any.size(); ++x) any[x] |= band[x];
  }
  for (std::size_t x = 0; x < any.size(); ++x) {
    if (any[x] == 0) row[x] = 0;
  }
  return true;
}

bool NewMask::WriteTo(const std::string& path, const std::string& driver) {
  if (IsEmpty()) return true;
  const Messages messages;
  const char* const drivers[] = {driver.c_str(), nullptr};
  const bool isInside = driver == "GTiff";
  const Setting inside("GDAL_TIFF_INTERNAL_MASK", isInside ? "YES" : "NO");
  // Before the file has a mask, it is the no-data values that GDAL goes by.
  const DatasetPtr before(GDALOpenEx(path.c_str(), GDAL_OF_RASTER, drivers, nullptr, nullptr));
  const DatasetPtr file(GDALOpenEx(path.c_str(), GDAL_OF_RASTER | (isInside ? GDAL_OF_UPDATE : 0U),
                                   drivers, nullptr, nullptr));
  if (before == nullptr || file == nullptr ||
      GDALCreateDatasetMaskBand(file.get(), GMF_PER_DATASET) != CE_None) {
    return messages.Fail(path, "the format takes no mask");
  }
  GDALRasterBandH const target = GDALGetMaskBand(GDALGetRasterBand(file.get(), 1));
  const auto width = static_cast<int>(samples_);
  std::vector<unsigned char> row(samples_);
  const Array<unsigned> none;
  for (int line = 0; line < static_cast<int>(lines_); ++line) {
    const BlockPlace place{0, static_cast<unsigned>(line), samples_, 1, none, 0};
    if (!Transfer(GF_Read, place, row.data()) || !Excluded(before.get(), line, row) ||
        GDALRasterIO(target, GF_Write, 0, line, width, 1, row.data(), width, 1, GDT_Byte, 0, 0) !=
            CE_None) {
      return messages.Fail(path, "the mask can't be written");
    }
  }
  GDALFlushCache(file.get());
  return !messages.HasError() || messages.Fail(path);
}

}  // namespace lumo::gdal
