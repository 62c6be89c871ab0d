#pragma once

#include <algorithm>
#include <optional>
#include <type_traits>
#include <utility>

#include "raster/tile.h"
#include "tasks/parallel_ranges.h"

// A tile cut into strips for all threads.

namespace lumo {

/// A rectangle of a tile, in its pixels from 0, without the borders; both ends are behind the last.
struct TilePart {
  unsigned rowFrom;
  unsigned rowTo;
  unsigned columnFrom;
  unsigned columnTo;
};

/// Points to the pixels of a part in one line of a pixel-interleaved tile, with all their bands:
/// `count` values that lie together, and their states. It refers to the tile.
///
///     for (unsigned y = part.rowFrom; y < part.rowTo; ++y) {
///       const TileRow<float, unsigned char> row = RowOf(tile, part, y);
///       for (std::size_t i = 0; i < row.count; ++i) {
///         if (IsValidState(row.states[i])) row.values[i] *= 2;
///       }
///     }
template <typename T, typename State>
struct TileRow {
  T* values;
  State* states;
  std::size_t count;
};
/// The pixels of a part in line `y` of a tile, to read.
template <typename T>
TileRow<const T, const unsigned char> RowOf(const Tile<T>& tile, const TilePart& part, unsigned y) {
  const std::size_t at = tile.Offset(part.columnFrom, y);
  return {tile.PixelArray().GetData() + at, tile.StateArray().GetData() + at,
          std::size_t{part.columnTo - part.columnFrom} * tile.Bands()};
}
/// The pixels of a part in line `y` of a tile, to write.
template <typename T>
TileRow<T, unsigned char> RowOf(Tile<T>& tile, const TilePart& part, unsigned y) {
  const std::size_t at = tile.Offset(part.columnFrom, y);
  return {tile.PixelArray().GetData() + at, tile.StateArray().GetData() + at,
          std::size_t{part.columnTo - part.columnFrom} * tile.Bands()};
}

/// Cuts a tile for a parallel loop: between rows first, and rows of long tiles into pieces, at most
/// 64 of both. The cut depends on the size of the tile alone.
class TileStrips {
 public:
  /// @param leastPixels  of a strip, as far as the tile has them.
  TileStrips(const BasicTile& tile, std::size_t leastPixels)
      : width_(tile.Width()), height_(tile.Height()) {
    constexpr std::size_t kMost = 64;
    const std::size_t pixels = std::size_t{width_} * height_;
    const std::size_t wanted = std::clamp(pixels / leastPixels, std::size_t{1}, kMost);
    rows_ = static_cast<unsigned>(std::min<std::size_t>(wanted, height_));
    columns_ = static_cast<unsigned>(std::min<std::size_t>(wanted / std::max(rows_, 1U), width_));
  }

  /// Strips of the tile, 1 or more unless it is empty.
  unsigned Count() const { return rows_ * columns_; }

  /// Strip `index`, from 0, row of strips by row of strips.
  TilePart Strip(unsigned index) const {
    const unsigned row = index / columns_;
    const unsigned column = index % columns_;
    return {Cut(height_, rows_, row), Cut(height_, rows_, row + 1), Cut(width_, columns_, column),
            Cut(width_, columns_, column + 1)};
  }

 private:
  static unsigned Cut(unsigned extent, unsigned parts, unsigned index) {
    return static_cast<unsigned>(std::uint64_t{extent} * index / parts);
  }

  unsigned width_;
  unsigned height_;
  unsigned rows_ = 0;
  unsigned columns_ = 0;
};

/// The pixels of a strip that are worth a thread of their own, for work of a few steps a value.
inline std::size_t LeastStripPixels(unsigned bands) {
  constexpr std::size_t kValues = 16 * 1024;
  return kValues / std::max(bands, 1U) + 1;
}

namespace detail {

/// Calls a function that returns whether it succeeded, or nothing, which counts as success.
template <typename F, typename... Args>
bool Succeeds(const F& work, Args&&... args) {
  if constexpr (std::is_void_v<std::invoke_result_t<const F&, Args...>>) {
    work(std::forward<Args>(args)...);
    return true;
  } else {
    return static_cast<bool>(work(std::forward<Args>(args)...));
  }
}

/// Holds what strips gave; no value for no strips.
template <typename R>
struct StripResult {
  mutable std::optional<R> value;  // a join may move it out of its right side
};

/// Joins the strips of a tile to one result.
template <typename R, typename Part, typename Merge>
class StripReduction final : public ArrayParallelReduce<StripResult<R>> {
 public:
  StripReduction(const TileStrips& strips, const Part& part, const Merge& merge)
      : ArrayParallelReduce<StripResult<R>>(strips.Count()),
        strips_(strips),
        part_(part),
        merge_(merge) {}

  StripResult<R> Identity() override { return {}; }

  void Join(StripResult<R>& left, const StripResult<R>& right) override {
    if (!right.value || this->Failed()) return;
    if (!left.value) {
      left.value = std::move(right.value);
    } else if (!Succeeds(merge_, *left.value, *right.value)) {
      this->Fail();
    }
  }

  StripResult<R> Accumulate(unsigned begin, unsigned end) override {
    StripResult<R> joined;
    for (unsigned i = begin; i < end && !this->Failed(); ++i) {
      const StripResult<R> strip{part_(strips_.Strip(i))};
      if (!strip.value) this->Fail();
      Join(joined, strip);
    }
    return joined;
  }

 private:
  const TileStrips& strips_;
  const Part& part_;
  const Merge& merge_;
};

}  // namespace detail

/// Runs `work(TilePart)` for the strips of a tile on all threads. `work` gives a bool, or nothing.
/// @param abort  is looked at before each strip; null for none.
/// @return false when some strip failed; the fault that it set is then set on this thread.
template <typename F>
bool ForEachStrip(const BasicTile& tile, std::size_t leastPixels, const AbortFlag* abort,
                  const F& work) {
  const TileStrips strips(tile, leastPixels);
  if (strips.Count() == 1) return detail::Succeeds(work, strips.Strip(0));
  ParallelResult result;
  ParallelFor(strips.Count(), abort, [&](unsigned i) {
    if (!result.Failed() && !detail::Succeeds(work, strips.Strip(i))) result.Fail();
  });
  return result.Close();
}

/// Joins what `part(TilePart)` gives for the strips of a tile: `merge(R& left, const R& right)`.
/// The joins follow the cut, which the size of the tile alone decides, so the result has the same
/// bits for any number of threads. `part` gives an R, or an optional that is empty where it failed;
/// `merge` a bool, or nothing.
/// @return empty when something failed, with its fault set on this thread, or was aborted.
template <typename R, typename Part, typename Merge>
std::optional<R> ReduceStrips(const BasicTile& tile, std::size_t leastPixels,
                              const AbortFlag* abort, const Part& part, const Merge& merge) {
  const TileStrips strips(tile, leastPixels);
  if (strips.Count() == 1) return part(strips.Strip(0));
  detail::StripReduction<R, Part, Merge> loop(strips, part, merge);
  detail::StripResult<R> joined;
  RunParallelReduce(loop, joined, abort);
  if (!loop.Close()) return std::nullopt;
  return std::move(joined.value);
}

}  // namespace lumo
