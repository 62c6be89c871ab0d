#include "fx/level_tasks.h"

#include <algorithm>
#include <limits>

#include "fx/task_setup.h"
#include "fx/tile_shape.h"
#include "platform/vector_clones.h"
#include "tasks/task_errors.h"

namespace lumo {
namespace {

constexpr double kLeastInt = std::numeric_limits<std::int32_t>::min();
constexpr double kMostInt = std::numeric_limits<std::int32_t>::max();

VEXG_CHOOSING_VECTOR_CLONES
void Stretch(const LinearStretch& by, const double* values, std::size_t count,
             std::int32_t* levels) {
  const double range = by.high - by.low, outRange = by.outHigh - by.outLow;
  for (std::size_t i = 0; i < count; ++i) {
    const double level = (values[i] - by.low) / range * outRange + by.outLow;
    const double least = level > kLeastInt ? level : kLeastInt;  // of what is not a number too
    levels[i] = static_cast<std::int32_t>(least < kMostInt ? least : kMostInt);
  }
}

VEXG_VECTOR_CLONES
void Clip(const ClipLimits& limits, std::int32_t* levels, std::size_t count) {
  for (std::size_t i = 0; i < count; ++i) {
    levels[i] = std::max(std::min(levels[i], limits.ceiling), limits.floor);
  }
}

}  // namespace

std::int32_t CutToInt(double value) {
  const double least = value > kLeastInt ? value : kLeastInt;
  return static_cast<std::int32_t>(least < kMostInt ? least : kMostInt);
}

void LinearStretch::SetDefaults() {
  if (outLow == -1.0) outLow = 0;
  if (outHigh == -1.0) outHigh = kMostInt;
  if (outLow >= outHigh) {
    outLow = 0;
    outHigh = kMostInt;
  }
}

void LinearStretch::Apply(const double* values, std::size_t count, std::int32_t* levels) const {
  LinearStretch set = *this;
  set.SetDefaults();
  Stretch(set, values, count, levels);
}

ClipLimits ClipLimits::Of(double low, double high, double segmentValue, double stretchValue) {
  const double range = high - low;
  if (!(range > 0)) return {};
  return {CutToInt((segmentValue - low) * stretchValue / range),
          CutToInt(range * stretchValue / range)};
}

void ClipLimits::Apply(std::int32_t* levels, std::size_t count) const {
  Clip(*this, levels, count);
}

template <typename T, typename R>
RasterLinearStretchTask<T, R>::RasterLinearStretchTask(ArgList& setup)
    : StatelessTask("RasterLinearStretchTask") {
  if (!ReadSetup(setup, 0, stretch_)) SetErrorState(TaskErrorBadParams());
}

template <typename T, typename R>
bool RasterLinearStretchTask<T, R>::Execute(ArgList& args) {
  const TilePtr<T> in(args.Get(0));
  if (args.GetCount() < 2 || in.IsNull() || !in->IsValid() || in->Bands() != 1) return false;
  const TilePtr<R> out = pool_.Take();
  if (!SizeLike(*in, *out)) return false;
  stretch_.Apply(in->PixelArray().GetData(), in->PixelArray().GetCount(),
                 out->PixelArray().GetData());
  return args.Set(1, out);
}

template <typename T>
RasterClipInPlaceTask<T>::RasterClipInPlaceTask(ArgList& setup)
    : StatelessTask("RasterClipInPlaceTask") {
  if (!ReadSetup(setup, 0, limits_)) SetErrorState(TaskErrorBadParams());
}

template <typename T>
bool RasterClipInPlaceTask<T>::Execute(ArgList& args) {
  const TilePtr<T> tile(args.Get(0));
  if (tile.IsNull() || !tile->IsValid()) return false;
  limits_.Apply(tile->PixelArray().GetData(), tile->PixelArray().GetCount());
  return true;
}

template <typename T, typename R>
RasterClipTask<T, R>::RasterClipTask(ArgList& setup) : StatelessTask("RasterClipTask") {
  if (!ReadSetup(setup, 0, limits_)) SetErrorState(TaskErrorBadParams());
}

template <typename T, typename R>
bool RasterClipTask<T, R>::Execute(ArgList& args) {
  const TilePtr<T> in(args.Get(0));
  if (args.GetCount() < 2 || in.IsNull() || !in->IsValid()) return false;
  const TilePtr<R> out = pool_.Take();
  if (!SizeLike(*in, *out)) return false;
  std::ranges::copy(in->PixelArray(), out->PixelArray().begin());
  limits_.Apply(out->PixelArray().GetData(), out->PixelArray().GetCount());
  return args.Set(1, out);
}

template class RasterLinearStretchTask<double, std::int32_t>;
template class RasterClipInPlaceTask<std::int32_t>;
template class RasterClipTask<std::int32_t, std::int32_t>;

}  // namespace lumo
