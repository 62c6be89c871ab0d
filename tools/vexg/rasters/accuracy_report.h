#pragma once

#include <string>
#include <vector>

#include "foundation/array.h"
#include "jobs/raster_job.h"
#include "output/json_number.h"
#include "rasters/class_steps.h"

namespace lumo::host {

constexpr const char* kCompareStep = "compare";

/// Adds the command that compares a map with samples. Further inputs are the caller's.
/// @param map  a variable.
JobWriterCommand& AddComparison(JobDraft& draft, const String& map, const SampleSet& samples);

/// Holds what AccuracyCommand gives.
class AccuracyReport {
 public:
  explicit AccuracyReport(const Map<String, String>& returns);

  /// Of what AsJson gave; throws an exception of the JSON library for anything else.
  explicit AccuracyReport(const Json& json);

  Json AsJson() const;
  /// A table: rows of known classes, columns of those of the map.
  std::string AsText() const;

 private:
  static Json ShareAsJson(const Array<double>& shares, std::size_t at);
  static std::string Percent(const Array<double>& shares, std::size_t at);

  std::vector<std::string> classes_;
  Array<unsigned> matrix_;
  Array<double> overall_, producer_, user_, f1_;
  double kappa_ = 0;
  unsigned outside_ = 0, noClass_ = 0;
};

}  // namespace lumo::host
