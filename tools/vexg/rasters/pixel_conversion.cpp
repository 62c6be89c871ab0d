#include "rasters/pixel_conversion.h"

#include <fmt/format.h>

#include "options/option_values.h"
#include "raster/pixel_types.h"
#include "verb.h"

namespace lumo::host {
namespace {

Array<double> ReadScale(const std::string& text) {
  const std::vector<std::string> parts = SplitList(text);
  Array<double> numbers{ArrayDims(static_cast<unsigned>(parts.size()))};
  bool isList = parts.size() == 2 || parts.size() == 4;
  for (unsigned i = 0; i < parts.size(); ++i) {
    Quantity number;
    isList = isList && ReadQuantity(parts[i], number) && number.unit.empty();
    numbers[i] = number.value;
  }
  if (!isList) {
    throw HostError(kExitUsage,
                    fmt::format("--scale: \"{}\" is neither LO,HI nor LO,HI,TO-LO,TO-HI", text));
  }
  if (numbers[0] == numbers[1]) {
    throw HostError(kExitUsage, fmt::format("--scale: {} is one value, and no range", numbers[0]));
  }
  return numbers;
}

}  // namespace

void PixelConversion::AddTypeTo(OptionSet& line, const std::string& meaning) {
  line.Add("--type", type,
           meaning +
               "; values are rounded for an integer type, and those that don't fit are not "
               "valid")
      .Takes(EightTypeName());
}

void PixelConversion::AddScaleTo(OptionSet& line) {
  line.Add("--scale", scale,
           "Carry values from LO to HI to the range from TO-LO to TO-HI, by default that of the "
           "type, or 0 to 1; what lies outside is cut to it")
      .Shows("LO,HI[,LO,HI]")
      .Example("0,3000");
  line.Add(
      "--unscale", isUnscaled,
      "Make pixels the values that the scales and offsets of the file stand for, Single unless "
      "--type says otherwise");
}

unsigned PixelConversion::TypeOf(unsigned dataType) const {
  if (!type.empty()) return ParseDataType(String(type));
  return isUnscaled ? kDataTypeOf<float> : dataType;
}

bool PixelConversion::IsNeeded(unsigned dataType) const {
  return TypeOf(dataType) != dataType || !scale.empty() || isUnscaled;
}

void PixelConversion::AddView(RasterChain& chain, const std::string& name,
                              unsigned dataType) const {
  if (!IsNeeded(dataType)) return;
  JobWriterCommand& view = chain.AddView(name, "CreateConvertedRasterCommand");
  view.AddInput("DataType", DataTypeName(TypeOf(dataType)));
  if (!scale.empty()) view.AddInput("Scale", ReadScale(scale));
  if (isUnscaled) view.AddInput("Unscale", true);
}

}  // namespace lumo::host
