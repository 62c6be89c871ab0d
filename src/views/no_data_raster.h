#pragma once

#include <vector>

#include "raster/no_data_marker.h"
#include "views/computed_raster.h"

namespace lumo {

/// Says which values of its parent are no data, by state bit NoData. Pixels that are read stay as
/// they are; written ones that are no data get the first of the values. Its statistics and
/// histograms are its own. Exists for EightTypes.
///
/// Ownership: shares the parent.
/// Threads:   every operation may run on many threads at once.
/// Failure:   over an empty parent IsValid() is false and operations give false, 0 or empty.
template <typename T>
class NoDataRaster final : public ComputedRaster<T> {
 public:
  /// @param removeAll  whether no pixel is no data, whatever the parent says; else the parent's
  ///                   bits stay.
  NoDataRaster(const RasterPtr<T>& parent, bool removeAll, Form description = Form::kTold)
      : NoDataRaster(parent, {}, false, removeAll, description) {}
  /// @param values       compared exactly; NaN is equal to every NaN.
  /// @param replace      whether only they are no data; else the parent's no data is as well.
  /// @param description  kTold: the parent's definition as it is; kExact: with the first of the
  ///                     values, which copies and warps take over.
  NoDataRaster(const RasterPtr<T>& parent, const Array<T>& values, bool replace,
               Form description = Form::kTold)
      : NoDataRaster(parent, values, replace, false, description) {}
  ~NoDataRaster() override { this->StopComputing(); }

  URI GetURI() const override { return this->DefaultURI("NoDataRaster"); }
  RasterDef GetRasterDef() const override;
  bool HasNoDataValue(unsigned band) const override;
  T NoDataValue(unsigned band) const override;
  RasterPtr<T> PyramidLevel(unsigned level) override;
  RasterPtr<T> StoredPyramidLevel(unsigned) override { return {}; }
  bool GetSubRect(const SubRect& rect, const Array<unsigned>& bands, Interleave interleave,
                  Array<T>& pixels, Array<unsigned char>& state) override;
  bool PutSubRect(const SubRect& rect, const Array<unsigned>& bands, Interleave interleave,
                  Array<T>& pixels, Array<unsigned char>& state) override;

 private:
  NoDataRaster(const RasterPtr<T>& parent, const Array<T>& values, bool replace, bool removeAll,
               Form description);

  Array<T> values_;
  bool replace_;
  bool removeAll_;
  Form description_;
  std::vector<NoDataMarker<T>> markers_;  // one for each value
};

VEXG_EXTERN(EIGHT, NoDataRaster);

}  // namespace lumo
