#include "rasters/rule_file.h"

#include <algorithm>
#include <cmath>

#include "foundation/near_name.h"
#include "verb.h"

namespace lumo::host {
namespace {

constexpr const char* kComparisons[] = {"between", "atLeast", "atMost", "outside"};
constexpr const char* kMemberships[] = {"crisp", "linear", "sCurve"};

/// Adds the row of a test.
void AddTest(const JsonField& test, unsigned rule, const AttributePlaces& places,
             std::vector<float>& row) {
  test.Allow({"attribute", "between", "atLeast", "atMost", "outside", "membership", "tolerance",
              "weight"});
  const JsonField attribute = test.Get("attribute");
  const AttributePlaces::Place place = places.Find(attribute.Text(), attribute.Where());
  const char* const* const comparison =
      std::find_if(std::begin(kComparisons), std::end(kComparisons),
                   [&](const char* name) { return test.Has(name); });
  if (comparison == std::end(kComparisons)) {
    test.Refuse("one of \"between\", \"atLeast\", \"atMost\" and \"outside\" is missing");
  }
  const auto number = comparison - kComparisons;
  const JsonField bound = test.Get(*comparison);
  double a = 0, b = 0;
  if (number == 0 || number == 3) {
    const std::vector<JsonField> both = bound.List();
    if (both.size() != 2) bound.Refuse("two numbers are expected");
    a = both[0].Number();
    b = both[1].Number();
  } else {
    a = bound.Number();
  }
  const std::string membership = test.TextOr("membership", kMemberships[0]);
  const auto* const kind = std::find(std::begin(kMemberships), std::end(kMemberships), membership);
  if (kind == std::end(kMemberships)) {
    test.Get("membership").Refuse("it is crisp, linear or sCurve");
  }
  for (const double value : {double(rule), double(place.file), double(place.attribute),
                             double(place.band), double(number), a, b, test.NumberOr("weight", 1),
                             double(kind - kMemberships), test.NumberOr("tolerance", 0)}) {
    row.push_back(static_cast<float>(value));
  }
}

Array<float> ArrayOfRows(const std::vector<float>& numbers, unsigned columns) {
  Array<float> rows{ArrayDims(static_cast<unsigned>(numbers.size()) / columns, columns)};
  std::copy(numbers.begin(), numbers.end(), rows.begin());
  return rows;
}

}  // namespace

void AttributePlaces::AddFile(const std::vector<std::string>& columns, unsigned attributes) {
  for (unsigned i = 0; i < columns.size(); ++i) {
    if (columns[i].empty()) continue;
    entries_.push_back({columns[i], {files_, i % attributes, i / attributes}});
  }
  ++files_;
}

AttributePlaces::Place AttributePlaces::Find(const std::string& name,
                                             const std::string& where) const {
  std::vector<std::string> names;
  for (const Entry& entry : entries_) {
    if (entry.name == name) return entry.place;
    names.push_back(entry.name);
  }
  throw HostError(kExitUsage, where + ": there is no attribute \"" + Printable(name) + "\"" +
                                  DidYouMean(name, names));
}

std::vector<AttributePlaces::Place> AttributePlaces::All() const {
  std::vector<Place> all;
  for (const Entry& entry : entries_) {
    if (entry.name.find("count_b") == std::string::npos) all.push_back(entry.place);
  }
  return all;
}

RuleFile ReadRules(const JsonField& root, const AttributePlaces& places) {
  root.Allow({"$schema", "classes", "rules"});
  RuleFile rules;
  std::vector<float> classRows, ruleRows, testRows;
  for (const JsonField& field : root.Get("classes").List()) {
    field.Allow({"name", "color", "threshold"});
    const auto index = static_cast<unsigned>(rules.classes.size());
    rules.classes.push_back(
        {field.Get("name").Text(),
         field.Has("color") ? field.Get("color").AsColor() : ColorOfClass(index),
         field.NumberOr("threshold", 0)});
    classRows.push_back(static_cast<float>(rules.classes.back().threshold));
  }
  unsigned number = 0;
  for (const JsonField& field : root.Get("rules").List()) {
    field.Allow({"class", "weight", "tests"});
    const std::string name = field.Get("class").Text();
    const auto found = std::find_if(rules.classes.begin(), rules.classes.end(),
                                    [&](const NamedClass& known) { return known.name == name; });
    if (found == rules.classes.end())
      field.Get("class").Refuse("there is no class \"" + name + "\"");
    ruleRows.push_back(static_cast<float>(found - rules.classes.begin()));
    ruleRows.push_back(static_cast<float>(field.NumberOr("weight", 1)));
    for (const JsonField& test : field.Get("tests").List()) AddTest(test, number, places, testRows);
    ++number;
  }
  rules.classRows = ArrayOfRows(classRows, 1);
  rules.ruleRows = ArrayOfRows(ruleRows, 2);
  rules.testRows = ArrayOfRows(testRows, 10);
  return rules;
}

Color ColorOfClass(unsigned index) {
  // Hues a golden angle apart, so that neighbours in the list differ.
  const double hue = std::fmod(index * 137.50776405, 360.0) / 60;
  const double value = index % 2 == 0 ? 0.9 : 0.7, low = value * 0.3;
  const auto channel = [&](double shift) {
    const double k = std::fmod(shift + hue, 6.0);
    const double share = std::clamp(std::min(k, 4 - k), 0.0, 1.0);
    return static_cast<std::uint8_t>(std::lround(255 * (value - (value - low) * share)));
  };
  return {String("class"), channel(5), channel(3), channel(1)};
}

}  // namespace lumo::host
