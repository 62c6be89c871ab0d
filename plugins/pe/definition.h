#pragma once

#include <cstdint>
#include <memory>
#include <string>

#include "georef/coordsys_info.h"

namespace lumo::pe {

/// The contents of the text of a coordinate system; never changed once read, and shared by all
/// systems and threads that use it.
struct Definition {
  std::uint64_t id = 0;      ///< one number for each definition of the process
  std::int32_t type = 0;     ///< 0 none, 1 geographic, 2 projected
  std::int32_t code = 0;     ///< EPSG code, 0 for none
  std::string text;          ///< WKT 2 in one line
  std::string mapText;       ///< WKT 2 of the horizontal system alone
  std::string geodeticText;  ///< WKT 2 of the geographic system below it, without a transform
  std::string datumText;     ///< the same, with the transform to WGS 84 that came with it, if any
  bool converts = false;     ///< map coordinates are not those of the geographic system
  double degrees = 1;        ///< degrees for a unit of the geographic system
  double meridian = 0;       ///< its prime meridian, degrees east of Greenwich
  CoordSysInfo info;
};
using DefinitionPtr = std::shared_ptr<const Definition>;

/// The definition that `text` stands for; null when it is none. Texts that were read lately are not
/// read again. Any thread.
DefinitionPtr FindDefinition(const std::string& text);

}  // namespace lumo::pe
