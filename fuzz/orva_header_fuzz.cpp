// The header of an ORVA raster, on a small file of pixels: it opens or it doesn't. One that opens
// can be read, and a change of it is a header again that says the same.

#include <cstdint>
#include <cstdlib>
#include <fstream>
#include <string>
#include <vector>

#include "commands/value_text.h"
#include "data/data_manager.h"
#include "data/raster_reader.h"
#include "support/temporary_directory.h"

namespace {

using lumo::Array;
using lumo::ArrayDims;
using lumo::RasterDataConnection;
using lumo::RasterDataConnectionPtr;
using lumo::RasterReaderPtr;
using lumo::String;

constexpr std::size_t kPixelBytes = 4096;

RasterDataConnectionPtr Open(const std::filesystem::path& path) {
  Array<String> strings{ArrayDims(2)};
  strings[0] = "ORVA";
  strings[1] = String(path.string());
  return RasterDataConnectionPtr(
      lumo::GetGlobalDataManager().ConnectDirect(strings, lumo::GeoRefPtr(), lumo::MetadataPtr()));
}

template <typename T>
bool Use(RasterDataConnection& source) {
  const RasterReaderPtr<T> reader = source.RasterReaderDispatch()->Get<T>();
  if (!reader) std::abort();
  Array<unsigned> bands{ArrayDims(2)};
  bands[0] = reader->Bands() - 1;
  bands[1] = 0;
  const unsigned width = std::min(reader->Samples(0), 8U), height = std::min(reader->Lines(0), 8U);
  std::vector<T> pixels(std::size_t{width} * height * 2);
  std::vector<unsigned char> state(pixels.size());
  if (!reader->ReadPixels(reader->Samples(0) - width, reader->Lines(0) - height, width, height,
                          bands, 0, pixels.data(), state.data())) {
    std::abort();
  }
  for (unsigned band = 0; band < std::min(reader->Bands(), 4U); ++band) {
    reader->ReadStats(band);
    reader->Histogram(band);
  }
  lumo::Palette palette;
  palette.Append(lumo::Color("x,y", 1, 2, 3));
  return reader->WritePalette(0, palette);
}

}  // namespace

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t* data, std::size_t size) {
  static const lumo::test::TemporaryDirectory directory;
  const std::filesystem::path path = directory.Path() / "raster";
  if (!std::filesystem::exists(path)) std::ofstream(path) << std::string(kPixelBytes, 'x');
  std::ofstream(path.string() + ".hdr", std::ios::binary)
      .write(reinterpret_cast<const char*>(data), static_cast<std::streamsize>(size));
  const RasterDataConnectionPtr source = Open(path);
  if (!source) return 0;
  const lumo::RasterDef before = source->RasterDef();
  if (!lumo::DispatchType(lumo::TwelveTypes{}, before.dataType,
                          [&]<typename T>() { return Use<T>(*source); })) {
    std::abort();
  }
  const RasterDataConnectionPtr again = Open(path);
  if (!again) std::abort();
  const lumo::RasterDef after = again->RasterDef();
  if (after.samples != before.samples || after.bands != before.bands ||
      after.noData.size() != before.noData.size() ||
      !(lumo::FormatValue(after.geoRef) == lumo::FormatValue(before.geoRef))) {
    std::abort();
  }
  return 0;
}
