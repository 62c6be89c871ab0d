#include "orva/orva_header.h"

#include <bit>
#include <charconv>
#include <cmath>
#include <limits>

#include "commands/value_text.h"
#include "orva/orva_georef.h"
#include "raster/no_data_number.h"
#include "raster/raster_details.h"

namespace lumo::orva {
namespace {

constexpr const char* kLittleEndian = "little endian";
constexpr const char* kBigEndian = "big endian";
constexpr const char* kNone = "none";

/// Reads the entries of a header, and remembers the first thing that is wrong.
class EntryReader {
 public:
  EntryReader(const HeaderText& text, std::string& fault) : text_(text), fault_(fault) {}

  bool Fail(unsigned line, const std::string& what) {
    fault_ = "line " + std::to_string(line) + ": " + what;
    return false;
  }

  /// The text of an entry that has to be there.
  bool Need(const char* name, std::string& value, unsigned& line) {
    const HeaderText::Entry* const entry = text_.Find(name);
    if (entry == nullptr) {
      return Fail(text_.LineCount(), std::string("the header ends without \"") + name + "\"");
    }
    value = TextOf(*entry);
    line = entry->line;
    return true;
  }

  bool NeedCount(const char* name, unsigned& count) {
    std::string value;
    unsigned line = 0;
    if (!Need(name, value, line)) return false;
    if (ParseNumber(value, count) && count != 0) return true;
    return Fail(line, std::string(name) + " is no count from 1 to 4294967295: " + value);
  }

 private:
  const HeaderText& text_;
  std::string& fault_;
};

bool ReadLayout(EntryReader& entries, Header& header) {
  std::string value;
  unsigned line = 0;
  if (!entries.NeedCount("samples", header.layout.samples) ||
      !entries.NeedCount("lines", header.layout.lines) ||
      !entries.NeedCount("bands", header.layout.bands) ||
      !entries.Need("interleave", value, line)) {
    return false;
  }
  header.layout.interleave = ParseValue<Interleave>(String(value));
  if (header.layout.interleave == Interleave::None) {
    return entries.Fail(line, "interleave is not BIP, BIL or BSQ: " + value);
  }
  return true;
}

bool ReadType(EntryReader& entries, Header& header) {
  std::string value;
  unsigned line = 0;
  if (!entries.Need("data type", value, line)) return false;
  header.dataType = ParseDataType(String(value));
  if (DataTypeBytes(header.dataType) == 0) {
    return entries.Fail(line, "no such data type: " + value);
  }
  if (!entries.Need("byte order", value, line)) return false;
  header.bigEndian = value == kBigEndian;
  if (!header.bigEndian && value != kLittleEndian) {
    return entries.Fail(line, "byte order is not little endian or big endian: " + value);
  }
  if (!entries.Need("header offset", value, line)) return false;
  if (!ParseNumber(value, header.offset)) {
    return entries.Fail(line, "header offset is no number of bytes: " + value);
  }
  std::uint64_t bytes = 0;
  constexpr std::uint64_t kMaxBytes = INT64_MAX;
  if (!header.layout.GetBytes(DataTypeBytes(header.dataType), bytes) ||
      header.offset > kMaxBytes - bytes) {
    return entries.Fail(line, "the file would be larger than any file");
  }
  return true;
}

bool FitsType(unsigned dataType, const std::string& number) {
  return DispatchType(TwelveTypes{}, dataType, [&]<typename T>() {
    T value{};
    return ParseNumber(number, value);
  });
}

bool ReadNoData(EntryReader& entries, Header& header) {
  const HeaderText::Entry* const entry = header.text.Find("no data values");
  if (entry == nullptr) return true;
  const std::vector<std::string> items = ItemsOf(*entry);
  if (items.size() != header.layout.bands) {
    return entries.Fail(entry->line, "not one no data value for each band");
  }
  for (unsigned band = 0; band < items.size(); ++band) {
    if (items[band] == kNone) continue;
    if (!FitsType(header.dataType, items[band])) {
      return entries.Fail(entry->line, "no data value of another type: " + items[band]);
    }
    header.noData[band] = items[band];
  }
  return true;
}

void WriteNoData(Header& header) {
  if (header.noData.empty()) return;
  std::vector<std::string> items(header.layout.bands, kNone);
  for (const auto& [band, value] : header.noData) items[band] = value;
  header.text.SetList("no data values", items);
}

bool TakeNoData(const RasterDef& def, Header& header, std::string& fault) {
  for (const auto& [band, value] : def.noData) {
    const std::string whole = NoDataOf(def, band)->whole;
    const std::string number = whole.empty() ? FormatValue(value).ToUTF8() : whole;
    if (band < def.bands && FitsType(def.dataType, number)) {
      header.noData[band] = number;
      continue;
    }
    fault = "the no-data value " + number + " of band " + std::to_string(band) +
            " is no pixel of this raster";
    return false;
  }
  return true;
}

}  // namespace

std::uint64_t Header::FileBytes() const {
  std::uint64_t bytes = 0;
  layout.GetBytes(DataTypeBytes(dataType), bytes);
  return offset + bytes;
}

std::string HeaderPath(const std::string& path) {
  return path + ".hdr";
}

bool ParseHeader(std::string_view text, Header& header, std::string& fault) {
  header = Header();
  if (!header.text.Parse(text, fault)) return false;
  EntryReader entries(header.text, fault);
  return ReadLayout(entries, header) && ReadType(entries, header) && ReadNoData(entries, header) &&
         ReadGeoRef(header.text, header.geoRef, fault);
}

bool MakeHeader(const RasterDef& def, Header& header, std::string& fault) {
  header = Header();
  // One band is the same in every interleave.
  const Interleave interleave =
      def.interleave == Interleave::None ? Interleave::BSQ : def.interleave;
  header.layout = {interleave, def.samples, def.lines, def.bands};
  header.dataType = def.dataType;
  header.bigEndian = std::endian::native == std::endian::big;
  std::uint64_t bytes = 0;
  if (DataTypeBytes(def.dataType) == 0) {
    fault = "no pixels of the type " + DataTypeName(def.dataType).ToUTF8();
  } else if (def.samples == 0 || def.lines == 0 || def.bands == 0) {
    fault = "a raster without pixels";
  } else if (FormatValue(interleave) == UnknownWordOf(interleave)) {
    fault = "no such interleave";
  } else if (!header.layout.GetBytes(DataTypeBytes(def.dataType), bytes)) {
    fault = "the file would be larger than any file";
  } else if (TakeNoData(def, header, fault)) {
    HeaderText& out = header.text;
    out.SetText("samples", std::to_string(def.samples));
    out.SetText("lines", std::to_string(def.lines));
    out.SetText("bands", std::to_string(def.bands));
    out.SetText("header offset", "0");
    out.SetText("data type", DataTypeName(def.dataType).ToUTF8());
    out.SetText("interleave", FormatValue(interleave).ToUTF8());
    out.SetText("byte order", header.bigEndian ? kBigEndian : kLittleEndian);
    WriteNoData(header);
    header.geoRef = CloneOf(def.geoRef);
    if (header.geoRef) {
      header.geoRef->SetDimensions(def.samples, def.lines);
      WriteGeoRef(*header.geoRef, out);
    }
    return true;
  }
  return false;
}

RasterDef MakeRasterDef(const Header& header) {
  RasterDef def;
  def.samples = header.layout.samples;
  def.lines = header.layout.lines;
  def.bands = header.layout.bands;
  def.interleave = header.layout.interleave;
  def.dataType = header.dataType;
  def.format = "ORVA";
  const bool isWhole =
      def.dataType == kDataTypeOf<std::int64_t> || def.dataType == kDataTypeOf<std::uint64_t>;
  for (const auto& [band, number] : header.noData) {
    ParseNumber(number, def.noData[band]);
    // The digits that a double lacks.
    if (isWhole) def.metadata.Set(BandDetailPath(band, "NoDataValue"), String(number));
  }
  def.SetGeoRef(header.geoRef);
  return def;
}

template <typename T>
bool ParseNumber(const std::string& text, T& value) {
  if constexpr (!std::is_arithmetic_v<T>) {
    value = T{};
    return ParseNumber(text, value.real);
  } else {
    const char* const end = text.data() + text.size();
    const auto [at, error] = std::from_chars(text.data(), end, value);
    if (error == std::errc() && at == end) return true;
    if constexpr (std::is_integral_v<T>) {  // it may be written as "0.0" or "1e3"
      double wide = 0;
      constexpr double kHalf = 0.5;
      const double low = static_cast<double>(std::numeric_limits<T>::min());
      const double high = std::ldexp(1.0, std::numeric_limits<T>::digits);
      if (ParseNumber(text, wide) && wide >= low && wide < high &&
          wide == std::floor(wide + kHalf)) {
        value = static_cast<T>(wide);
        return true;
      }
    }
    value = T();
    return false;
  }
}

#define PARSE_NUMBER(T) template bool ParseNumber(const std::string&, T&);
VEXG_FOR(TWELVE, PARSE_NUMBER);

}  // namespace lumo::orva
