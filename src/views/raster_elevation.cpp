#include <cmath>
#include <limits>

#include "commands/catalog.h"
#include "georef/elevation_model.h"
#include "raster/raster.h"
#include "raster/raster_def.h"

namespace lumo {
namespace {

/// Heights from the first band of an open raster, so that a geo-reference finds its terrain under
/// the raster's identifier.
template <typename T>
class RasterElevation final : public ElevationModel {
 public:
  explicit RasterElevation(const RasterPtr<T>& raster)
      : raster_(raster), geoRef_(raster->GetRasterDef().geoRef) {}

  unsigned Samples() const override { return raster_->Samples(); }
  unsigned Lines() const override { return raster_->Lines(); }
  const GeoRef* Reference() const override { return geoRef_.Get(); }
  URI GetURI() const override { return raster_->GetURI(); }

  bool ReadHeights(const SubRect& rect, Array<double>& heights) const override {
    const Array<unsigned> firstBand = [] {
      Array<unsigned> bands{ArrayDims(1)};
      bands[0] = 0;
      return bands;
    }();
    Array<T> pixels;
    Array<unsigned char> state;
    if (!raster_->GetSubRect(rect, firstBand, Interleave::None, pixels, state) ||
        !heights.Resize(ArrayDims(rect.Height(), rect.Width()))) {
      return false;
    }
    for (unsigned i = 0; i < heights.GetCount(); ++i) {
      const bool valid = IsValidState(state[i]);
      heights[i] =
          valid ? static_cast<double>(pixels[i]) : std::numeric_limits<double>::quiet_NaN();
    }
    return true;
  }

 private:
  RasterPtr<T> raster_;
  GeoRefPtr geoRef_;
};

ElevationModelPtr FindElevation(const URI& uri) {
  const BasicRasterPtr raster(catalog::Find(uri));
  ElevationModelPtr model;
  if (!raster || !raster->IsValid()) return model;
  DispatchType(TenTypes{}, raster->DataType(), [&]<typename T>() {
    model.Reset(new RasterElevation<T>(RasterPtr<T>(raster)));
    return true;
  });
  return model;
}

[[maybe_unused]] const bool gFinderSet = [] {
  ElevationModel::SetFinder(FindElevation);
  return true;
}();

}  // namespace
}  // namespace lumo
