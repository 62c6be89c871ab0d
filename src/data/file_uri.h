#pragma once

#include <string>
#include <vector>

#include "foundation/string.h"

namespace lumo {

/// The identity in the catalog of a source that is a file: its path, absolute and with links
/// resolved, so that every way to name the file gives one URI. A "]" is written as "%5D", since a
/// URI travels in brackets.
/// @param path  UTF-8; the file need not exist.
VEXG_EXPORT URI FileURI(const std::string& path);

/// The path of a file from its URI; a counter behind it is left off.
VEXG_EXPORT std::string PathOfFileURI(const URI& uri);

/// The URI of a further raster on the source `uri`, that has changed since an earlier one was
/// opened: with "//" and the counter behind it, as no path has.
/// @param counter  1 for the first raster, whose URI is that of the source.
VEXG_EXPORT URI CountedURI(const URI& uri, unsigned counter);

/// The parts of a source's name that may be paths of files: all of it, and what stands between, or
/// behind, its colons and quotes, as in the name of a file's part.
VEXG_EXPORT std::vector<std::string> PathsIn(const std::string& name);

}  // namespace lumo
