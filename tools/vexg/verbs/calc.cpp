#include <algorithm>
#include <limits>

#include <fmt/format.h>

#include "options/option_values.h"
#include "raster/pixel_types.h"
#include "rasters/raster_verb.h"
#include "views/expression.h"

namespace lumo::host {
namespace {

/// A raster behind the first one, and the letter in front of its bands.
struct Further {
  std::string letter;
  std::string file{};
  unsigned dataType = 0;
};

/// A role that a band may have for indices.
struct Role {
  std::string name;
  std::string meaning;
  std::string band{};
};

class CalcVerb final : public RasterVerb {
 public:
  explicit CalcVerb(OptionSet& line) {
    AddOutputTo(line, "The raster of results");
    line.Add(
            "expression", expressions_,
            "What each pixel is computed from; several with ; between them make several bands, and "
            "NAME=EXPRESSION gives a band a name")
        .Shows("EXPRESSION")
        .Required();
    GetSource().AddTo(line);
    for (Further& further : further_) {
      line.Add(fmt::format("--{}", further.letter).c_str(), further.file,
               fmt::format("A further raster of the same size, with bands {0}_b0, {0}_b1, ...",
                           further.letter))
          .IsFile();
    }
    for (Role& role : roles_) {
      line.Add(fmt::format("--{}", role.name).c_str(), role.band,
               fmt::format("The {} band, for indices: its number, from 0, or its name",
                           role.meaning))
          .Shows("BAND");
    }
    line.Add("--type", type_, "Pixel type of the result; results for integers are rounded")
        .Takes(EightTypeName())
        .ShowsDefault();
    AddAreaTo(line);
    line.AddNote(
        "Bands are b0, b1, ... Operators are + - * / ^, comparisons, && || !; functions abs, acos, "
        "asin, atan, atan2, ceil, cos, exp, floor, log, log10, log2, max, min, pow, round, sin, "
        "sqrt, tan and where(condition, then, else). Indices are ndvi, ndwi, evi and savi, of the "
        "bands of --red, --nir, --green and --blue, or with bands in parentheses.");
    line.AddNote(
        "A pixel is not valid where a band that its expression uses is not, and where the result "
        "is "
        "no finite number or does not fit into --type.");
    line.AddExample("vexg calc ratio.tif \"(b3 - b2) / (b3 + b2)\" scene.tif");
    line.AddExample(
        "vexg calc indices.tif \"NDVI=ndvi; NDWI=ndwi\" scene.tif --green 1 --red 2 --nir 3");
    line.AddExample(
        "vexg calc change.tif \"where(abs(b0 - a_b0) > 20, 1, 0)\" now.tif --a then.tif "
        "--type Byte");
  }

 private:
  void CheckOptions() override {
    std::erase_if(further_, [](const Further& further) { return further.file.empty(); });
    std::erase_if(roles_, [](const Role& role) { return role.band.empty(); });
    for (Role& role : roles_) {
      const bool isNumber = role.band.find_first_not_of("0123456789") == std::string::npos;
      if (isNumber) role.band = fmt::format("b{}", role.band);
    }
    if (GetArea().HasMaskBand() && !further_.empty()) {
      throw HostError(
          kExitUsage,
          fmt::format("--mask-band goes with one raster; with --{} a mask is part of the "
                      "expression, as in where({}_b0 == 0, nan, b0)",
                      further_.front().letter, further_.front().letter));
    }
    RasterVerb::CheckOptions();
  }

  std::vector<std::string> GetFurtherInputs() const override {
    std::vector<std::string> files;
    for (const Further& further : further_) files.push_back(further.file);
    return files;
  }

  /// Opens all, and computes nothing yet: faults of the expressions are found before anything is
  /// made.
  void AddQuestions(JobDraft& draft) const override {
    std::string rasters = "$source";
    for (const Further& further : further_) {
      AddOpen(draft, further.letter, {further.file, {}});
      rasters.append(" $").append(further.letter);
    }
    AddExpression(draft, rasters);
  }

  RasterInfo PlanRaster(JobSession& /*session*/, const JobResults& opened,
                        const RasterInfo& source) override {
    for (Further& further : further_) {
      further.dataType =
          ParseDataType(opened.Find(String(further.letter)).returns.Find("DataType"));
    }
    RasterInfo planned = source;
    planned.bands = bands_ = CountExpressions(expressions_);
    planned.dataType = ParseDataType(String(type_));
    return planned;
  }

  void AddViews(RasterChain& chain) const override {
    std::string rasters = chain.GetTop().ToUTF8();
    for (const Further& further : further_) {
      AddOpen(chain.GetDraft(), further.letter, {further.file, {}});
      chain.Take(further.letter);
      GetArea().AddViewsOfFurther(chain, further.letter, further.dataType);
      rasters.append(" ").append(chain.GetTop().ToUTF8());
    }
    AddExpression(chain.GetDraft(), rasters);
    chain.Take("calc");
  }

  /// Adds the command that makes the result of rasters, into the variable "$calc".
  /// @param rasters  variables, with blanks between them.
  void AddExpression(JobDraft& draft, const std::string& rasters) const {
    JobWriterCommand& calc = draft.Open("calc", "CreateExpressionRasterCommand");
    calc.AddExpandedInput("SrcURI", String(rasters));
    calc.AddInput("Expressions", String(expressions_));
    calc.AddInput("DataType", String(type_));
    const auto addList = [&](const char* input, const auto& all, const auto& textOf) {
      if (all.empty()) return;
      Array<String> texts{ArrayDims(static_cast<unsigned>(all.size()))};
      std::transform(all.begin(), all.end(), texts.begin(), textOf);
      calc.AddInput(input, texts);
    };
    addList("Names", further_, [](const Further& further) { return String(further.letter); });
    addList("Roles", roles_,
            [](const Role& role) { return String(fmt::format("{}={}", role.name, role.band)); });
  }

  bool IsReal() const {
    const unsigned type = ParseDataType(String(type_));
    return type == kDataTypeOf<float> || type == kDataTypeOf<double>;
  }

  /// NaN for a floating-point type, which no result can be.
  FillValues GetNoData(const FillValues& chosen) const override {
    if (!IsReal()) return chosen;
    return FillValues(bands_, std::numeric_limits<double>::quiet_NaN());
  }

  bool FillsNoData(const FillValues& noData) const override {
    return IsReal() || RasterVerb::FillsNoData(noData);
  }

  /// No results that are pixels with data are NaN: of floating-point types nothing need be counted.
  RasterContents ReadWanted(const JobResults& results) const override {
    if (!IsReal()) return RasterVerb::ReadWanted(results);
    return ReadContents(results, kShown);
  }

  void Compare(MadeRaster& raster, Losses& losses) const override {
    raster.isFilled = raster.isFilled || IsReal();
    CompareKept(raster, losses);
  }

  std::string expressions_;
  std::vector<Further> further_{{"a"}, {"b"}, {"c"}, {"d"}, {"e"}, {"f"}, {"g"}, {"h"}};
  std::vector<Role> roles_{
      {"red", "red"}, {"nir", "near infrared"}, {"green", "green"}, {"blue", "blue"}};
  std::string type_ = "Single";
  unsigned bands_ = 0;
};

const VerbRegistration calcRegistration("calc", "Computes a raster from the bands of others",
                                        &SetUp<CalcVerb>);

}  // namespace
}  // namespace lumo::host
