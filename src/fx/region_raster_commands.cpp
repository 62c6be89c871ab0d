#include "foundation/fault.h"
#include "fx/attribute_inputs.h"
#include "fx/class_scores.h"
#include "fx/region_rasters.h"

namespace lumo {
namespace {

InputDeclaration LabelsInput() {
  return {"LabelURI", Presence::kRequired, ValueKind::kURI, "the labels, of type Int32"};
}

InputDeclaration OutputInput(const char* help) {
  return {"OutURI", Presence::kRequired, ValueKind::kURI, help};
}

InputDeclaration RulesInput() {
  return {"RuleDefinition", Presence::kRequired, ValueKind::kNumberArray,
          "rows of 2: the class that a rule feeds, and its weight there"};
}

InputDeclaration TestsInput() {
  return {"AttributeDefinition", Presence::kRequired, ValueKind::kNumberArray,
          "rows of 10, see FxComputeFuzzyClassificationCommand"};
}

/// Helps the commands that paint.
class PaintCommand : public RegionCommand {
 protected:
  /// The raster that is painted: of type T and the labels' size, with so many bands at least.
  template <typename T>
  RasterPtr<T> FindOutput(const BasicRaster& labels, unsigned bands) const {
    const BasicRasterPtr output = FindRaster("OutURI");
    if (!output) return {};
    const bool fits = output->Samples() == labels.Samples() && output->Lines() == labels.Lines();
    if (output->DataType() != kDataTypeOf<T>) {
      SetFault(String("OutURI: the raster is not of type ") + DataTypeName(kDataTypeOf<T>));
    } else if (!fits) {
      SetFault("OutURI: the raster has another size than the labels");
    } else if (output->Bands() < bands) {
      SetFault(String("OutURI: the raster has " + std::to_string(output->Bands()) + " bands, not " +
                      std::to_string(bands)));
    } else if (!output->CanWrite()) {
      SetFault("OutURI: the raster can't be written");
    } else {
      return RasterPtr<T>(output);
    }
    return {};
  }

  /// Runs the process that is made from `args`, and ends the command.
  template <typename Process, typename... Args>
  CommandResult Paint(const Args&... args) {
    Process process(args..., GetIPC());
    return HasRun(process) ? Succeed() : Fail(TakeFaultOr("the raster could not be painted"));
  }
};

const CommandDeclaration kAttributes{
    "FxCreateRegionAttributesRasterCommand",
    "Feature extraction",
    "Paints attributes of regions into a raster.",
    {LabelsInput(),
     AttributesInput(),
     {"SelectedAttributes", Presence::kRequired, ValueKind::kIntegerArray,
      "rows of file, attribute and band, one for each band of the raster"},
     OutputInput("the raster to write, of type Single; label 0 becomes 0")},
    {}};

class FxCreateRegionAttributesRasterCommand final : public PaintCommand {
  CommandResult Execute() override {
    if (!CheckInputs()) return Fail();
    const BasicRasterPtr labels = FindLabels(nullptr, false);
    ChosenAttributes columns;
    if (!labels || !columns.Open(Read<Array<String>>("AttributesFXA"))) return Fail();
    const auto rows = Read<Array<unsigned>>("SelectedAttributes");
    std::vector<AttributeChoice> choices;
    for (unsigned i = 0; i + 2 < rows.GetCount(); i += 3) {
      choices.push_back({rows[i], rows[i + 1], rows[i + 2]});
    }
    if (choices.empty()) return Fail("SelectedAttributes: there is no row");
    if (!columns.Choose(std::move(choices), "SelectedAttributes")) return Fail();
    const auto output = FindOutput<float>(*labels, columns.Count());
    if (!output) return Fail();
    return Paint<CreateRegionAttributesRasterProcess>(RasterPtr<std::int32_t>(labels), columns,
                                                      output);
  }
};

const CommandFactoryT<FxCreateRegionAttributesRasterCommand> attributesFactory(kAttributes);

/// Reads what both commands of scores have: labels, files and definitions.
class ScorePaintCommand : public PaintCommand {
 protected:
  bool ReadAll(bool withClasses) {
    labels_ = FindLabels(nullptr, false);
    if (!labels_) return false;
    Array<float> classes;
    if (withClasses) classes = Read<Array<float>>("ClassDefinition");
    return columns_.Open(Read<Array<String>>("AttributesFXA")) &&
           rules_.Read(withClasses ? &classes : nullptr, Read<Array<float>>("RuleDefinition"),
                       Read<Array<float>>("AttributeDefinition")) &&
           columns_.Choose(rules_.Choices(), "AttributeDefinition");
  }

  template <typename Process>
  CommandResult PaintScores(std::size_t bands) {
    const auto output = FindOutput<float>(*labels_, static_cast<unsigned>(bands));
    if (!output) return Fail();
    return Paint<Process>(RasterPtr<std::int32_t>(labels_), columns_, rules_, output);
  }

  BasicRasterPtr labels_;
  ChosenAttributes columns_;
  FuzzyRuleSet rules_;
};

const CommandDeclaration kRuleScores{
    "FxCreateRegionRuleScoresRasterCommand",
    "Feature extraction",
    "Paints the scores of rules into a raster.",
    {LabelsInput(), RulesInput(), AttributesInput(), TestsInput(),
     OutputInput("the raster to write, of type Single, with a band for each rule")},
    {}};

class FxCreateRegionRuleScoresRasterCommand final : public ScorePaintCommand {
  CommandResult Execute() override {
    if (!CheckInputs() || !ReadAll(false)) return Fail();
    return PaintScores<CreateRegionRuleScoresRasterProcess>(rules_.rules.size());
  }
};

const CommandFactoryT<FxCreateRegionRuleScoresRasterCommand> ruleScoresFactory(kRuleScores);

const CommandDeclaration kClassScores{
    "FxCreateRegionClassScoresRasterCommand",
    "Feature extraction",
    "Paints the scores of classes into a raster, as rules give them.",
    {LabelsInput(),
     {"ClassDefinition", Presence::kRequired, ValueKind::kNumberArray,
      "the threshold of each class"},
     RulesInput(),
     AttributesInput(),
     TestsInput(),
     OutputInput("the raster to write, of type Single, with a band for each class")},
    {}};

class FxCreateRegionClassScoresRasterCommand final : public ScorePaintCommand {
  CommandResult Execute() override {
    if (!CheckInputs() || !ReadAll(true)) return Fail();
    return PaintScores<CreateRegionClassScoresRasterProcess>(rules_.ClassCount());
  }
};

const CommandFactoryT<FxCreateRegionClassScoresRasterCommand> classScoresFactory(kClassScores);

const CommandDeclaration kClassification{
    "FxCreateRegionClassificationRasterCommand",
    "Feature extraction",
    "Paints the class of the best score of each region into a raster.",
    {LabelsInput(),
     {"ClassFXC", Presence::kRequired, ValueKind::kText, "the file of scores"},
     OutputInput("the raster to write, of type Byte: the index of the class and 1, 0 for none, and "
                 "the number of classes and 1 for label 0")},
    {}};

class FxCreateRegionClassificationRasterCommand final : public PaintCommand {
  CommandResult Execute() override {
    URI uri;
    if (!CheckInputs()) return Fail();
    const BasicRasterPtr labels = FindLabels(nullptr, false);
    if (!labels || !TakeExisting("ClassFXC", uri)) return Fail();
    const Pointer<RegionClassificationProbabilityFile> scores(
        new RegionClassificationProbabilityFile(uri, false));
    if (!scores->IsValid()) {
      return Fail(String("ClassFXC: " + uri.ToUTF8() + " is no file of scores"));
    }
    const auto output = FindOutput<unsigned char>(*labels, 1);
    if (!output) return Fail();
    return Paint<RasterClassifyProcess>(RasterPtr<std::int32_t>(labels), scores, output);
  }
};

const CommandFactoryT<FxCreateRegionClassificationRasterCommand> classificationFactory(
    kClassification);

}  // namespace
}  // namespace lumo
