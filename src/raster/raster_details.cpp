#include "raster/raster_details.h"

#include <algorithm>
#include <charconv>
#include <map>

#include "raster/raster_storage.h"

namespace lumo {
namespace {

const std::string kRoot = "/private/Raster/";
const std::string kBands = "Bands/";
const std::string kPoints = "Points/";
constexpr const char* kGrid = "Grid";

/// Splits "Bands/<n>/<name>". False for another name.
bool SplitBandName(const std::string& name, unsigned& band, std::string& rest) {
  if (!name.starts_with(kBands)) return false;
  const char* const end = name.data() + name.size();
  const auto [at, fault] = std::from_chars(name.data() + kBands.size(), end, band);
  if (fault != std::errc() || at == end || *at != '/') return false;
  rest.assign(at + 1, end);
  return true;
}

std::vector<double> NumbersOf(const std::string& text) {
  std::istringstream in = MakeTextReader(String(text));
  std::vector<double> numbers;
  for (double number = 0; ReadNumber(in, number);) numbers.push_back(number);
  return numbers;
}

String TextOf(const std::vector<double>& numbers) {
  std::string text;
  for (const double number : numbers) {
    text.append(text.empty() ? "" : " ").append(FormatValue(number).ToUTF8());
  }
  return String(text);
}

bool IsOfPlace(const std::string& name) {
  return name == kGrid || name == "CoordSys" || name.starts_with(kPoints);
}

bool IsKept(const std::string& name, KeptDetails kept) {
  unsigned band = 0;
  std::string rest;
  const bool ofBand = SplitBandName(name, band, rest);
  if (ofBand && rest == "NoDataValue") return true;
  switch (kept) {
    case KeptDetails::kNames:
      return ofBand && rest == "Description";
    case KeptDetails::kBands:
      return !IsOfPlace(name);
    case KeptDetails::kAll:
      return true;
    default:
      return false;
  }
}

}  // namespace

std::span<const EnumWord<KeptDetails>> WordsOf(KeptDetails) {
  static constexpr EnumWord<KeptDetails> kWords[] = {{"Told", KeptDetails::kTold},
                                                     {"Names", KeptDetails::kNames},
                                                     {"Bands", KeptDetails::kBands},
                                                     {"All", KeptDetails::kAll}};
  return kWords;
}

String DetailPath(const std::string& name) {
  return String(kRoot + name);
}

String BandDetailPath(unsigned band, const std::string& name) {
  return String(kRoot + kBands + std::to_string(band) + "/" + name);
}

String FileStatePath() {
  return "/private/FileState";
}

std::string FindDetail(const Metadata& metadata, const String& path) {
  String text;
  return metadata.GetString(path, text) ? text.ToUTF8() : std::string();
}

std::vector<std::string> DetailNames(const Metadata& metadata) {
  List<String> paths;
  metadata.GetNamesPrivate(String(kRoot), paths);
  std::vector<std::string> names;
  for (const String& path : paths) {
    std::string name = path.ToUTF8();
    if (name.starts_with(kRoot)) name.erase(0, kRoot.size());
    while (name.ends_with('/')) name.pop_back();
    names.push_back(name);
  }
  return names;
}

void SetCategories(Metadata& metadata, unsigned band, const Array<String>& names) {
  std::string text;
  for (const String& name : names) {
    std::string line = name.ToUTF8();
    std::replace(line.begin(), line.end(), '\n', ' ');
    text += line + '\n';
  }
  if (!text.empty()) metadata.Set(BandDetailPath(band, "Categories"), String(text));
  metadata.Set(BandDetailPath(band, "AttributeTable"), String("Categories"));
}

std::vector<std::string> FindCategories(const Metadata& metadata, unsigned band) {
  std::istringstream lines(FindDetail(metadata, BandDetailPath(band, "Categories")));
  std::vector<std::string> names;
  for (std::string line; std::getline(lines, line);) names.push_back(line);
  return names;
}

void ChooseBandDetails(Metadata& metadata, const Array<unsigned>& bands) {
  std::map<unsigned, std::vector<std::pair<std::string, std::string>>> all;
  for (const std::string& name : DetailNames(metadata)) {
    unsigned band = 0;
    std::string rest;
    if (!SplitBandName(name, band, rest)) continue;
    all[band].emplace_back(rest, FindDetail(metadata, DetailPath(name)));
  }
  if (all.empty()) return;
  metadata.Remove(String(kRoot + "Bands"));
  for (unsigned band = 0; band < bands.GetCount(); ++band) {
    const auto found = all.find(bands[band]);
    if (found == all.end()) continue;
    for (const auto& [name, text] : found->second) {
      metadata.Set(BandDetailPath(band, name), String(text));
    }
  }
}

void AddBandDetails(Metadata& metadata, unsigned offset, const Metadata& other) {
  for (const std::string& name : DetailNames(other)) {
    unsigned band = 0;
    std::string rest;
    if (!SplitBandName(name, band, rest)) continue;
    metadata.Set(BandDetailPath(offset + band, rest), String(FindDetail(other, DetailPath(name))));
  }
}

void KeepSharedBandDetails(Metadata& metadata, const Metadata& other) {
  for (const std::string& name : DetailNames(metadata)) {
    unsigned band = 0;
    std::string rest;
    if (!SplitBandName(name, band, rest)) continue;
    const String path = DetailPath(name);
    const bool isShared =
        rest != "NoDataValue" && FindDetail(metadata, path) == FindDetail(other, path);
    if (!isShared) metadata.Remove(path);
  }
}

void MovePlaceDetails(Metadata& metadata, unsigned left, unsigned top) {
  for (const std::string& name : DetailNames(metadata)) {
    const bool isGrid = name == kGrid;
    if (!isGrid && !name.starts_with(kPoints)) continue;
    std::vector<double> numbers = NumbersOf(FindDetail(metadata, DetailPath(name)));
    if (numbers.size() < 5) continue;
    if (isGrid) {
      if (numbers.size() != 6) continue;
      numbers[0] += numbers[1] * left + numbers[2] * top;
      numbers[3] += numbers[4] * left + numbers[5] * top;
    } else {
      numbers[0] -= left;
      numbers[1] -= top;
    }
    metadata.Set(DetailPath(name), TextOf(numbers));
  }
}

void KeepDetails(Metadata& metadata, KeptDetails kept) {
  for (const std::string& name : DetailNames(metadata)) {
    if (!IsKept(name, kept)) metadata.Remove(DetailPath(name));
  }
  DropStorage(metadata);
}

}  // namespace lumo
