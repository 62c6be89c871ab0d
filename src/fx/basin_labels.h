#pragma once

#include <cstdint>
#include <vector>

#include "platform/export.h"

namespace lumo {

/// Gives the labels of the catchment basins of an image strip by strip, whoever has found them.
/// Labels go from 1 on, in the order of the first pixels of minima; 0 is for excluded pixels.
///
/// Threads: any number may ask, but TakeRanks. Failure: false, with the fault set.
class VEXG_EXPORT BasinLabels {
 public:
  virtual ~BasinLabels() = default;

  /// How many strips there are.
  virtual unsigned Strips() const = 0;
  /// The lines of a strip.
  virtual std::uint32_t LinesOf(unsigned strip) const = 0;
  virtual std::uint32_t Width() const = 0;

  /// How many minima there are.
  virtual std::uint32_t Count() const = 0;
  /// For each label its number in the order of levels, and of first pixels where these are equal,
  /// which is the label that Watershed gives. Empties the list.
  virtual std::vector<std::uint32_t> TakeRanks() = 0;
  /// Marks the basins, by label, of which neighbours may be found more than once: ForEachStripEdge
  /// on one strip after the other, or whatever else finds them, meets the others in one place.
  virtual bool MarkSeamBasins(std::vector<bool>& marks) const = 0;

  /// Labels a strip.
  virtual bool Label(unsigned strip, std::int32_t* labels) const = 0;
  /// Reads the labels of the line above a strip, or below it. @param line  [out] empty where there
  /// is none.
  virtual bool ReadLabelsAbove(unsigned strip, std::vector<std::int32_t>& line) const = 0;
  virtual bool ReadLabelsBelow(unsigned strip, std::vector<std::int32_t>& line) const = 0;
};

}  // namespace lumo
