#pragma once

#include <string>

#include "foundation/run_controls.h"

namespace lumo::host {

/// Gives the checksum of the bytes of a file, as text; no text after an abort. Throws HostError for
/// a file that can't be read.
std::string ChecksumOf(const std::string& file, const AbortFlag& abort);

}  // namespace lumo::host
