#pragma once

#include <cstdint>
#include <vector>

#include "fx/region_attributes.h"

namespace lumo {

/// Gathers records of regions, which may come in any order, and puts them into a file sorted by
/// label, many at a time, so that its pages are seldom changed. Of several records of one label
/// that which came last stays.
///
///     RecordSpool spool(file);
///     for (const Region& region : regions) spool.Add(region.label, region.values);
///     if (!spool.Flush()) return false;
///
/// Threads: one at a time. Failure: false, with the error on the file, which TakeFault explains.
class VEXG_EXPORT RecordSpool {
 public:
  /// The bytes that are held at most.
  static constexpr std::size_t kBytes = std::size_t{32} << 20;

  /// @param file  outlives the spool.
  explicit RecordSpool(RegionAttributesFile<float>& file)
      : file_(file), length_(std::size_t{file.Bands()} * file.Attributes()) {}

  /// Values of a record: bands by attributes.
  std::size_t RecordLength() const { return length_; }

  /// Takes a record.
  bool Add(std::uint32_t label, const float* record);
  /// Puts all records into the file.
  bool Flush();

 private:
  RegionAttributesFile<float>& file_;
  std::size_t length_;
  std::vector<std::uint32_t> labels_;
  std::vector<float> values_;
};

}  // namespace lumo
