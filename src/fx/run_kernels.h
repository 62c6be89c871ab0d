#pragma once

#include <span>

#include "fx/region_sums.h"
#include "fx/strip_regions.h"

namespace lumo {

/// Adds the runs of a line of pixels to the sums of their regions: four or eight bands at a time,
/// in vector registers.
/// @param line   pixel-interleaved. @param end  behind the last value that may be read.
/// @param sums   regions by bands.
void AddRuns(std::span<const LabelRun> runs, const std::uint8_t* line, const std::uint8_t* end,
             std::size_t bands, RegionSums<std::uint8_t>* sums);
void AddRuns(std::span<const LabelRun> runs, const std::int8_t* line, const std::int8_t* end,
             std::size_t bands, RegionSums<std::int8_t>* sums);
void AddRuns(std::span<const LabelRun> runs, const std::uint16_t* line, const std::uint16_t* end,
             std::size_t bands, RegionSums<std::uint16_t>* sums);
void AddRuns(std::span<const LabelRun> runs, const std::int16_t* line, const std::int16_t* end,
             std::size_t bands, RegionSums<std::int16_t>* sums);

/// The same for pixels of other types, one band after the other.
template <typename T>
void AddRuns(std::span<const LabelRun> runs, const T* line, const T* /*end*/, std::size_t bands,
             RegionSums<T>* sums) {
  for (const LabelRun& run : runs) {
    RegionSums<T>* const to = sums + run.region * bands;
    const T* const first = line + run.first * bands;
    for (std::size_t band = 0; band < bands; ++band) {
      RegionSums<T> sum = to[band];
      const T* value = first + band;
      for (std::uint32_t i = 0; i < run.count; ++i, value += bands) sum.Add(*value);
      sum.AddCount(run.count);
      to[band] = sum;
    }
  }
}

}  // namespace lumo
