#pragma once

#include "raster/raster_def.h"
#include "views/computed_raster.h"

namespace lumo {

/// Names the part of a pixel that the first of the three bands of a ComplexRaster shows.
enum class ComplexPart {
  kReal,       ///< real part
  kImag,       ///< imaginary part
  kMagnitude,  ///< square root of the sum of both squares
  kPower,      ///< natural logarithm of the magnitude; minus infinity of 0
  kPhase,      ///< radians, -pi to pi
};

/// Magnitude of a complex number, without an overflow of the squares.
VEXG_EXPORT double ComplexMagnitude(double re, double im);
/// Phase of a complex number, radians: by the half-angle formula 2 atan2(im, |z| + re), and pi on
/// the negative real axis.
VEXG_EXPORT double ComplexPhase(double re, double im);

/// Shows each band of a complex raster as three real bands: first the part that the view is about,
/// then the real and the imaginary part. Band b stands on band b / 3. It can't be written, and has
/// statistics of its own. T is float or double.
///
/// Ownership: shares the parent, which does not know the view.
/// Threads:   every operation may run on many threads at once; nothing is stored per call.
/// Failure:   over an empty parent IsValid() is false and operations give false, 0 or empty.
template <typename T>
class ComplexRaster final : public ComputedRaster<T> {
 public:
  /// @param part  of the bands 0, 3, 6 and so on.
  ComplexRaster(const RasterPtr<Complex<T>>& parent, ComplexPart part);
  ~ComplexRaster() override { this->StopComputing(); }

  URI GetURI() const override;
  bool IsValid() const override { return parent_ && parent_->IsValid() && Object::IsValid(); }
  unsigned DataType() const override { return parent_ ? kDataTypeOf<T> : 0; }
  bool CanWrite() const override { return false; }
  RasterDef GetRasterDef() const override;
  unsigned Samples() const override { return parent_ ? parent_->Samples() : 0; }
  unsigned Lines() const override { return parent_ ? parent_->Lines() : 0; }
  unsigned Bands() const override { return parent_ ? 3 * parent_->Bands() : 0; }

  bool PyramidExists() const override { return parent_ && parent_->PyramidExists(); }
  PyramidDef GetPyramidDef() const override;
  AsyncPtr PyramidBuild(const PyramidDef& def, const lumo::TileDimensions& tiles,
                        const AsyncCallbackPtr& callback) override;
  AsyncPtr PyramidAsync() const override;
  bool PyramidDelete() override { return parent_ && parent_->PyramidDelete(); }
  bool PyramidRefresh() override { return parent_ && parent_->PyramidRefresh(); }
  RasterPtr<T> PyramidLevel(unsigned level) override;

  void SetTileDimensions(const lumo::TileDimensions& tiles) override;
  lumo::TileDimensions TileDimensions() const override;

  /// As Raster<T>::GetSubRect; a block needs an interleave.
  bool GetSubRect(const SubRect& rect, const Array<unsigned>& bands, Interleave interleave,
                  Array<T>& pixels, Array<unsigned char>& state) override;
  std::uint64_t WriteCount() const override { return parent_ ? parent_->WriteCount() : 0; }

 private:
  RasterPtr<Complex<T>> parent_;  // the base has no parent: its type is another
  const ComplexPart part_;
};

extern template class VEXG_EXPORT ComplexRaster<float>;
extern template class VEXG_EXPORT ComplexRaster<double>;

}  // namespace lumo
