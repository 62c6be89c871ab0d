#pragma once

#include <string>

#include "mosaic/mosaic_file.h"

namespace lumo {

// The definition of a mosaic as JSON (docs/mosaics.md).

/// The text of a definition.
/// @param file  where it will lie: paths are written as they are seen from there.
std::string MosaicToJson(const MosaicDocument& document, const std::string& file);

/// Reads the text of a definition that lies in `file`. Throws JsonMisfit for a text that is no
/// JSON, and for fields that don't fit.
MosaicDocument MosaicFromJson(const std::string& text, const std::string& file);

/// True for a name that is a path, and no address or name of a part of a file.
bool IsSceneOnDisk(const std::string& name);

}  // namespace lumo
