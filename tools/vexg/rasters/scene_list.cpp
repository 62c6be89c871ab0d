#include "rasters/scene_list.h"

#include <algorithm>
#include <filesystem>
#include <fstream>

#include <fmt/format.h>
#include <nlohmann/json.hpp>

#include "foundation/near_name.h"
#include "foundation/text_case.h"
#include "verb.h"

namespace lumo::host {
namespace {

namespace fs = std::filesystem;
using Json = nlohmann::ordered_json;

bool IsFile(const std::string& name) {
  std::error_code missing;
  return fs::is_regular_file(name, missing);
}

std::string EndingOf(const std::string& name) {
  return LowerCase(fs::path(name).extension().string());
}

/// True when a name fits a pattern with *, ? and [...].
bool Fits(const char* name, const char* pattern) {
  for (; *pattern != '\0'; ++pattern, ++name) {
    if (*pattern == '*') {
      for (const char* rest = name;; ++rest) {
        if (Fits(rest, pattern + 1)) return true;
        if (*rest == '\0') return false;
      }
    }
    if (*name == '\0') return false;
    if (*pattern == '[') {
      const bool isNot = pattern[1] == '!' || pattern[1] == '^';
      const char* at = pattern + (isNot ? 2 : 1);
      bool isIn = false;
      for (; *at != '\0' && *at != ']'; ++at) {
        if (at[1] == '-' && at[2] != ']' && at[2] != '\0') {
          isIn = isIn || (*name >= *at && *name <= at[2]);
          at += 2;
        } else {
          isIn = isIn || *name == *at;
        }
      }
      if (*at == '\0' || isIn == isNot) return false;
      pattern = at;
    } else if (*pattern != '?' && *pattern != *name) {
      return false;
    }
  }
  return *name == '\0';
}

std::vector<std::string> ExpandPattern(const std::string& word) {
  const fs::path path(word);
  const fs::path folder = path.has_parent_path() ? path.parent_path() : fs::path(".");
  const std::string pattern = path.filename().string();
  std::vector<std::string> names;
  std::error_code fault;
  for (fs::directory_iterator at(folder, fault), end; !fault && at != end; at.increment(fault)) {
    const std::string name = at->path().filename().string();
    const bool isHidden = name.starts_with('.') && !pattern.starts_with('.');
    if (!isHidden && Fits(name.c_str(), pattern.c_str()) && IsFile(at->path().string())) {
      names.push_back((path.has_parent_path() ? folder / name : fs::path(name)).string());
    }
  }
  if (fault) throw HostError(kExitFailed, folder.string() + ": " + fault.message());
  if (names.empty()) throw HostError(kExitFailed, word + ": no file has such a name");
  std::sort(names.begin(), names.end());
  return names;
}

/// A name of a list or a collection in `file`.
std::string NameIn(const std::string& file, std::string name) {
  if (name.starts_with("file://")) name.erase(0, 7);
  const bool isAbsolute = fs::path(name).is_absolute() || name.find("://") != name.npos;
  const fs::path folder = fs::path(file).parent_path();
  return isAbsolute || folder.empty() ? name : (folder / name).lexically_normal().string();
}

std::vector<std::string> ReadList(const std::string& file) {
  std::ifstream in(file);
  if (!in) throw HostError(kExitFailed, file + ": can't be read");
  std::vector<std::string> names;
  for (std::string line; std::getline(in, line);) {
    const std::size_t begin = line.find_first_not_of(" \t\r");
    if (begin == line.npos || line[begin] == '#') continue;
    const std::size_t end = line.find_last_not_of(" \t\r");
    names.push_back(NameIn(file, line.substr(begin, end - begin + 1)));
  }
  if (in.bad()) throw HostError(kExitFailed, file + ": can't be read to its end");
  if (names.empty()) throw HostError(kExitFailed, file + ": the list names no scene");
  return names;
}

/// True for an asset that is a raster: by its roles, its type or its name.
bool IsRaster(const Json& asset) {
  const Json roles = asset.value("roles", Json::array());
  const bool isData = std::find(roles.begin(), roles.end(), "data") != roles.end();
  const std::string type = asset.value("type", "");
  const std::string ending = EndingOf(asset.value("href", ""));
  return isData || type.starts_with("image/tiff") || type.starts_with("image/jp2") ||
         (roles.empty() && type.empty() && (ending == ".tif" || ending == ".tiff"));
}

std::string FindAsset(const std::string& file, const Json& item, const std::string& wanted) {
  const std::string id = item.value("id", "without id");
  const Json assets = item.value("assets", Json::object());
  std::vector<std::string> keys;
  for (const auto& [key, asset] : assets.items()) {
    if (wanted.empty() ? IsRaster(asset) : key == wanted) keys.push_back(key);
  }
  if (keys.size() == 1) {
    const std::string href = assets[keys[0]].value("href", "");
    if (!href.empty()) return NameIn(file, href);
    throw HostError(kExitFailed, fmt::format("{}: item {}: asset {} has no href", file,
                                             Printable(id), Printable(keys[0])));
  }
  if (keys.empty() && !wanted.empty()) {
    throw HostError(kExitFailed, fmt::format("{}: item {} has no asset {}", file, Printable(id),
                                             Printable(wanted)));
  }
  if (keys.empty()) {
    throw HostError(kExitFailed,
                    fmt::format("{}: item {} has no raster among its assets", file, Printable(id)));
  }
  std::string list;
  for (const std::string& key : keys) list.append(list.empty() ? "" : ", ").append(Printable(key));
  throw HostError(kExitUsage, fmt::format("{}: item {} has several rasters; choose one by --asset: "
                                          "{}",
                                          file, Printable(id), list));
}

std::vector<std::string> ReadItems(const std::string& file, const std::string& asset) {
  std::ifstream in(file);
  if (!in) throw HostError(kExitFailed, file + ": can't be read");
  std::vector<std::string> names;
  try {
    const Json json = Json::parse(in);
    const std::string type = json.value("type", "");
    if (type == "Feature") {
      names.push_back(FindAsset(file, json, asset));
    } else if (type == "FeatureCollection") {
      for (const Json& item : json.at("features")) names.push_back(FindAsset(file, item, asset));
    } else {
      throw HostError(kExitFailed, file + ": no STAC item or item collection");
    }
  } catch (const Json::exception& error) {
    throw HostError(kExitFailed,
                    file + ": no STAC item or item collection: " + Printable(error.what(), 120));
  }
  if (names.empty()) throw HostError(kExitFailed, file + ": the collection has no item");
  return names;
}

}  // namespace

std::vector<std::string> ExpandScenes(const std::vector<std::string>& words,
                                      const std::string& asset) {
  std::vector<std::string> scenes;
  for (const std::string& word : words) {
    const std::string ending = EndingOf(word);
    std::vector<std::string> names;
    if (word.starts_with('@') && !IsFile(word)) {
      names = ReadList(word.substr(1));
    } else if (IsFile(word)) {
      const bool isList = ending == ".txt" || ending == ".lst";
      const bool isItems = ending == ".json" || ending == ".geojson";
      names = isList    ? ReadList(word)
              : isItems ? ReadItems(word, asset)
                        : std::vector<std::string>{word};
    } else if (fs::path(word).filename().string().find_first_of("*?[") != std::string::npos) {
      names = ExpandPattern(word);
    } else {
      names = {word};
    }
    scenes.insert(scenes.end(), names.begin(), names.end());
  }
  return scenes;
}

}  // namespace lumo::host
