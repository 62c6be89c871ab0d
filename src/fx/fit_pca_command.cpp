#include <algorithm>
#include <set>

#include "foundation/fault.h"
#include "fx/class_scores.h"
#include "fx/pca_model.h"

namespace lumo {
namespace {

const CommandDeclaration kFitPCA{
    "FitPCAModelCommand",
    "Feature extraction",
    "Fits the model by which FxComputePCAClassificationCommand scores regions, from examples. A "
    "command of this library's own.",
    {ExamplesInput(),
     AttributesInput(),
     StatisticsInput(),
     ChoicesInput(),
     {"Variance", Presence::kOptional, ValueKind::kNumber,
      "the share of the variance that the components hold at least, above 0 to 1; 0.99 when "
      "absent"}},
    {{"PCACoefficients", ValueKind::kNumberArray,
      "a row for each attribute, a column for each component"},
     {"Weights", ValueKind::kNumberArray, "a row for each component, a column for each class"},
     {"Thresholds", ValueKind::kNumberArray, "the same"},
     {"Shares", ValueKind::kNumberArray, "of the variance, of each component"}}};

class FitPCAModelCommand final : public ClassScoresCommand {
  CommandResult Execute() override {
    if (!CheckInputs()) return Fail();
    const double share = HasInput("Variance") ? Read<double>("Variance") : 0.99;
    if (!(share > 0 && share <= 1)) return Fail("Variance: it is above 0 and at most 1");
    if (!OpenFiles(true) || !ChooseAttributes() || !ReadExamples()) return Fail();
    std::set<unsigned> classes;
    for (const ClassExample& example : examples_) classes.insert(example.classIndex);
    if (classes.size() < 2) return Fail("ExampleDefinition: examples are of two classes at least");

    PcaFit fit(columns_.Count());
    if (!AddRegions(fit)) return Fail();
    if (!fit.FindComponents(share)) {
      return Fail("AttributeDefinition: the attributes are the same for all regions");
    }
    if (!AddExamples(fit)) return Fail();
    const PcaModel model = fit.GetModel(classCount_);
    const unsigned components = model.components;
    Write("PCACoefficients", Table(model.coefficients, columns_.Count(), components));
    Write("Weights", Table(model.weights, components, classCount_));
    Write("Thresholds", Table(model.thresholds, components, classCount_));
    Array<double> shares{ArrayDims(components)};
    std::copy(model.shares.begin(), model.shares.end(), shares.begin());
    Write("Shares", shares);
    return Succeed();
  }

  /// Adds all regions that there are, in their order.
  bool AddRegions(PcaFit& fit) {
    constexpr unsigned kBlock = 4096;
    const unsigned count = columns_.RegionCount();
    std::vector<unsigned> block;
    std::vector<double> z(std::size_t{kBlock} * columns_.Count());
    for (unsigned region = 0; region < count; ++region) {
      if (!columns_.IsAbsent(region)) block.push_back(region);
      if (block.size() < kBlock && region + 1 != count) continue;
      const auto length = static_cast<unsigned>(block.size());
      columns_.Read(block.data(), length, z.data());
      columns_.Standardize(length, z.data());
      fit.AddRegions(length, z.data());
      block.clear();
      GetIPC().progress->Update((region + 1.0) / count);
      if (GetIPC().abort->IsSet()) {
        SetFault("the work was aborted");
        return false;
      }
    }
    return true;
  }

  bool AddExamples(PcaFit& fit) {
    std::set<unsigned> classes;
    std::vector<double> z(columns_.Count());
    for (const ClassExample& example : examples_) {
      columns_.Read(&example.region, 1, z.data());
      columns_.Standardize(1, z.data());
      if (fit.AddExample(example.classIndex, z.data())) classes.insert(example.classIndex);
    }
    if (classes.size() >= 2) return true;
    SetFault("ExampleDefinition: examples of two classes at least have numbers as attributes");
    return false;
  }

  static Array<double> Table(const std::vector<double>& numbers, unsigned rows, unsigned columns) {
    Array<double> table{ArrayDims(rows, columns)};
    std::copy(numbers.begin(), numbers.end(), table.begin());
    return table;
  }
};

const CommandFactoryT<FitPCAModelCommand> fitPCAModelFactory(kFitPCA);

}  // namespace
}  // namespace lumo
