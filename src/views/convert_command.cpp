#include <algorithm>
#include <limits>
#include <string>
#include <utility>

#include <fmt/format.h>

#include "raster/raster_def.h"
#include "raster/raster_details.h"
#include "views/expression_raster.h"
#include "views/publish_raster.h"

namespace lumo {
namespace {

const CommandDeclaration kConverted{
    "CreateConvertedRasterCommand",
    "Views",
    "Shows a raster with pixels of another type, or values on another scale. A command of this "
    "library's own.",
    {{"SrcURI", Presence::kRequired, ValueKind::kURI, "the raster to stand on"},
     {"DataType", Presence::kOptional, ValueKind::kWord,
      "pixel type; that of the raster, or Single with Unscale, when absent. Values are rounded for "
      "an integer type, and what does not fit is not valid",
      "", &EightTypeWords},
     {"Scale", Presence::kOptional, ValueKind::kNumberArray,
      "LO, HI and the values they become, TO-LO and TO-HI: the ends of the range of an integer "
      "type "
      "or 0 and 1 when these two are absent. What lies outside is cut to the range"},
     {"Unscale", Presence::kOptional, ValueKind::kBoolean,
      "values are pixel * scale + offset, as the bands of the raster say; false when absent"}},
    PublishedOutputs()};

/// The range that pixels of a type show: that of an integer type, or 0 to 1.
template <typename T>
std::pair<double, double> ShownRange() {
  if constexpr (std::is_integral_v<T>) {
    return {std::numeric_limits<T>::min(), std::numeric_limits<T>::max()};
  }
  return {0, 1};
}

std::string NumberText(double value) {
  return fmt::format("({:.17g})", value);
}

/// A number among the details of a band, or what it is when there is none.
double NumberOf(const Metadata& details, unsigned band, const char* name, double otherwise) {
  const std::string text = FindDetail(details, BandDetailPath(band, name));
  return text.empty() ? otherwise : ParseValue<double>(String(text));
}

class CreateConvertedRasterCommand final : public PublishCommand {
  CommandResult Execute() override {
    if (!CheckInputs()) return Fail();
    const BasicRasterPtr source = FindRaster("SrcURI");
    if (!source) return Fail();
    isUnscaled_ = HasInput("Unscale") && Read<bool>("Unscale");
    scale_ = Read<Array<double>>("Scale");
    if (HasInput("Scale") && scale_.GetCount() != 2 && scale_.GetCount() != 4) {
      return Fail("Scale: neither two numbers nor four");
    }
    if (HasInput("Scale") && scale_[0] == scale_[1]) return Fail("Scale: the ends are the same");
    unsigned dataType = isUnscaled_ ? kDataTypeOf<float> : source->DataType();
    if (HasInput("DataType")) dataType = ParseDataType(Read<String>("DataType"));
    details_ = source->GetRasterDef().metadata;
    BasicRasterPtr view;
    const bool isKnown = DispatchType(EightTypes{}, dataType, [&]<typename T>() {
      const std::vector<NamedExpression> expressions =
          ParseExpressions(TextOfBands<T>(*source), BandNames({{"", source->Bands()}}));
      if (expressions.empty()) return false;
      view.Reset(new ExpressionRaster<T>({source}, expressions, &details_));
      return true;
    });
    if (!isKnown) return Fail("DataType: there is no such view of this pixel type");
    return view->IsValid() ? Publish(view) : Fail();
  }

  /// One expression for each band. Details that hold no longer are taken away.
  template <typename T>
  std::string TextOfBands(const BasicRaster& source) {
    std::string all;
    for (unsigned band = 0; band < source.Bands(); ++band) {
      std::string value = fmt::format("b{}", band);
      if (isUnscaled_) {
        value =
            fmt::format("({} * {} + {})", value, NumberText(NumberOf(details_, band, "Scale", 1)),
                        NumberText(NumberOf(details_, band, "Offset", 0)));
      }
      if (scale_.GetCount() != 0) value = OnLine<T>(value);
      if (isUnscaled_ || scale_.GetCount() != 0) {
        for (const char* const name : {"Scale", "Offset"}) {
          details_.Remove(BandDetailPath(band, name));
        }
      }
      if (scale_.GetCount() != 0) details_.Remove(BandDetailPath(band, "Unit"));
      details_.Remove(BandDetailPath(band, "NoDataValue"));
      all.append(all.empty() ? "" : "; ").append(value);
    }
    return all;
  }

  /// An expression carried along the line of Scale, and cut to its end.
  template <typename T>
  std::string OnLine(const std::string& value) const {
    auto [low, high] = ShownRange<T>();
    if (scale_.GetCount() == 4) {
      low = scale_[2];
      high = scale_[3];
    }
    return fmt::format("min(max(({} - {}) * {} / {} + {}, {}), {})", value, NumberText(scale_[0]),
                       NumberText(high - low), NumberText(scale_[1] - scale_[0]), NumberText(low),
                       NumberText(std::min(low, high)), NumberText(std::max(low, high)));
  }

  bool isUnscaled_ = false;
  Array<double> scale_;
  Metadata details_;
};

const CommandFactoryT<CreateConvertedRasterCommand> createConvertedRasterFactory(kConverted);

}  // namespace
}  // namespace lumo
