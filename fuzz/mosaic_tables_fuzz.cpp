// The two files of tables of a mosaic, and a footprint file: they open or they don't; of those that
// open everything is read.

#include <algorithm>
#include <cstdint>
#include <cstdlib>
#include <fstream>
#include <string>

#include "mosaic/footprint_file.h"
#include "mosaic/mosaic_tables.h"
#include "support/temporary_directory.h"

namespace {

void Check(bool condition) {
  if (!condition) std::abort();
}

}  // namespace

/// The first two bytes say how long the first file is.
extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t* data, std::size_t size) {
  static const lumo::test::TemporaryDirectory directory;
  if (size < 2) return 0;
  const std::size_t first = std::min<std::size_t>(data[0] + data[1] * 256U, size - 2);
  const std::string base = (directory.Path() / "tables").string();
  const auto write = [](const std::string& path, const std::uint8_t* from, std::size_t bytes) {
    std::ofstream(path, std::ios::binary)
        .write(reinterpret_cast<const char*>(from), static_cast<std::streamsize>(bytes));
  };
  write(base + ".mlh", data + 2, first);
  write(base + ".mlt", data + 2 + first, size - 2 - first);
  lumo::MosaicTableReader reader{lumo::String(base)};
  if (reader.IsValid()) {
    for (unsigned scene = 0; scene < std::min(reader.Scenes(), 4U); ++scene) {
      for (unsigned band = 0; band < std::min(reader.Bands(), 4U); ++band) {
        lumo::MosaicTable table;
        Check(!reader.Read(scene, band, table) || table.entries.size() <= lumo::kMosaicTableBins);
      }
    }
  }
  write(base + ".msf", data + 2, size - 2);
  const auto footprint = lumo::ReadFootprint<std::uint8_t>(lumo::String(base + ".msf"));
  Check(footprint.IsValid() == !footprint.Rings().empty());
  return 0;
}
