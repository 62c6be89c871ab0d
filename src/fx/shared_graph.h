#pragma once

#include <algorithm>
#include <vector>

#include "fx/segment_shares.h"
#include "fx/strip_basins.h"
#include "fx/usable_pixels.h"

namespace lumo {

/// Says which pixels of basins are added up, and what of them.
struct GraphSums {
  unsigned bands = 0;
  bool onlyUsable = false;   ///< pixels that IsUsable says take part, instead of all
  bool withSquares = false;  ///< the squares of the values as well
};

/// Holds the basins of a share and their neighbours, as merging needs them. Basins that come from
/// the share above have their values in raster order in place of sums, so that the sums of
/// floating-point values go on as they would without shares.
///
/// Memory: beside StripBasins the values of the basins that come from the share above.
template <typename T>
class SharedGraph {
 public:
  /// The basins as StripBasins::Find made them, with runs of the pixels in `values` alone.
  StripBasins basins;
  std::vector<double> squares;  ///< by number; of those that don't continue
  std::vector<T> values;        ///< of the runs, band by band for each pixel

  /// Begins with basins that are found.
  void Begin(StripBasins&& found, const GraphSums& sums) {
    sums_ = sums;
    basins = std::move(found);
    basins.runs.clear();
    const std::size_t count = basins.basins.size();
    basins.pixels.assign(count, 0.0);
    basins.sums.assign(count * sums.bands, 0.0);
    squares.assign(sums.withSquares ? count : 0, 0.0);
    values.clear();
  }

  /// Adds the next pixels. @param numbers  of their basins.
  void Add(const std::int32_t* numbers, std::size_t count, const T* pixels,
           const unsigned char* states) {
    const unsigned bands = sums_.bands;
    for (std::size_t i = 0; i < count; ++i, pixels += bands, states += bands) {
      const auto number = static_cast<std::size_t>(numbers[i]);
      if (number == 0 || (sums_.onlyUsable && !IsUsable(states, bands))) continue;
      if (basins.basins[number].continues) {
        Keep(static_cast<std::uint32_t>(number), pixels);
        continue;
      }
      basins.pixels[number] += 1;
      double* const to = basins.sums.data() + number * bands;
      for (unsigned band = 0; band < bands; ++band) to[band] += static_cast<double>(pixels[band]);
      if (sums_.withSquares) squares[number] += SumOfSquares(pixels, bands);
    }
  }

  /// The squares of the values of a pixel.
  static double SumOfSquares(const T* pixel, unsigned bands) {
    double sum = 0;
    for (unsigned band = 0; band < bands; ++band) {
      const auto value = static_cast<double>(pixel[band]);
      sum += value * value;
    }
    return sum;
  }

  void Put(ShareWriter& to) const;
  /// Reads a graph. False for one that can't be.
  bool Get(ShareReader& from, const GraphSums& sums);
  /// True when no basin has a label above the last one.
  bool HasLabelsBelow(std::uint32_t last) const {
    return std::all_of(basins.basins.begin(), basins.basins.end(),
                       [last](const StripBasins::Basin& basin) { return basin.label <= last; });
  }

 private:
  static constexpr std::uint8_t kContinues = 1, kGoesOn = 2;

  /// Keeps the values of a pixel of a basin that continues.
  void Keep(std::uint32_t number, const T* pixel) {
    if (basins.runs.empty() || basins.runs.back().basin != number) {
      basins.runs.push_back({values.size() / sums_.bands, 0, number});
    }
    ++basins.runs.back().pixels;
    values.insert(values.end(), pixel, pixel + sums_.bands);
  }
  bool IsSound() const;

  GraphSums sums_;
};

template <typename T>
void SharedGraph<T>::Put(ShareWriter& to) const {
  std::vector<std::uint32_t> labels, runs;
  std::vector<std::uint8_t> flags;
  for (const StripBasins::Basin& basin : basins.basins) {
    labels.push_back(basin.label);
    flags.push_back((basin.continues ? kContinues : 0U) | (basin.goesOn ? kGoesOn : 0U));
  }
  for (const StripBasins::Run& run : basins.runs) {
    runs.push_back(run.basin);
    runs.push_back(run.pixels);
  }
  PutList(to, labels);
  PutList(to, flags);
  PutList(to, basins.pixels);
  PutList(to, basins.sums);
  PutList(to, squares);
  PutList(to, basins.pairs);
  PutList(to, runs);
  PutList(to, values);
}

template <typename T>
bool SharedGraph<T>::Get(ShareReader& from, const GraphSums& sums) {
  sums_ = sums;
  std::vector<std::uint32_t> labels, runs;
  std::vector<std::uint8_t> flags;
  if (!GetList(from, labels) || !GetList(from, flags) || !GetList(from, basins.pixels) ||
      !GetList(from, basins.sums) || !GetList(from, squares) || !GetList(from, basins.pairs) ||
      !GetList(from, runs) || !GetList(from, values) || flags.size() != labels.size() ||
      runs.size() % 2 != 0) {
    return false;
  }
  basins.basins.resize(labels.size());
  for (std::size_t i = 0; i < labels.size(); ++i) {
    basins.basins[i] = {labels[i], (flags[i] & kContinues) != 0, (flags[i] & kGoesOn) != 0};
  }
  basins.runs.clear();
  std::size_t first = 0;
  for (std::size_t i = 0; i < runs.size(); i += 2) {
    basins.runs.push_back({first, runs[i + 1], runs[i]});
    first += runs[i + 1];
  }
  return first * sums.bands == values.size() && IsSound();
}

template <typename T>
bool SharedGraph<T>::IsSound() const {
  const std::size_t count = basins.basins.size();
  const auto isBasin = [count](std::uint32_t number) { return number != 0 && number < count; };
  return basins.pixels.size() == count && basins.sums.size() == count * sums_.bands &&
         squares.size() == (sums_.withSquares ? count : 0) &&
         std::all_of(basins.runs.begin(), basins.runs.end(),
                     [&](const StripBasins::Run& run) { return isBasin(run.basin); }) &&
         std::all_of(basins.pairs.begin(), basins.pairs.end(), [&](const LabelPair& pair) {
           return isBasin(pair.low) && isBasin(pair.high);
         });
}

}  // namespace lumo
