#include "memory_description.h"

#include <charconv>
#include <cmath>
#include <limits>

#include "data/format_table.h"
#include "foundation/fault.h"
#include "raster/pixel_types.h"

namespace lumo::memory {
namespace {

/// Takes the fields of a connection text one after the other.
class FieldReader {
 public:
  explicit FieldReader(std::string_view text) : rest_(text) {}

  /// Takes "NAME=" off the front.
  bool Take(std::string_view name) {
    if (!rest_.starts_with(name) || rest_.substr(name.size(), 1) != "=") return false;
    rest_.remove_prefix(name.size() + 1);
    return true;
  }

  /// Takes a number and the mark behind it.
  template <typename T, typename... Format>
  bool TakeNumber(T& value, char mark, Format... format) {
    const auto [at, error] =
        std::from_chars(rest_.data(), rest_.data() + rest_.size(), value, format...);
    if (error != std::errc() || at == rest_.data() + rest_.size() || *at != mark) return false;
    rest_.remove_prefix(static_cast<std::size_t>(at - rest_.data()) + 1);
    return true;
  }

  template <typename T>
  bool TakeField(std::string_view name, T& value) {
    return Take(name) && TakeNumber(value, ';');
  }

  bool TakePair(std::string_view name, double& x, double& y) {
    return Take(name) && TakeNumber(x, ',') && TakeNumber(y, ';') && std::isfinite(x) &&
           std::isfinite(y);
  }

  std::string_view Rest() const { return rest_; }
  void Skip(std::size_t count) { rest_.remove_prefix(count); }

 private:
  std::string_view rest_;
};

bool ReadAddress(FieldReader& fields, Description& block) {
  constexpr int kHexadecimal = 16;
  if (!fields.Take("PIXELDATA")) return false;
  if (fields.Rest().starts_with("0x")) fields.Skip(2);
  std::uintptr_t address = 0;
  if (!fields.TakeNumber(address, ';', kHexadecimal)) return false;
  block.pixels = reinterpret_cast<void*>(address);
  return true;
}

/// Reads the fields that follow the name, to the end of the text.
bool ReadAfterName(FieldReader fields, Description& block) {
  std::int32_t interleave = 0;
  std::uint16_t bands = 0;
  if (!fields.TakeField("SAMPLES", block.layout.samples) ||
      !fields.TakeField("LINES", block.layout.lines) || !fields.TakeField("BANDS", bands) ||
      !fields.TakeField("INTERLEAVE", interleave) ||
      !fields.TakeField("PIXELTYPE", block.dataType) ||
      !fields.TakePair("PIXELSIZE", block.pixelSizeX, block.pixelSizeY) ||
      !fields.TakePair("TIEPTMAP", block.tieMapX, block.tieMapY) || !fields.Take("COORDSYS")) {
    return false;
  }
  block.layout.bands = bands;
  block.layout.interleave = static_cast<Interleave>(interleave);
  block.coordSys = fields.Rest();
  return true;
}

/// The name may hold any text: it ends before the first place from which the rest can be read.
bool ReadFields(std::string_view text, Description& block) {
  FieldReader fields(text);
  if (!ReadAddress(fields, block) || !fields.Take("NAME")) return false;
  constexpr std::string_view kNext = ";SAMPLES=";
  const std::string_view from = fields.Rest();
  for (std::size_t at = from.find(kNext); at != std::string_view::npos;
       at = from.find(kNext, at + 1)) {
    if (ReadAfterName(FieldReader(from.substr(at + 1)), block)) {
      block.name = from.substr(0, at);
      return true;
    }
  }
  return false;
}

/// Reads "NODATA=<band>:<value>,<band>:<value>".
bool ReadNoData(const std::string& text, Description& block) {
  const std::string list = text + ",";
  FieldReader fields(list);
  if (!fields.Take("NODATA")) return false;
  while (!fields.Rest().empty()) {
    unsigned band = 0;
    double value = 0;
    if (!fields.TakeNumber(band, ':') || !fields.TakeNumber(value, ',')) return false;
    block.noData[band] = value;
  }
  return true;
}

/// Gives the reason why no block can be as described; null when one can.
const char* FindFault(Description& block) {
  FlatLayout& layout = block.layout;
  const unsigned elementBytes = DataTypeBytes(block.dataType);
  const auto address = reinterpret_cast<std::uintptr_t>(block.pixels);
  std::uint64_t bytes = 0;
  if (elementBytes == 0) return "no such pixel type";
  if (layout.samples == 0 || layout.lines == 0 || layout.bands == 0) return "no pixels";
  if (layout.interleave == Interleave::None && layout.bands == 1) {
    layout.interleave = Interleave::BSQ;  // one band is the same in every interleave
  }
  if (layout.interleave < Interleave::BIP || layout.interleave > Interleave::BSQ) {
    return "no such interleave";
  }
  if (address == 0) return "no address";
  if (!layout.GetBytes(elementBytes, bytes) ||
      bytes > std::numeric_limits<std::uintptr_t>::max() - address) {
    return "more pixels than memory holds";
  }
  const bool aligned = DispatchType(TwelveTypes{}, block.dataType,
                                    [&]<typename T>() { return address % alignof(T) == 0; });
  return aligned ? nullptr : "the address isn't one of such pixels";
}

}  // namespace

bool ReadDescription(const Array<String>& connStrings, Description& block) {
  Array<String> rest;
  RemoveFormatNames(connStrings, rest);
  const bool hasNoData = rest.GetCount() == 2;
  if ((rest.GetCount() != 1 && !hasNoData) || !ReadFields(rest[0].ToUTF8(), block) ||
      (hasNoData && !ReadNoData(rest[1].ToUTF8(), block))) {
    SetFault("MemoryRaster: the connection text doesn't describe a block");
    return false;
  }
  const char* const fault = FindFault(block);
  if (fault == nullptr) return true;
  SetFault(std::string("MemoryRaster: ").append(fault));
  return false;
}

}  // namespace lumo::memory
