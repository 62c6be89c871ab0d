#include "gdal_masks.h"

#include "raster/pixel_states.h"

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
    BlockStrides strides;
    strides.pixel = static_cast<std::size_t>(pixel);
    strides.band = static_cast<std::size_t>(band);
    for (unsigned y = 0; y < place.height; ++y) {
      const unsigned char* const row = &values[std::size_t{y} * place.width];
      unsigned char* const states = state + line * y;
      if (mask.targets.size() == place.bands.GetCount()) {
        ExcludeMasked(row, place.width, mask.targets.size(), strides, mask.bit, states);
        continue;
      }
      for (const unsigned target : mask.targets) {
        ExcludeMasked(row, place.width, 1, strides, mask.bit, states + band * target);
      }
    }
  }
  return true;
}

}  // namespace lumo::gdal
