#pragma once

#include <string>
#include <vector>

#include <CLI/CLI.hpp>

namespace lumo::host {

// How the values of options are read: what a person means by them, as far as there is no doubt.

/// Takes one of the words, whatever its case, and what other programs call it ("bilinear" for
/// linear). Another word is refused with the nearest one.
CLI::Validator OneOf(const std::vector<std::string>& words);

/// Takes a number with or without one of the units behind it. Another unit, or no number, is
/// refused.
/// @param units  of the same size, in the order in which a message names them.
CLI::Validator NumberWithUnit(const std::vector<std::string>& units);

/// Takes the name of a pixel type, whatever its case, and what other programs call it ("Float32").
CLI::Validator PixelTypeName();

/// Takes a coordinate system; a bare number is a code of the EPSG registry.
CLI::Validator CoordSysName();

/// A number and the unit behind it, as they were typed.
struct Quantity {
  double value = 0;
  std::string unit;  ///< in lower case; empty for none
};

/// Reads a number with or without a unit. False for anything else.
bool ReadQuantity(const std::string& text, Quantity& quantity);

/// The key of the format that a person means: the key itself, whatever its case, or the name that
/// the drivers have for it. Throws HostError with the nearest key for another text.
/// @param option  whose value it is.
std::string FormatKey(const std::string& option, const std::string& text);

/// The arguments of the program with the lists of its options in one piece: "--gain 6 5 4" becomes
/// "--gain 6,5,4". What an option that takes one value is followed by stays.
std::vector<std::string> JoinLists(const CLI::App& app, std::vector<std::string> arguments);

/// The line that says what is wrong with a command line, where to read on, and which verb or option
/// is the nearest.
std::string DescribeBadLine(const CLI::App& app, const std::vector<std::string>& arguments,
                            const CLI::ParseError& error);

}  // namespace lumo::host
