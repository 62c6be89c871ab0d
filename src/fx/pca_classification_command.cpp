#include <algorithm>
#include <numeric>

#include "commands/division.h"
#include "foundation/fault.h"
#include "fx/class_scores.h"

namespace lumo {
namespace {

const CommandDeclaration kPca{
    "FxComputePCAClassificationCommand",
    "Feature extraction",
    "Scores regions for classes by a model of principal components of their attributes.",
    WithShareInputs({ExamplesInput(),
                     AttributesInput(),
                     StatisticsInput(),
                     ChoicesInput(),
                     {"PCACoefficients", Presence::kRequired, ValueKind::kNumberArray,
                      "a row for each attribute, a column for each component"},
                     {"Weights", Presence::kRequired, ValueKind::kNumberArray,
                      "a row for each component, a column for each class"},
                     {"Thresholds", Presence::kRequired, ValueKind::kNumberArray, "the same"},
                     ScoresInput()}),
    {}};

class FxComputePCAClassificationCommand final : public ClassScoresCommand {
  CommandResult Execute() override {
    if (!CheckInputs() || !OpenFiles(true) || !ChooseAttributes() || !ReadExamples() ||
        !ReadModel() || !CreateScores(classCount_)) {
      return Fail();
    }
    std::vector<unsigned> regions;
    for (unsigned region = 0; region < columns_.RegionCount(); ++region) {
      if (!columns_.IsAbsent(region)) regions.push_back(region);
    }
    largest_.assign(classCount_, 0.0F);
    const bool isDone =
        ScoreRegions(regions, [&](const unsigned*, unsigned count, const double* values,
                                  double* scores) { Score(count, values, scores); });
    if (isDone && !IsShare()) PlaceExamples(regions);
    return Finish(isDone);
  }

  bool ReadModel() {
    coefficients_ = Read<Array<double>>("PCACoefficients");
    weights_ = Read<Array<double>>("Weights");
    thresholds_ = Read<Array<double>>("Thresholds");
    components_ = coefficients_.GetCount() / columns_.Count();
    const auto check = [&](const char* input, const Array<double>& table, unsigned rows,
                           unsigned columns) {
      if (table.IsValid() && columns != 0 && table.GetCount() == std::uint64_t{rows} * columns) {
        return true;
      }
      SetFault(String(std::string(input) + ": the numbers are not " + std::to_string(rows) +
                      " rows of " + std::to_string(columns)));
      return false;
    };
    return check("PCACoefficients", coefficients_, columns_.Count(), components_) &&
           check("Weights", weights_, components_, classCount_) &&
           check("Thresholds", thresholds_, components_, classCount_);
  }

  void Score(unsigned count, const double* values, double* scores) const {
    const unsigned attributes = columns_.Count();
    std::vector<double> z(values, values + std::size_t{attributes} * count);
    columns_.Standardize(count, z.data());
    std::vector<double> y(components_);
    for (unsigned j = 0; j < count; ++j, scores += classCount_) {
      for (unsigned k = 0; k < components_; ++k) {
        y[k] = 0;
        for (unsigned i = 0; i < attributes; ++i) {
          y[k] += z[std::size_t{i} * count + j] * coefficients_[std::size_t{i} * components_ + k];
        }
      }
      for (unsigned c = 0; c < classCount_; ++c) {
        double score = 0;
        for (unsigned k = 0; k < components_; ++k) {
          const std::size_t at = std::size_t{k} * classCount_ + c;
          score += (y[k] - thresholds_[at]) * weights_[at];
        }
        scores[c] = score > 0 ? score : 0;
      }
    }
  }

  /// An example has the best score of all regions for its class.
  void PlaceExamples(const std::vector<unsigned>& regions) {
    for (const unsigned region : regions) {
      for (unsigned c = 0; c < classCount_; ++c) {
        largest_[c] = std::max(largest_[c], std::as_const(*scores_).Value(region, 0, c));
      }
    }
    for (const ClassExample& example : examples_) {
      scores_->Value(example.region, 0, example.classIndex) = largest_[example.classIndex];
    }
  }

  Array<double> coefficients_, weights_, thresholds_;
  unsigned components_ = 0;
  std::vector<float> largest_;  // score of each class
};

const CommandFactoryT<FxComputePCAClassificationCommand> fxComputePCAClassificationFactory(kPca);
const DivisionRegistration fxComputePCAClassificationDivision(
    {.command = "FxComputePCAClassificationCommand",
     .kind = DivisionKind::kShares,
     .makes = {"ClassFXC"}});

}  // namespace
}  // namespace lumo
