// The text form of a model: what is read must, written and read again, be the same text; and what
// the model then says of points must end.

#include <cstdint>
#include <cstdlib>
#include <string>

#include "commands/value_text.h"
#include "georef/georef.h"

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t* data, std::size_t size) {
  using lumo::GeoRefPtr;
  const lumo::String text(std::string(reinterpret_cast<const char*>(data), size));
  const auto model = lumo::ParseValue<GeoRefPtr>(text);
  if (model.IsNull()) return 0;
  const lumo::String first = lumo::FormatValue(model);
  const auto again = lumo::ParseValue<GeoRefPtr>(first);
  if (again.IsNull() || lumo::FormatValue(again).ToUTF8() != first.ToUTF8()) std::abort();

  double x = 0, y = 0;
  model->PixelToMap(1, 2, x, y);
  model->MapToPixel(x, y, x, y);
  model->MapExtent(true);
  model->SetDimensions(7, 9);
  const GeoRefPtr part = model->SubRectGeoRef(lumo::SubRect(1, 1, 3, 4));
  const GeoRefPtr coarse = part->ResampledGeoRef(2, 3);
  lumo::Array<double> points{lumo::ArrayDims(1, 2)};
  points[0] = points[1] = 1;
  model->PixelToPixel(points, *coarse);
  return 0;
}
