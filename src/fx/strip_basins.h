#pragma once

#include <cstdint>
#include <unordered_map>
#include <vector>

#include "fx/label_pairs.h"

namespace lumo {

/// Holds the basins of a strip of whole lines, and of the line below it, as far as the strip alone
/// shows them: how large they are, the sums of their bands, and which are neighbours. Basins have
/// numbers from 1 here. What a merge needs of a strip, without its pixels.
///
/// A basin that continues one of the strip above has no sums: the order in which floating-point
/// values are added counts, so its pixels are listed instead, to be added to those above.
///
///     StripBasins basins;
///     basins.Find({labels, pixels, width, below, strip > 0}, ownLabels, pairs);
///     basins.AddUp(labels, values, bands);      // labels are now numbers
struct VEXG_EXPORT StripBasins {
  /// The labels of a strip.
  struct Lines {
    std::int32_t* labels = nullptr;  ///< become numbers; 0 stays
    std::size_t pixels = 0;
    std::uint32_t width = 0;
    const std::int32_t* below = nullptr;  ///< of the line below; null at the end of the raster
    bool hasAbove = false;
  };
  /// A part of all labels: those above `first`, `count` of them.
  struct Labels {
    std::uint32_t first = 0;
    std::uint32_t count = 0;
  };
  /// Pixels of one line and one basin.
  struct Run {
    std::size_t first = 0;
    std::uint32_t pixels = 0;
    std::uint32_t basin = 0;  ///< its number
  };
  struct Basin {
    std::uint32_t label = 0;  ///< 0 for none
    bool continues = false;   ///< has pixels in the first line of the strip, and there is one above
    bool goesOn = false;      ///< has pixels in the line below
  };

  std::vector<Basin> basins;     ///< by number; none has the number 0
  std::vector<double> pixels;    ///< by number; of those that don't continue
  std::vector<double> sums;      ///< by number and band; of those that don't continue
  std::vector<LabelPair> pairs;  ///< by numbers, as they come first in the strip
  std::vector<Run> runs;         ///< of those that continue, in raster order

  /// Finds basins, pairs and runs.
  /// @param own      labels that begin in the strip.
  /// @param scratch  lends memory.
  void Find(const Lines& lines, const Labels& own, LabelPairs& scratch);
  /// The same of a strip of very many lines, of which some at a time are looked at; without runs.
  void FindInParts(const Lines& lines, const Labels& own, LabelPairs& scratch);

  /// Adds up the pixels of basins that don't continue. @param numbers  as Find left them.
  template <typename T>
  void AddUp(const std::int32_t* numbers, std::size_t count, const T* values, unsigned bands) {
    pixels.assign(basins.size(), 0.0);
    sums.assign(basins.size() * bands, 0.0);
    for (std::size_t i = 0; i < count; ++i, values += bands) {
      const auto number = static_cast<std::size_t>(numbers[i]);
      if (number == 0 || basins[number].continues) continue;
      pixels[number] += 1;
      double* const sum = sums.data() + number * bands;
      for (unsigned band = 0; band < bands; ++band) sum[band] += static_cast<double>(values[band]);
    }
  }

 private:
  std::vector<std::int32_t> FindBasins(const Lines& lines, const Labels& own);
  void Number(std::int32_t* labels, std::size_t count, const Labels& own);
  void Mark(const Lines& lines, const std::vector<std::int32_t>& below);
  void ListRuns(const Lines& lines);

  std::unordered_map<std::int32_t, std::uint32_t> others_;  // the numbers of labels not its own
};

/// Calls `visit(a, b)` for each edge of a strip between labels that differ, none of them 0: row by
/// row, for each pixel first the edge to the right, then the one below.
/// @param below  the labels of the line below the strip; null at the end of the raster.
template <typename Visit>
void ForEachStripEdge(const std::int32_t* labels, std::size_t pixels, std::uint32_t width,
                      const std::int32_t* below, const Visit& visit) {
  const auto visitTo = [&](std::int32_t a, std::int32_t b) {
    if (a != b && a != 0 && b != 0) {
      visit(static_cast<std::uint32_t>(a), static_cast<std::uint32_t>(b));
    }
  };
  for (std::size_t at = 0; at < pixels; at += width) {
    const std::int32_t* const line = labels + at;
    const std::int32_t* const next = at + width < pixels ? line + width : below;
    for (std::uint32_t x = 0; x < width; ++x) {
      if (x + 1 < width) visitTo(line[x], line[x + 1]);
      if (next != nullptr) visitTo(line[x], next[x]);
    }
  }
}

}  // namespace lumo
