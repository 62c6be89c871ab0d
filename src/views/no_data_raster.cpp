#include "views/no_data_raster.h"

#include <algorithm>
#include <limits>

#include "platform/vector_clones.h"
#include "raster/raster_def.h"

namespace lumo {
namespace {

VEXG_VECTOR_CLONES void ClearNoData(unsigned char* states, std::size_t count) {
  for (std::size_t i = 0; i < count; ++i) {
    states[i] = static_cast<unsigned char>(states[i] & ~PixelValueState::NoData);
  }
}

/// Puts a value in the place of pixels that are no data.
template <typename T>
void Burn(T value, std::size_t count, const unsigned char* __restrict states,
          T* __restrict pixels) {
  for (std::size_t i = 0; i < count; ++i) {
    if ((states[i] & PixelValueState::NoData) != 0) pixels[i] = value;
  }
}

}  // namespace

template <typename T>
NoDataRaster<T>::NoDataRaster(const RasterPtr<T>& parent, const Array<T>& values, bool replace,
                              bool removeAll, Form description)
    : ComputedRaster<T>(parent),
      values_(values),
      replace_(replace),
      removeAll_(removeAll),
      description_(description) {
  // The elements of a block are one flat row, of whatever bands.
  constexpr unsigned kAnyCount = std::numeric_limits<unsigned>::max();
  for (const T value : values_) {
    markers_.emplace_back(std::vector<std::optional<T>>{value}, Interleave::None, kAnyCount,
                          kAnyCount);
  }
}

template <typename T>
RasterDef NoDataRaster<T>::GetRasterDef() const {
  RasterDef def = ComputedRaster<T>::GetRasterDef();
  if (description_ == Form::kTold || (!removeAll_ && values_.GetCount() == 0)) return def;
  def.noData.clear();
  for (unsigned band = 0; band < def.bands && !removeAll_; ++band) {
    def.noData[band] = static_cast<double>(values_[0]);
  }
  return def;
}

template <typename T>
bool NoDataRaster<T>::HasNoDataValue(unsigned /*band*/) const {
  return !this->Parent().IsNull() && !removeAll_;
}

template <typename T>
T NoDataRaster<T>::NoDataValue(unsigned /*band*/) const {
  return this->Parent().IsNull() || values_.GetCount() == 0 ? T() : values_[0];
}

template <typename T>
bool NoDataRaster<T>::GetSubRect(const SubRect& rect, const Array<unsigned>& bands,
                                 Interleave interleave, Array<T>& pixels,
                                 Array<unsigned char>& state) {
  if (!ComputedRaster<T>::GetSubRect(rect, bands, interleave, pixels, state)) return false;
  // In pieces that stay in the first cache from one value to the next.
  constexpr std::size_t kPiece = 4096;
  const std::size_t count = state.GetCount();
  for (std::size_t at = 0; at < count; at += kPiece) {
    const std::size_t here = std::min(kPiece, count - at);
    unsigned char* const states = state.GetData() + at;
    if (removeAll_ || replace_) ClearNoData(states, here);
    if (removeAll_) continue;
    for (const NoDataMarker<T>& marker : markers_) {
      marker.Mark(0, here, pixels.GetData() + at, states);
    }
  }
  return true;
}

template <typename T>
bool NoDataRaster<T>::PutSubRect(const SubRect& rect, const Array<unsigned>& bands,
                                 Interleave interleave, Array<T>& pixels,
                                 Array<unsigned char>& state) {
  if (!this->Parent().IsNull() && bands.GetCount() != 0 && values_.GetCount() != 0) {
    const std::size_t count = std::min(pixels.GetCount(), state.GetCount());
    Burn(values_[0], count, state.GetData(), pixels.GetData());
  }
  return ComputedRaster<T>::PutSubRect(rect, bands, interleave, pixels, state);
}

template <typename T>
RasterPtr<T> NoDataRaster<T>::PyramidLevel(unsigned level) {
  const RasterPtr<T> reduced = ComputedRaster<T>::PyramidLevel(level);
  return reduced
             ? RasterPtr<T>(new NoDataRaster(reduced, values_, replace_, removeAll_, description_))
             : RasterPtr<T>();
}

VEXG_INSTANCES(EIGHT, NoDataRaster);

}  // namespace lumo
