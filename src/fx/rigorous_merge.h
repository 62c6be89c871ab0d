#pragma once

#include <cstdint>
#include <vector>

#include "fx/label_pairs.h"

namespace lumo {

/// Says how the values of segments are added up. Told: as float, in the order of the pixels. Exact:
/// as double.
enum class RegionSums : unsigned char { kTold, kExact };

/// Joins all neighbouring segments of a label image whose cost (see LambdaSchedule) is below a
/// threshold, where costs are those of the segments as they are: the result is the connected
/// components of the graph of neighbours without the edges of higher cost.
///
/// Label 0 counts as a segment.
///
/// Threads: one at a time; the arrays are kept from image to image.
class VEXG_EXPORT RigorousMerge {
 public:
  /// Forgets everything, and makes room for the labels 0 to `labelCount`, of `bands` bands.
  void Begin(std::uint32_t labelCount, std::uint32_t bands, RegionSums sums = RegionSums::kTold);

  /// Adds a pixel to its segment.
  /// @param values  one for each band.
  template <typename T>
  void AddPixel(std::uint32_t label, const T* values, std::size_t bandStride) {
    const std::size_t at = std::size_t{label} * bands_;
    for (std::uint32_t band = 0; band < bands_; ++band) {
      const T value = values[band * bandStride];
      if (sums_ == RegionSums::kExact) {
        exactSums_[at + band] += static_cast<double>(value);
      } else {
        toldSums_[at + band] += static_cast<float>(value);
      }
    }
    counts_[label] += 1.0F;
  }

  /// Joins the segments whose costs are below the threshold. Behind all pixels.
  /// @return for each label the number of what it has become part of. Numbers follow the groups
  ///         that were joined, then the labels that stayed alone, in their order; the first of
  ///         these has the number of the last group. Without any joining each label stays.
  std::vector<std::uint32_t> Join(const std::vector<LabelPair>& pairs, double threshold);

 private:
  float CostOf(const LabelPair& pair) const;
  double MeanOf(std::uint32_t label, std::uint32_t band) const;

  std::uint32_t bands_ = 0;
  RegionSums sums_ = RegionSums::kTold;
  std::vector<float> toldSums_;  // by label, then band
  std::vector<double> exactSums_;
  std::vector<float> counts_;  // by label
};

}  // namespace lumo
