#include "rasters/vector_info.h"

#include <algorithm>
#include <cctype>
#include <filesystem>

#include <fmt/format.h>

#include "commands/value_text.h"
#include "foundation/near_name.h"
#include "georef/coordsys.h"
#include "jobs/result_output.h"

namespace lumo::host {
namespace {

constexpr const char* kEndings[] = {".gpkg", ".fgb", ".geojson", ".geojsons", ".geojsonl", ".shp",
                                    ".csv",  ".kml", ".gml",     ".topojson", ".fxv"};
constexpr const char* kQuery = "query";

std::string SystemName(const std::string& text) {
  CoordSys system;
  if (text.empty() || !system.SetFromString(String(text))) return {};
  return system.Info()->name.ToUTF8();
}

}  // namespace

bool IsVectorName(const std::string& file) {
  std::string ending = std::filesystem::path(file).extension().string();
  std::transform(ending.begin(), ending.end(), ending.begin(),
                 [](unsigned char c) { return static_cast<char>(std::tolower(c)); });
  return std::find(std::begin(kEndings), std::end(kEndings), ending) != std::end(kEndings);
}

JobDraft MakeVectorQuery(const std::string& file, unsigned layer) {
  JobDraft draft;
  JobWriterCommand& query = draft.Step(kQuery, "QueryVectorsCommand");
  query.AddInput("Vectors", String(std::filesystem::absolute(file).string()));
  query.AddInput("Layer", layer);
  return draft;
}

std::vector<VectorLayerInfo> ReadVectorLayers(JobSession& session, const std::string& file) {
  std::vector<VectorLayerInfo> layers;
  unsigned count = 1;
  for (unsigned layer = 0; layer < count; ++layer) {
    const JobResults results = session.Run(MakeVectorQuery(file, layer));
    const auto& returns = results.Find(kQuery).returns;
    count = ParseValue<unsigned>(returns.Find("Layers"));
    VectorLayerInfo info;
    info.name = returns.Find("Name").ToUTF8();
    info.geometry = returns.Find("Geometry").ToUTF8();
    info.records = ParseValue<std::int64_t>(returns.Find("Records"));
    if (returns.Find("Bounds").GetLength() != 0) {
      info.bounds = ParseValue<Array<double>>(returns.Find("Bounds"));
    }
    info.coordSys = returns.Find("CoordSys").ToUTF8();
    info.fields = ParseValue<Array<String>>(returns.Find("Fields"));
    info.fieldTypes = ParseValue<Array<String>>(returns.Find("FieldTypes"));
    layers.push_back(std::move(info));
  }
  return layers;
}

Json VectorAsJson(const std::string& file, const std::vector<VectorLayerInfo>& layers) {
  Json list = Json::array();
  for (const VectorLayerInfo& layer : layers) {
    Json fields = Json::array();
    for (unsigned i = 0; i < layer.fields.GetCount(); ++i) {
      fields.push_back(
          {{"name", layer.fields[i].ToUTF8()}, {"type", layer.fieldTypes[i].ToUTF8()}});
    }
    Json bounds;
    for (const double value : layer.bounds) bounds.push_back(NumberAsJson(value));
    list.push_back({{"name", layer.name},
                    {"geometry", layer.geometry},
                    {"records", layer.records},
                    {"bounds", bounds},
                    {"coordSys", layer.coordSys},
                    {"coordSysName", SystemName(layer.coordSys)},
                    {"fields", fields}});
  }
  return {{"file", file}, {"layers", list}};
}

std::string VectorAsText(const std::string& file, const std::vector<VectorLayerInfo>& layers) {
  std::string text = fmt::format("{}\n", Printable(file));
  for (const VectorLayerInfo& layer : layers) {
    const std::string name = SystemName(layer.coordSys);
    text += fmt::format("  layer          {}\n", Printable(layer.name));
    text += fmt::format("  records        {}, {}\n", layer.records, layer.geometry);
    text += fmt::format("  system         {}\n", name.empty() ? "none" : name);
    if (layer.bounds.GetCount() == 4) {
      text += fmt::format("  bounds         {:.10g} {:.10g} to {:.10g} {:.10g}\n", layer.bounds[0],
                          layer.bounds[1], layer.bounds[2], layer.bounds[3]);
    }
    for (unsigned i = 0; i < layer.fields.GetCount(); ++i) {
      text += fmt::format("  {:<14} {}, {}\n", i == 0 ? "columns" : "",
                          Printable(layer.fields[i].ToUTF8()), layer.fieldTypes[i].ToUTF8());
    }
  }
  return text;
}

}  // namespace lumo::host
