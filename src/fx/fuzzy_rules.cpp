#include "fx/fuzzy_rules.h"

#include <algorithm>
#include <cmath>

#include "commands/value_text.h"
#include "foundation/fault.h"

namespace lumo {
namespace {

/// From 0 below `low` to 1 above `high`.
double Rise(double x, double low, double high) {
  if (x < low) return 0;
  if (x > high) return 1;
  return low == high ? 0.5 : (x - low) / (high - low);
}
double Fall(double x, double low, double high) {
  if (x < low) return 1;
  if (x > high) return 0;
  return low == high ? 0.5 : (high - x) / (high - low);
}

double SquareOf(double value) {
  return value * value;
}

/// The same, with no slope at the ends.
double CurveUp(double x, double low, double middle, double high) {
  if (x < low) return 0;
  if (x > high) return 1;
  if (low == high) return 0.5;
  if (x < middle) return SquareOf((x - low) / (middle - low)) / 2;
  return 1 - SquareOf((high - x) / (high - middle)) / 2;
}
double CurveDown(double x, double low, double middle, double high) {
  if (x < low) return 1;
  if (x > high) return 0;
  if (low == high) return 0.5;
  if (x < middle) return 1 - SquareOf((x - low) / (middle - low)) / 2;
  return SquareOf((high - x) / (high - middle)) / 2;
}

bool IsComparison(const FuzzyTest& test, FuzzyComparison comparison) {
  return test.comparison == static_cast<double>(comparison);
}

double CrispMembership(const FuzzyTest& test, double x) {
  if (IsComparison(test, FuzzyComparison::kBetween)) return test.a <= x && x <= test.b ? 1 : 0;
  if (IsComparison(test, FuzzyComparison::kAtLeast)) return x >= test.a ? 1 : 0;
  if (IsComparison(test, FuzzyComparison::kAtMost)) return x <= test.a ? 1 : 0;
  if (IsComparison(test, FuzzyComparison::kOutside)) return x <= test.a || x >= test.b ? 1 : 0;
  return 0;
}

/// Combines the two sides of a test. @param up,down  of a value, around a bound.
template <typename Up, typename Down>
double SidesOf(const FuzzyTest& test, const Up& up, const Down& down) {
  if (IsComparison(test, FuzzyComparison::kBetween)) return std::min(up(test.a), down(test.b));
  if (IsComparison(test, FuzzyComparison::kAtLeast)) return up(test.a);
  if (IsComparison(test, FuzzyComparison::kAtMost)) return down(test.a);
  if (IsComparison(test, FuzzyComparison::kOutside)) return std::max(down(test.a), up(test.b));
  return 0;
}

/// Reads an index out of a table of numbers. False where it is none below `end`.
bool ReadIndex(const char* input, std::size_t row, unsigned column, float value, std::size_t end,
               unsigned& index) {
  const auto number = static_cast<double>(value);
  if (number >= 0 && number < static_cast<double>(end) && number == std::floor(number)) {
    index = static_cast<unsigned>(number);
    return true;
  }
  return Refuse(std::string(input) + ": row " + std::to_string(row) + ", column " +
                std::to_string(column) + ": " + FormatValue(value).ToUTF8() +
                " is no index below " + std::to_string(end));
}

/// True when a table has whole rows, one at least.
bool CheckRows(const char* input, const Array<float>& table, unsigned columns) {
  if (table.IsValid() && table.GetCount() != 0 && table.GetCount() % columns == 0) return true;
  return Refuse(std::string(input) + ": the numbers are no rows of " + std::to_string(columns));
}

constexpr unsigned kRuleColumns = 2;
constexpr unsigned kTestColumns = 10;

}  // namespace

double MembershipOf(const FuzzyTest& test, double value) {
  if (std::isnan(value)) return 0;
  if (test.membership == static_cast<double>(FuzzyMembership::kCrisp)) {
    return CrispMembership(test, value);
  }
  const double t = test.tolerance / 100;
  if (test.membership == static_cast<double>(FuzzyMembership::kLinear)) {
    return SidesOf(
        test, [&](double at) { return Rise(value, (1 - t) * at, (1 + t) * at); },
        [&](double at) { return Fall(value, (1 - t) * at, (1 + t) * at); });
  }
  if (test.membership == static_cast<double>(FuzzyMembership::kSCurve)) {
    return SidesOf(
        test, [&](double at) { return CurveUp(value, (1 - t) * at, at, (1 + t) * at); },
        [&](double at) { return CurveDown(value, (1 - t) * at, at, (1 + t) * at); });
  }
  return 0;
}

bool FuzzyRuleSet::Read(const Array<float>* classes, const Array<float>& ruleRows,
                        const Array<float>& testRows) {
  thresholds.clear();
  if (classes != nullptr) {
    if (!classes->IsValid() || classes->GetCount() == 0) {
      return Refuse("ClassDefinition: there is no class");
    }
    thresholds.assign(classes->begin(), classes->end());
  }
  if (!CheckRows("RuleDefinition", ruleRows, kRuleColumns)) return false;
  rules.assign(ruleRows.GetCount() / kRuleColumns, {});
  for (std::size_t row = 0; row < rules.size(); ++row) {
    const float* const at = ruleRows.GetData() + row * kRuleColumns;
    // Where no classes are scored a rule may feed any.
    const std::size_t end = classes != nullptr ? thresholds.size() : 1U << 24U;
    if (!ReadIndex("RuleDefinition", row, 0, at[0], end, rules[row].classIndex)) return false;
    rules[row].weight = static_cast<double>(at[1]);
  }
  if (!CheckRows("AttributeDefinition", testRows, kTestColumns)) return false;
  tests.assign(testRows.GetCount() / kTestColumns, {});
  for (std::size_t row = 0; row < tests.size(); ++row) {
    const float* const at = testRows.GetData() + row * kTestColumns;
    FuzzyTest& test = tests[row];
    constexpr std::size_t kAny = 1U << 24U;  // checked against the files later
    const auto read = [&](unsigned column, std::size_t end, unsigned& index) {
      return ReadIndex("AttributeDefinition", row, column, at[column], end, index);
    };
    if (!read(0, rules.size(), test.rule) || !read(1, kAny, test.attribute.file) ||
        !read(2, kAny, test.attribute.attribute) || !read(3, kAny, test.attribute.band)) {
      return false;
    }
    test.comparison = static_cast<double>(at[4]);
    test.a = static_cast<double>(at[5]);
    test.b = static_cast<double>(at[6]);
    test.weight = static_cast<double>(at[7]);
    test.membership = static_cast<double>(at[8]);
    test.tolerance = static_cast<double>(at[9]);
  }
  return true;
}

std::vector<AttributeChoice> FuzzyRuleSet::Choices() const {
  std::vector<AttributeChoice> choices;
  for (const FuzzyTest& test : tests) choices.push_back(test.attribute);
  return choices;
}

void FuzzyRuleSet::ScoreRules(const double* values, std::size_t stride, double* ruleScores) const {
  std::fill_n(ruleScores, rules.size(), 0.0);
  for (std::size_t i = 0; i < tests.size(); ++i) {
    ruleScores[tests[i].rule] += MembershipOf(tests[i], values[i * stride]) * tests[i].weight;
  }
}

void FuzzyRuleSet::ScoreClasses(const double* ruleScores, double* classScores) const {
  std::fill_n(classScores, thresholds.size(), 0.0);
  for (std::size_t i = 0; i < rules.size(); ++i) {
    classScores[rules[i].classIndex] += rules[i].weight * ruleScores[i];
  }
}

void FuzzyRuleSet::Normalize(double* classScores) const {
  double sum = 0;
  for (std::size_t i = 0; i < thresholds.size(); ++i) {
    classScores[i] = classScores[i] > thresholds[i] ? classScores[i] - thresholds[i] : 0;
    sum += classScores[i];
  }
  if (!(sum > 0)) return;
  for (std::size_t i = 0; i < thresholds.size(); ++i) classScores[i] /= sum;
}

}  // namespace lumo
