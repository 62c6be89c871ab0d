#include <algorithm>
#include <limits>
#include <numeric>

#include "commands/division.h"
#include "foundation/fault.h"
#include "fx/class_scores.h"
#include "fx/nearest_examples.h"

namespace lumo {

/// How the scores of nearest neighbours are stored. Told: for the class that wins the squared
/// distance from its mean. Votes: for each class its share of the votes.
enum class NeighborScores : unsigned char { kTold, kVotes };

std::span<const EnumWord<NeighborScores>> WordsOf(NeighborScores) {
  static constexpr EnumWord<NeighborScores> kWords[] = {{"Told", NeighborScores::kTold},
                                                        {"Votes", NeighborScores::kVotes}};
  return kWords;
}

namespace {

const CommandDeclaration kKnn{"FxComputeKNNClassificationCommand",
                              "Feature extraction",
                              "Scores regions for classes by the votes of the nearest examples.",
                              WithShareInputs({ExamplesInput(),
                                               {"Neighbors", Presence::kRequired,
                                                ValueKind::kInteger, "how many examples vote"},
                                               AttributesInput(),
                                               StatisticsInput(),
                                               ChoicesInput(),
                                               ScoresInput(),
                                               {"Scores", Presence::kOptional, ValueKind::kWord,
                                                "Told: the squared distance from the mean of the "
                                                "class that wins, 0 for the others; Votes: "
                                                "the share of the votes of each class",
                                                "", &WordsIn<NeighborScores>}}),
                              {}};

class FxComputeKNNClassificationCommand final : public ClassScoresCommand {
  CommandResult Execute() override {
    if (!CheckInputs()) return Fail();
    neighbors_ = Read<unsigned>("Neighbors");
    if (neighbors_ == 0) return Fail("Neighbors: one example votes at least");
    if (!OpenFiles(true) || !ChooseAttributes() || !ReadExamples() || !CreateScores(classCount_)) {
      return Fail();
    }
    form_ = Read<NeighborScores>("Scores");
    ReadExampleValues();
    const NearestExamples nearest(trained_, columns_.Count());
    std::vector<unsigned> regions(std::max(columns_.RegionCount(), 1U) - 1);
    std::iota(regions.begin(), regions.end(), 1U);  // region 0 is none
    const bool isDone =
        ScoreRegions(regions, [&](const unsigned*, unsigned count, const double* values,
                                  double* scores) { Score(nearest, count, values, scores); });
    if (isDone && !IsShare()) PlaceExamples();
    return Finish(isDone);
  }

  /// The standardized values of the examples, and their means for each class.
  void ReadExampleValues() {
    const unsigned attributes = columns_.Count();
    means_.assign(std::size_t{classCount_} * attributes, 0.0);
    std::vector<unsigned> members(classCount_);
    std::vector<double> z(attributes);
    for (const ClassExample& example : examples_) {
      columns_.Read(&example.region, 1, z.data());
      columns_.Standardize(1, z.data());
      trained_.insert(trained_.end(), z.begin(), z.end());
      ++members[example.classIndex];
      for (unsigned i = 0; i < attributes; ++i) {
        means_[std::size_t{example.classIndex} * attributes + i] += z[i];
      }
    }
    for (unsigned c = 0; c < classCount_; ++c) {
      for (unsigned i = 0; i < attributes && members[c] != 0; ++i) {
        means_[std::size_t{c} * attributes + i] /= members[c];
      }
    }
  }

  double DistanceFromMean(const double* z, unsigned classIndex) const {
    double sum = 0;
    for (unsigned i = 0; i < columns_.Count(); ++i) {
      const double difference = z[i] - means_[std::size_t{classIndex} * columns_.Count() + i];
      sum += difference * difference;
    }
    return sum;
  }

  void Score(const NearestExamples& nearest, unsigned count, const double* values,
             double* scores) const {
    const unsigned attributes = columns_.Count();
    std::vector<double> block(values, values + std::size_t{attributes} * count);
    columns_.Standardize(count, block.data());
    std::vector<double> z(attributes);
    std::vector<NearestExamples::Found> found;
    std::vector<unsigned> votes(classCount_);
    for (unsigned j = 0; j < count; ++j, scores += classCount_) {
      for (unsigned i = 0; i < attributes; ++i) z[i] = block[std::size_t{i} * count + j];
      nearest.Find(z.data(), neighbors_, found);
      std::fill(votes.begin(), votes.end(), 0U);
      for (const auto& example : found) ++votes[examples_[example.number].classIndex];
      if (form_ == NeighborScores::kVotes) {
        for (unsigned c = 0; c < classCount_ && !found.empty(); ++c) {
          scores[c] = static_cast<double>(votes[c]) / static_cast<double>(found.size());
        }
        continue;
      }
      const auto winner =  // of a tie the lowest class
          static_cast<unsigned>(std::max_element(votes.begin(), votes.end()) - votes.begin());
      scores[winner] = DistanceFromMean(z.data(), winner);
    }
  }

  /// An example is of its own class alone.
  void PlaceExamples() {
    for (std::size_t e = 0; e < examples_.size(); ++e) {
      const ClassExample& example = examples_[e];
      for (unsigned c = 0; c < classCount_; ++c) scores_->Value(example.region, 0, c) = 0;
      float score = 1;
      if (form_ == NeighborScores::kTold) {
        const double distance =
            DistanceFromMean(trained_.data() + e * columns_.Count(), example.classIndex);
        score = std::max(static_cast<float>(distance), std::numeric_limits<float>::denorm_min());
      }
      scores_->Value(example.region, 0, example.classIndex) = score;
    }
  }

  unsigned neighbors_ = 0;
  NeighborScores form_ = NeighborScores::kTold;
  std::vector<double> trained_;  // values of the examples, row by row
  std::vector<double> means_;    // of the classes, row by row
};

const CommandFactoryT<FxComputeKNNClassificationCommand> fxComputeKNNClassificationFactory(kKnn);
const DivisionRegistration fxComputeKNNClassificationDivision(
    {.command = "FxComputeKNNClassificationCommand",
     .kind = DivisionKind::kShares,
     .makes = {"ClassFXC"}});

}  // namespace
}  // namespace lumo
