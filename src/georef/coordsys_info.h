#pragma once

#include <cstdint>

#include "foundation/string.h"

namespace lumo {

/// The plain description of a coordinate system. The defaults describe the empty one.
///
/// The library only carries these values and compares `name`, `unitName`, `parameters` and
/// `datumName`; docs/georeferencing.md says what the plug-in writes into each.
struct CoordSysInfo {
  static constexpr unsigned kParameterCount = 16;

  String name{""};
  double value = 0;
  String projectionName{""};
  String geographicName{""};
  String datumName{"D_Unknown"};
  String spheroidName{""};
  String semiMajorText{"0.0"};
  double semiMajor = 0;  ///< metres, the number of the text above
  String inverseFlatteningText{"0.0"};
  double inverseFlattening = 0;  ///< 0 for a sphere
  String primeMeridianText{"0.0"};
  double primeMeridian = 0;  ///< degrees east of Greenwich
  String unitName{"Meter"};
  double unitFactor = 1.0;    ///< to metres, or to degrees for an angular unit
  std::int32_t unitKind = 0;  ///< 0 linear, 1 angular
  std::int32_t unitCode = 9001;
  String text{""};
  double parameters[kParameterCount] = {};
};

}  // namespace lumo
