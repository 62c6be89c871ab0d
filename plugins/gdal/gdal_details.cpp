#include "gdal_details.h"

#include <array>
#include <cpl_conv.h>
#include <cpl_minixml.h>
#include <cpl_string.h>
#include <gdal_pam.h>
#include <gdal_rat.h>
#include <locale>
#include <map>
#include <memory>
#include <ogr_srs_api.h>
#include <sstream>
#include <string>
#include <vector>

#include "raster/pixel_types.h"
#include "raster/raster_details.h"

namespace lumo::gdal {
namespace {

constexpr const char* kItems = "Items/";
constexpr const char* kPoints = "Points/";
/// The text of an attribute table that is to be made of the names of values.
constexpr const char* kOfCategories = "Categories";

/// Names of items that describe a file and its pixels as they lie there, not of the raster.
bool IsOfFile(const std::string& name) {
  return name.starts_with("STATISTICS_") || name.starts_with("NITF_") || name == "JPEG_QUALITY";
}

/// A slash would be a step down the tree.
std::string Encoded(const std::string& name) {
  std::string text;
  for (const char c : name) text += c == '/' ? "%2F" : c == '%' ? "%25" : std::string(1, c);
  return text;
}

std::string Decoded(const std::string& name) {
  std::string text;
  for (std::size_t i = 0; i < name.size(); ++i) {
    const bool isSlash = name.compare(i, 3, "%2F") == 0, isPercent = name.compare(i, 3, "%25") == 0;
    text += isSlash ? '/' : isPercent ? '%' : name[i];
    if (isSlash || isPercent) i += 2;
  }
  return text;
}

std::string TextOf(double number) {
  return FormatValue(number).ToUTF8();
}

template <std::size_t N>
std::string TextOf(const std::array<double, N>& numbers) {
  std::string text;
  for (const double number : numbers) text.append(text.empty() ? "" : " ").append(TextOf(number));
  return text;
}

/// N numbers with blanks between them. False for another text.
template <std::size_t N>
bool NumbersOf(const std::string& text, std::array<double, N>& numbers) {
  std::istringstream in(text);
  in.imbue(std::locale::classic());
  for (double& number : numbers) {
    if (!(in >> number)) return false;
  }
  return true;
}

/// Calls `enter(name, value)` for each item of the main domain that describes the raster.
template <typename Enter>
void VisitItems(GDALMajorObjectH object, const Enter& enter) {
  for (char** item = GDALGetMetadata(object, nullptr); item != nullptr && *item != nullptr;
       ++item) {
    char* name = nullptr;
    const char* const value = CPLParseNameValue(*item, &name);
    const bool isUsual = *item == std::string("AREA_OR_POINT=Area");
    if (name != nullptr && value != nullptr && !isUsual && !IsOfFile(name)) enter(name, value);
    CPLFree(name);
  }
}

/// The name of a band's meaning, where it has one of its own.
std::string MeaningOf(GDALRasterBandH band) {
  const GDALColorInterp meaning = GDALGetRasterColorInterpretation(band);
  const bool isPlain =
      meaning == GCI_Undefined || meaning == GCI_GrayIndex || meaning == GCI_PaletteIndex;
  return isPlain ? std::string() : GDALGetColorInterpretationName(meaning);
}

/// The names of the values of a band, each on a line.
std::string CategoriesOf(GDALRasterBandH band) {
  std::string lines;
  for (char** name = GDALGetRasterCategoryNames(band); name != nullptr && *name != nullptr;
       ++name) {
    lines.append(*name).append("\n");
  }
  return lines;
}

/// The same as a list of GDAL's.
CPLStringList CategoryList(const std::string& lines) {
  CPLStringList list;
  std::istringstream in(lines);
  for (std::string line; std::getline(in, line);) list.AddString(line.c_str());
  return list;
}

/// The attribute table of a band as XML; empty where it has none that tells more than how often
/// values are.
std::string TableOf(GDALRasterBandH band) {
  constexpr int kMostRows = 65536;
  if (band == nullptr) return {};  // of a file that can't be read any more
  GDALRasterAttributeTable* const table = GDALRasterBand::FromHandle(band)->GetDefaultRAT();
  if (table == nullptr || table->GetRowCount() == 0 || table->GetRowCount() > kMostRows) return {};
  bool tells = false;
  for (int i = 0; i < table->GetColumnCount(); ++i) {
    tells = tells || table->GetTypeOfCol(i) == GFT_String || table->GetUsageOfCol(i) == GFU_Generic;
  }
  CPLXMLNode* const tree = tells ? table->Serialize() : nullptr;
  char* const text = tree != nullptr ? CPLSerializeXMLTree(tree) : nullptr;
  std::string xml = text != nullptr ? text : "";
  CPLFree(text);
  CPLDestroyXMLNode(tree);
  return xml;
}

/// Reads one. False for a text that is none.
bool ReadTable(const std::string& xml, GDALDefaultRasterAttributeTable& table) {
  CPLXMLNode* const tree = CPLParseXMLString(xml.c_str());
  const bool done = tree != nullptr && table.XMLInit(tree, "") == CE_None;
  CPLDestroyXMLNode(tree);
  return done;
}

/// Makes one of the names and colours of the values of a band.
void MakeTable(GDALRasterBand& band, const std::string& categories,
               GDALDefaultRasterAttributeTable& table) {
  table.SetTableType(GRTT_THEMATIC);
  table.CreateColumn("Value", GFT_Integer, GFU_MinMax);
  table.CreateColumn("Class", GFT_String, GFU_Name);
  const CPLStringList names = CategoryList(categories);
  const GDALColorTable* const colors = band.GetColorTable();
  if (colors != nullptr) {
    table.CreateColumn("Red", GFT_Integer, GFU_Red);
    table.CreateColumn("Green", GFT_Integer, GFU_Green);
    table.CreateColumn("Blue", GFT_Integer, GFU_Blue);
  }
  for (int value = 0, row = 0; value < names.size(); ++value) {
    if (names[value][0] == '\0') continue;
    table.SetValue(row, 0, value);
    table.SetValue(row, 1, names[value]);
    const GDALColorEntry* const color = colors != nullptr && value < colors->GetColorEntryCount()
                                            ? colors->GetColorEntry(value)
                                            : nullptr;
    if (color != nullptr) {
      table.SetValue(row, 2, color->c1);
      table.SetValue(row, 3, color->c2);
      table.SetValue(row, 4, color->c3);
    }
    ++row;
  }
}

/// The details of a band by their names.
std::map<std::string, std::string> DetailsOf(GDALRasterBandH band) {
  std::map<std::string, std::string> details;
  const auto enter = [&](const std::string& name, const char* text) {
    if (text != nullptr && *text != '\0') details[name] = text;
  };
  enter("Description", GDALGetDescription(band));
  enter("Unit", GDALGetRasterUnitType(band));
  enter("Meaning", MeaningOf(band).c_str());
  enter("Categories", CategoriesOf(band).c_str());
  enter("AttributeTable", TableOf(band).c_str());
  int has = FALSE;
  const double scale = GDALGetRasterScale(band, &has);
  if (has != FALSE && scale != 1) details["Scale"] = TextOf(scale);
  const double offset = GDALGetRasterOffset(band, &has);
  if (has != FALSE && offset != 0) details["Offset"] = TextOf(offset);
  VisitItems(band, [&](const std::string& name, const char* value) {
    details[kItems + Encoded(name)] = value;
  });
  return details;
}

std::string WktOf(OGRSpatialReferenceH system) {
  if (system == nullptr) return {};
  const char* const options[] = {"FORMAT=WKT2_2018", nullptr};
  char* text = nullptr;
  std::string wkt;
  if (OSRExportToWktEx(system, &text, options) == OGRERR_NONE && text != nullptr) wkt = text;
  CPLFree(text);
  return wkt;
}

void ReadPlace(GDALDatasetH dataset, bool hasGrid, Metadata& metadata) {
  const auto set = [&](const std::string& name, const std::string& text) {
    if (!text.empty()) metadata.Set(DetailPath(name), String(text));
  };
  std::array<double, 6> grid{};
  if (!hasGrid && GDALGetGeoTransform(dataset, grid.data()) == CE_None) set("Grid", TextOf(grid));
  const int count = GDALGetGCPCount(dataset);
  const GDAL_GCP* const points = GDALGetGCPs(dataset);
  for (int i = 0; points != nullptr && i < count; ++i) {
    const GDAL_GCP& p = points[i];
    set(kPoints + std::to_string(i + 1),
        TextOf(std::array{p.dfGCPPixel, p.dfGCPLine, p.dfGCPX, p.dfGCPY, p.dfGCPZ}));
  }
  const bool hasPoints = points != nullptr && count > 0;
  if (hasPoints || !hasGrid) {
    set("CoordSys", WktOf(hasPoints ? GDALGetGCPSpatialRef(dataset) : GDALGetSpatialRef(dataset)));
  }
}

/// The details that a definition has beside its fields, sorted by what they belong to.
struct Wanted {
  explicit Wanted(const RasterDef& def) : bands(def.bands) {
    for (const std::string& name : DetailNames(def.metadata)) {
      const std::string text = FindDetail(def.metadata, DetailPath(name));
      if (name.starts_with(kItems)) {
        items[Decoded(name.substr(std::string(kItems).size()))] = text;
      } else if (name.starts_with("Bands/")) {
        const std::size_t slash = name.find('/', 6);
        const unsigned long band = std::strtoul(name.c_str() + 6, nullptr, 10);
        if (slash != name.npos && band < bands.size()) bands[band][name.substr(slash + 1)] = text;
      } else if (name.starts_with(kPoints)) {
        std::array<double, 5> numbers{};
        if (NumbersOf(text, numbers)) points.push_back(numbers);
      } else if (name == "Grid") {
        hasGrid = NumbersOf(text, grid);
      } else if (name == "CoordSys") {
        coordSys = text;
      }
    }
    // The geo-reference goes before them.
    const bool isPlaced = def.geoRef && (def.geoRef->GetType() == GeoRef::kStd ||
                                         def.geoRef->GetType() == GeoRef::kStdRpc);
    if (isPlaced) {
      hasGrid = false;
      points.clear();
      coordSys.clear();
    }
  }

  std::map<std::string, std::string> items;
  std::vector<std::map<std::string, std::string>> bands;
  std::vector<std::array<double, 5>> points;
  std::array<double, 6> grid{};
  bool hasGrid = false;
  std::string coordSys;
};

struct SystemReleaser {
  void operator()(void* system) const { OSRRelease(system); }
};
using SystemPtr = std::unique_ptr<void, SystemReleaser>;

SystemPtr MakeSystem(const std::string& wkt) {
  if (wkt.empty()) return {};
  SystemPtr system(OSRNewSpatialReference(nullptr));
  if (OSRSetFromUserInput(system.get(), wkt.c_str()) != OGRERR_NONE) return {};
  OSRSetAxisMappingStrategy(system.get(), OAMS_TRADITIONAL_GIS_ORDER);
  return system;
}

/// Sets a detail of a band. Drivers that have no room for one may refuse it, which is no failure:
/// CompleteDetails comes after.
void SetDetail(GDALRasterBandH band, const std::string& name, const std::string& text) {
  const std::string items = kItems;
  if (name == "Description") {
    GDALSetDescription(band, text.c_str());
  } else if (name == "Unit") {
    GDALSetRasterUnitType(band, text.c_str());
  } else if (name == "Scale") {
    GDALSetRasterScale(band, CPLAtof(text.c_str()));
  } else if (name == "Offset") {
    GDALSetRasterOffset(band, CPLAtof(text.c_str()));
  } else if (name == "Meaning") {
    GDALSetRasterColorInterpretation(band, GDALGetColorInterpretationByName(text.c_str()));
  } else if (name == "Categories") {
    GDALSetRasterCategoryNames(band, CategoryList(text).List());
  } else if (name.starts_with(items)) {
    GDALSetMetadataItem(band, Decoded(name.substr(items.size())).c_str(), text.c_str(), nullptr);
  }
}

/// The same into the file beside the raster's.
bool SetDetailBeside(GDALPamRasterBand& band, const std::string& name, const std::string& text) {
  using Base = GDALPamRasterBand;
  const std::string items = kItems;
  const double number = CPLAtof(text.c_str());
  if (name == "Description") {
    band.Base::SetDescription(text.c_str());
    return true;
  }
  if (name == "Unit") return band.Base::SetUnitType(text.c_str()) == CE_None;
  if (name == "Scale") return band.Base::SetScale(number) == CE_None;
  if (name == "Offset") return band.Base::SetOffset(number) == CE_None;
  if (name == "Meaning") {
    const GDALColorInterp meaning = GDALGetColorInterpretationByName(text.c_str());
    return band.Base::SetColorInterpretation(meaning) == CE_None;
  }
  if (name == "Categories") {
    return band.Base::SetCategoryNames(CategoryList(text).List()) == CE_None;
  }
  if (name == "AttributeTable") {
    if (text == kOfCategories) return true;  // comes last
    GDALDefaultRasterAttributeTable table;
    return !ReadTable(text, table) || band.SetDefaultRAT(&table) == CE_None;
  }
  if (!name.starts_with(items)) return true;
  const std::string item = Decoded(name.substr(items.size()));
  return band.Base::SetMetadataItem(item.c_str(), text.c_str()) == CE_None;
}

std::vector<GDAL_GCP> PointsOf(const Wanted& wanted) {
  static char kEmpty[] = "";
  std::vector<GDAL_GCP> points;
  for (const auto& [pixel, line, x, y, z] : wanted.points) {
    points.push_back({kEmpty, kEmpty, pixel, line, x, y, z});
  }
  return points;
}

}  // namespace

void ReadDetails(GDALDatasetH dataset, bool hasGrid, Metadata& metadata) {
  for (int i = 0; i < GDALGetRasterCount(dataset); ++i) {
    for (const auto& [name, text] : DetailsOf(GDALGetRasterBand(dataset, i + 1))) {
      metadata.Set(BandDetailPath(static_cast<unsigned>(i), name), String(text));
    }
  }
  VisitItems(dataset, [&](const std::string& name, const char* value) {
    metadata.Set(DetailPath(kItems + Encoded(name)), String(value));
  });
  ReadPlace(dataset, hasGrid, metadata);
}

void WriteBandDetails(GDALDatasetH dataset, const RasterDef& def) {
  const Wanted wanted(def);
  for (std::size_t i = 0; i < wanted.bands.size(); ++i) {
    GDALRasterBandH const band = GDALGetRasterBand(dataset, static_cast<int>(i) + 1);
    for (const auto& [name, text] : wanted.bands[i]) SetDetail(band, name, text);
  }
  for (const auto& [name, text] : wanted.items) {
    GDALSetMetadataItem(dataset, name.c_str(), text.c_str(), nullptr);
  }
}

bool HasPlaceDetails(const RasterDef& def) {
  const Wanted wanted(def);
  return wanted.hasGrid || !wanted.points.empty() || !wanted.coordSys.empty();
}

bool WritePlaceDetails(GDALDatasetH dataset, const RasterDef& def) {
  const Wanted wanted(def);
  const SystemPtr system = MakeSystem(wanted.coordSys);
  const std::vector<GDAL_GCP> points = PointsOf(wanted);
  if (!points.empty()) {
    return GDALSetGCPs2(dataset, static_cast<int>(points.size()), points.data(), system.get()) ==
           CE_None;
  }
  std::array<double, 6> grid = wanted.grid;
  return (!wanted.hasGrid || GDALSetGeoTransform(dataset, grid.data()) == CE_None) &&
         (system == nullptr || GDALSetSpatialRef(dataset, system.get()) == CE_None);
}

bool CompleteDetails(GDALPamDataset& file, const RasterDef& def) {
  Wanted wanted(def);
  bool done = true;
  const bool isImagine = file.GetDriver() == GDALGetDriverByName("HFA");
  for (std::size_t i = 0; i < wanted.bands.size(); ++i) {
    if (wanted.bands[i].empty()) continue;
    GDALRasterBand* const band = file.GetRasterBand(static_cast<int>(i) + 1);
    auto* const target = dynamic_cast<GDALPamRasterBand*>(band);
    // Imagine files have tables of their own, which no file beside them replaces.
    if (isImagine) wanted.bands[i].erase("AttributeTable");
    const auto has = DetailsOf(GDALRasterBand::ToHandle(band));
    for (const auto& [name, text] : wanted.bands[i]) {
      const auto found = has.find(name);
      if (found != has.end() && found->second == text) continue;
      if (target != nullptr) done = SetDetailBeside(*target, name, text) && done;
    }
    const auto table = wanted.bands[i].find("AttributeTable");
    if (table != wanted.bands[i].end() && table->second == kOfCategories && target != nullptr) {
      GDALDefaultRasterAttributeTable made;
      MakeTable(*band, wanted.bands[i]["Categories"], made);
      done = target->SetDefaultRAT(&made) == CE_None && done;
    }
  }
  for (const auto& [name, text] : wanted.items) {
    const char* const value = file.GetMetadataItem(name.c_str());
    if (value != nullptr && text == value) continue;
    done = file.GDALPamDataset::SetMetadataItem(name.c_str(), text.c_str()) == CE_None && done;
  }
  const SystemPtr system = MakeSystem(wanted.coordSys);
  const auto* const reference = OGRSpatialReference::FromHandle(system.get());
  const std::vector<GDAL_GCP> points = PointsOf(wanted);
  const auto count = static_cast<int>(points.size());
  if (count != 0) {
    const bool has = file.GetGCPCount() == count;
    return done &&
           (has || file.GDALPamDataset::SetGCPs(count, points.data(), reference) == CE_None);
  }
  std::array<double, 6> grid{};
  const bool lacksGrid = wanted.hasGrid && (file.GetGeoTransform(grid.data()) != CE_None ||
                                            TextOf(grid) != TextOf(wanted.grid));
  grid = wanted.grid;
  if (lacksGrid) done = file.GDALPamDataset::SetGeoTransform(grid.data()) == CE_None && done;
  const bool lacksSystem = reference != nullptr && (file.GetSpatialRef() == nullptr ||
                                                    !file.GetSpatialRef()->IsSame(reference));
  if (lacksSystem) done = file.GDALPamDataset::SetSpatialRef(reference) == CE_None && done;
  return done;
}

bool GivesMask(const RasterDef& def) {
  return (def.bands == 2 || def.bands == 4) &&
         (def.dataType == kDataTypeOf<std::uint8_t> || def.dataType == kDataTypeOf<std::uint16_t>);
}

bool IsAlpha(const RasterDef& def, unsigned band) {
  return FindDetail(def.metadata, BandDetailPath(band, "Meaning")) == "Alpha";
}

bool IsInColors(const RasterDef& def) {
  const auto means = [&](unsigned band, const char* meaning) {
    return FindDetail(def.metadata, BandDetailPath(band, "Meaning")) == meaning;
  };
  return def.bands >= 3 && means(0, "Red") && means(1, "Green") && means(2, "Blue");
}

}  // namespace lumo::gdal
