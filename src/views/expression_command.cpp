#include "foundation/fault.h"
#include "foundation/text_case.h"
#include "views/expression_raster.h"
#include "views/publish_raster.h"

namespace lumo {
namespace {

const CommandDeclaration kExpression{
    "CreateExpressionRasterCommand",
    "Views",
    "Shows what expressions make of the bands of rasters as a raster, a band for each expression. "
    "A "
    "command of this library's own.",
    {{"SrcURI", Presence::kRequired, ValueKind::kURIArray,
      "the rasters, of one size; the bands of the first are b0, b1 and so on"},
     {"Expressions", Presence::kRequired, ValueKind::kText,
      "one for each band, with ; between them, as NAME=EXPRESSION where the band gets a name: "
      "NDVI=(b3 - b2) / (b3 + b2)"},
     {"Names", Presence::kOptional, ValueKind::kTextList,
      "of the rasters behind the first, whose bands are NAME_b0 and so on; a, b, c and so on when "
      "absent"},
     {"Roles", Presence::kOptional, ValueKind::kTextList,
      "further names of bands, as ROLE=BAND, such as nir=b3; indices take nir, red, green and "
      "blue"},
     {"DataType", Presence::kOptional, ValueKind::kWord,
      "pixel type; Single when absent. Results for integers are rounded, and what does not fit is "
      "not valid",
      "", &EightTypeWords}},
    CombinedOutputs()};

class CreateExpressionRasterCommand final : public CombineCommand {
  CommandResult Execute() override {
    if (!CheckInputs()) return Fail();
    const std::vector<BasicRasterPtr> rasters = FindRasters("SrcURI");
    if (rasters.empty()) return Fail();
    const std::optional<BandNames> names = NameBands(rasters);
    if (!names) return Fail();
    const std::vector<NamedExpression> expressions =
        ParseExpressions(Read<String>("Expressions").ToUTF8(), *names);
    if (expressions.empty()) return Fail();
    const unsigned dataType =
        HasInput("DataType") ? ParseDataType(Read<String>("DataType")) : kDataTypeOf<float>;
    BasicRasterPtr view;
    const bool isKnown = DispatchType(EightTypes{}, dataType, [&]<typename T>() {
      view.Reset(new ExpressionRaster<T>(rasters, expressions));
      return true;
    });
    if (!isKnown) return Fail("DataType: an expression gives no such pixels");
    if (!view->IsValid()) return Fail();
    WriteApart(rasters);
    return Publish(view);
  }

  /// The names of all bands; nothing, with the fault text set, for names or roles that can't be.
  std::optional<BandNames> NameBands(const std::vector<BasicRasterPtr>& rasters) const {
    std::vector<BandNames::Source> sources;
    const auto given = Read<Array<String>>("Names");
    if (HasInput("Names") && given.GetCount() + 1 != rasters.size()) {
      SetFault("Names: there are " + std::to_string(given.GetCount()) + " for " +
               std::to_string(rasters.size() - 1) + " rasters behind the first");
      return std::nullopt;
    }
    for (unsigned i = 0; i < rasters.size(); ++i) {
      std::string name;
      if (i != 0) name = HasInput("Names") ? given[i - 1].ToUTF8() : NameOf(i - 1);
      if (i != 0 && !BandNames::IsName(name)) {
        SetFault("Names: \"" + name + "\" is no name: it takes letters, digits and underscores");
        return std::nullopt;
      }
      for (const BandNames::Source& source : sources) {
        if (source.name.empty() || LowerCase(source.name) != LowerCase(name)) continue;
        SetFault("Names: \"" + name + "\" comes twice");
        return std::nullopt;
      }
      sources.push_back({name, rasters[i]->Bands()});
    }
    BandNames names(sources);
    for (const String& role : Read<Array<String>>("Roles")) {
      const std::string text = role.ToUTF8();
      const std::size_t sign = text.find('=');
      if (sign == std::string::npos) {
        SetFault("Roles: \"" + text + "\" is not ROLE=BAND");
        return std::nullopt;
      }
      if (!names.AddRole(text.substr(0, sign), text.substr(sign + 1))) return std::nullopt;
    }
    return names;
  }

  /// "a" to "z", then "a1" and so on.
  static std::string NameOf(unsigned index) {
    const std::string letter(1, static_cast<char>('a' + index % 26));
    return index < 26 ? letter : letter + std::to_string(index / 26);
  }
};

const CommandFactoryT<CreateExpressionRasterCommand> createExpressionRasterFactory(kExpression);

}  // namespace
}  // namespace lumo
