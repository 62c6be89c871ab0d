#pragma once

#include <memory>
#include <vector>

#include "fx/region_attribute_stats.h"
#include "fx/region_attributes.h"

namespace lumo {

/// Names one attribute of one of several files.
struct AttributeChoice {
  unsigned file = 0;       ///< among the files, from 0
  unsigned attribute = 0;  ///< of a band
  unsigned band = 0;
};

/// Reads chosen attributes of regions from several files, a block of regions at a time.
///
///     ChosenAttributes attributes;
///     if (!attributes.Open(files) || !attributes.Choose(choices, "AttributeDefinition")) return
///     Fail(); std::vector<double> values(attributes.Count() * regions.size());
///     attributes.Read(regions.data(), regions.size(), values.data());
///
/// Threads: one at a time. Failure: false, with the fault set, which names the file or the row.
class VEXG_EXPORT ChosenAttributes {
 public:
  /// Opens the files. @param names  in the form of URIs.
  bool Open(const Array<String>& names);
  /// Opens the files of statistics, one for each file of regions.
  bool OpenStatistics(const Array<String>& names);

  /// Chooses what is read. @param input  the name that a fault has for the rows.
  bool Choose(std::vector<AttributeChoice> choices, const char* input);

  unsigned FileCount() const { return static_cast<unsigned>(files_.size()); }
  /// Attributes that are chosen.
  unsigned Count() const { return static_cast<unsigned>(choices_.size()); }
  /// The regions that all files have: the smallest of their counts.
  unsigned RegionCount() const;

  /// Reads the chosen attributes of regions, attribute by attribute.
  /// @param values  [out] of attribute i and regions[j] at i * count + j.
  void Read(const unsigned* regions, unsigned count, double* values) const;

  /// True when the file of the first chosen attribute has no such region.
  bool IsAbsent(unsigned region) const;

  /// Takes the mean of each chosen attribute off its values, and divides them by its standard
  /// deviation; 0 where that is 0. Statistics are open.
  /// @param values  as Read gives them.
  void Standardize(unsigned count, double* values) const;

 private:
  struct Scale {
    double mean = 0;
    double deviation = 0;
  };

  std::vector<std::unique_ptr<RegionAttributesFile<float>>> files_;
  std::vector<std::unique_ptr<RegionAttributeStatsFile<float>>> statistics_;
  std::vector<AttributeChoice> choices_;
  std::vector<Scale> scales_;  // of the chosen attributes
};

}  // namespace lumo
