#pragma once

#include <algorithm>
#include <filesystem>
#include <fstream>
#include <iterator>
#include <string>
#include <vector>

#include "support/raster_sources.h"
#include "support/temporary_directory.h"
#include "support/test_rasters.h"

namespace lumo::test {

inline void WriteFile(const std::filesystem::path& path, const std::string& content) {
  std::ofstream(path, std::ios::binary) << content;
}

inline std::string ReadFile(const std::filesystem::path& path) {
  std::ifstream file(path, std::ios::binary);
  return {std::istreambuf_iterator<char>(file), std::istreambuf_iterator<char>()};
}

/// A raster whose files a test writes byte by byte, without the library.
struct Scene {
  unsigned samples = 7, lines = 5, bands = 4;
  Interleave interleave = Interleave::BIP;
  bool bigEndian = false;
  std::size_t offset = 0;
  std::string more;  ///< lines of the header

  std::vector<unsigned> AllBands() const {
    std::vector<unsigned> all;
    for (unsigned band = 0; band < bands; ++band) all.push_back(band);
    return all;
  }
  SubRect All() const { return {0, 0, samples - 1, lines - 1}; }

  std::string Header(const std::string& dataType) const {
    static constexpr const char* kWords[] = {"BIP", "BIL", "BSQ"};
    return "ORVA\nsamples = " + std::to_string(samples) + "\nlines = " + std::to_string(lines) +
           "\nbands = " + std::to_string(bands) + "\nheader offset = " + std::to_string(offset) +
           "\ndata type = " + dataType + "\ninterleave = " + kWords[static_cast<int>(interleave)] +
           "\nbyte order = " + (bigEndian ? "big" : "little") + " endian\n" + more + "end = ORVA\n";
  }

  /// The bytes of one element as the file has them.
  template <typename T>
  std::string Bytes(T value) const {
    const std::size_t numberBytes = std::is_arithmetic_v<T> ? sizeof(T) : sizeof(T) / 2;
    std::string bytes(reinterpret_cast<const char*>(&value), sizeof(T));
    for (std::size_t at = 0; bigEndian && at < bytes.size(); at += numberBytes) {
      std::reverse(bytes.begin() + static_cast<std::ptrdiff_t>(at),
                   bytes.begin() + static_cast<std::ptrdiff_t>(at + numberBytes));
    }
    return bytes;
  }

  /// The file of a raster whose pixels are `value(sample, line, band)`.
  template <typename T, typename Value>
  std::string Pixels(Value&& value) const {
    std::string bytes(offset, '#');
    VisitBlock(interleave, All(), AllBands(),
               [&](unsigned s, unsigned l, unsigned b) { bytes += Bytes<T>(value(s, l, b)); });
    return bytes;
  }

  /// Writes both files; the pixels are a ramp.
  template <typename T>
  void Write(const std::filesystem::path& path) const {
    WriteFile(path, Pixels<T>(RampValue<T>));
    WriteFile(path.string() + ".hdr", Header(DataTypeName(kDataTypeOf<T>).ToUTF8()));
  }

  RasterDef Def(unsigned dataType) const {
    RasterDef def;
    def.samples = samples;
    def.lines = lines;
    def.bands = bands;
    def.interleave = interleave;
    def.dataType = dataType;
    def.format = "ORVA";
    return def;
  }
};

template <typename... Ts, typename Body>
void ForEachType(TypeList<Ts...>, Body&& body) {
  (body.template operator()<Ts>(), ...);
}

}  // namespace lumo::test
