#pragma once

#include <span>

#include "foundation/string.h"

namespace lumo {

/// Which class reads a metadata format.
enum eMetadataReader : std::int32_t {
  kNoMetadataReader = 0,
  kTextMetadataReader = 1,
  kXmlMetadataReader = 2,
  kOrvaMetadataReader = 3,
  kGdalMetadataReader = 4,  ///< the format's plug-in, through a data connection
  kGmlMetadataReader = 5,
  kPleiadesDimMetadataReader = 6,
  kLandsatMetadataReader = 7,  ///< of this library's own
};

/// One row of the table of metadata formats.
struct MetadataFormat {
  const char* word;     ///< compared exactly
  const char* mdfFile;  ///< name of the definition file
  eMetadataReader reader;
  const char* extra;  ///< GDAL's driver of reader 4, the input type of those of XML
};

/// The metadata formats.
VEXG_EXPORT std::span<const MetadataFormat> GetMetadataFormats();

/// The row of a format word, null when there is none.
VEXG_EXPORT const MetadataFormat* FindMetadataFormat(const String& word);

/// Looks a format word up. False, with nothing changed, for an unknown one.
VEXG_EXPORT bool GMetadataByFrmtName(const String& format, String& mdfFile, eMetadataReader& reader,
                                     String& extra);

}  // namespace lumo
