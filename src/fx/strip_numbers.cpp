#include "fx/strip_numbers.h"

#include <algorithm>

#include "fx/task_setup.h"
#include "tasks/task_errors.h"

namespace lumo {

StripNumberTask::StripNumberTask(ArgList& setup) : SequentialTask("StripNumberTask") {
  if (!ReadSetup(setup, 0, count_)) SetErrorState(TaskErrorBadParams());
}

bool StripNumberTask::Execute(ArgList& args) {
  return !HasError() && next_ < count_ && args.Set(0, MakeSetup(next_++));
}

namespace {

/// Replaces labels, none of which is 0, by what `find` gives for them.
template <typename Find>
void ReplaceLabels(std::int32_t* labels, std::size_t count, const Find& find) {
  std::int32_t last = 0, found = 0;
  for (std::size_t i = 0; i < count; ++i) {
    if (labels[i] == 0) continue;
    if (labels[i] != last) {
      last = labels[i];
      found = static_cast<std::int32_t>(find(static_cast<std::uint32_t>(last)));
    }
    labels[i] = found;
  }
}

}  // namespace

bool SegmentNumbers::FindBasins(unsigned strip, Tile<std::int32_t>& tile) const {
  TileDimensions size;
  size.width = basins_.Width();
  size.height = basins_.LinesOf(strip);
  size.bands = 1;
  if (!tile.ResizeForOverwrite(size)) return false;
  tile.SetIndex({0, strip});
  std::fill(tile.StateArray().begin(), tile.StateArray().end(),
            static_cast<unsigned char>(PixelValueState::Valid));
  return basins_.Label(strip, tile.PixelArray().GetData());
}

void SegmentNumbers::FindRoots(std::int32_t* labels, std::size_t count) {
  ReplaceLabels(labels, count, [this](std::uint32_t label) {
    return joined_ == nullptr ? forest_.RootOf(label) : joined_->RootOf(forest_.NumberOf(label));
  });
}

bool SegmentNumbers::MarkBorders(Tile<std::int32_t>& tile) {
  const unsigned strip = tile.Index().second;
  std::vector<std::int32_t> below, before;
  if (!basins_.ReadLabelsBelow(strip, below) || !basins_.ReadLabelsAbove(strip, before)) {
    return false;
  }
  FindRoots(below.data(), below.size());
  FindRoots(before.data(), before.size());
  FindRoots(tile.PixelArray().GetData(), tile.PixelArray().GetCount());
  const std::size_t width = tile.Width(), lines = tile.Height();
  const bool isLast = strip + 1 == basins_.Strips();
  // The line that a line is compared with; a raster of one line compares it with itself.
  const auto lineOf = [width](const std::int32_t* from) {
    return std::vector<std::int32_t>(from, from + width);
  };
  std::int32_t* const pixels = tile.PixelArray().GetData();
  if (strip == 0) before = lineOf(pixels);
  // The last but one line of the raster, and the last, look back.
  const auto looksBack = [&](std::size_t y) {
    const std::size_t behind = lines - 1 - y;
    return isLast ? behind < 2
                  : behind == 0 && basins_.LinesOf(strip + 1) == 1 && strip + 2 == basins_.Strips();
  };
  for (std::size_t y = 0; y < lines; ++y) {
    std::int32_t* const to = pixels + y * width;
    std::vector<std::int32_t> line = lineOf(to);
    const std::int32_t* const other = looksBack(y)    ? before.data()
                                      : y + 1 < lines ? to + width
                                                      : below.data();
    for (std::size_t x = 0; x < width; ++x) {
      const std::size_t beside = x + 2 < width ? x + 1 : x == 0 ? 0 : x - 1;
      to[x] = line[x] == line[beside] && line[x] == other[x] ? 0 : 1;
    }
    before.swap(line);
  }
  return true;
}

bool SegmentNumbers::Number(Tile<std::int32_t>& tile) {
  if (bordersOnly_) {
    if (!MarkBorders(tile)) return false;
  } else {
    ReplaceLabels(tile.PixelArray().GetData(), tile.PixelArray().GetCount(),
                  [this](std::uint32_t label) {
                    const std::uint32_t number = forest_.NumberOf(label);
                    return joined_ == nullptr ? number : joined_->NumberOf(number);
                  });
  }
  return forest_.IsWell() && (joined_ == nullptr || joined_->IsWell());
}

}  // namespace lumo
