#pragma once

#include <optional>
#include <string>

#include "platform/export.h"

namespace lumo {

/// A file of metadata and the word of its format.
struct MetadataSource {
  std::string format;
  std::string file;
};

/// Takes "FORMAT:FILE" apart, or finds the format of "FILE" by its ending and, of XML files, by
/// what stands near their beginning. The header beside an ORVA raster stands for the raster.
/// @param folder  where a relative name begins; the folder of the process when empty. The file that
///                is given is below it.
/// @return nothing, with the fault text set, when the format can't be found.
VEXG_EXPORT std::optional<MetadataSource> FindMetadataSource(const std::string& text,
                                                             const std::string& folder = {});

}  // namespace lumo
