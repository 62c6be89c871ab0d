#pragma once

#include <cmath>
#include <complex>
#include <deque>

#include "foundation/fault.h"
#include "pyramid/pyramid_tasks_body.h"
#include "pyramid/reduced_levels.h"
#include "raster/pixel_mode.h"
#include "raster/tile_process.h"

namespace lumo {

namespace detail {

/// The type that pixels are added up in: exact for integers of 32 bits, for those of 64 with all
/// digits of one.
template <typename T>
using LevelSum =
    std::conditional_t<std::is_floating_point_v<T>, double,
                       std::conditional_t<!std::is_integral_v<T>, std::complex<double>,
                                          std::conditional_t<sizeof(T) == 8, long double, double>>>;

template <typename T>
LevelSum<T> SumOf(const T& value) {
  if constexpr (std::is_arithmetic_v<T>) {
    return static_cast<LevelSum<T>>(value);
  } else {
    return {static_cast<double>(value.real), static_cast<double>(value.imag)};
  }
}

template <typename T>
T MeanOf(const LevelSum<T>& sum, double count) {
  if constexpr (std::is_integral_v<T>) {
    return static_cast<T>(std::floor(sum / count + LevelSum<T>(0.5)));
  } else if constexpr (std::is_floating_point_v<T>) {
    return static_cast<T>(sum / count);
  } else {
    T mean{};
    mean.real = static_cast<decltype(mean.real)>(sum.real() / count);
    mean.imag = static_cast<decltype(mean.imag)>(sum.imag() / count);
    return mean;
  }
}

template <typename T>
bool IsCounted(const T& value, unsigned char state) {
  return IsValidState(state) && (value == value);  // NaN differs from itself
}

/// A line of the raster.
template <typename T>
struct SourceLine {
  const T* values;
  const unsigned char* states;

  const T& Value(std::size_t i) const { return values[i]; }
  unsigned char State(std::size_t i) const { return states[i]; }
  double Count(std::size_t i) const { return IsCounted(values[i], states[i]) ? 1 : 0; }
  LevelSum<T> Sum(std::size_t i) const {
    return IsCounted(values[i], states[i]) ? SumOf(values[i]) : LevelSum<T>();
  }
};

/// A line of a level in the making.
template <typename T>
struct LevelLine {
  std::vector<T> values;              ///< the first valid pixel below, else the first; or the mode
  std::vector<unsigned char> states;  ///< of that
  std::vector<double> counts;         ///< of valid pixels of the raster
  std::vector<LevelSum<T>> sums;      ///< of those

  void Resize(std::size_t size) {
    values.resize(size), states.resize(size), counts.resize(size), sums.resize(size);
  }
  const T& Value(std::size_t i) const { return values[i]; }
  unsigned char State(std::size_t i) const { return states[i]; }
  double Count(std::size_t i) const { return counts[i]; }
  LevelSum<T> Sum(std::size_t i) const { return sums[i]; }
};

/// Makes the lines of one level, each out of two of the level below.
template <typename T>
class LineReducer {
 public:
  LineReducer(unsigned width, unsigned bands, LevelReduction reduction)
      : bands_(bands),
        size_(std::size_t{width} * bands),
        isMode_(reduction != LevelReduction::kAverage) {
    line_.Resize(size_);
    if (isMode_) upper_.Resize(2 * size_);
  }

  /// Takes a line of the level below. @return true when a line of this level is whole.
  template <typename Below>
  bool Take(const Below& below) {
    isOdd_ = !isOdd_;
    if (isMode_) {
      isOdd_ ? Keep(below) : TakeMode(below);
    } else {
      isOdd_ ? Add<true>(below) : Add<false>(below);
    }
    return !isOdd_;
  }

  const LevelLine<T>& Line() const { return line_; }

 private:
  template <bool kIsUpper, typename Below>
  void Add(const Below& below) {
    for (std::size_t i = 0, at = 0; i < size_; at += bands_) {
      for (unsigned band = 0; band < bands_; ++band, ++i, ++at) {
        const std::size_t next = at + bands_;
        const double first = below.Count(at), second = below.Count(next);
        const double before = kIsUpper ? 0 : line_.counts[i];
        if (kIsUpper || (before == 0 && first + second != 0)) {
          const std::size_t chosen = first == 0 && second != 0 ? next : at;
          line_.values[i] = below.Value(chosen);
          line_.states[i] = below.State(chosen);
        }
        line_.counts[i] = before + first + second;
        const LevelSum<T> sum = below.Sum(at) + below.Sum(next);
        line_.sums[i] = kIsUpper ? sum : line_.sums[i] + sum;
      }
    }
  }

  template <typename Below>
  void Keep(const Below& below) {
    for (std::size_t i = 0; i < 2 * size_; ++i) {
      upper_.values[i] = below.Value(i);
      upper_.states[i] = below.State(i);
      upper_.counts[i] = below.Count(i);
    }
  }

  template <typename Below>
  void TakeMode(const Below& lower) {
    std::array<T, 4> counted{};
    for (std::size_t i = 0, at = 0; i < size_; at += bands_) {
      for (unsigned band = 0; band < bands_; ++band, ++i, ++at) {
        unsigned count = 0;
        unsigned char state = 0;
        const auto take = [&](const auto& line, std::size_t from) {
          if (line.Count(from) == 0) return;
          if (count == 0) state = line.State(from);
          counted[count++] = line.Value(from);
        };
        take(upper_, at), take(upper_, at + bands_), take(lower, at), take(lower, at + bands_);
        line_.counts[i] = count;
        line_.values[i] = count != 0 ? ModeOf(counted, count) : upper_.Value(at);
        line_.states[i] = count != 0 ? state : upper_.State(at);
      }
    }
  }

  const unsigned bands_;
  const std::size_t size_;  // values of a line
  const bool isMode_;
  bool isOdd_ = false;  // of two lines one has come
  LevelLine<T> line_;
  LevelLine<T> upper_;  // of the level below, for modes
};

/// Makes the levels out of the lines of the raster as they come, and writes them.
template <typename T>
class LevelCascade {
 public:
  LevelCascade(const PyramidPlan<T>& plan, LevelReduction reduction, const Array<unsigned>& bands)
      : isMean_(reduction == LevelReduction::kAverage), bandCount_(bands.GetCount()) {
    for (const unsigned band : bands) {
      const bool has = plan.source->HasNoDataValue(band);
      noData_.push_back(has ? std::optional(plan.source->NoDataValue(band)) : std::nullopt);
    }
    const unsigned side = TilingOf(plan.source->Bands(), plan.tileSide).side;
    for (unsigned number = 0; number <= plan.levelMax; ++number) {
      const LevelShape shape(plan.source->Samples(), plan.source->Lines(), number, side);
      if (shape.IsEmpty()) break;
      Level& level = levels_.emplace_back(shape.width, bandCount_, reduction);
      if (number < plan.levelMin) continue;
      const RasterPtr<T> stored = plan.full->StoredPyramidLevel(number);
      // Its own lines are handed over, none of them left out.
      const LevelShape whole(shape.width, shape.height, 0, side);
      if (stored) {
        level.writer = std::make_unique<LevelStripWriter<T>>(stored, whole, shape.width, bands);
      } else {
        isGood_ = false;
      }
    }
  }

  /// Takes whole lines of the raster, of all bands, pixel-interleaved.
  bool Take(const Tile<T>& block) {
    if (!isGood_ || (levels_.front().writer && !levels_.front().writer->Take(block))) return false;
    const std::size_t size = std::size_t{block.Width()} * bandCount_;
    for (unsigned y = 0; y < block.Height(); ++y) {
      const SourceLine<T> line{block.PixelArray().GetData() + y * size,
                               block.StateArray().GetData() + y * size};
      if (levels_.size() > 1 && levels_[1].reducer.Take(line) && !HandOn(1)) return false;
    }
    return true;
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
    return isLast || !levels_[number + 1].reducer.Take(level.reducer.Line()) || HandOn(number + 1);
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

  const bool isMean_;
  const unsigned bandCount_;
  bool isGood_ = true;
  std::vector<std::optional<T>> noData_;
  std::deque<Level> levels_;  // from the raster itself on
  Tile<T> tile_;              // a line
};

}  // namespace detail

template <typename T>
bool ReducedLevels<T>::Make(const PyramidPlan<T>& plan, LevelReduction reduction,
                            const Array<unsigned>& bands, const ObjectPtr& stats, const IPC& ipc) {
  detail::LevelCascade<T> cascade(plan, reduction, bands);
  const TileDimensions lines =
      WideTiles(plan.source.Get(), sizeof(T), RasterIteratorStream<T>::kBudget, 0);
  TileProcess<> process("ReducedLevels", ipc);
  const auto slot =
      process.Read(RasterIteratorPtr<T>(new RasterIterator<T>(plan.source, lines, bands)));
  if constexpr (std::is_arithmetic_v<T>) {
    if (stats) {
      process.template AddTask<RasterStatsAccumulateTask<T, RasterStats<T>>>(ArgIDs({slot.id}),
                                                                             stats);
    }
  }
  process.Add("ReducedLevels", StageOrder::kOneByOne,
              [&](ArgList& token, const AbortFlag* /*abort*/) {
                const TilePtr<T> block = slot.In(token);
                return block && block->IsValid() && cascade.Take(*block);
              });
  process.Close();
  return process.RunProcess(process.kHere);
}

}  // namespace lumo
