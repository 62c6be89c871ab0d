#pragma once

#include <optional>
#include <string>

#include "metadata/metadata.h"

namespace lumo {

/// How the pixels of a raster lie in its file, as far as that can be told.
///
/// The tiles of a RasterDef are those that reading goes by, one line high where blocks are as wide
/// as the raster. These are the blocks of the file itself.
struct RasterStorage {
  unsigned blockWidth = 0;   ///< in pixels
  unsigned blockHeight = 0;  ///< in lines: of a strip, or of a tile
  std::string compression;   ///< the codec, "ZSTD" or "JPEG"; "none"; empty where nobody knows
};

/// Keeps it in a RasterDef's metadata. It belongs to the file: no copy gets it.
VEXG_EXPORT void SetStorage(Metadata& metadata, const RasterStorage& storage);
/// Finds it; nothing where no reader told it.
VEXG_EXPORT std::optional<RasterStorage> FindStorage(const Metadata& metadata);
/// Takes it away.
VEXG_EXPORT void DropStorage(Metadata& metadata);

}  // namespace lumo
