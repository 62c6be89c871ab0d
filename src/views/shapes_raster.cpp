#include "views/shapes_raster.h"

#include <algorithm>

#include "foundation/fault.h"
#include "raster/block_shape.h"
#include "raster/pixel_value.h"

namespace lumo {
namespace {

/// Writes the pixels of one record into a block.
template <typename T>
void Burn(const SpanRows& rows, const SubRect& rect, T value, T* pixels, unsigned char* states) {
  const std::int64_t last = std::min<std::int64_t>(rows.LastRow(), rect.bottom);
  for (std::int64_t row = std::max<std::int64_t>(rows.FirstRow(), rect.top); row <= last; ++row) {
    const std::size_t line = static_cast<std::size_t>(row - rect.top) * rect.Width();
    const ColumnSpan* const end = rows.End(row);
    for (const ColumnSpan* span = rows.Begin(row); span != end; ++span) {
      const std::int64_t from = std::max<std::int64_t>(span->first, rect.left);
      const std::int64_t to = std::min<std::int64_t>(span->last, rect.right);
      if (from > to) continue;
      const std::size_t at = line + static_cast<std::size_t>(from - rect.left);
      const auto count = static_cast<std::size_t>(to - from + 1);
      std::fill_n(pixels + at, count, value);
      std::fill_n(states + at, count, static_cast<unsigned char>(PixelValueState::Valid));
    }
  }
}

}  // namespace

template <typename T>
ShapesRaster<T>::ShapesRaster(const ValuedShapes& shapes) : isNoData_(shapes.isNoData) {
  def_.samples = shapes.samples;
  def_.lines = shapes.lines;
  def_.bands = 1;
  def_.dataType = kDataTypeOf<T>;
  def_.interleave = Interleave::BSQ;
  def_.SetGeoRef(shapes.geoRef);
  if (isNoData_) def_.noData[0] = shapes.background;
  shapes_.Reset(new RasterizedGeometry(ShownOnGrid(shapes.geometry, shapes.geoRef, shapes.options),
                                       shapes.geoRef, shapes.samples, shapes.lines,
                                       shapes.options));
  const auto take = [&](double value) {
    const std::optional<T> pixel = ToPixel<T>(value);
    if (!pixel) this->SetErrorState(ObjectErrorNotConstructed());
    return pixel.value_or(T());
  };
  background_ = take(shapes.background);
  values_.reserve(shapes.values.size());
  for (const double value : shapes.values) values_.push_back(take(value));
}

template <typename T>
bool ShapesRaster<T>::GetSubRect(const SubRect& rect, const Array<unsigned>& bands,
                                 Interleave interleave, Array<T>& pixels,
                                 Array<unsigned char>& state) {
  const BlockShape block(rect, bands, interleave);
  const bool isHere =
      IsValid() && rect.right < Samples() && rect.bottom < Lines() &&
      std::all_of(block.bands.begin(), block.bands.end(), [](unsigned band) { return band == 0; });
  if (!isHere || !block.Size(pixels, state)) return false;
  const std::size_t count = std::size_t{block.width} * block.height;
  const auto outside = isNoData_ ? PixelValueState::NoData : PixelValueState::Valid;
  std::fill_n(pixels.GetData(), count, background_);
  std::fill_n(state.GetData(), count, static_cast<unsigned char>(outside));
  const bool isCarried = shapes_->ForEachRecord(WindowOf(rect), [&](std::int32_t record,
                                                                    const SpanRows& rows) {
    Burn(rows, rect, values_[static_cast<std::size_t>(record)], pixels.GetData(), state.GetData());
  });
  if (!isCarried || block.count == 1) return isCarried;
  // The band is asked for several times.
  for (unsigned band = 1; band < block.count; ++band) {
    std::copy_n(pixels.GetData(), count, pixels.GetData() + band * count);
    std::copy_n(state.GetData(), count, state.GetData() + band * count);
  }
  const Array<T> plane = pixels;
  const Array<unsigned char> planeState = state;
  return block.Convert(plane, planeState, Interleave::BSQ, pixels, state, interleave);
}

VEXG_INSTANCES(EIGHT, ShapesRaster);

}  // namespace lumo
