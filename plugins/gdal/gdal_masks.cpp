#include "gdal_masks.h"

#include <algorithm>

namespace lumo::gdal {

Masks::Masks(const RasterLevel& level, const Array<unsigned>& bands) {
  for (unsigned i = 0; i < bands.GetCount(); ++i) {
    const GDALRasterBandH band = level.bands[bands[i]];
    const int flags = GDALGetMaskFlags(band);
    // A band's own no-data value is looked for in its pixels.
    const bool isNoData = (flags & GMF_NODATA) != 0;
    if ((flags & GMF_ALL_VALID) != 0 || (isNoData && (flags & GMF_PER_DATASET) == 0)) continue;
    const unsigned char bit = isNoData ? PixelValueState::NoData : PixelValueState::Masked;
    const GDALRasterBandH mask = GDALGetMaskBand(band);
    const bool isShared = (flags & (GMF_PER_DATASET | GMF_ALPHA)) != 0;
    if (isShared && !masks_.empty() && masks_.back().bit == bit) {
      masks_.back().targets.push_back(i);
    } else if (mask != nullptr) {
      masks_.push_back({mask, bit, {i}});
    }
  }
}

bool Masks::Apply(const BlockPlace& place, GSpacing pixel, GSpacing line, GSpacing band,
                  unsigned char* state) const {
  std::vector<unsigned char> values(std::size_t{place.width} * place.height);
  for (const Mask& mask : masks_) {
    const auto at = [](unsigned number) { return static_cast<int>(number); };
    if (GDALRasterIO(mask.band, GF_Read, at(place.left), at(place.top), at(place.width),
                     at(place.height), values.data(), at(place.width), at(place.height), GDT_Byte,
                     0, 0) != CE_None) {
      return false;
    }
    if (std::find(values.begin(), values.end(), 0) == values.end()) continue;
    for (const unsigned target : mask.targets) {
      const unsigned char* value = values.data();
      for (unsigned y = 0; y < place.height; ++y) {
        unsigned char* byte = state + band * target + line * y;
        for (unsigned x = 0; x < place.width; ++x, byte += pixel) {
          *byte = static_cast<unsigned char>(*byte | (*value++ == 0 ? mask.bit : 0));
        }
      }
    }
  }
  return true;
}

}  // namespace lumo::gdal
