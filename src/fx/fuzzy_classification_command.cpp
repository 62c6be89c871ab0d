#include <numeric>

#include "commands/division.h"
#include "foundation/fault.h"
#include "fx/class_scores.h"
#include "fx/fuzzy_rules.h"

namespace lumo {
namespace {

const CommandDeclaration kFuzzy{
    "FxComputeFuzzyClassificationCommand",
    "Feature extraction",
    "Scores regions for classes by rules on their attributes.",
    WithShareInputs(
        {{"ClassDefinition", Presence::kRequired, ValueKind::kNumberArray,
          "the threshold of each class"},
         {"RuleDefinition", Presence::kRequired, ValueKind::kNumberArray,
          "rows of 2: the class that a rule feeds, and its weight there"},
         AttributesInput(),
         {"AttributeDefinition", Presence::kRequired, ValueKind::kNumberArray,
          "rows of 10, one for each test: rule, file, attribute, band; comparison 0 between a and "
          "b, 1 "
          "at least a, 2 at most a, 3 outside of a and b; a; b; weight in the rule; membership 0 "
          "crisp, "
          "1 linear, 2 an S-curve; tolerance in percent"},
         {"LabelValues", Presence::kRequired, ValueKind::kIntegerArray,
          "the regions to score; all where the first is 4294967295"},
         ScoresInput()}),
    {}};

class FxComputeFuzzyClassificationCommand final : public ClassScoresCommand {
  CommandResult Execute() override {
    if (!CheckInputs() || !OpenFiles(false)) return Fail();
    const auto classes = Read<Array<float>>("ClassDefinition");
    FuzzyRuleSet rules;
    if (!rules.Read(&classes, Read<Array<float>>("RuleDefinition"),
                    Read<Array<float>>("AttributeDefinition")) ||
        !columns_.Choose(rules.Choices(), "AttributeDefinition")) {
      return Fail();
    }
    std::vector<unsigned> regions;
    if (!ReadRegions(regions) || !CreateScores(static_cast<unsigned>(rules.ClassCount()))) {
      return Fail();
    }
    return Finish(ScoreRegions(
        regions, [&](const unsigned*, unsigned count, const double* values, double* scores) {
          std::vector<double> ruleScores(rules.rules.size());
          for (unsigned i = 0; i < count; ++i, scores += rules.ClassCount()) {
            rules.ScoreRules(values + i, count, ruleScores.data());
            rules.ScoreClasses(ruleScores.data(), scores);
            rules.Normalize(scores);
          }
        }));
  }

  bool ReadRegions(std::vector<unsigned>& regions) {
    constexpr unsigned kAll = 0xFFFFFFFF;
    const auto values = Read<Array<unsigned>>("LabelValues");
    const unsigned count = columns_.RegionCount();
    if (values.GetCount() != 0 && values[0] == kAll) {
      regions.resize(count);
      std::iota(regions.begin(), regions.end(), 0U);
      return true;
    }
    regions.assign(values.begin(), values.end());
    for (const unsigned region : regions) {
      if (region < count) continue;
      SetFault(String("LabelValues: there is no region " + std::to_string(region) + ", only " +
                      std::to_string(count)));
      return false;
    }
    return true;
  }
};

const CommandFactoryT<FxComputeFuzzyClassificationCommand> fxComputeFuzzyClassificationFactory(
    kFuzzy);
const DivisionRegistration fxComputeFuzzyClassificationDivision(
    {.command = "FxComputeFuzzyClassificationCommand",
     .kind = DivisionKind::kShares,
     .makes = {"ClassFXC"}});

}  // namespace
}  // namespace lumo
