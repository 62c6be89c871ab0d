// A region file: as attributes it opens or it doesn't, and as statistics; of one that opens any
// value can be read and written, and it opens again as it was. One that doesn't open stays.

#include <cmath>
#include <cstdint>
#include <cstdlib>
#include <fstream>
#include <string>
#include <utility>

#include "fx/region_attribute_stats.h"
#include "fx/region_kinds.h"
#include "support/temporary_directory.h"

namespace {

using lumo::String;
using lumo::URI;

void Check(bool condition) {
  if (!condition) std::abort();
}

/// @return false for a file that doesn't open.
template <typename File>
bool UseRegions(const URI& uri) {
  const File readOnly(uri, false);
  File store(uri, true);
  Check(readOnly.IsValid() == store.IsValid());
  if (!store.IsValid()) return false;
  const unsigned bands = store.Bands(), attributes = store.Attributes();
  const unsigned regions = store.RegionCount();
  const unsigned band = bands != 0 ? bands - 1 : 0;
  store.RegionExists(regions, band);
  store.Value(regions, band, 0) = 7.0F;
  Check(std::as_const(store).Value(regions, band, 0) == 7.0F);
  Check(store.Close());
  File again(uri, true);
  Check(again.IsValid() && again.Bands() == bands && again.Attributes() == attributes);
  Check(std::as_const(again).Value(regions, band, 0) == 7.0F);
  return true;
}

bool UseStats(const URI& uri) {
  lumo::RegionAttributeStatsFile<float> store(uri);
  if (!store.IsValid()) return false;
  const unsigned band = store.Bands() - 1, attribute = store.Attributes() - 1;
  if (store.Bands() == 0 || store.Attributes() == 0) return true;
  store.Count(band, attribute) = 3.0F;
  Check(store.Close());
  lumo::RegionAttributeStatsFile<float> again(uri);
  Check(again.IsValid() && std::as_const(again).Count(band, attribute) == 3.0F);
  return true;
}

}  // namespace

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t* data, std::size_t size) {
  static const lumo::test::TemporaryDirectory directory;
  const std::filesystem::path path = directory.Path() / "regions";
  std::ofstream(path, std::ios::binary)
      .write(reinterpret_cast<const char*>(data), static_cast<std::streamsize>(size));
  const URI uri{String(path.string())};
  const bool isOpened = UseRegions<lumo::RegionAttributesFile<float>>(uri);
  UseRegions<lumo::SpectralRegionAttributesFile>(uri);
  if (UseStats(uri) || isOpened) return 0;
  std::ifstream in(path, std::ios::binary);
  const std::string left{std::istreambuf_iterator<char>(in), std::istreambuf_iterator<char>()};
  Check(left == std::string(reinterpret_cast<const char*>(data), size));
  return 0;
}
