// Every text form of a value: whatever is read must, written and read again, be the same text.

#include <cstdint>
#include <cstdlib>
#include <string>

#include "commands/value_text.h"
#include "foundation/color.h"
#include "foundation/sub_rect.h"
#include "raster/band_values.h"
#include "raster/tile_dimensions.h"

namespace {

template <typename T>
void ReadWriteRead(const lumo::String& text) {
  const lumo::String first = lumo::FormatValue(lumo::ParseValue<T>(text));
  const lumo::String second = lumo::FormatValue(lumo::ParseValue<T>(first));
  if (first.ToUTF8() != second.ToUTF8()) std::abort();
}

/// A palette that breaks off has colours without a name, which the form can't distinguish from
/// others; what stays is their number.
void ReadPalette(const lumo::String& text) {
  const auto first = lumo::ParseValue<lumo::Palette>(text);
  const auto second = lumo::ParseValue<lumo::Palette>(lumo::FormatValue(first));
  if (first.GetCount() != second.GetCount()) std::abort();
}

}  // namespace

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t* data, std::size_t size) {
  using lumo::Array;
  const lumo::String text(std::string(reinterpret_cast<const char*>(data), size));
  ReadWriteRead<bool>(text);
  ReadWriteRead<int>(text);
  ReadWriteRead<unsigned char>(text);
  ReadWriteRead<float>(text);
  ReadWriteRead<double>(text);
  ReadWriteRead<lumo::String>(text);
  ReadWriteRead<lumo::URI>(text);
  ReadWriteRead<Array<lumo::String>>(text);
  ReadWriteRead<Array<double>>(text);
  ReadWriteRead<Array<signed char>>(text);
  ReadWriteRead<Array<std::uint64_t>>(text);
  ReadPalette(text);
  ReadWriteRead<lumo::SubRect>(text);
  ReadWriteRead<lumo::TileDimensions>(text);
  ReadWriteRead<lumo::PyramidType>(text);
  ReadWriteRead<lumo::RasterBandStats<float>>(text);
  ReadWriteRead<lumo::RasterBandHistogram<std::uint8_t>>(text);
  ReadWriteRead<lumo::RasterBandHistogram<double>>(text);
  return 0;
}
