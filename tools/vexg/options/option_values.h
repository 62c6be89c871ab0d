#pragma once

#include <string>
#include <vector>

#include "options/option.h"

namespace lumo::host {

// How the values of options are read: what a person means by them, as far as there is no doubt.

/// Takes one of the words, whatever its case, and what other programs call it ("bilinear" for
/// linear). Another word is refused with the nearest one.
ValueRule OneOf(const std::vector<std::string>& words);

/// Takes a number with or without one of the units behind it. Another unit, or no number, is
/// refused.
/// @param units  names of one unit; the first is the one that messages and the help use.
ValueRule NumberWithUnit(const std::vector<std::string>& units);

/// Takes the name of a pixel type, whatever its case, and what other programs call it ("Float32").
ValueRule PixelTypeName();

/// The same, of the types that rasters are computed in: EightTypes.
ValueRule EightTypeName();

/// Takes a coordinate system; a bare number is a code of the EPSG registry.
ValueRule CoordSysName();

/// A number and the unit behind it, as they were typed.
struct Quantity {
  double value = 0;
  std::string unit;  ///< in lower case; empty for none
};

/// Reads a number with or without a unit. False for anything else.
bool ReadQuantity(const std::string& text, Quantity& quantity);

/// Gives the elements of a list with commas; an empty text has one, which is empty.
std::vector<std::string> SplitList(const std::string& list);

/// The key of the format that a person means: the key itself, whatever its case, or the name that
/// the drivers have for it. Throws HostError with the nearest key for another text.
/// @param option  whose value it is.
std::string FormatKey(const std::string& option, const std::string& text);

}  // namespace lumo::host
