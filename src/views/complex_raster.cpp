#include "views/complex_raster.h"

#include <cmath>
#include <numbers>

#include "raster/interleave.h"

namespace lumo {

double ComplexMagnitude(double re, double im) {
  const double a = std::fabs(re), b = std::fabs(im);
  if (a > b) {
    const double r = b / a;
    return std::sqrt(r * r + 1.0) * a;
  }
  if (b == 0.0) return 0.0;
  const double r = a / b;
  return std::sqrt(r * r + 1.0) * b;
}

double ComplexPhase(double re, double im) {
  if (re > 0.0 || im != 0.0) return 2.0 * std::atan2(im, ComplexMagnitude(re, im) + re);
  return re < 0.0 ? std::numbers::pi : 0.0;
}

namespace {

const char* ClassName(ComplexPart part) {
  switch (part) {
    case ComplexPart::kReal:
      return "ComplexRealRaster";
    case ComplexPart::kImag:
      return "ComplexImagRaster";
    case ComplexPart::kMagnitude:
      return "ComplexMagnitudeRaster";
    case ComplexPart::kPower:
      return "ComplexPowerRaster";
    case ComplexPart::kPhase:
      return "ComplexPhaseRaster";
  }
  return "ComplexRaster";
}

template <typename T>
T PartOf(const Complex<T>& pixel, ComplexPart part) {
  switch (part) {
    case ComplexPart::kReal:
      return pixel.real;
    case ComplexPart::kImag:
      return pixel.imag;
    case ComplexPart::kMagnitude:
      return static_cast<T>(ComplexMagnitude(pixel.real, pixel.imag));
    case ComplexPart::kPower:
      return static_cast<T>(std::log(ComplexMagnitude(pixel.real, pixel.imag)));
    case ComplexPart::kPhase:
      return static_cast<T>(ComplexPhase(pixel.real, pixel.imag));
  }
  return T();
}

/// The value that stands behind the band b of a view: its own part, then real, then imaginary.
ComplexPart PartOfBand(unsigned band, ComplexPart first) {
  return band % 3 == 0 ? first : band % 3 == 1 ? ComplexPart::kReal : ComplexPart::kImag;
}

/// Computes `count` elements, each `step` after the one before.
template <typename T>
void Convert(const Complex<T>* from, T* to, std::size_t count, std::size_t step, ComplexPart part) {
  for (std::size_t i = 0; i < count; ++i) to[i * step] = PartOf(from[i * step], part);
}

}  // namespace

template <typename T>
ComplexRaster<T>::ComplexRaster(const RasterPtr<Complex<T>>& parent, ComplexPart part)
    : parent_(parent), part_(part) {}

template <typename T>
URI ComplexRaster<T>::GetURI() const {
  return this->DefaultURI(ClassName(part_));
}

template <typename T>
RasterDef ComplexRaster<T>::GetRasterDef() const {
  if (!parent_) return {};
  RasterDef def = parent_->GetRasterDef();
  def.bands *= 3;
  def.dataType = kDataTypeOf<T>;
  def.noData.clear();  // the states carry it
  if (def.bands == 0) def.Clear();
  return def;
}

template <typename T>
PyramidDef ComplexRaster<T>::GetPyramidDef() const {
  return parent_ ? parent_->GetPyramidDef() : PyramidDef();
}

template <typename T>
AsyncPtr ComplexRaster<T>::PyramidBuild(const PyramidDef& def, const lumo::TileDimensions& tiles,
                                        const AsyncCallbackPtr& callback) {
  return parent_ ? parent_->PyramidBuild(def, tiles, callback) : AsyncPtr();
}

template <typename T>
AsyncPtr ComplexRaster<T>::PyramidAsync() const {
  return parent_ ? parent_->PyramidAsync() : AsyncPtr();
}

template <typename T>
RasterPtr<T> ComplexRaster<T>::PyramidLevel(unsigned level) {
  const RasterPtr<Complex<T>> reduced =
      parent_ ? parent_->PyramidLevel(level) : RasterPtr<Complex<T>>();
  return reduced ? RasterPtr<T>(new ComplexRaster(reduced, part_)) : RasterPtr<T>();
}

template <typename T>
void ComplexRaster<T>::SetTileDimensions(const lumo::TileDimensions& tiles) {
  if (parent_) parent_->SetTileDimensions(tiles);
}

template <typename T>
lumo::TileDimensions ComplexRaster<T>::TileDimensions() const {
  return parent_ ? parent_->TileDimensions() : lumo::TileDimensions();
}

template <typename T>
bool ComplexRaster<T>::GetSubRect(const SubRect& rect, const Array<unsigned>& bands,
                                  Interleave interleave, Array<T>& pixels,
                                  Array<unsigned char>& state) {
  const std::size_t width = rect.Width(), height = rect.Height();
  const unsigned count = bands.GetCount();
  if (!parent_ || interleave < Interleave::BIP || interleave > Interleave::BSQ) return false;
  const ArrayDims dims = BlockDims(interleave, rect.Width(), rect.Height(), count);
  Array<unsigned> parentBands(bands.GetDims());
  for (unsigned i = 0; i < count; ++i) parentBands[i] = bands[i] / 3;
  Array<Complex<T>> block;
  if (!pixels.Resize(dims) || !parent_->GetSubRect(rect, parentBands, interleave, block, state)) {
    return false;
  }
  for (unsigned i = 0; i < count; ++i) {
    const ComplexPart part = PartOfBand(bands[i], part_);
    switch (interleave) {
      case Interleave::BSQ:
        Convert(&block[i * width * height], &pixels[i * width * height], width * height, 1, part);
        break;
      case Interleave::BIL:
        for (std::size_t y = 0; y < height; ++y) {
          const std::size_t at = (y * count + i) * width;
          Convert(&block[at], &pixels[at], width, 1, part);
        }
        break;
      default:
        Convert(&block[i], &pixels[i], width * height, count, part);
    }
  }
  return true;
}

template class ComplexRaster<float>;
template class ComplexRaster<double>;

}  // namespace lumo
