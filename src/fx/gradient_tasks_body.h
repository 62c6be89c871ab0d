#pragma once

#include <algorithm>
#include <vector>

#include "fx/gradient_kernels.h"
#include "fx/gradient_tasks.h"
#include "fx/task_setup.h"
#include "raster/pixel_states.h"
#include "tasks/parallel.h"
#include "tasks/scratch_pool.h"
#include "tasks/task_errors.h"

namespace lumo {
namespace detail {

/// Sizes a tile of one band like another one, with borders that reach no further than its.
inline bool SizeOneBand(const BasicTile& shape, unsigned border, BasicTile& tile) {
  TileDimensions dimensions = shape.Dimensions();
  dimensions.bands = 1;
  for (unsigned* const side : {&dimensions.borderLeft, &dimensions.borderRight,
                               &dimensions.borderTop, &dimensions.borderBottom}) {
    *side = std::min(*side, border);
  }
  if (!tile.ResizeForOverwrite(dimensions)) return false;
  tile.SetIndex(shape.Index());
  tile.SetOrigin(shape.Origin());
  return true;
}

/// Joins the states of the bands of pixels: what is not valid in one of them is not valid.
inline void JoinBands(const unsigned char* states, std::size_t bands, std::size_t pixels,
                      unsigned char* joined) {
  for (std::size_t pixel = 0; pixel < pixels; ++pixel, states += bands) {
    unsigned char any = 0;
    for (std::size_t band = 0; band < bands; ++band) any |= states[band];
    joined[pixel] = any & PixelValueState::NotValid;
  }
}

/// Computes the rows of a tile of gradients.
template <typename T>
class SobelRows {
 public:
  SobelRows(const Tile<T>& in, Tile<double>& out)
      : in_(in),
        out_(out),
        width_(in.FullWidth()),
        height_(in.FullHeight()),
        left_(in.BorderLeft() - out.BorderLeft()),
        top_(in.BorderTop() - out.BorderTop()),
        allValid_(AllValid(in.StateArray().GetData(), in.StateArray().GetCount())) {}

  void Compute(unsigned row) {
    const std::size_t columns = out_.FullWidth();
    double* const gradients = out_.PixelArray().GetData() + row * columns;
    unsigned char* const states = out_.StateArray().GetData() + row * columns;
    if (width_ < 3 || height_ < 3) {
      std::fill_n(gradients, columns, 0.0);
      std::fill_n(states, columns, static_cast<unsigned char>(PixelValueState::NoData));
      return;
    }
    // All in pixels of the tile that comes in, where none at an edge has a gradient of its own.
    const std::size_t y = std::clamp<std::size_t>(top_ + row, 1, height_ - 2);
    const std::size_t begin = std::clamp<std::size_t>(left_, 1, width_ - 2);
    const std::size_t end = std::clamp<std::size_t>(left_ + columns - 1, 1, width_ - 2) + 1;
    const std::size_t bands = in_.Bands(), line = width_ * bands;
    // Where the first of them stands in the row that comes out.
    const std::size_t first = std::min(begin - std::min(begin, left_), columns - (end - begin));
    const T* const middle = in_.PixelArray().GetData() + y * line + begin * bands;
    ComputeSobelRow(middle - line, middle, middle + line, bands, end - begin, gradients + first);
    if (allValid_) {
      std::fill_n(states, columns, static_cast<unsigned char>(PixelValueState::Valid));
    } else {
      JoinNeighbourhoods(y, begin, end, states + first);
    }
    Extend(gradients, first, first + (end - begin), columns);
    Extend(states, first, first + (end - begin), columns);
  }

 private:
  /// Gives the pixels in front of and behind a range of a row the values at its ends.
  template <typename V>
  static void Extend(V* row, std::size_t begin, std::size_t end, std::size_t columns) {
    std::fill_n(row, begin, row[begin]);
    if (end < columns) std::fill(row + end, row + columns, row[end - 1]);
  }

  void JoinNeighbourhoods(std::size_t y, std::size_t begin, std::size_t end,
                          unsigned char* states) {
    const auto scratch = scratch_.Borrow();
    scratch->assign(2 * width_, 0);
    unsigned char* const column = scratch->data();  // of three pixels
    unsigned char* const joined = column + width_;
    const std::size_t bands = in_.Bands();
    for (std::size_t line = y - 1; line <= y + 1; ++line) {
      JoinBands(in_.StateArray().GetData() + line * width_ * bands, bands, width_, joined);
      for (std::size_t x = 0; x < width_; ++x) column[x] |= joined[x];
    }
    for (std::size_t x = begin; x < end; ++x) {
      states[x - begin] = static_cast<unsigned char>(
          (column[x - 1] | column[x] | column[x + 1]) != 0 ? PixelValueState::NoData
                                                           : PixelValueState::Valid);
    }
  }

  const Tile<T>& in_;
  Tile<double>& out_;
  std::size_t width_, height_;  // of the whole tile that comes in
  std::size_t left_, top_;      // where the one that comes out begins in it
  bool allValid_;
  ScratchPool<std::vector<unsigned char>> scratch_;
};

/// True when the tile of gradients could be sized in the tile that came in.
template <typename T, typename R>
bool TakeGradientTile(const ArgList& args, unsigned border, TilePool<R>& pool, TilePtr<T>& in,
                      TilePtr<R>& out) {
  in = TilePtr<T>(args.Get(0));
  if (args.GetCount() < 2 || in.IsNull() || !in->IsValid()) return false;
  out = pool.Take();
  return SizeOneBand(*in, border, *out);
}

}  // namespace detail

template <typename T, typename R>
ParallelBorderedRasterIntensity<T, R>::ParallelBorderedRasterIntensity(const Tile<T>& in,
                                                                       Tile<R>& out)
    : BorderedTileParallelFor2<R>(out), in_(in), weights_(ArrayDims(in.Bands())) {
  std::fill(weights_.begin(), weights_.end(), 1.0 / in.Bands());
}

template <typename T, typename R>
void ParallelBorderedRasterIntensity<T, R>::Body(int xBegin, int xEnd, int yBegin, int yEnd) {
  Tile<R>& out = this->GetTile();
  const auto pixels = static_cast<std::size_t>(xEnd - xBegin);
  for (int y = yBegin; y < yEnd; ++y) {
    const std::size_t from = in_.Offset(xBegin, y), to = out.Offset(xBegin, y);
    ComputeIntensityRow(in_.PixelArray().GetData() + from, weights_.GetData(), in_.Bands(), pixels,
                        out.PixelArray().GetData() + to);
    detail::JoinBands(in_.StateArray().GetData() + from, in_.Bands(), pixels,
                      out.StateArray().GetData() + to);
  }
}

template <typename T, typename R>
RasterIntensityTask<T, R>::RasterIntensityTask(ArgList& setup)
    : StatelessTask("RasterIntensityTask") {
  if (!ReadSetup(setup, 0, border_)) SetErrorState(TaskErrorBadParams());
}

template <typename T, typename R>
bool RasterIntensityTask<T, R>::Execute(ArgList& args) {
  TilePtr<T> in;
  TilePtr<R> out;
  if (!detail::TakeGradientTile(args, border_, pool_, in, out)) return false;
  ParallelBorderedRasterIntensity<T, R> loop(*in, *out);
  RunParallelFor2(static_cast<IParallelFor2<int>&>(loop), 0, GetAbortFlag());
  return args.Set(1, out);
}

template <typename T, typename R>
RasterSobelBandMaxTask<T, R>::RasterSobelBandMaxTask(ArgList& setup)
    : StatelessTask("RasterSobelBandMaxTask") {
  if (!ReadSetup(setup, 0, border_)) SetErrorState(TaskErrorBadParams());
}

template <typename T, typename R>
bool RasterSobelBandMaxTask<T, R>::Execute(ArgList& args) {
  TilePtr<T> in;
  TilePtr<R> out;
  if (!detail::TakeGradientTile(args, border_, pool_, in, out)) return false;
  detail::SobelRows<T> rows(*in, *out);
  ParallelFor(static_cast<unsigned>(out->FullHeight()), GetAbortFlag(),
              [&](unsigned row) { rows.Compute(row); });
  return args.Set(1, out);
}

}  // namespace lumo
