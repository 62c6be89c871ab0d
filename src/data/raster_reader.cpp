#include "data/format_table.h"
#include "data/raster_reader_body.h"
#include "foundation/own_plugin.h"

namespace lumo {

bool detail::FillsBlocks(const String& format) {
  const FormatRecord* const row = FindFormat(format);
  // A pyramid file may lack tiles.
  return row != nullptr && row->name != "Pyramid" && IsOwnPlugin(LibraryName(*row).ToUTF8());
}

VEXG_INSTANCES(TWELVE, RasterReader);

}  // namespace lumo
