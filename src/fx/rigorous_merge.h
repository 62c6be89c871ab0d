#pragma once

#include <cstdint>
#include <vector>

#include "commands/value_text.h"
#include "fx/label_pairs.h"

namespace lumo {

/// Joins all neighbouring segments of a label image whose cost (see LambdaSchedule) is below a
/// threshold, where costs are those of the segments as they are: the result is the connected
/// components of the graph of neighbours without the edges of higher cost.
///
/// Label 0 counts as a segment. In the told form the values and the pixels of segments are added up
/// as float, in the order of the pixels; in the exact form as double.
///
/// Threads: one at a time; the arrays are kept from image to image.
class VEXG_EXPORT RigorousMerge {
 public:
  /// Forgets everything, and makes room for the labels 0 to `labelCount`, of `bands` bands.
  void Begin(std::uint32_t labelCount, std::uint32_t bands, Form sums = Form::kTold);

  /// Adds a pixel to its segment.
  /// @param values  one for each band.
  template <typename T>
  void AddPixel(std::uint32_t label, const T* values, std::size_t bandStride) {
    const std::size_t at = std::size_t{label} * bands_;
    for (std::uint32_t band = 0; band < bands_; ++band) {
      const T value = values[band * bandStride];
      if (sums_ == Form::kExact) {
        exactSums_[at + band] += static_cast<double>(value);
      } else {
        toldSums_[at + band] += static_cast<float>(value);
      }
    }
    ++counts_[label];
  }

  /// Adds pixels to their segment, in the exact form.
  /// @param sums  of their values, one for each band.
  void AddSums(std::uint32_t label, double pixels, const double* sums) {
    const std::size_t at = std::size_t{label} * bands_;
    for (std::uint32_t band = 0; band < bands_; ++band) exactSums_[at + band] += sums[band];
    counts_[label] += static_cast<std::uint32_t>(pixels);
  }

  /// Joins the segments whose costs are below the threshold. Behind all pixels.
  /// @return for each label the number of its group. Numbers follow the groups
  ///         that were joined, then the labels that stayed alone, in their order; the first of
  ///         these has the number of the last group. Without any joining each label stays.
  std::vector<std::uint32_t> Join(const std::vector<LabelPair>& pairs, double threshold);

 private:
  double CountOf(std::uint32_t label) const;
  float CostOf(const LabelPair& pair) const;
  double MeanOf(std::uint32_t label, std::uint32_t band) const;

  std::uint32_t bands_ = 0;
  Form sums_ = Form::kTold;
  std::vector<float> toldSums_;  // by label, then band
  std::vector<double> exactSums_;
  std::vector<std::uint32_t> counts_;  // by label
};

}  // namespace lumo
