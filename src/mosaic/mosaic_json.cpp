#include "mosaic/mosaic_json.h"

#include <cmath>
#include <filesystem>
#include <map>
#include <set>

#include <fmt/format.h>

#include "foundation/json_lines.h"
#include "foundation/near_name.h"
#include "foundation/text_case.h"
#include "georef/std_georef.h"
#include "mosaic/json_fields_body.h"
#include "mosaic/match_mode.h"
#include "raster/pixel_types.h"

namespace lumo {
namespace {

namespace fs = std::filesystem;
using Json = nlohmann::ordered_json;

constexpr const char* kVersionField = "vmosaic";
constexpr unsigned kVersion = 1;
constexpr const char* kModes[] = {"overlaps", "scenes"};

/// Turns the paths of a definition into those in its file, and back.
class PathForm {
 public:
  explicit PathForm(const std::string& file)
      : folder_(fs::absolute(file).lexically_normal().parent_path()) {}

  std::string Absolute(const std::string& text) const {
    if (text.empty() || !IsSceneOnDisk(text) || fs::path(text).is_absolute()) return text;
    return (folder_ / text).lexically_normal().string();
  }
  std::string Relative(const std::string& path) const {
    if (path.empty() || !IsSceneOnDisk(path)) return path;
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

}  // namespace

bool IsSceneOnDisk(const std::string& name) {
  return name.find("://") == name.npos && name.find(":\"") == name.npos &&
         !name.starts_with("/vsi");
}

std::string MosaicToJson(const MosaicDocument& document, const std::string& file) {
  const PathForm paths(file);
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
  return WriteJson(json);
}

MosaicDocument MosaicFromJson(const std::string& text, const std::string& file) {
  const Json json = ParseJson(text);
  const PathForm paths(file);
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

}  // namespace lumo
