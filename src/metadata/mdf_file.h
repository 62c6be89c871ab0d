#pragma once

#include <string_view>
#include <vector>

#include "metadata/mdf_format.h"

namespace lumo {

/// Reads a definition file; see docs/metadata.md for the language. Nothing behind the first fault
/// is read.
/// @param format   changed by the file's "frmt." properties.
/// @param entries  [out] those of the file are added, in its order.
/// @return false when the file can't be read or is wrong: the parse log and the fault text say why.
VEXG_EXPORT bool ReadMdfFile(const String& path, MdfFormat& format, std::vector<MdfEntry>& entries);

/// The same of the file's text.
/// @param path  for the words of a fault.
VEXG_EXPORT bool ReadMdfText(std::u16string_view text, const String& path, MdfFormat& format,
                             std::vector<MdfEntry>& entries);

}  // namespace lumo
