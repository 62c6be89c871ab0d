#include "views/expression_raster.h"

#include <algorithm>
#include <cmath>
#include <limits>

#include "foundation/fault.h"
#include "raster/block_shape.h"
#include "raster/block_strides.h"
#include "raster/pixel_value.h"
#include "tasks/parallel.h"
#include "tasks/scratch_pool.h"
#include "views/expression_block.h"

namespace lumo {
namespace {

/// The result of an expression as a pixel; nothing for one that isn't finite or does not fit.
template <typename T>
std::optional<T> PixelOf(double value) {
  if (!std::isfinite(value)) return std::nullopt;
  return ToPixel<T>(std::is_integral_v<T> ? std::round(value) : value);
}

/// Writes the results of a run of valid pixels, side by side, of a floating-point type. False where
/// some do not fit; all have to be stored one by one then.
template <typename T>
bool StoreFitting(const double* values, std::size_t count, T* pixels) {
  bool fit = true;
  for (std::size_t i = 0; i < count; ++i) {
    pixels[i] = static_cast<T>(values[i]);
    fit &= std::abs(pixels[i]) <= std::numeric_limits<T>::max();  // not so of NaN
  }
  return fit;
}

/// Writes the results of a run of pixels.
/// @param states  of what they were computed from; null where all are valid.
/// @param step    from one pixel to the next.
template <typename T>
void Store(const double* values, const unsigned char* states, std::size_t count, T* pixels,
           unsigned char* state, std::size_t step) {
  if constexpr (std::is_floating_point_v<T>) {
    if (states == nullptr && step == 1 && StoreFitting(values, count, pixels)) {
      std::fill_n(state, count, static_cast<unsigned char>(PixelValueState::Valid));
      return;
    }
  }
  for (std::size_t i = 0; i < count; ++i) {
    const auto before =
        static_cast<unsigned char>(states == nullptr ? 0 : states[i] & PixelValueState::NotValid);
    const std::optional<T> pixel = before == 0 ? PixelOf<T>(values[i]) : std::nullopt;
    const auto own =
        static_cast<unsigned char>(pixel ? PixelValueState::Valid : PixelValueState::NoData);
    pixels[i * step] = pixel.value_or(T());
    state[i * step] = before != 0 ? before : own;
  }
}

std::string NameOf(const BasicRaster& raster) {
  return raster.GetURI().ToUTF8();
}

std::string SizeOf(const BasicRaster& raster) {
  return NameOf(raster) + " has " + std::to_string(raster.Samples()) + " by " +
         std::to_string(raster.Lines()) + " pixels";
}

}  // namespace

template <typename T>
ExpressionRaster<T>::ExpressionRaster(const std::vector<BasicRasterPtr>& rasters,
                                      const std::vector<NamedExpression>& expressions,
                                      const Metadata* details)
    : DerivedRaster<T>(rasters), expressions_(expressions) {
  SetUp(details);
}

template <typename T>
void ExpressionRaster<T>::SetUp(const Metadata* details) {
  const std::vector<BasicRasterPtr>& rasters = this->GetRasters();
  if (rasters.empty() || expressions_.empty()) return;
  for (const BasicRasterPtr& raster : rasters) {
    if (!raster || !raster->IsValid()) return;
    const BasicRasterPtr& first = rasters.front();
    if (raster->Samples() != first->Samples() || raster->Lines() != first->Lines()) {
      SetFault(SizeOf(*first) + " and " + SizeOf(*raster) +
               "; an expression takes rasters of one size");
      return;
    }
    if (!DispatchType(TenTypes{}, raster->DataType(), []<typename S>() { return true; })) {
      SetFault(NameOf(*raster) + " is complex; an expression takes its parts");
      return;
    }
  }
  std::vector<std::string> names;
  for (const NamedExpression& expression : expressions_) names.push_back(expression.name);
  this->Describe(names);
  if (details != nullptr) this->SetDetails(*details);
}

template <typename T>
bool ExpressionRaster<T>::GetSubRect(const SubRect& rect, const Array<unsigned>& bands,
                                     Interleave interleave, Array<T>& pixels,
                                     Array<unsigned char>& state) {
  const BlockShape shape(rect, bands, interleave);
  if (rect.right >= this->Samples() || rect.bottom >= this->Lines() || !shape.Size(pixels, state)) {
    return false;
  }
  std::vector<const Expression*> wanted;
  for (const unsigned band : shape.bands) {
    if (band >= this->Bands()) return false;
    wanted.push_back(&expressions_[band].expression);
  }
  ExpressionBlock block(this->GetRasters(), std::move(wanted));
  if (!block.Read(rect)) return false;

  const BlockStrides strides(interleave, shape.width, shape.height, shape.count);
  constexpr auto kMost = static_cast<unsigned>(Expression::kMostPixels);
  const unsigned runs = (shape.width - 1) / kMost + 1;  // of a line
  ScratchPool<ExpressionBlock::Line> lines;
  ParallelFor(shape.height, nullptr, [&](unsigned begin, unsigned end) {
    const auto line = lines.Borrow(block);
    for (unsigned y = begin; y < end; ++y) {
      for (unsigned run = 0; run < runs; ++run) {
        const unsigned first = run * kMost;
        const unsigned count = std::min(kMost, shape.width - first);
        line->Fetch(y, first, count);
        for (unsigned i = 0; i < shape.count; ++i) {
          line->Compute(i);
          const std::size_t at = first * strides.pixel + y * strides.line + i * strides.band;
          Store(line->Values(), line->States(), count, pixels.GetData() + at, state.GetData() + at,
                strides.pixel);
        }
      }
    }
  });
  return true;
}

VEXG_INSTANCES(EIGHT, ExpressionRaster);

}  // namespace lumo
