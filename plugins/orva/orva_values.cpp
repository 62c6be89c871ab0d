#include "orva/orva_values.h"

#include <sstream>

#include "commands/value_text.h"

namespace lumo::orva {
namespace {

constexpr const char* kStats = "statistics";
constexpr const char* kHistograms = "histograms";
constexpr const char* kPalettes = "palettes";

/// True when nothing but blanks is left.
bool IsAtEnd(std::istream& in) {
  return !in.fail() && (in >> std::ws).eof();
}

/// Reads the items of a list, each by `read(stream)`, which is true when it is well and of a band
/// that the raster has.
template <typename Read>
bool ReadItems(const Header& header, const char* name, std::string& fault, Read&& read) {
  const HeaderText::Entry* const entry = header.text.Find(name);
  if (entry == nullptr) return true;
  for (const std::string& item : ItemsOf(*entry)) {
    std::istringstream in = MakeTextReader(String(item));
    if (read(in) && IsAtEnd(in)) continue;
    fault = "line " + std::to_string(entry->line) + ": bad item in \"" + name + "\"";
    return false;
  }
  return true;
}

template <typename Items, typename Write>
void WriteItems(HeaderText& text, const char* name, const Items& items, Write&& write) {
  if (items.empty()) {
    text.Remove(name);
    return;
  }
  std::vector<std::string> texts;
  for (const auto& item : items) {
    std::ostringstream out = MakeTextWriter();
    write(out, item);
    texts.push_back(std::move(out).str());
    while (texts.back().ends_with(' ')) texts.back().pop_back();
  }
  text.SetList(name, texts);
}

/// Items of one colour each: band, red, green, blue, alpha, the null flag, and the name.
bool ReadPalettes(const Header& header, std::map<unsigned, Palette>& palettes, std::string& fault) {
  return ReadItems(header, kPalettes, fault, [&](std::istream& in) {
    unsigned band = 0;
    Color color;
    bool whole = ReadNumber(in, band);
    for (std::uint8_t* part : {&color.r, &color.g, &color.b, &color.a}) {
      whole = whole && ReadNumber(in, *part);
    }
    whole = whole && in >> color.isNull && band < header.layout.bands;
    if (!whole) return false;
    in.get();  // the blank before the name
    std::string name;
    std::getline(in, name, '\0');
    in.clear();
    color.name = String(name);
    palettes[band].Append(color);
    return true;
  });
}

void WritePalettes(const std::map<unsigned, Palette>& palettes, HeaderText& text) {
  std::vector<std::pair<unsigned, Color>> colors;
  for (const auto& [band, palette] : palettes) {
    Palette copy(palette);
    for (unsigned i = 0; i < palette.GetCount(); ++i) colors.emplace_back(band, *copy.At(i));
  }
  WriteItems(text, kPalettes, colors, [](std::ostream& out, const auto& item) {
    const auto& [band, color] = item;
    out << band << ' ' << +color.r << ' ' << +color.g << ' ' << +color.b << ' ' << +color.a << ' '
        << (color.isNull ? 1 : 0) << ' ' << color.name.ToUTF8();
  });
}

}  // namespace

template <typename T>
bool BandValues<T>::Read(const Header& header, std::string& fault) {
  *this = {};
  if constexpr (std::is_arithmetic_v<T>) {
    const bool whole = ReadItems(header, kStats, fault,
                                 [&](std::istream& in) {
                                   std::uint64_t pixelCount = 0;
                                   RasterBandStats<T> band;
                                   if (!ReadNumber(in, pixelCount) || !(in >> band)) return false;
                                   band.pixelCount = pixelCount;
                                   stats[band.band] = band;
                                   return band.band < header.layout.bands;
                                 }) &&
                       ReadItems(header, kHistograms, fault, [&](std::istream& in) {
                         RasterBandHistogram<T> histogram;
                         if (!(in >> histogram)) return false;
                         histograms.push_back(histogram);
                         return histogram.band < header.layout.bands &&
                                histogram.counts.GetCount() == histogram.binCount;
                       });
    if (!whole) return false;
  }
  return ReadPalettes(header, palettes, fault);
}

template <typename T>
void BandValues<T>::Write(HeaderText& text) const {
  if constexpr (std::is_arithmetic_v<T>) {
    WriteItems(text, kStats, stats, [](std::ostream& out, const auto& item) {
      out << item.second.pixelCount << ' ' << item.second;
    });
    WriteItems(text, kHistograms, histograms,
               [](std::ostream& out, const auto& histogram) { out << histogram; });
  }
  WritePalettes(palettes, text);
}

#define BAND_VALUES(T) template struct BandValues<T>;
VEXG_FOR(TWELVE, BAND_VALUES);

}  // namespace lumo::orva
