#include "rasters/metadata_source.h"

#include <filesystem>
#include <fstream>
#include <map>

#include "data/format_table.h"
#include "foundation/text_case.h"
#include "metadata/metadata_formats.h"
#include "rasters/raster_source.h"
#include "verb.h"

namespace lumo::host {
namespace {

namespace fs = std::filesystem;

constexpr const char* kHeaderEnding = ".hdr";

/// The ending of a name in lower case, with its dot.
std::string EndingOf(const std::string& file) {
  return LowerCase(fs::path(file).extension().string());
}

/// The format of an XML file by the words near its beginning; empty for others.
std::string FormatOfXml(const std::string& file) {
  std::string start(1U << 16U, '\0');
  std::ifstream in(file, std::ios::binary);
  in.read(start.data(), static_cast<std::streamsize>(start.size()));
  start.resize(static_cast<std::size_t>(in.gcount()));
  const auto holds = [&](const char* word) { return start.find(word) != start.npos; };
  if (holds("<Rational_Function_Model")) return "PLEIADESRPC";
  if (holds("<Dimap_Document")) return "PLEIADESDIM";
  if (holds("<LANDSAT_METADATA_FILE")) return "LANDSAT";
  for (const char* const word :
       {"Level-1C_User_Product", "Level-2A_User_Product", "Level-1C_Tile_ID", "Level-2A_Tile_ID"}) {
    if (holds(word)) return "SENTINEL2";
  }
  return holds("FeatureCollection") ? "GML" : "";
}

std::string DetectFormat(const std::string& file) {
  static const std::map<std::string, const char*> kFormats = {
      {".imd", "DGIMD"}, {".rpb", "DGRPB"},  {".til", "DGTIL"}, {".tif", "TIFF"},
      {".tiff", "TIFF"}, {".img", "Erdas"},  {".grb", "GRIB"},  {".grb2", "GRIB"},
      {".grib", "GRIB"}, {".grib2", "GRIB"}, {".hdr", "ORVA"}};
  const std::string ending = EndingOf(file);
  const std::string name = LowerCase(fs::path(file).filename().string());
  for (const char* const end : {"mtl.txt", "mtl.json"}) {
    if (name.ends_with(end)) return "LANDSAT";
  }
  const auto known = kFormats.find(ending);
  if (known != kFormats.end()) return known->second;
  if (ending == ".xml" || ending == ".gml") {
    const std::string format = FormatOfXml(file);
    if (!format.empty()) return format;
  }
  return fs::exists(file + kHeaderEnding) ? "ORVA" : "";
}

std::string FormatWords() {
  std::string words;
  for (const MetadataFormat& format : GetMetadataFormats()) {
    words.append(words.empty() ? "" : ", ").append(format.word);
  }
  return words;
}

}  // namespace

MetadataSource ParseMetadataSource(const std::string& text) {
  MetadataSource source;
  const std::size_t colon = text.find(':');
  if (colon != text.npos && FindMetadataFormat(String(text.substr(0, colon))) != nullptr) {
    source = {text.substr(0, colon), text.substr(colon + 1)};
  } else {
    source = {DetectFormat(text), text};
  }
  if (source.format.empty()) {
    throw HostError(kExitUsage, text +
                                    ": the name doesn't tell what metadata these are; write "
                                    "FORMAT:FILE, where FORMAT is one of " +
                                    FormatWords());
  }
  const bool namesPixels = source.format == "ORVA" && EndingOf(source.file) != kHeaderEnding;
  if (namesPixels && fs::exists(source.file + kHeaderEnding)) source.file += kHeaderEnding;
  return source;
}

Array<String> ConnStringsOf(const MetadataSource& source) {
  return ConnStrings({String(source.format), String(AbsoluteName(source.file))});
}

}  // namespace lumo::host
