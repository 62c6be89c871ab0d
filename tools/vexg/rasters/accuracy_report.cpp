#include "rasters/accuracy_report.h"

#include <algorithm>
#include <limits>

#include <fmt/format.h>

#include "foundation/near_name.h"
#include "options/option_values.h"

namespace lumo::host {
namespace {

/// A number, or what can't be written as one.
double NumberOf(const Json& json) {
  return json.is_null() ? std::numeric_limits<double>::quiet_NaN() : json.get<double>();
}

void TakeShare(const Json& json, Array<double>& shares, unsigned at) {
  unsigned place = at * 3;
  for (const char* const name : {"share", "low", "high"}) {
    shares[place++] = NumberOf(json.at(name));
  }
}

}  // namespace

JobWriterCommand& AddComparison(JobDraft& draft, const String& map, const SampleSet& samples) {
  JobWriterCommand& compare = draft.Step(kCompareStep, "AccuracyCommand");
  compare.AddVariableInput("MapURI", map);
  AddSamples(compare, samples);
  return compare;
}

AccuracyReport::AccuracyReport(const Map<String, String>& returns) {
  for (const String& name : ParseValue<Array<String>>(returns.Find("Classes"))) {
    classes_.push_back(name.ToUTF8());
  }
  matrix_ = ParseValue<Array<unsigned>>(returns.Find("Matrix"));
  overall_ = ParseValue<Array<double>>(returns.Find("Overall"));
  producer_ = ParseValue<Array<double>>(returns.Find("Producer"));
  user_ = ParseValue<Array<double>>(returns.Find("User"));
  f1_ = ParseValue<Array<double>>(returns.Find("F1"));
  kappa_ = ParseValue<double>(returns.Find("Kappa"));
  outside_ = ParseValue<unsigned>(returns.Find("Outside"));
  noClass_ = ParseValue<unsigned>(returns.Find("NoClass"));
}

AccuracyReport::AccuracyReport(const Json& json)
    : kappa_(NumberOf(json.at("kappa"))),
      outside_(json.at("outside").get<unsigned>()),
      noClass_(json.at("noClass").get<unsigned>()) {
  const auto count = static_cast<unsigned>(json.at("classes").size());
  matrix_.Resize(ArrayDims(count, count));
  overall_.Resize(ArrayDims(1, 3));
  for (Array<double>* const shares : {&producer_, &user_}) shares->Resize(ArrayDims(count, 3));
  f1_.Resize(ArrayDims(count));
  TakeShare(json.at("overall"), overall_, 0);
  for (unsigned i = 0; i < count; ++i) {
    const Json& one = json.at("classes").at(i);
    classes_.push_back(one.at("class").get<std::string>());
    TakeShare(one.at("producer"), producer_, i);
    TakeShare(one.at("user"), user_, i);
    f1_[i] = NumberOf(one.at("f1"));
    for (unsigned j = 0; j < count; ++j) {
      matrix_[i * count + j] = json.at("matrix").at(i).at(j).get<unsigned>();
    }
  }
}

Json AccuracyReport::ShareAsJson(const Array<double>& shares, std::size_t at) {
  return {{"share", NumberAsJson(shares[at * 3])},
          {"low", NumberAsJson(shares[at * 3 + 1])},
          {"high", NumberAsJson(shares[at * 3 + 2])}};
}

Json AccuracyReport::AsJson() const {
  Json list = Json::array(), rows = Json::array();
  for (std::size_t i = 0; i < classes_.size(); ++i) {
    list.push_back({{"class", classes_[i]},
                    {"producer", ShareAsJson(producer_, i)},
                    {"user", ShareAsJson(user_, i)},
                    {"f1", NumberAsJson(f1_[i])}});
    Json row = Json::array();
    for (std::size_t j = 0; j < classes_.size(); ++j)
      row.push_back(matrix_[i * classes_.size() + j]);
    rows.push_back(row);
  }
  return {{"overall", ShareAsJson(overall_, 0)},
          {"kappa", NumberAsJson(kappa_)},
          {"classes", list},
          {"matrix", rows},
          {"outside", outside_},
          {"noClass", noClass_}};
}

std::string AccuracyReport::Percent(const Array<double>& shares, std::size_t at) {
  return fmt::format("{:5.1f} ({:.1f} to {:.1f})", 100 * shares[at * 3], 100 * shares[at * 3 + 1],
                     100 * shares[at * 3 + 2]);
}

std::string AccuracyReport::AsText() const {
  std::size_t widest = 5;
  for (const std::string& name : classes_) widest = std::max(widest, Printable(name).size());
  std::string text = fmt::format("{:<{}}", "known", widest);
  for (std::size_t j = 0; j < classes_.size(); ++j) text += fmt::format(" {:>6}", j + 1);
  text += fmt::format("  {:<22} {:<22} {}\n", "producer's %", "user's %", "F1");
  for (std::size_t i = 0; i < classes_.size(); ++i) {
    text += fmt::format("{:<{}}", Printable(classes_[i]), widest);
    for (std::size_t j = 0; j < classes_.size(); ++j) {
      text += fmt::format(" {:>6}", matrix_[i * classes_.size() + j]);
    }
    text +=
        fmt::format("  {:<22} {:<22} {:.3f}\n", Percent(producer_, i), Percent(user_, i), f1_[i]);
  }
  text += fmt::format("\noverall {} %, kappa {:.3f}\n", Percent(overall_, 0), kappa_);
  if (outside_ != 0) text += fmt::format("{} samples are on no pixel that counts\n", outside_);
  if (noClass_ != 0) text += fmt::format("{} samples are on pixels of no class\n", noClass_);
  return text;
}

}  // namespace lumo::host
