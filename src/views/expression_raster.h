#pragma once

#include <vector>

#include "views/derived_raster.h"
#include "views/expression.h"

namespace lumo {

/// Shows what expressions make of the bands of one or several rasters of one size, a band for each
/// expression. Nothing is kept; a pixel has the same bits whatever block it is read in, and on
/// however many threads.
///
/// A pixel whose expression uses one that isn't valid has the states of all of those. One whose
/// result is NaN or infinite, or does not fit into T, holds no data. A result for integers is
/// rounded to the nearest one, halves away from 0; ToPixel then decides what fits. A pixel that is
/// not valid is 0. The names of bands are those of the expressions; see DerivedRaster. Exists for
/// EightTypes, on rasters of TenTypes; 64-bit integers are rounded to 53 bits.
///
/// Threads:   every operation may run on many threads at once. A block is computed by all threads.
/// Failure:   IsValid() is false, with a fault text, when rasters differ in size or are of another
///            type; operations then give false, 0 or empty.
/// Cost:      that of reading the bands which the expressions use, once for each block, and of the
///            expressions.
template <typename T>
class ExpressionRaster final : public DerivedRaster<T> {
 public:
  /// @param rasters      that the bands of the expressions are of.
  /// @param expressions  one for each band.
  /// @param details      of bands and raster, in the place of the names of expressions and what
  ///                     the first raster has of its place; null for those.
  ExpressionRaster(const std::vector<BasicRasterPtr>& rasters,
                   const std::vector<NamedExpression>& expressions,
                   const Metadata* details = nullptr);
  ~ExpressionRaster() override { this->StopComputing(); }

  URI GetURI() const override { return this->DefaultURI("ExpressionRaster"); }
  bool GetSubRect(const SubRect& rect, const Array<unsigned>& bands, Interleave interleave,
                  Array<T>& pixels, Array<unsigned char>& state) override;

 private:
  void SetUp(const Metadata* details);
  RasterPtr<T> MakeOn(const std::vector<BasicRasterPtr>& levels) const override {
    return RasterPtr<T>(new ExpressionRaster(levels, expressions_));
  }

  std::vector<NamedExpression> expressions_;
};

VEXG_EXTERN(EIGHT, ExpressionRaster);

}  // namespace lumo
