// The connection text of a memory raster: it opens or it doesn't, and the block is not touched,
// since its address is whatever the text says.

#include <cstdint>
#include <cstdlib>
#include <string>

#include "data/data_manager.h"
#include "data/raster_reader.h"

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t* data, std::size_t size) {
  lumo::Array<lumo::String> strings{lumo::ArrayDims(2)};
  strings[0] = "MemoryRaster";
  strings[1] = lumo::String(std::string(reinterpret_cast<const char*>(data), size));
  const lumo::RasterDataConnectionPtr source(
      lumo::GetGlobalDataManager().ConnectDirect(strings, lumo::GeoRefPtr(), lumo::MetadataPtr()));
  if (!source) return 0;
  const lumo::RasterDef def = source->RasterDef();
  const auto reader = source->RasterReaderDispatch()->GetBasic();
  if (!reader || def.samples == 0 || def.lines == 0 || def.bands == 0 ||
      reader->Bands() != def.bands || lumo::DataTypeBytes(def.dataType) == 0 ||
      source->URI().GetLength() == 0) {
    std::abort();
  }
  return 0;
}
