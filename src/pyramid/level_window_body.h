#pragma once

#include <algorithm>

#include "foundation/fault.h"
#include "pyramid/level_window.h"
#include "pyramid/pixel_picker.h"

namespace lumo {

template <typename T>
bool LevelWindow<T>::Begin(unsigned column, unsigned endColumn, unsigned row, unsigned bands) {
  left_ = column * shape_.tileSide;
  top_ = row * shape_.tileSide;
  const unsigned last = endColumn - 1;
  const unsigned width = last * shape_.tileSide + shape_.ColumnWidth(last) - left_;
  if (tiles_.Resize(width, shape_.RowHeight(row), bands)) return true;
  SetFault("there is no memory for a strip of level " + std::to_string(shape_.level) +
           " of the pyramid");
  return false;
}

template <typename T>
void LevelWindow<T>::Take(const Tile<T>& block) {
  const unsigned top = block.Origin().second;
  const unsigned first = std::max(shape_.FirstFrom(top), top_);
  const unsigned end =
      std::min(shape_.FirstFrom(std::uint64_t{top} + block.Height()), top_ + tiles_.Height());
  for (unsigned line = first; line < end; ++line) TakeLine(block, line);
}

/// A run of a line of the level that a block has, and where it lies in the block.
template <typename T>
struct LevelWindow<T>::Line {
  unsigned first;  // pixels of the level
  unsigned end;
  unsigned y;          // of the level
  unsigned blockLine;  // line of the block
};

template <typename T>
void LevelWindow<T>::TakeLine(const Tile<T>& block, unsigned line) {
  const auto [x, y] = block.Origin();
  const Line stretch{
      std::max(shape_.FirstFrom(x), left_),
      std::min(shape_.FirstFrom(std::uint64_t{x} + block.Width()), left_ + tiles_.Width()), line,
      static_cast<unsigned>((std::uint64_t{line} << shape_.level) - y)};
  if (stretch.first >= stretch.end) return;
  Pick(block.PixelArray(), block, stretch, tiles_.PixelArray());
  const PickedBlock states{
      block.StateArray().GetData(), 1, block.Order(), block.Width(), block.Height(), block.Bands()};
  if (HasMasks(states, stretch.blockLine)) {
    Pick(block.StateArray(), block, stretch, tiles_.StateArray());
  }
}

/// Copies a run of pixels, or of states, tile by tile.
template <typename T>
template <typename E>
void LevelWindow<T>::Pick(const Array<E>& from, const Tile<T>& block, const Line& line,
                          Array<E>& to) const {
  const unsigned bands = block.Bands();
  const std::size_t height = tiles_.Height();
  const PickedBlock picked{from.GetData(), sizeof(E),      block.Order(),
                           block.Width(),  block.Height(), bands};
  for (unsigned x = line.first; x < line.end;) {
    const unsigned column = x / shape_.tileSide;
    const unsigned tileLeft = column * shape_.tileSide;
    const unsigned width = shape_.ColumnWidth(column);
    const unsigned end = std::min(line.end, tileLeft + width);
    const std::size_t at = std::size_t{tileLeft - left_} * height +
                           std::size_t{line.y - top_} * width + (x - tileLeft);
    const std::uint64_t blockX = (std::uint64_t{x} << shape_.level) - block.Origin().first;
    PickPixels(picked, line.blockLine, static_cast<unsigned>(blockX),
               std::size_t{1} << shape_.level, end - x, to.GetData() + at * bands);
    x = end;
  }
}

}  // namespace lumo
