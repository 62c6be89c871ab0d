#include <algorithm>

#include <fmt/format.h>

#include "commands/division.h"
#include "foundation/fault.h"
#include "fx/attribute_csv.h"
#include "fx/tree_cut.h"
#include "fx/tree_labels_raster.h"
#include "fx/tree_scales.h"
#include "views/publish_raster.h"

namespace lumo {
namespace {

InputDeclaration TreeInput() {
  return {"Tree", Presence::kRequired, ValueKind::kText,
          "a file that the input Tree of FxTileSegmentMergeCommand made"};
}

std::vector<OutputDeclaration> LabelsOutputs() {
  std::vector<OutputDeclaration> outputs = PublishedOutputs();
  outputs.push_back({"Segments", ValueKind::kInteger, "how many there are"});
  outputs.push_back({"MergeValue", ValueKind::kNumber, "the cost up to which merges were done"});
  return outputs;
}

const CommandDeclaration kTreeLabels{
    "CreateTreeLabelsRasterCommand",
    "Feature extraction",
    "Shows the segments of a tree at any cost as a raster of labels, those of a segmentation with "
    "Seamless and this MergeValue. A command of this library's own.",
    {TreeInput(),
     {"MergeValue", Presence::kOptional, ValueKind::kNumber,
      "cost up to which segments are merged; none unless above 0, as when absent"},
     {"MergePercent", Presence::kOptional, ValueKind::kNumber,
      "percentage of all merges to do, in place of MergeValue"}},
    LabelsOutputs()};

class CreateTreeLabelsRasterCommand final : public PublishCommand {
  CommandResult Execute() override {
    if (!CheckInputs()) return Fail();
    const SegmentTreePtr tree = SegmentTree::Open(Read<String>("Tree").ToUTF8());
    if (!tree) return Fail();
    auto mergeValue = Read<double>("MergeValue");
    if (HasInput("MergePercent")) {
      const auto percent = Read<double>("MergePercent");
      if (HasInput("MergeValue")) return Fail("MergeValue and MergePercent exclude each other");
      if (!(percent >= 0 && percent <= 100)) return Fail("MergePercent: 0 to 100 percent");
      if (!FindMergeValue(*tree, percent, mergeValue)) return Fail();
    }
    TreeCut cut;
    if (!CutTree(*tree, mergeValue, cut)) return Fail();
    Write("Segments", cut.count);
    Write("MergeValue", mergeValue);
    return Publish(BasicRasterPtr(new TreeLabelsRaster(tree, std::move(cut))));
  }
};

const CommandFactoryT<CreateTreeLabelsRasterCommand> labelsFactory(kTreeLabels);

const CommandDeclaration kTreeLevels{
    "CreateTreeLevelsTableCommand",
    "Feature extraction",
    "Makes a table of the segments of a tree at several costs, with the segment of the next cost "
    "that each lies in. A command of this library's own.",
    {TreeInput(),
     {"MergeValues", Presence::kRequired, ValueKind::kNumberArray,
      "costs up to which segments are merged, in ascending order"},
     {"Table", Presence::kRequired, ValueKind::kText,
      "the file of text to make: level from 1 on, cost, segment, its pixels, and the segment of "
      "the next level that it lies in, with commas between"}},
    {{"Segments", ValueKind::kIntegerArray, "how many there are of each level"}}};

class CreateTreeLevelsTableCommand final : public Command {
  CommandResult Execute() override {
    if (!CheckInputs()) return Fail();
    const auto given = Read<Array<double>>("MergeValues");
    const std::vector<double> values(given.begin(), given.end());
    if (values.empty() || !std::is_sorted(values.begin(), values.end())) {
      return Fail("MergeValues: costs in ascending order, one at least");
    }
    const SegmentTreePtr tree = SegmentTree::Open(Read<String>("Tree").ToUTF8());
    TreeBasins basins;
    std::vector<TreeCut> cuts;
    if (!tree || !tree->ReadBasins(basins) || !CutTree(*tree, values, cuts)) return Fail();
    AttributeCsv table;
    if (!table.Begin(Read<String>("Table").ToUTF8(),
                     {"level", "mergeValue", "segment", "pixels", "parent"})) {
      return Fail();
    }
    Array<unsigned> counts{ArrayDims(static_cast<unsigned>(cuts.size()))};
    for (std::size_t level = 0; level < cuts.size(); ++level) {
      counts[static_cast<unsigned>(level)] = cuts[level].count;
      const TreeCut* const upper = level + 1 < cuts.size() ? &cuts[level + 1] : nullptr;
      const std::string begin = fmt::format("{},{}", level + 1, values[level]);
      if (IsAborted() || !WriteLevel(begin, cuts[level], upper, basins, table)) return Fail();
    }
    if (!table.Close()) return Fail();
    Write("Segments", counts);
    return Succeed();
  }

  bool IsAborted() const { return GetIPC().abort->IsSet(); }

  static bool WriteLevel(const std::string& begin, const TreeCut& cut, const TreeCut* upper,
                         const TreeBasins& basins, AttributeCsv& table) {
    const std::vector<std::uint64_t> pixels = PixelsOf(cut, basins);
    std::vector<std::uint32_t> parents;
    if (upper != nullptr) parents = ParentsOf(cut, *upper);
    for (std::uint32_t i = 0; i < cut.count; ++i) {
      const std::string parent = upper != nullptr ? fmt::format("{}", parents[i]) : std::string();
      const std::string line = fmt::format("{},{},{},{}", begin, i + 1, pixels[i], parent);
      if (!table.WriteLine(line)) return false;
    }
    return true;
  }
};

const CommandFactoryT<CreateTreeLevelsTableCommand> levelsFactory(kTreeLevels);
const DivisionRegistration levelsDivision({.command = "CreateTreeLevelsTableCommand",
                                           .makes = {"Table"}});

const CommandDeclaration kSuggest{
    "SuggestSegmentScalesCommand",
    "Feature extraction",
    "Finds costs at which segments of a tree are likely to be whole objects: peaks of the rate at "
    "which the local variance changes with scale (Dragut, Tiede and Levick 2010). A command of "
    "this "
    "library's own.",
    {TreeInput(),
     {"LeastProminence", Presence::kOptional, ValueKind::kNumber,
      "peaks are left out whose prominence is a smaller share of the highest, 0 to 1; 0.1 when "
      "absent"}},
    {{"MergeValues", ValueKind::kNumberArray, "costs of the levels, a quarter of an octave apart"},
     {"Segments", ValueKind::kNumberArray, "how many there are at each level"},
     {"LocalVariance", ValueKind::kNumberArray,
      "mean over the segments of each level of the standard deviation of their values"},
     {"Rates", ValueKind::kNumberArray, "its change from the level before, in percent"},
     {"Peaks", ValueKind::kNumberArray,
      "costs at the peaks of the rates, the most prominent first"},
     {"Onsets", ValueKind::kNumberArray,
      "for each peak the cost of the lowest rate in front of it, at which its objects are whole "
      "yet"},
     {"Prominences", ValueKind::kNumberArray,
      "how far the rate falls on both sides of each peak, in percent"}}};

class SuggestSegmentScalesCommand final : public Command {
  CommandResult Execute() override {
    if (!CheckInputs()) return Fail();
    constexpr double kLeast = 0.1;
    const double least = HasInput("LeastProminence") ? Read<double>("LeastProminence") : kLeast;
    if (!(least >= 0 && least <= 1)) return Fail("LeastProminence: 0 to 1");
    const SegmentTreePtr tree = SegmentTree::Open(Read<String>("Tree").ToUTF8());
    std::vector<ScaleLevel> levels;
    if (!tree || !FindScales(*tree, levels)) return Fail();
    WriteAll("MergeValues", levels, [](const ScaleLevel& l) { return l.mergeValue; });
    WriteAll("Segments", levels, [](const auto& l) { return static_cast<double>(l.segments); });
    WriteAll("LocalVariance", levels, [](const ScaleLevel& l) { return l.localVariance; });
    WriteAll("Rates", levels, [](const ScaleLevel& l) { return l.rate; });
    const std::vector<ScaleLevel> peaks = PeaksOf(levels, least);
    WriteAll("Peaks", peaks, [](const ScaleLevel& l) { return l.mergeValue; });
    WriteAll("Onsets", peaks, [](const ScaleLevel& l) { return l.onset; });
    WriteAll("Prominences", peaks, [](const ScaleLevel& l) { return l.prominence; });
    return Succeed();
  }

  template <typename Number>
  void WriteAll(const char* name, const std::vector<ScaleLevel>& levels, const Number& number) {
    Array<double> numbers{ArrayDims(static_cast<unsigned>(levels.size()))};
    std::transform(levels.begin(), levels.end(), numbers.begin(), number);
    Write(name, numbers);
  }
};

const CommandFactoryT<SuggestSegmentScalesCommand> suggestFactory(kSuggest);

}  // namespace
}  // namespace lumo
