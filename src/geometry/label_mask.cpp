#include "geometry/label_mask.h"

#include "raster/pixel_types.h"

namespace lumo {
namespace {

template <typename T>
class RasterLabelMask final : public LabelMask {
 public:
  explicit RasterLabelMask(const RasterPtr<T>& raster) : raster_(raster) {
    bands_.Resize(ArrayDims(1));
    bands_[0] = 0;
  }

  bool Apply(unsigned line, unsigned lines, unsigned char* states) override {
    SubRect rect;
    rect.left = 0;
    rect.top = line;
    rect.right = raster_->Samples() - 1;
    rect.bottom = line + lines - 1;
    if (!raster_->GetSubRect(rect, bands_, Interleave::BSQ, pixels_, states_)) return false;
    for (unsigned i = 0; i < pixels_.GetCount(); ++i) {
      const bool counts = pixels_[i] != T() && IsValidState(states_[i]);
      if (!counts) states[i] |= PixelValueState::Masked;
    }
    return true;
  }

 private:
  RasterPtr<T> raster_;
  Array<unsigned> bands_;
  Array<T> pixels_;
  Array<unsigned char> states_;
};

}  // namespace

LabelMaskPtr MakeLabelMask(const BasicRasterPtr& raster) {
  LabelMaskPtr mask;
  DispatchType(EightTypes{}, raster->DataType(), [&]<typename T>() {
    mask.Reset(new RasterLabelMask<T>(RasterPtr<T>(raster)));
    return true;
  });
  return mask;
}

}  // namespace lumo
