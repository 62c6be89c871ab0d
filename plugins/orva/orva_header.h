#pragma once

#include <map>
#include <string>

#include "georef/georef.h"
#include "orva/orva_text.h"
#include "raster/flat_block.h"
#include "raster/pixel_types.h"
#include "raster/raster_def.h"

namespace lumo::orva {

/// The description of the pixels by an ORVA header. Palettes, statistics and histograms are in
/// `text`, see orva_values.h.
struct Header {
  HeaderText text;
  FlatLayout layout;
  std::uint64_t offset = 0;  ///< bytes in the file before the first pixel
  unsigned dataType = 0;     ///< one of TwelveTypes
  bool bigEndian = false;
  std::map<unsigned, std::string> noData;  ///< the numbers by band, each one that the type can hold
  GeoRefPtr geoRef;                        ///< empty when there is none

  /// Bytes from the beginning of the file to the end of the pixels.
  std::uint64_t FileBytes() const;
};

/// The path of the header of a file.
std::string HeaderPath(const std::string& path);

/// Reads a header from its text.
/// @param fault  [out] "line N: what".
bool ParseHeader(std::string_view text, Header& header, std::string& fault);

/// Makes the header of a new raster, in the byte order of this machine.
/// @param fault  [out] what the format can't hold.
bool MakeHeader(const RasterDef& def, Header& header, std::string& fault);

/// The description of the raster that a header belongs to.
RasterDef MakeRasterDef(const Header& header);

/// The number that `text` is, as a T: all of it, rounded to T where T is a floating type. Of a
/// complex T the real part. False when it is none, or T can't hold it.
template <typename T>
bool ParseNumber(const std::string& text, T& value);

}  // namespace lumo::orva
