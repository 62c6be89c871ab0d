#include "views/masked_raster.h"

#include <algorithm>
#include <map>
#include <vector>

#include "raster/interleave.h"

namespace lumo {
namespace {

Array<RasterMaskPtr> ForBands(const RasterMaskPtr& mask, unsigned bands) {
  Array<RasterMaskPtr> masks;
  if (masks.Resize(ArrayDims(std::max(bands, 1U)))) {
    std::fill(masks.begin(), masks.end(), mask);
  }
  return masks;
}

}  // namespace

template <typename T>
MaskedRaster<T>::MaskedRaster(const RasterPtr<T>& parent, const RasterMaskPtr& mask)
    : MaskedRaster(parent, ForBands(mask, parent ? parent->Bands() : 0)) {}

template <typename T>
MaskedRaster<T>::MaskedRaster(const RasterPtr<T>& parent, const Array<RasterMaskPtr>& masks)
    : ComputedRaster<T>(parent), masks_(masks) {}

template <typename T>
bool MaskedRaster<T>::GetSubRect(const SubRect& rect, const Array<unsigned>& bands,
                                 Interleave interleave, Array<T>& pixels,
                                 Array<unsigned char>& state) {
  if (!IsValid() || !ComputedRaster<T>::GetSubRect(rect, bands, interleave, pixels, state)) {
    return false;
  }
  const SubRect ordered(rect.left, rect.top, rect.right, rect.bottom);
  const Array<unsigned> shown = BandsOfBlock(bands, interleave);
  StateRuns states(PixelValueState::Masked, state, interleave, ordered.Width(), ordered.Height(),
                   shown.GetCount());
  if (!states.Fits()) return false;
  // A line is asked for once of each mask.
  std::map<const RasterMask*, std::vector<unsigned>> positions;
  for (unsigned i = 0; i < shown.GetCount(); ++i) positions[MaskOf(shown[i])].push_back(i);
  std::vector<unsigned char> marks(ordered.Width(), 0);
  for (const auto& [mask, of] : positions) {
    if (mask == nullptr && positions.size() == 1) {
      states.PutAll(false);
      continue;
    }
    for (unsigned line = 0; line < ordered.Height(); ++line) {
      if (mask != nullptr) {
        mask->GetMarks(ordered.left, ordered.top + line, marks.size(), marks.data());
      } else {
        std::fill(marks.begin(), marks.end(), static_cast<unsigned char>(0));
      }
      if (positions.size() == 1) {
        states.PutLine(line, marks.data(), 1);
      } else {
        for (const unsigned i : of) states.PutLineOfBand(line, i, marks.data(), 1);
      }
    }
  }
  return true;
}

template <typename T>
RasterPtr<T> MaskedRaster<T>::PyramidLevel(unsigned level) {
  const RasterPtr<T> reduced = ComputedRaster<T>::PyramidLevel(level);
  Array<RasterMaskPtr> masks;
  if (!reduced || !masks.Resize(masks_.GetDims())) return {};
  std::map<const RasterMask*, RasterMaskPtr> made;
  for (unsigned i = 0; i < masks_.GetCount(); ++i) {
    if (!masks_[i]) continue;
    RasterMaskPtr& mask = made[masks_[i].Get()];
    if (!mask) {
      mask.Reset(
          new RasterMask(*masks_[i], reduced->Samples(), reduced->Lines(), reduced->Bands()));
    }
    if (!mask->IsValid()) return {};
    masks[i] = mask;
  }
  return RasterPtr<T>(new MaskedRaster(reduced, masks));
}

template <typename T>
std::uint64_t MaskedRaster<T>::WriteCount() const {
  std::uint64_t count = ComputedRaster<T>::WriteCount();
  for (const RasterMaskPtr& mask : masks_) {
    if (mask) count += mask->ChangeCount();
  }
  return count;
}

VEXG_INSTANCES(EIGHT, MaskedRaster);

}  // namespace lumo
