#include "pyramid_values.h"

#include <sstream>

#include "foundation/text_form.h"

namespace lumo::pyramid {
namespace {

constexpr const char* kNoData = "nodata";
constexpr const char* kStats = "statistics";
constexpr const char* kHistogram = "histogram";
constexpr const char* kGeoRef = "georeference";
constexpr const char* kFile = "file";

template <typename T>
bool ReadValue(std::istream& in, T& value) {
  if constexpr (std::is_arithmetic_v<T>) {
    return ReadNumber(in, value);
  } else {
    return bool(in >> value);
  }
}

template <typename T>
void WriteValue(std::ostream& out, const T& value) {
  if constexpr (std::is_arithmetic_v<T>) {
    WriteNumber(out, value);
  } else {
    out << value;
  }
}

/// Reads the value of one line into `values`.
template <typename T>
bool ReadLine(const std::string& word, std::istream& in, unsigned bands, Values<T>& values) {
  if (word == kGeoRef) {
    in >> values.geoRef;
    return bool(values.geoRef);
  }
  if (word == kFile) {
    std::uint64_t bytes = 0;
    std::int64_t time = 0;
    if (!ReadNumber(in, bytes) || !ReadNumber(in, time)) return false;
    values.fileState = std::to_string(bytes) + " " + std::to_string(time);
    return true;
  }
  if (word == kNoData) {
    unsigned band = 0;
    return ReadNumber(in, band) && band < bands && ReadValue(in, values.noData[band]);
  }
  if constexpr (std::is_arithmetic_v<T>) {
    if (word == kStats) {
      std::uint64_t pixelCount = 0;
      RasterBandStats<T> stats;
      if (!ReadNumber(in, pixelCount) || !(in >> stats) || stats.band >= bands) return false;
      stats.pixelCount = pixelCount;
      values.stats[stats.band] = stats;
      return true;
    }
    if (word == kHistogram) {
      RasterBandHistogram<T> histogram;
      if (!(in >> histogram) || histogram.band >= bands ||
          histogram.counts.GetCount() != histogram.binCount) {
        return false;
      }
      values.histograms.push_back(histogram);
      return true;
    }
  }
  return false;
}

}  // namespace

template <typename T>
bool Values<T>::Read(const std::string& text, unsigned bands) {
  *this = {};
  std::istringstream lines(text);
  for (std::string line; std::getline(lines, line);) {
    const std::size_t blank = line.find(' ');
    if (blank == std::string::npos) return false;
    std::istringstream in = MakeTextReader(String(line.substr(blank + 1)));
    if (!ReadLine(line.substr(0, blank), in, bands, *this)) return false;
  }
  return true;
}

template <typename T>
std::string Values<T>::Write() const {
  std::ostringstream out = MakeTextWriter();
  if (!fileState.empty()) out << kFile << ' ' << fileState << '\n';
  if (geoRef) out << kGeoRef << ' ' << geoRef << '\n';
  for (const auto& [band, value] : noData) {
    out << kNoData << ' ' << band << ' ';
    WriteValue(out, value);
    out << '\n';
  }
  if constexpr (std::is_arithmetic_v<T>) {
    for (const auto& [band, values] : stats) {
      out << kStats << ' ' << values.pixelCount << ' ' << values << '\n';
    }
    for (const RasterBandHistogram<T>& histogram : histograms) {
      out << kHistogram << ' ' << histogram << '\n';
    }
  }
  return std::move(out).str();
}

#define VALUES(T) template struct Values<T>;
VEXG_FOR(TWELVE, VALUES);

}  // namespace lumo::pyramid
