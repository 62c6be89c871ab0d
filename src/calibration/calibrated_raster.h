#pragma once

#include <memory>

#include "calibration/calibration_constants.h"
#include "tasks/scratch_pool.h"
#include "views/derived_raster.h"

namespace lumo {

namespace detail {
class NumberBlock;
}

/// Shows the physical values of a raster of digital numbers, with pixels of type T. Nothing is
/// kept; a pixel has the same bits whatever block it is read in, those that Calibrate gives it (see
/// calibration_process.h).
///
/// The states are those of the raster; a pixel that is not valid is 0. The names of the bands stay;
/// see DerivedRaster. Exists for EightTypes, on rasters of EightTypes.
///
///     CalibrationConstants constants;  // Landsat 8, band 10: kelvins
///     constants.quantity = CalibrationQuantity::kTemperature;
///     constants.gains = …
///     const RasterPtr<float> kelvins(new CalibratedRaster<float>(scene, constants));
///
/// Threads:   every operation may run on many threads at once. A block is computed by all threads.
/// Failure:   IsValid() is false, with a fault text, where constants are missing or the raster is
///            of another type; operations then give false, 0 or empty.
/// Cost:      that of reading the bands that are asked for, and of the formula.
template <typename T>
class CalibratedRaster final : public DerivedRaster<T> {
 public:
  CalibratedRaster(const BasicRasterPtr& raster, const CalibrationConstants& constants);
  ~CalibratedRaster() override;

  URI GetURI() const override { return this->DefaultURI("CalibratedRaster"); }
  bool GetSubRect(const SubRect& rect, const Array<unsigned>& bands, Interleave interleave,
                  Array<T>& pixels, Array<unsigned char>& state) override;

 private:
  void SetUp();
  RasterPtr<T> MakeOn(const std::vector<BasicRasterPtr>& levels) const override {
    return RasterPtr<T>(new CalibratedRaster(levels.front(), constants_));
  }
  bool IsAllBands(const Array<unsigned>& bands) const;
  std::unique_ptr<CalibrationFormula> MakeFormula(const Array<unsigned>& bands) const;

  const CalibrationConstants constants_;
  std::unique_ptr<CalibrationFormula> formula_;               // of all bands
  ScratchPool<std::unique_ptr<detail::NumberBlock>> blocks_;  // memory for what is read
};

VEXG_EXTERN(EIGHT, CalibratedRaster);

}  // namespace lumo
