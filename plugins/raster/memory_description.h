#pragma once

#include <map>
#include <string>

#include "foundation/array.h"
#include "raster/flat_block.h"

namespace lumo::memory {

/// The description of a block by the connection text of a memory raster. The text has one form, in
/// which every field stands once and in this order:
///
///   PIXELDATA=address;NAME=text;SAMPLES=n;LINES=n;BANDS=n;INTERLEAVE=n;PIXELTYPE=n;
///   PIXELSIZE=x,y;TIEPTMAP=x,y;COORDSYS=text
///
/// The address is hexadecimal, as printf writes a pointer. A second text may give no-data values:
/// "NODATA=<band>:<value>,<band>:<value>".
struct Description {
  void* pixels = nullptr;  ///< aligned for the pixel type; belongs to who made the text
  std::string name;
  FlatLayout layout;
  unsigned dataType = 0;  ///< one of TwelveTypes
  double pixelSizeX = 0;  ///< 0: there is no geo-reference
  double pixelSizeY = 0;
  double tieMapX = 0;
  double tieMapY = 0;
  std::string coordSys;               ///< blank when there is none
  std::map<unsigned, double> noData;  ///< by band
};

/// Reads the pieces of connection strings that are no format's key. The block isn't touched.
/// False, with SetFault, for a text of another form, or a block that memory can't hold.
bool ReadDescription(const Array<String>& connStrings, Description& block);

}  // namespace lumo::memory
