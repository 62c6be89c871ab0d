#include "mosaic/mosaic_file.h"

#include <algorithm>
#include <chrono>
#include <cmath>
#include <filesystem>
#include <map>
#include <mutex>
#include <set>

#include <fmt/format.h>

#include "data/access_policy.h"
#include "data/format_table.h"
#include "foundation/fault.h"
#include "foundation/json_lines.h"
#include "foundation/near_name.h"
#include "foundation/text_case.h"
#include "georef/std_georef.h"
#include "mosaic/json_fields_body.h"
#include "mosaic/match_mode.h"
#include "mosaic/owner_file.h"
#include "platform/random_access_file.h"
#include "raster/pixel_types.h"

namespace lumo {
namespace {

namespace fs = std::filesystem;
using Json = nlohmann::ordered_json;

constexpr const char* kVersionField = "vmosaic";
constexpr unsigned kVersion = 1;
constexpr const char* kModes[] = {"overlaps", "scenes"};

/// True for a name that is a path, and no address or name of a part of a file.
bool IsPath(const std::string& name) {
  return name.find("://") == name.npos && name.find(":\"") == name.npos &&
         !name.starts_with("/vsi");
}

/// Turns the paths of a definition into those in its file, and back.
class PathForm {
 public:
  explicit PathForm(const std::string& file)
      : folder_(fs::absolute(file).lexically_normal().parent_path()) {}

  std::string Absolute(const std::string& text) const {
    if (text.empty() || !IsPath(text) || fs::path(text).is_absolute()) return text;
    return (folder_ / text).lexically_normal().string();
  }
  std::string Relative(const std::string& path) const {
    if (path.empty() || !IsPath(path)) return path;
    const fs::path relative = fs::absolute(path).lexically_normal().lexically_relative(folder_);
    return relative.empty() ? path : relative.generic_string();
  }

 private:
  fs::path folder_;
};

/// Coordinate systems by their texts: a definition names few, often.
class Systems {
 public:
  CoordSys Read(const std::string& text, const std::string& pointer) {
    if (text.empty()) return {};
    const auto [at, isNew] = known_.try_emplace(text);
    if (isNew && !at->second.SetFromString(String(text))) {
      throw JsonMisfit{pointer, "no coordinate system: " + Printable(text, 60)};
    }
    return at->second;
  }

 private:
  std::map<std::string, CoordSys> known_;
};

/// The text of a coordinate system: "EPSG:n" where it names its code at the end and is that one.
std::string TextOf(const CoordSys& system) {
  String text;
  system.ToString(text);
  const std::string whole = text.ToUTF8();
  constexpr std::string_view kMark = "ID[\"EPSG\",";
  const std::size_t mark = whole.rfind(kMark);
  if (mark == whole.npos) return whole;
  const std::size_t digits = mark + kMark.size();
  const std::size_t end = whole.find_first_not_of("0123456789", digits);
  if (end == digits || whole.substr(std::min(end, whole.size())) != "]]") return whole;
  const std::string code = "EPSG:" + whole.substr(digits, end - digits);
  CoordSys named;
  String again;
  if (!named.SetFromString(String(code))) return whole;
  named.ToString(again);
  return again == text ? code : whole;
}

Json FromNumbers(std::initializer_list<double> values) {
  Json list = Json::array();
  for (const double value : values) list.push_back(JsonFields::FromNumber(value));
  return list;
}

template <typename E>
E ReadWord(const std::string& text, const std::string& pointer) {
  std::string words;
  for (const EnumWord<E>& entry : WordsOf(E())) {
    if (LowerCase(entry.word) == text) return entry.value;
    words.append(words.empty() ? "" : ", ").append(LowerCase(entry.word));
  }
  throw JsonMisfit{pointer, fmt::format("\"{}\" is none of {}", Printable(text, 60), words)};
}

unsigned ReadPixelType(JsonFields& fields) {
  const auto name = fields.Get<std::string>("pixel_type");
  const unsigned type = ParseDataType(String(name));
  const bool isKnown = DataTypeName(type).ToUTF8() == name &&
                       DispatchType(EightTypes{}, type, []<typename T>() { return true; });
  if (isKnown) return type;
  throw JsonMisfit{fields.PointerOf("pixel_type"),
                   fmt::format("\"{}\" is no pixel type of a mosaic", Printable(name, 60))};
}

// Geo-references: a plain grid by its fields, any other one by the library's text form.

Json ToJson(const GeoRef& model, const std::string& systemOfMosaic) {
  if (model.GetType() != GeoRef::kStd) {
    return {{"text", FormatValue(CloneOf(GeoRefPtr(const_cast<GeoRef*>(&model), true))).ToUTF8()}};
  }
  Json json{{"origin", FromNumbers({model.TieMapX(), model.TieMapY()})},
            {"pixel_size", FromNumbers({model.PixelSizeX(), model.PixelSizeY()})}};
  if (model.TiePixelX() != 0 || model.TiePixelY() != 0) {
    json["origin_pixel"] = FromNumbers({model.TiePixelX(), model.TiePixelY()});
  }
  if (model.Rotation() != 0) json["rotation"] = JsonFields::FromNumber(model.Rotation());
  const std::string system = TextOf(model.CoordinateSystem());
  if (system != systemOfMosaic) json["coordinate_system"] = system;
  return json;
}

/// @param systemOfMosaic  of a model without a coordinate system of its own.
GeoRefPtr ReadGeoRef(JsonFields& fields, const std::string& systemOfMosaic, Systems& systems) {
  const auto text = fields.GetOr<std::string>("text", "");
  if (!text.empty()) {
    const auto model = ParseValue<GeoRefPtr>(String(text));
    if (!model) throw JsonMisfit{fields.PointerOf("text"), "is no geo-reference"};
    return model;
  }
  const auto pair = [&](const char* name) {
    return JsonFields::Numbers(fields.At(name), fields.PointerOf(name), 2);
  };
  const GeoRefPtr model(new StdGeoRef);
  const std::vector<double> origin = pair("origin"), size = pair("pixel_size");
  if (!(std::isfinite(size[0]) && std::isfinite(size[1]) && size[0] != 0 && size[1] != 0)) {
    throw JsonMisfit{fields.PointerOf("pixel_size"), "has to be two numbers other than 0"};
  }
  const std::vector<double> pixel =
      fields.Has("origin_pixel") ? pair("origin_pixel") : std::vector<double>{0, 0};
  model->SetTieMap(origin[0], origin[1]);
  model->SetTiePixel(pixel[0], pixel[1]);
  model->SetPixelSize(size[0], size[1]);
  model->SetRotation(fields.GetOr<double>("rotation", 0));
  model->SetCoordinateSystem(
      systems.Read(fields.GetOr<std::string>("coordinate_system", systemOfMosaic),
                   fields.PointerOf("coordinate_system")));
  return model;
}

void ReadSize(JsonFields& fields, unsigned& samples, unsigned& lines) {
  const std::string pointer = fields.PointerOf("size");
  const Json& size = fields.At("size");
  if (!size.is_array() || size.size() != 2) {
    throw JsonMisfit{pointer, "has to be a list of 2 numbers"};
  }
  samples = JsonFields::As<unsigned>(size[0], pointer + "/0");
  lines = JsonFields::As<unsigned>(size[1], pointer + "/1");
  if (samples == 0 || lines == 0) throw JsonMisfit{pointer, "has to be two numbers above 0"};
}

// Scenes.

Json ToJson(const MosaicSceneHeader& header, const std::string& systemOfMosaic) {
  Json json{{"size", {header.samples, header.lines}},
            {"bands", header.bands},
            {"pixel_type", DataTypeName(header.dataType).ToUTF8()},
            {"interleave", FormatValue(header.interleave).ToUTF8()}};
  if (!header.format.empty()) json["format"] = header.format;
  if (!header.palettes.empty()) json["palettes"] = header.palettes;
  if (!header.details.empty()) json["details"] = header.details;
  if (header.tileWidth != 0 || header.tileHeight != 0) {
    json["tile"] = {header.tileWidth, header.tileHeight};
  }
  if (header.levelMax != 0) json["levels"] = {header.levelMin, header.levelMax};
  const auto hasValue = [](const auto& value) { return value.has_value(); };
  if (std::any_of(header.noData.begin(), header.noData.end(), hasValue)) {
    Json& list = json["no_data"] = Json::array();
    for (const auto& value : header.noData) {
      list.push_back(value ? JsonFields::FromNumber(*value) : Json());
    }
  }
  json["grid"] = ToJson(*header.geoRef, systemOfMosaic);
  json["file_state"] = header.state;
  return json;
}

MosaicSceneHeader ReadHeader(const Json& json, const std::string& pointer,
                             const std::string& systemOfMosaic, Systems& systems) {
  JsonFields fields(json, pointer);
  MosaicSceneHeader header;
  ReadSize(fields, header.samples, header.lines);
  header.bands = fields.Get<unsigned>("bands");
  header.dataType = ReadPixelType(fields);
  header.interleave = ParseValue<Interleave>(String(fields.GetOr<std::string>("interleave", "")));
  header.format = fields.GetOr<std::string>("format", "");
  if (fields.Has("palettes")) {
    const Json& bands = fields.At("palettes");
    if (!bands.is_array()) throw JsonMisfit{fields.PointerOf("palettes"), "has to be a list"};
    for (const Json& band : bands) {
      header.palettes.push_back(JsonFields::As<unsigned>(band, fields.PointerOf("palettes")));
    }
  }
  if (fields.Has("details")) {
    const Json& details = fields.At("details");
    const std::string at = fields.PointerOf("details");
    if (!details.is_object()) throw JsonMisfit{at, "has to be an object"};
    for (const auto& [name, text] : details.items()) {
      header.details[name] = JsonFields::As<std::string>(text, at + "/" + name);
    }
  }
  const auto pair = [&](const char* name, unsigned& first, unsigned& second) {
    if (!fields.Has(name)) return;
    JsonFields::Numbers(fields.At(name), fields.PointerOf(name), 2);
    first = JsonFields::As<unsigned>(fields.At(name)[0], fields.PointerOf(name));
    second = JsonFields::As<unsigned>(fields.At(name)[1], fields.PointerOf(name));
  };
  pair("tile", header.tileWidth, header.tileHeight);
  pair("levels", header.levelMin, header.levelMax);
  header.noData.resize(header.bands);
  if (fields.Has("no_data")) {
    const Json& list = fields.At("no_data");
    const std::string at = fields.PointerOf("no_data");
    if (!list.is_array() || list.size() != header.bands) {
      throw JsonMisfit{at, "has to be a list with a value, or null, for each band"};
    }
    for (unsigned i = 0; i < header.bands; ++i) {
      if (!list[i].is_null()) header.noData[i] = JsonFields::Number(list[i], at);
    }
  }
  JsonFields grid(fields.At("grid"), fields.PointerOf("grid"));
  header.geoRef = ReadGeoRef(grid, systemOfMosaic, systems);
  grid.Finish();
  header.geoRef->SetDimensions(header.samples, header.lines);
  header.state = fields.GetOr<std::string>("file_state", "");
  fields.Finish();
  return header;
}

Json ToJson(const MosaicScene& scene, const PathForm& paths, const std::string& systemOfMosaic) {
  Json json{{"file", paths.Relative(scene.file)}};
  if (!scene.options.empty()) json["options"] = scene.options;
  if (!scene.matches) json["match"] = false;
  if (!scene.footprint.empty()) json["footprint"] = paths.Relative(scene.footprint);
  if (!scene.seam.empty()) json["seam"] = paths.Relative(scene.seam);
  json["header"] = ToJson(scene.header, systemOfMosaic);
  return json;
}

MosaicScene ReadScene(const Json& json, const std::string& pointer, const PathForm& paths,
                      const std::string& systemOfMosaic, Systems& systems) {
  JsonFields fields(json, pointer);
  MosaicScene scene;
  scene.file = paths.Absolute(fields.Get<std::string>("file"));
  if (scene.file.empty()) throw JsonMisfit{fields.PointerOf("file"), "is empty"};
  if (fields.Has("options")) {
    const Json& options = fields.At("options");
    if (!options.is_array()) throw JsonMisfit{fields.PointerOf("options"), "has to be a list"};
    for (const Json& option : options) {
      scene.options.push_back(JsonFields::As<std::string>(option, fields.PointerOf("options")));
    }
  }
  scene.matches = fields.GetOr<bool>("match", true);
  scene.footprint = paths.Absolute(fields.GetOr<std::string>("footprint", ""));
  scene.seam = paths.Absolute(fields.GetOr<std::string>("seam", ""));
  scene.header =
      ReadHeader(fields.At("header"), fields.PointerOf("header"), systemOfMosaic, systems);
  fields.Finish();
  return scene;
}

// The whole.

Json ToJson(const MosaicDocument& document, const PathForm& paths) {
  const std::string system = TextOf(document.grid->CoordinateSystem());
  Json grid = ToJson(*document.grid, "");
  grid["size"] = {document.grid->Samples(), document.grid->Lines()};
  Json json{{kVersionField, kVersion},
            {"pixel_type", DataTypeName(document.dataType).ToUTF8()},
            {"bands", document.bands},
            {"grid", grid},
            {"no_data", document.noData ? JsonFields::FromNumber(*document.noData) : Json()},
            {"resampling", LowerCase(FormatValue(document.resampling).ToUTF8())},
            {"feather_width", JsonFields::FromNumber(document.featherWidth)},
            {"reference", document.reference},
            {"match",
             {{"mode", kModes[std::min(document.matchMode, 1U)]},
              {"bins", LowerCase(FormatValue(document.bins).ToUTF8())}}}};
  if (!document.tables.empty()) json["tables"] = paths.Relative(document.tables);
  json["working_directory"] = paths.Relative(document.workingDirectory);
  Json& scenes = json["scenes"] = Json::array();
  for (const MosaicScene& scene : document.scenes) scenes.push_back(ToJson(scene, paths, system));
  return json;
}

void ReadMatch(JsonFields& fields, MosaicDocument& document) {
  if (!fields.Has("match")) return;
  JsonFields match(fields.At("match"), fields.PointerOf("match"));
  const auto mode = match.GetOr<std::string>("mode", kModes[0]);
  if (mode != kModes[0] && mode != kModes[1]) {
    throw JsonMisfit{match.PointerOf("mode"), "has to be \"overlaps\" or \"scenes\""};
  }
  document.matchMode = mode == kModes[1] ? 1 : 0;
  document.bins =
      ReadWord<Form>(match.GetOr<std::string>("bins", "exact"), match.PointerOf("bins"));
  match.Finish();
}

void ReadScenes(JsonFields& fields, const PathForm& paths, const std::string& system,
                Systems& systems, MosaicDocument& document) {
  const Json& scenes = fields.At("scenes");
  const std::string at = fields.PointerOf("scenes");
  if (!scenes.is_array() || scenes.empty()) {
    throw JsonMisfit{at, "has to be a list with a scene at least"};
  }
  std::set<std::pair<std::string, std::vector<std::string>>> seen;
  for (std::size_t i = 0; i < scenes.size(); ++i) {
    const std::string pointer = fmt::format("{}/{}", at, i);
    MosaicScene scene = ReadScene(scenes[i], pointer, paths, system, systems);
    if (!seen.insert({scene.file, scene.options}).second) {
      throw JsonMisfit{pointer + "/file", scene.file + ": the scene is there twice"};
    }
    const bool fits =
        scene.header.dataType == document.dataType && scene.header.bands == document.bands;
    if (!fits) {
      throw JsonMisfit{pointer + "/header", "is of another pixel type or number of bands"};
    }
    document.scenes.push_back(std::move(scene));
  }
}

MosaicDocument FromJson(const Json& json, const PathForm& paths) {
  JsonFields fields(json, "");
  if (fields.Get<unsigned>(kVersionField) != kVersion) {
    throw JsonMisfit{fields.PointerOf(kVersionField),
                     fmt::format("only version {} is known", kVersion)};
  }
  fields.GetOr<std::string>("$schema", "");
  MosaicDocument document;
  document.dataType = ReadPixelType(fields);
  document.bands = fields.Get<unsigned>("bands");
  if (document.bands == 0) throw JsonMisfit{fields.PointerOf("bands"), "has to be above 0"};
  Systems systems;
  JsonFields grid(fields.At("grid"), fields.PointerOf("grid"));
  unsigned samples = 0, lines = 0;
  ReadSize(grid, samples, lines);
  const auto system = grid.GetOr<std::string>("coordinate_system", "");
  document.grid = ReadGeoRef(grid, "", systems);
  grid.Finish();
  if (document.grid->GetType() != GeoRef::kStd) {
    throw JsonMisfit{fields.PointerOf("grid"), "is no plain grid"};
  }
  document.grid->SetDimensions(samples, lines);
  if (fields.Has("no_data") && !fields.At("no_data").is_null()) {
    document.noData = JsonFields::Number(fields.At("no_data"), fields.PointerOf("no_data"));
  }
  document.resampling = ReadWord<PyramidResamplingMethod>(
      fields.GetOr<std::string>("resampling", "nearest"), fields.PointerOf("resampling"));
  document.featherWidth = fields.GetOr<double>("feather_width", 0);
  if (!(document.featherWidth >= 0 && document.featherWidth <= kMostFeatherWidth)) {
    throw JsonMisfit{fields.PointerOf("feather_width"),
                     fmt::format("has to be 0 to {} pixels", kMostFeatherWidth)};
  }
  document.reference = fields.GetOr<unsigned>("reference", 0);
  ReadMatch(fields, document);
  document.tables = paths.Absolute(fields.GetOr<std::string>("tables", ""));
  document.workingDirectory = paths.Absolute(fields.GetOr<std::string>("working_directory", "."));
  if (!document.workingDirectory.ends_with('/')) document.workingDirectory += '/';
  ReadScenes(fields, paths, system, systems, document);
  if (document.reference >= document.scenes.size()) {
    throw JsonMisfit{fields.PointerOf("reference"), "there is no such scene"};
  }
  fields.Finish();
  return document;
}

bool ReadText(const std::string& path, std::string& text, std::string& fault) {
  const auto file =
      platform::RandomAccessFile::Open(path, platform::RandomAccessFile::Access::kRead, &fault);
  std::uint64_t size = 0;
  if (!file || !file->GetSize(size, &fault)) return false;
  constexpr std::uint64_t kMost = std::uint64_t{256} << 20;
  if (size > kMost) {
    fault = path + ": too large for the definition of a mosaic";
    return false;
  }
  text.resize(size);
  return file->Read(0, text.data(), text.size(), &fault);
}

}  // namespace

Array<String> ConnStringsOf(const MosaicScene& scene) {
  std::vector<String> pieces;
  bool isFirst = true;
  for (const std::string& option : scene.options) {
    if (isFirst && FindFormat(String(option)) == nullptr) pieces.emplace_back(scene.file);
    isFirst = isFirst && FindFormat(String(option)) != nullptr;
    pieces.emplace_back(option);
  }
  const String file(scene.file);
  if (std::find(pieces.begin(), pieces.end(), file) == pieces.end()) pieces.push_back(file);
  Array<String> strings{ArrayDims(static_cast<unsigned>(pieces.size()))};
  std::copy(pieces.begin(), pieces.end(), strings.begin());
  return strings;
}

std::string StateOfScene(const MosaicScene& scene) {
  if (!IsPath(scene.file)) return {};
  std::string state;
  for (const char* const ending : {"", ".ovr", ".pyr"}) {
    const platform::FileIdentity file = platform::IdentifyFile(scene.file + ending);
    if (!file.exists && *ending == '\0') return {};
    if (!file.exists) continue;
    if (!state.empty()) state.append(" ").append(ending);
    state.append(state.empty() ? "" : " ").append(fmt::format("{} {}", file.size, file.time));
  }
  return state;
}

bool IsMosaicFile(const std::string& path) {
  if (!LowerCase(path).ends_with(kMosaicEnding)) return false;
  const auto file =
      platform::RandomAccessFile::Open(path, platform::RandomAccessFile::Access::kRead, nullptr);
  char begin[256];
  std::size_t got = 0;
  if (!file || !file->ReadUpTo(0, begin, sizeof(begin), got)) return false;
  const std::string text(begin, got);
  const std::size_t first = text.find_first_not_of(" \t\r\n");
  return first != text.npos && text[first] == '{';
}

namespace {

/// The definitions that were read last, as long as their files stay the same: a raster is opened by
/// several hands, each of which reads it.
class RecentDocuments {
 public:
  bool Find(const std::string& path, const platform::FileIdentity& file, MosaicDocument& document) {
    const std::lock_guard lock(lock_);
    for (const Entry& entry : entries_) {
      if (entry.path != path || !(entry.file == file)) continue;
      document = entry.document;
      return true;
    }
    return false;
  }
  void Add(const std::string& path, const platform::FileIdentity& file,
           const MosaicDocument& document) {
    const std::lock_guard lock(lock_);
    constexpr std::size_t kKept = 4;
    std::erase_if(entries_, [&](const Entry& entry) { return entry.path == path; });
    if (entries_.size() == kKept) entries_.erase(entries_.begin());
    entries_.push_back({path, file, document});
  }

 private:
  struct Entry {
    std::string path;
    platform::FileIdentity file;
    MosaicDocument document;
  };
  std::mutex lock_;
  std::vector<Entry> entries_;
};

RecentDocuments& GetRecentDocuments() {
  static RecentDocuments documents;
  return documents;
}

/// True for a file that was last changed so long ago that a change since would show in its time.
bool IsSettled(const platform::FileIdentity& file) {
  const auto now = std::chrono::duration_cast<std::chrono::nanoseconds>(
                       std::chrono::system_clock::now().time_since_epoch())
                       .count();
  constexpr std::int64_t kTick = 20'000'000;  // ns, above that of file systems' clocks
  return file.exists && now - file.time > kTick;
}

}  // namespace

bool ReadMosaicFile(const std::string& path, MosaicDocument& document, std::string& fault) {
  const platform::FileIdentity file = platform::IdentifyFile(path);
  if (MayReachFile(path, false) && GetRecentDocuments().Find(path, file, document)) return true;
  std::string text;
  if (!ReadText(path, text, fault)) return false;
  try {
    document = FromJson(ParseJson(text), PathForm(path));
    if (IsSettled(file) && platform::IdentifyFile(path) == file) {
      GetRecentDocuments().Add(path, file, document);
    }
    return true;
  } catch (const JsonMisfit& misfit) {
    fault = misfit.pointer.empty() && misfit.what.starts_with("line ")
                ? fmt::format("{}: {}", path, misfit.what)
                : fmt::format("{}: line {}: {}{}{}", path, LineOfJson(text, misfit.pointer),
                              misfit.pointer.empty() ? "" : misfit.pointer.c_str() + 1,
                              misfit.pointer.empty() ? "" : ": ", misfit.what);
  } catch (const std::exception& error) {
    fault = fmt::format("{}: {}", path, Printable(error.what(), 120));
  }
  return false;
}

bool WriteMosaicFile(const std::string& path, const MosaicDocument& document, std::string& fault,
                     const std::string& place) {
  const std::string text = WriteJson(ToJson(document, PathForm(place.empty() ? path : place)));
  return platform::ReplaceFile(path, text, &fault);
}

bool UpdateMosaicFile(const std::string& path,
                      const std::function<bool(MosaicDocument&, std::string&)>& change,
                      std::string& fault) {
  static std::mutex ofThisProcess;
  const std::lock_guard lock(ofThisProcess);
  OwnerFile owner(path);
  MosaicDocument document;
  return owner.Take(fault) && ReadMosaicFile(path, document, fault) && change(document, fault) &&
         WriteMosaicFile(path, document, fault);
}

}  // namespace lumo
