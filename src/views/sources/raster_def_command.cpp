#include "views/sources/raster_def_command.h"

#include "foundation/fault.h"

namespace lumo {
namespace {

/// The names of the types that a pixel can have.
std::vector<const char*> DataTypeWords() {
  static const std::vector<std::string> kNames = [] {
    std::vector<std::string> names;
    for (unsigned code = 0; code < 100; ++code) {
      if (DataTypeBytes(code) != 0) names.push_back(DataTypeName(code).ToUTF8());
    }
    return names;
  }();
  std::vector<const char*> words;
  for (const std::string& name : kNames) words.push_back(name.c_str());
  return words;
}

}  // namespace

bool RasterDefCommand::ReadRasterDef(RasterDef& def) const {
  if (HasInput("SrcURI")) {
    const BasicRasterPtr source(CatalogFind(Read<URI>("SrcURI")));
    if (source) def = source->GetRasterDef();
  }
  if (HasInput("Format")) def.format = Read<String>("Format");
  if (HasInput("Samples")) def.samples = Read<unsigned>("Samples");
  if (HasInput("Lines")) def.lines = Read<unsigned>("Lines");
  if (HasInput("Bands")) {
    def.bands = Read<unsigned>("Bands");
    def.noData.erase(def.noData.lower_bound(def.bands), def.noData.end());
  }
  if (HasInput("Interleave")) def.interleave = Read<Interleave>("Interleave");
  if (HasInput("DataType")) def.dataType = ParseDataType(Read<String>("DataType"));
  return ReadNoData(def) && ReadGeoRef(def);
}

bool RasterDefCommand::ReadNoData(RasterDef& def) const {
  const auto flags = Read<Array<bool>>("HasNoDataValue");
  const auto values = Read<Array<double>>("NoDataValue");
  if (flags.GetCount() > def.bands || values.GetCount() > def.bands) {
    SetFault("there are more no-data entries than bands");
    return false;
  }
  for (unsigned band = 0; band < flags.GetCount(); ++band) def.SetNoData(band, flags[band]);
  for (unsigned band = 0; band < values.GetCount(); ++band) def.noData[band] = values[band];
  return true;
}

bool RasterDefCommand::ReadGeoRef(RasterDef& def) const {
  if (!HasInput("GeoRef")) return true;
  const auto geoRef = Read<GeoRefPtr>("GeoRef");
  if (!geoRef) {
    SetFault("GeoRef makes no geo-reference");
    return false;
  }
  def.SetGeoRef(geoRef);
  return true;
}

std::vector<InputDeclaration> RasterDefInputs(std::vector<InputDeclaration> own) {
  own.insert(own.end(),
             {{"SrcURI", Presence::kOptional, ValueKind::kURI,
               "an open raster whose description is the start"},
              {"Samples", Presence::kOptional, ValueKind::kInteger, "pixels of a line"},
              {"Lines", Presence::kOptional, ValueKind::kInteger, "lines"},
              {"Bands", Presence::kOptional, ValueKind::kInteger, "bands"},
              {"DataType", Presence::kOptional, ValueKind::kWord, "pixel type", "", &DataTypeWords},
              {"HasNoDataValue", Presence::kOptional, ValueKind::kBooleanArray,
               "for each band, whether it has a no-data value"},
              {"NoDataValue", Presence::kOptional, ValueKind::kNumberArray,
               "no-data values of the bands, which have one then"},
              {"GeoRef", Presence::kOptional, ValueKind::kGeoRef, "the geo-reference"}});
  return own;
}

}  // namespace lumo
