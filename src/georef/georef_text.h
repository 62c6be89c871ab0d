#pragma once

#include <iosfwd>
#include <span>

#include "foundation/string.h"

namespace lumo {

// The pieces of which the text form of a model is made.

/// Writes numbers in scientific notation with 17 digits, each followed by a blank.
void WriteNumbers(std::ostream& out, std::span<const double> values);

/// Reads as many numbers as `values` holds; the stream fails, and the rest is 0, when one is
/// missing.
void ReadNumbers(std::istream& in, std::span<double> values);

/// Takes the text up to the next "|", with white space off both ends, and skips the mark. The
/// stream fails when it ends before the mark.
String ReadUpToBar(std::istream& in);

}  // namespace lumo
