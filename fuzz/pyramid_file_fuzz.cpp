// A pyramid file: it opens or it doesn't. Of one that opens every level can be asked for: its tiles
// are read or refused, and its values are changed and read back.
//
// Checksums keep a fuzzer out, so all are made right first where the input's first byte asks for
// it.

#include <cstdint>
#include <cstdlib>
#include <cstring>
#include <fstream>
#include <string>
#include <vector>

#define XXH_INLINE_ALL
#include <xxhash.h>

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

// Places in the file, see docs/file-formats.md.
constexpr std::size_t kHeaderBytes = 872;
constexpr std::size_t kExtents = 72, kExtentCount = 33, kExtentBytes = 24;
constexpr std::size_t kHeaderSum = kHeaderBytes - 8;
constexpr std::size_t kHeaderPlaces[] = {0, 4096};

std::uint64_t NumberAt(const std::string& bytes, std::size_t at) {
  std::uint64_t number = 0;
  std::memcpy(&number, &bytes[at], sizeof number);
  return number;
}

void SumAt(std::string& bytes, std::size_t at, std::uint64_t from, std::uint64_t count) {
  if (from > bytes.size() || count > bytes.size() - from) return;
  const std::uint64_t sum = XXH3_64bits(&bytes[from], count);
  std::memcpy(&bytes[at], &sum, sizeof sum);
}

/// Of the tiles that an index names.
void MakeTileSums(std::string& bytes, std::uint64_t from, std::uint64_t count) {
  constexpr std::uint64_t kEntry = 24;
  if (from > bytes.size() || count > bytes.size() - from) return;
  for (std::uint64_t at = from; at + kEntry <= from + count; at += kEntry) {
    const std::uint64_t sizes = NumberAt(bytes, at + 8);
    SumAt(bytes, at + 16, NumberAt(bytes, at), (sizes & 0xFFFFFFFF) + (sizes >> 32));
  }
}

void MakeSums(std::string& bytes) {
  for (const std::size_t place : kHeaderPlaces) {
    if (place + kHeaderBytes > bytes.size()) return;
    for (std::size_t i = 0; i < kExtentCount; ++i) {
      const std::size_t at = place + kExtents + i * kExtentBytes;
      if (i != 0) MakeTileSums(bytes, NumberAt(bytes, at), NumberAt(bytes, at + 8));
      SumAt(bytes, at + 16, NumberAt(bytes, at), NumberAt(bytes, at + 8));
    }
    SumAt(bytes, place + kHeaderSum, place, kHeaderSum);
  }
}

template <typename T>
bool Use(RasterDataConnection& source) {
  const RasterReaderPtr<T> reader = source.RasterReaderDispatch()->Get<T>();
  if (!reader) std::abort();
  Array<unsigned> bands{ArrayDims(2)};
  bands[0] = reader->Bands() - 1;
  bands[1] = 0;
  for (int level = reader->PyramidLevelMin(); level <= reader->PyramidLevelMax(); ++level) {
    const auto number = static_cast<unsigned>(level);
    const unsigned samples = reader->Samples(number), lines = reader->Lines(number);
    const unsigned width = std::min(samples, 9U), height = std::min(lines, 9U);
    if (width == 0 || height == 0) continue;
    std::vector<T> pixels(std::size_t{width} * height * 2);
    std::vector<unsigned char> state(pixels.size());
    reader->ReadPixels(samples - width, lines - height, width, height, bands, number, pixels.data(),
                       state.data());
  }
  for (unsigned band = 0; band < std::min(reader->Bands(), 4U); ++band) {
    reader->ReadStats(band);
    reader->Histogram(band);
  }
  if constexpr (std::is_arithmetic_v<T>) {
    Array<lumo::RasterBandStats<T>> stats{ArrayDims(1)};
    stats[0].mask = lumo::StatsMask::Basic;
    stats[0].mean = 2.5;
    if (!reader->WriteStats(stats) || !(reader->ReadStats(0).mean == 2.5)) std::abort();
  }
  return true;
}

}  // namespace

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t* data, std::size_t size) {
  static const lumo::test::TemporaryDirectory directory;
  if (size == 0) return 0;
  std::string bytes(reinterpret_cast<const char*>(data) + 1, size - 1);
  if ((data[0] & 1) != 0) MakeSums(bytes);
  const std::filesystem::path path = directory.Path() / "pyramid";
  std::ofstream(path, std::ios::binary) << bytes;
  Array<String> strings{ArrayDims(2)};
  strings[0] = "Pyramid";
  strings[1] = String(path.string());
  const RasterDataConnectionPtr source(
      lumo::GetGlobalDataManager().ConnectDirect(strings, lumo::GeoRefPtr(), lumo::MetadataPtr()));
  if (!source) return 0;
  const bool used = lumo::DispatchType(lumo::TwelveTypes{}, source->RasterDef().dataType,
                                       [&]<typename T>() { return Use<T>(*source); });
  if (!used) std::abort();
  return 0;
}
