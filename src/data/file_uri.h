#pragma once

#include "foundation/string.h"

namespace lumo {

/// The identity in the catalog of a source that is a file: its path, absolute and with links
/// resolved, so that every way to name the file gives one URI. A "]" is written as "%5D", since a
/// URI travels in brackets.
/// @param path  UTF-8; the file need not exist.
VEXG_EXPORT URI FileURI(const std::string& path);

/// The path of a file from its URI.
VEXG_EXPORT std::string PathOfFileURI(const URI& uri);

}  // namespace lumo
