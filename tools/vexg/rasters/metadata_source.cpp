#include "rasters/metadata_source.h"

#include "data/format_table.h"
#include "foundation/fault.h"
#include "rasters/raster_source.h"
#include "verb.h"

namespace lumo::host {

MetadataSource ParseMetadataSource(const std::string& text) {
  const auto source = FindMetadataSource(text);
  if (!source) throw HostError(kExitUsage, TakeFault().ToUTF8());
  return *source;
}

Array<String> ConnStringsOf(const MetadataSource& source) {
  return ConnStrings({String(source.format), String(AbsoluteName(source.file))});
}

}  // namespace lumo::host
