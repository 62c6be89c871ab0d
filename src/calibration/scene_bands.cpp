#include "calibration/scene_bands.h"

#include <algorithm>
#include <cctype>
#include <cmath>
#include <filesystem>
#include <optional>
#include <set>

#include <fmt/format.h>

#include "data/file_uri.h"
#include "raster/raster_def.h"
#include "raster/raster_details.h"

namespace lumo {
namespace {

bool IsWordEnd(const std::string& text, std::size_t at) {
  return at >= text.size() || std::isalnum(static_cast<unsigned char>(text[at])) == 0;
}

std::string UpperCase(std::string text) {
  for (char& c : text) c = static_cast<char>(std::toupper(static_cast<unsigned char>(c)));
  return text;
}

/// A name of a band without what differs between ways to write it: "B04" and "band 4" are "4".
std::string PlainName(const std::string& name) {
  std::string plain = UpperCase(name);
  for (const char* const start : {"BAND", "B"}) {
    if (plain.starts_with(start)) plain.erase(0, std::char_traits<char>::length(start));
  }
  plain.erase(0, plain.find_first_not_of(" _-"));
  const std::size_t digit = plain.find_first_not_of('0');
  return digit == plain.npos ? plain : plain.substr(digit);
}

/// The name of a band that begins at a place of a text in upper case, plain; empty for none.
/// @param end  is set behind it.
std::string NameAt(const std::string& text, std::size_t at, std::size_t& end) {
  end = at;
  if (text.compare(at, 4, "BAND") == 0) {
    end += 4;
    if (end < text.size() && std::string(" _-").find(text[end]) != std::string::npos) ++end;
  } else if (text[at] == 'B') {
    ++end;
  }
  const std::size_t digits = end;
  while (end < text.size() && std::isdigit(static_cast<unsigned char>(text[end])) != 0) ++end;
  if (digits == at || end == digits || end > digits + 2) return {};
  if (end < text.size() && text[end] == 'A') ++end;
  constexpr const char* kGain = "_VCID_";
  if (text.compare(end, 6, kGain) == 0 && end + 6 < text.size()) end += 7;
  return IsWordEnd(text, end) ? PlainName(text.substr(digits, end - digits)) : std::string();
}

/// The one band that a text names as a word of it, plain; empty for none or several.
/// @param place  is set to where that word begins.
std::string NameIn(const std::string& words, std::size_t& place) {
  const std::string text = UpperCase(words);
  std::string found;
  for (std::size_t at = 0, end = 0; at < text.size(); ++at) {
    if (at != 0 && !IsWordEnd(text, at - 1)) continue;
    const std::string name = NameAt(text, at, end);
    if (name.empty()) continue;
    if (!found.empty() && found != name) return {};
    found = name;
    place = at;
  }
  return found;
}

std::string StemOf(const std::string& file) {
  return UpperCase(std::filesystem::path(file).stem().string());
}

std::string ListOf(const std::vector<String>& names) {
  std::string list;
  for (const String& name : names) list.append(list.empty() ? "" : ", ").append(name.ToUTF8());
  return list;
}

/// Finds the bands of one raster.
class Finder {
 public:
  Finder(const SceneCalibration& scene, const BandsOfRaster& raster)
      : scene_(scene), raster_(raster) {}

  SceneBands Find(const std::vector<std::string>& chosen, bool isThermal) {
    if (scene_.bandNames.empty()) {
      found_.doubt = "it names no bands";
    } else if (!chosen.empty()) {
      TakeChosen(chosen);
    } else if (!TakeFile() && found_.doubt.empty() && !TakeNames() && !TakeNumber(isThermal)) {
      found_.doubt = fmt::format(
          "which of its bands {} the {} of {} is not told by the name of the file, the names of "
          "the bands or their number",
          ListOf(scene_.bandNames), BandsText(), Name());
    }
    if (!found_.doubt.empty()) found_.bands.clear();
    return std::move(found_);
  }

 private:
  std::size_t Count() const { return raster_.names.size(); }
  std::string BandsText() const {
    return Count() == 1 ? "one band" : fmt::format("{} bands", Count());
  }
  std::string Name() const { return raster_.file.empty() ? "the raster" : raster_.file; }

  /// The band of the scene with a plain name.
  std::optional<std::size_t> BandOf(const std::string& plain) const {
    for (std::size_t band = 0; band < scene_.bandNames.size(); ++band) {
      if (PlainName(scene_.bandNames[band].ToUTF8()) == plain) return band;
    }
    return std::nullopt;
  }

  void TakeChosen(const std::vector<std::string>& chosen) {
    if (chosen.size() != Count()) {
      found_.doubt = fmt::format("{} of its bands are named, and {} has {}", chosen.size(), Name(),
                                 BandsText());
      return;
    }
    for (const std::string& name : chosen) {
      const auto band = BandOf(PlainName(name));
      if (!band) {
        found_.doubt =
            fmt::format("it tells of no band \"{}\", but of {}", name, ListOf(scene_.bandNames));
        return;
      }
      found_.bands.push_back(*band);
    }
    found_.how = "as chosen";
  }

  bool TakeFile() {
    if (raster_.file.empty() || Count() != 1) return false;
    const std::string stem = StemOf(raster_.file);
    for (std::size_t band = 0; band < scene_.bandFiles.size(); ++band) {
      const std::string file = scene_.bandFiles[band].ToUTF8();
      if (!file.empty() && StemOf(file) == stem) return Take({band}, "by the name of the file");
    }
    std::size_t place = 0;
    const std::string name = NameIn(stem, place);
    if (name.empty()) return false;
    for (const char* const surface : {"SR_", "ST_"}) {
      if (place >= 3 && stem.compare(place - 3, 3, surface) == 0) {
        found_.doubt = fmt::format(
            "{} is of the surface by its name, and its pixels are no counts of the sensor", Name());
        return false;
      }
    }
    const auto band = BandOf(name);
    if (!band) {
      found_.doubt = fmt::format("{} is of band {} by its name; it tells of {}", Name(), name,
                                 ListOf(scene_.bandNames));
      return false;
    }
    WarnOfOther(stem.substr(0, place), *band);
    return Take({*band}, "by the name of the file");
  }

  /// Warns where a file whose name is that of a product isn't of this scene.
  /// @param front  of its name, before the band.
  void WarnOfOther(const std::string& front, std::size_t band) {
    constexpr std::size_t kShortest = 16;  // of the names of products
    if (band >= scene_.bandFiles.size() || front.size() < kShortest || front[0] != 'L') return;
    const std::string file = scene_.bandFiles[band].ToUTF8();
    if (file.empty() || StemOf(file).starts_with(front)) return;
    found_.warning = fmt::format("{} seems to be of another scene, whose file is {}", Name(), file);
  }

  bool TakeNames() {
    std::vector<std::size_t> bands;
    bool onlyCounts = true;
    for (std::size_t i = 0; i < Count(); ++i) {
      std::size_t place = 0;
      const auto band = BandOf(NameIn(raster_.names[i], place));
      if (!band) return false;
      const std::string name = UpperCase(raster_.names[i]);
      onlyCounts = onlyCounts && name.starts_with("BAND") && name.size() > 4 &&
                   name.substr(5) == fmt::format("{}", i + 1);
      bands.push_back(*band);
    }
    const bool areDistinct = std::set<std::size_t>(bands.begin(), bands.end()).size() == Count();
    return !onlyCounts && areDistinct && Take(bands, "by the names of the bands");
  }

  bool TakeNumber(bool isThermal) {
    std::vector<std::size_t> bands;
    if (isThermal) {
      for (std::size_t band = 0; band < scene_.k1.size(); ++band) {
        if (!std::isnan(scene_.k1[band])) bands.push_back(band);
      }
      if (bands.size() == Count()) return Take(bands, "by their number");
    }
    bands.clear();
    if (Count() == scene_.bandNames.size()) {
      for (std::size_t band = 0; band < Count(); ++band) bands.push_back(band);
      return Take(bands, "by their number");
    }
    const std::string instrument = scene_.instrument.ToUTF8();
    std::vector<const char*> usual;
    if (instrument.starts_with("OLI")) usual = {"1", "2", "3", "4", "5", "6", "7"};
    if (instrument == "TM" || instrument.starts_with("ETM")) usual = {"1", "2", "3", "4", "5", "7"};
    if (usual.size() != Count()) return false;
    for (const char* const name : usual) {
      const auto band = BandOf(name);
      if (!band) return false;
      bands.push_back(*band);
    }
    return Take(bands, "by their number");
  }

  bool Take(std::vector<std::size_t> bands, const char* how) {
    found_.bands = std::move(bands);
    found_.how = how;
    return true;
  }

  const SceneCalibration& scene_;
  const BandsOfRaster& raster_;
  SceneBands found_;
};

}  // namespace

BandsOfRaster::BandsOfRaster(const BasicRaster& raster) {
  const std::string path = PathOfFileURI(raster.GetURI());
  file = std::filesystem::path(path.substr(0, path.find('|'))).filename().string();
  const Metadata details = raster.GetRasterDef().metadata;
  for (unsigned band = 0; band < raster.Bands(); ++band) {
    names.push_back(FindDetail(details, BandDetailPath(band, "Description")));
  }
}

SceneBands FindSceneBands(const SceneCalibration& scene, const BandsOfRaster& raster,
                          const std::vector<std::string>& chosen, bool isThermal) {
  return Finder(scene, raster).Find(chosen, isThermal);
}

SceneCalibration ChooseSceneBands(const SceneCalibration& scene,
                                  const std::vector<std::size_t>& bands) {
  SceneCalibration of = scene;
  const auto choose = [&](auto& list) {
    if (list.size() != scene.bandNames.size()) return;
    std::remove_reference_t<decltype(list)> chosen;
    for (const std::size_t band : bands) chosen.push_back(list[band]);
    list = std::move(chosen);
  };
  choose(of.gains);
  choose(of.offsets);
  choose(of.irradiances);
  choose(of.reflectanceGains);
  choose(of.reflectanceOffsets);
  choose(of.k1);
  choose(of.k2);
  choose(of.bandFiles);
  choose(of.bandNames);  // the last, since the others are as long
  return of;
}

}  // namespace lumo
