#pragma once

#include <deque>
#include <functional>
#include <memory>
#include <optional>
#include <vector>

#include "pyramid/line_reducer.h"
#include "pyramid/pyramid_tasks_body.h"

namespace lumo::detail {

/// Says which levels a cascade makes, and out of which lines.
struct CascadeDef {
  unsigned samples;    ///< of the raster
  unsigned lines;      ///< of the raster
  unsigned side;       ///< of tiles
  unsigned levelMin;   ///< first level that is written
  unsigned levelMax;   ///< last level that is made
  unsigned from = 0;   ///< the level whose lines come; it is written of blocks of the raster alone
  unsigned first = 0;  ///< line of the raster that comes first, where tiles of all levels begin
  unsigned end = 0;    ///< the line behind the last; such a one as well, or that of the raster
};

/// The value that marks pixels without data in each of some bands; nothing where there is none.
template <typename T>
std::vector<std::optional<T>> NoDataValuesOf(Raster<T>& raster, const Array<unsigned>& bands) {
  std::vector<std::optional<T>> values;
  for (const unsigned band : bands) {
    const bool has = raster.HasNoDataValue(band);
    values.push_back(has ? std::optional(raster.NoDataValue(band)) : std::nullopt);
  }
  return values;
}

/// Gives what writes the rows of tiles of a level into the store of a raster.
template <typename T>
std::function<LevelRowSink<T>(const LevelShape&)> SinksOf(const RasterPtr<T>& full,
                                                          const Array<unsigned>& bands) {
  return [=](const LevelShape& shape) -> LevelRowSink<T> {
    const RasterPtr<T> stored = full->StoredPyramidLevel(shape.level);
    return stored ? MakeRowSink(stored, shape, bands) : LevelRowSink<T>();
  };
}

/// Makes levels out of lines as they come, and gives their rows of tiles to be written.
template <typename T>
class LevelCascade {
 public:
  /// @param noData  of the bands that the lines have.
  /// @param sinkOf  gives what takes the rows of tiles of a level; an empty one fails all.
  /// @param onTop   gets the lines of the last level, where that has any; null for nobody.
  LevelCascade(const CascadeDef& def, LevelReduction reduction,
               std::vector<std::optional<T>> noData,
               const std::function<LevelRowSink<T>(const LevelShape&)>& sinkOf,
               std::function<bool(const LevelLine<T>&)> onTop = nullptr)
      : def_(def),
        isMean_(reduction == LevelReduction::kAverage),
        bandCount_(static_cast<unsigned>(noData.size())),
        noData_(std::move(noData)),
        onTop_(std::move(onTop)) {
    for (unsigned number = def.from; number <= def.levelMax; ++number) {
      const LevelShape shape(def.samples, def.lines, number, def.side);
      if (shape.IsEmpty()) break;
      Level& level = levels_.emplace_back(shape.width, bandCount_, reduction);
      level.y = def.first >> number;
      if (number < def.levelMin) continue;
      const LevelRowSink<T> sink = sinkOf(shape);
      // Its own lines are handed over, none of them left out.
      const LevelShape whole(shape.width, shape.height, 0, def.side);
      const unsigned endRow = def.end == def.lines ? shape.Rows() : (def.end >> number) / def.side;
      level.writer = std::make_unique<LevelStripWriter<T>>(sink, whole, shape.width,
                                                           level.y / def.side, endRow);
      isGood_ = isGood_ && sink != nullptr;
    }
  }

  /// Takes whole lines of the raster, of all bands, pixel-interleaved; others than those from
  /// `first` to before `end` are passed over.
  bool Take(const Tile<T>& block) {
    if (!isGood_ || (levels_.front().writer && !levels_.front().writer->Take(block))) return false;
    const std::size_t size = std::size_t{block.Width()} * bandCount_;
    for (unsigned y = 0; y < block.Height(); ++y) {
      const unsigned at = block.Origin().second + y;
      if (at < def_.first || at >= def_.end) continue;
      const SourceLine<T> line{block.PixelArray().GetData() + y * size,
                               block.StateArray().GetData() + y * size};
      if (!TakeLine(line)) return false;
    }
    return true;
  }

  /// Takes a line of the level that comes.
  template <typename Line>
  bool TakeLine(const Line& line) {
    return isGood_ && (levels_.size() < 2 || !levels_[1].reducer.Take(line) || HandOn(1));
  }

 private:
  struct Level {
    Level(unsigned levelWidth, unsigned bands, LevelReduction reduction)
        : width(levelWidth), reducer(levelWidth, bands, reduction) {}

    const unsigned width;
    LineReducer<T> reducer;
    std::unique_ptr<LevelStripWriter<T>> writer;  // of a level that is stored
    unsigned y = 0;                               // of its next line
  };

  /// Writes a line of a level that has become whole, and gives it to the next level.
  bool HandOn(std::size_t number) {
    Level& level = levels_[number];
    if (level.writer && !Write(level)) return false;
    ++level.y;
    const bool isLast = number + 1 == levels_.size();
    if (isLast) return onTop_ == nullptr || onTop_(level.reducer.Line());
    return !levels_[number + 1].reducer.Take(level.reducer.Line()) || HandOn(number + 1);
  }

  bool Write(Level& level) {
    const LevelLine<T>& line = level.reducer.Line();
    if (!tile_.Resize(level.width, 1, bandCount_)) return false;
    tile_.SetOrigin({0, level.y});
    T* const values = tile_.PixelArray().GetData();
    std::copy(line.states.begin(), line.states.end(), tile_.StateArray().GetData());
    std::copy(line.values.begin(), line.values.end(), values);
    for (std::size_t i = 0; isMean_ && i < line.values.size();) {
      for (unsigned band = 0; band < bandCount_; ++band, ++i) {
        if (line.counts[i] == 0) continue;
        const T mean = MeanOf<T>(line.sums[i], line.counts[i]);
        const std::optional<T>& noData = noData_[band];
        if (!noData || !IsSamePixel(mean, *noData)) values[i] = mean;
      }
    }
    return level.writer->Take(tile_);
  }

  const CascadeDef def_;
  const bool isMean_;
  const unsigned bandCount_;
  bool isGood_ = true;
  const std::vector<std::optional<T>> noData_;
  const std::function<bool(const LevelLine<T>&)> onTop_;
  std::deque<Level> levels_;  // from the one whose lines come on
  Tile<T> tile_;              // a line
};

}  // namespace lumo::detail
