#pragma once

#include <map>
#include <string>

#include "gdal_common/stored_stats.h"

namespace lumo::tiff {

/// Holds the values that GDAL stores of the bands of a file: in a tag of it, and in a file beside
/// it, which goes first.
///
/// Failure: false for a text that holds anything else, or isn't written as GDAL writes it.
class StoredItems {
 public:
  /// Takes the text of the tag of GDAL's items.
  bool TakeTag(const std::string& text, unsigned bands);
  /// Takes the text of the file beside a raster, `NAME.aux.xml`.
  bool TakeSideFile(const std::string& text, unsigned bands);

  /// The details of a band that the tag has, by their names: Description, Unit, Meaning, Scale and
  /// Offset.
  const std::map<std::string, std::string>& Details(unsigned band) const;
  /// The statistics of a band; nothing where none of all its pixels are stored.
  std::optional<gdal::StoredStats> Stats(unsigned band) const;
  /// True when the file beside it holds histograms, which are GDAL's to read.
  bool HasHistograms() const { return hasHistograms_; }

 private:
  class Parser;

  std::map<unsigned, std::map<std::string, std::string>> items_;  // by band and name
  std::map<unsigned, std::map<std::string, std::string>> details_;
  bool hasHistograms_ = false;
};

}  // namespace lumo::tiff
