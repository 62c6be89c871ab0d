#include "raster/band_values.h"

#include <algorithm>
#include <charconv>
#include <string>

#include "foundation/scientific_notation.h"

namespace lumo {
namespace {

void SetLastEntry(Array<double>& array, unsigned index, double value) {
  if (array.GetCount() != index + 1) {
    const unsigned before = array.GetCount();
    if (!array.Resize(ArrayDims(index + 1))) return;
    for (unsigned i = before; i < index; ++i) array[i] = 0.0;
  }
  array[index] = value;
}

template <typename T>
inline constexpr bool kIsByte = sizeof(T) == 1;

/// Values that have a character of their own which white space and markup leave alone.
bool HasCharacter(unsigned char value) {
  return (value > 0x20 && value < 0x7F) || value > 0xA0;
}

template <typename T>
void WriteBound(std::ostream& out, T value) {
  if constexpr (!kIsByte<T>) {
    WriteNumber(out, value);
  } else if (const auto byte = static_cast<unsigned char>(value); !HasCharacter(byte)) {
    const std::string digits = std::to_string(static_cast<int>(value));
    out << (digits.size() < 2 ? "0" + digits : digits);
  } else if (byte < 0x80) {
    out << static_cast<char>(byte);
  } else {
    out << static_cast<char>(0xC0 | (byte >> 6)) << static_cast<char>(0x80 | (byte & 0x3F));
  }
}

template <typename T>
bool ReadBound(std::istream& in, T& value) {
  if constexpr (!kIsByte<T>) {
    return ReadNumber(in, value);
  } else {
    std::string word;
    if (!(in >> word)) return false;
    const auto unit = [&](std::size_t i) { return static_cast<unsigned char>(word[i]); };
    if (word.size() == 1 && unit(0) < 0x80) {
      value = static_cast<T>(unit(0));
    } else if (word.size() == 2 && (unit(0) == 0xC2 || unit(0) == 0xC3)) {
      value = static_cast<T>(static_cast<unsigned char>((unit(0) << 6) | (unit(1) & 0x3F)));
    } else {
      int number = 0;
      const char* const end = word.data() + word.size();
      const auto [at, error] = std::from_chars(word.data(), end, number);
      value = static_cast<T>(number);
      if (error == std::errc() && at == end && static_cast<int>(value) == number) return true;
      in.setstate(std::ios::failbit);
      return false;
    }
    return true;
  }
}

}  // namespace

template <typename T>
void RasterBandStats<T>::SetSumXY(unsigned otherBand, double value) {
  SetLastEntry(sumXY, otherBand, value);
  mask |= StatsMask::SumXY;
}

template <typename T>
void RasterBandStats<T>::SetCov(unsigned otherBand, double value) {
  SetLastEntry(cov, otherBand, value);
  mask |= StatsMask::Cov;
}

template <typename T>
std::ostream& operator<<(std::ostream& out, const RasterBandStats<T>& stats) {
  out << stats.band << ' ' << stats.mask << ' ';
  WriteNumber(out, stats.min);
  out << ' ';
  WriteNumber(out, stats.max);
  for (const double value : {stats.mean, stats.std, stats.sum, stats.sum2, stats.rms}) {
    out << ' ';
    WriteNumber(out, value);
  }
  out << ' ' << stats.sumXY << ' ' << stats.cov;
  return out;
}

template <typename T>
std::istream& operator>>(std::istream& in, RasterBandStats<T>& stats) {
  RasterBandStats<T> read;
  const bool whole =
      ReadNumber(in, read.band) && ReadNumber(in, read.mask) && ReadNumber(in, read.min) &&
      ReadNumber(in, read.max) && ReadNumber(in, read.mean) && ReadNumber(in, read.std) &&
      ReadNumber(in, read.sum) && ReadNumber(in, read.sum2) && ReadNumber(in, read.rms) &&
      in >> read.sumXY && in >> read.cov && read.sumXY.IsValid() && read.cov.IsValid();
  if (!whole) in.setstate(std::ios::failbit);
  stats = whole ? std::move(read) : RasterBandStats<T>();
  return in;
}

template <typename T>
bool operator==(const RasterBandHistogram<T>& a, const RasterBandHistogram<T>& b) {
  const bool same = a.band == b.band && a.source == b.source && a.sign == b.sign &&
                    a.reserved == b.reserved && a.min == b.min && a.max == b.max &&
                    a.binCount == b.binCount;
  return same && (a.binCount == 0 || std::ranges::equal(a.counts, b.counts));
}

template <typename T>
std::ostream& operator<<(std::ostream& out, const RasterBandHistogram<T>& histogram) {
  {
    const ScientificNotation notation(out);
    out << histogram.band << ' ' << static_cast<unsigned>(histogram.sign) << ' '
        << histogram.binSize << ' ' << histogram.binCount << ' ';
    WriteBound(out, histogram.min);
    out << ' ';
    WriteBound(out, histogram.max);
  }
  return out << ' ' << FormatValue(histogram.source).ToUTF8() << ' ' << histogram.counts;
}

template <typename T>
std::istream& operator>>(std::istream& in, RasterBandHistogram<T>& histogram) {
  RasterBandHistogram<T> read;
  unsigned sign = 0;
  std::string source;
  const bool whole = ReadNumber(in, read.band) && ReadNumber(in, sign) &&
                     ReadNumber(in, read.binSize) && ReadNumber(in, read.binCount) &&
                     ReadBound(in, read.min) && ReadBound(in, read.max) && in >> source &&
                     in >> read.counts && read.counts.IsValid();
  if (!whole) {
    in.setstate(std::ios::failbit);
    histogram = {};
    return in;
  }
  read.sign = sign <= 2 ? static_cast<HistogramSign>(sign) : HistogramSign::kBoth;
  read.source = ParseValue<StatsSource>(String(source));
  histogram = std::move(read);
  return in;
}

#define STATS_AND_TEXT_FORMS(T)                                                                \
  template struct VEXG_EXPORT RasterBandStats<T>;                                              \
  template VEXG_EXPORT std::ostream& operator<<(std::ostream&, const RasterBandStats<T>&);     \
  template VEXG_EXPORT std::istream& operator>>(std::istream&, RasterBandStats<T>&);           \
  template VEXG_EXPORT std::ostream& operator<<(std::ostream&, const RasterBandHistogram<T>&); \
  template VEXG_EXPORT std::istream& operator>>(std::istream&, RasterBandHistogram<T>&);
VEXG_FOR(TEN, STATS_AND_TEXT_FORMS);

#define COMPARISON(T)                                                 \
  template VEXG_EXPORT bool operator==(const RasterBandHistogram<T>&, \
                                       const RasterBandHistogram<T>&);
VEXG_FOR(TWELVE, COMPARISON);

}  // namespace lumo
