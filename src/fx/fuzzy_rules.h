#pragma once

#include <vector>

#include "fx/chosen_attributes.h"

namespace lumo {

/// Compares the value of an attribute with one or two others.
enum class FuzzyComparison : unsigned char {
  kBetween = 0,
  kAtLeast = 1,
  kAtMost = 2,
  kOutside = 3
};

/// The shape in which membership goes from 0 to 1 around a value.
enum class FuzzyMembership : unsigned char { kCrisp = 0, kLinear = 1, kSCurve = 2 };

/// A test of an attribute, which feeds a rule.
struct FuzzyTest {
  unsigned rule = 0;
  AttributeChoice attribute;
  double comparison = 0;  ///< a FuzzyComparison; others give 0
  double a = 0;           ///< compared with
  double b = 0;           ///< compared with too, of kBetween and kOutside
  double weight = 0;      ///< of the test in its rule
  double membership = 0;  ///< a FuzzyMembership; others are crisp, and give 0
  double tolerance = 0;   ///< percent of a and b, within which membership goes from 0 to 1
};

/// A rule, which feeds a class.
struct FuzzyRule {
  unsigned classIndex = 0;
  double weight = 0;  ///< in its class
};

/// Gives how well a value passes a test, 0 to 1: a step, a ramp or an S-curve (Zadeh, Calculus of
/// fuzzy restrictions, 1975) from (1 - t) a to (1 + t) a, and likewise of b, where t is the
/// tolerance. Where that is a point the value is 1/2 there. A value that is not a number gives 0.
VEXG_EXPORT double MembershipOf(const FuzzyTest& test, double value);

/// Scores regions by rules: the score of a rule is the sum of the memberships of its tests by their
/// weights, that of a class the sum of the scores of its rules by theirs. Threads: any may score.
struct VEXG_EXPORT FuzzyRuleSet {
  std::vector<double> thresholds;  ///< of the classes
  std::vector<FuzzyRule> rules;
  std::vector<FuzzyTest> tests;

  std::size_t ClassCount() const { return thresholds.size(); }

  /// Reads definitions as job documents have them: a number for each class, rows of 2 for rules and
  /// of 10 for tests. `classes` may be null, where only rules are scored. False, with the fault
  /// set, which names the row and column of what is wrong.
  bool Read(const Array<float>* classes, const Array<float>& ruleRows,
            const Array<float>& testRows);
  /// The attributes of the tests, by their rows.
  std::vector<AttributeChoice> Choices() const;

  /// @param values      of the tests' attributes, `stride` apart.
  /// @param ruleScores  [out] one for each rule.
  void ScoreRules(const double* values, std::size_t stride, double* ruleScores) const;
  /// @param classScores  [out] one for each class.
  void ScoreClasses(const double* ruleScores, double* classScores) const;
  /// Takes the threshold off each score, 0 for those that are not above it, and divides them by
  /// their sum unless that is 0.
  void Normalize(double* classScores) const;
};

}  // namespace lumo
