#pragma once

#include <optional>
#include <string>
#include <vector>

#include "jobs/raster_job.h"
#include "output/output_file.h"

namespace lumo::host {

/// Which segments of a tree are meant.
struct TreeCutRequest {
  std::string tree;  ///< the file
  std::optional<double> mergeValue, mergePercent;
};

/// Adds the command that shows the segments of a tree as a raster, into the variable "$" name.
void AddTreeLabels(JobDraft& draft, const std::string& name, const TreeCutRequest& request);

/// Segments of a tree at several costs, each within those of the next.
struct TreeLevels {
  std::string tree;
  std::vector<double> mergeValues;  ///< in ascending order

  /// The files that are made: one of labels for each level, then the table.
  /// @param name  of all; its ending, where it is that of a raster, is that of the labels.
  std::vector<std::string> FilesOf(const std::string& name) const;

  /// Adds the commands that make all files.
  /// @param files   as FilesOf gives them, or others in their places.
  /// @param format  of the labels.
  void AddMaking(JobDraft& draft, const std::vector<std::string>& files,
                 const std::string& format) const;
  /// Throws HostError when a raster could not be written to its end. Behind the making.
  void CheckMade(const JobResults& results) const;
};

/// Holds how local variance grows with scale, and the costs that it suggests.
struct ScaleCurve {
  std::vector<double> mergeValues, segments, localVariance, rates;  ///< by level
  std::vector<double> peaks, onsets, prominences;                   ///< the most prominent first

  static ScaleCurve Read(const JobResults& results);

  std::string AsText() const;
  std::string AsJson(const std::string& file) const;
  /// Draws the rates and the local variance over the cost, with lines at what is suggested.
  void Draw(const OutputFile& output) const;
};

/// Adds the command whose results ScaleCurve reads.
void AddSuggest(JobDraft& draft, const std::string& tree);
/// The name of its step.
inline constexpr const char* kSuggestStep = "suggest";

/// Reads costs, one at least, and puts them in order. Throws HostError for what are none.
std::vector<double> ReadMergeValues(const std::string& list);

}  // namespace lumo::host
