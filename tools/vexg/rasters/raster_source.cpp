#include "rasters/raster_source.h"

#include <algorithm>
#include <charconv>
#include <filesystem>

#include <fmt/format.h>

#include "data/file_uri.h"
#include "data/format_table.h"
#include "options/option_values.h"
#include "raster/pixel_types.h"
#include "verb.h"
#include "views/sources/catalog_raster_ref.h"

namespace lumo::host {
namespace {

/// The whole numbers between commas; false for anything else.
bool ParseNumbers(const std::string& text, std::vector<unsigned>& numbers) {
  const char* at = text.data();
  const char* const end = at + text.size();
  for (;;) {
    unsigned value = 0;
    const auto [next, fault] = std::from_chars(at, end, value);
    if (fault != std::errc()) return false;
    numbers.push_back(value);
    if (next == end) return true;
    if (*next != ',') return false;
    at = next + 1;
  }
}

}  // namespace

void SourceOptions::AddTo(OptionSet& line) {
  line.Add("file", file, "The raster").IsFile().Required();
  AddFormatTo(line);
}

void SourceOptions::AddFormatTo(OptionSet& line) {
  line.Add("--input-format", format, "Key of its format, see vexg formats; else detected")
      .Shows("KEY");
  line.Add("--subdataset", subdataset,
           "Which of the rasters in the file: its number, from 1, or the end of its name; as "
           "FILE|SUBDATASET=N")
      .Shows("N|NAME");
}

std::string FileOf(const SourceOptions& source) {
  return source.file.substr(0, source.file.find('|'));
}

std::string AbsoluteName(const std::string& file) {
  if (file.find('|') != std::string::npos) {
    throw HostError(kExitUsage, file + ": a job can't carry a name with | in it; rename the file");
  }
  if (String(file).ToUTF8() != file) {
    throw HostError(kExitUsage, file + ": the name is no UTF-8; rename the file");
  }
  if (file.empty()) throw HostError(kExitUsage, "a file's name is empty");
  if (file.find("://") != std::string::npos) return file;
  return std::filesystem::absolute(file).string();
}

Array<String> ConnStringsOf(const SourceOptions& source) {
  std::vector<String> pieces;
  if (!source.format.empty()) pieces.emplace_back(FormatKey("--input-format", source.format));
  const bool isMosaic = source.format.empty() && source.file.ends_with(".vmosaic");
  if (isMosaic) pieces.emplace_back("EXTERNAL");  // which no other format need be asked for
  std::string rest = source.file;
  std::size_t bar = rest.find('|');
  pieces.emplace_back(AbsoluteName(rest.substr(0, bar)));
  while (bar != rest.npos) {
    rest.erase(0, bar + 1);
    bar = rest.find('|');
    pieces.emplace_back(rest.substr(0, bar));
    if (pieces.back().ToUTF8().find('=') == std::string::npos) {
      throw HostError(kExitUsage, source.file +
                                      ": behind a | stands NAME=VALUE; a file whose name "
                                      "holds a | has to be renamed");
    }
  }
  if (!source.subdataset.empty()) pieces.emplace_back("SUBDATASET=" + source.subdataset);
  Array<String> strings{ArrayDims(static_cast<unsigned>(pieces.size()))};
  std::copy(pieces.begin(), pieces.end(), strings.begin());
  return strings;
}

void AddOpen(JobDraft& draft, const std::string& name, const SourceOptions& source) {
  JobWriterCommand& open = draft.Open(name, "OpenRasterCommand");
  open.AddInput("ConnStr", ConnStringsOf(source));
  open.AddInput("CheckSource", SourceCheck::kCompared);
}

std::vector<std::string> FilesOfSavedValues(const SourceOptions& source) {
  const std::string file = FileOf(source);
  return {file, file + ".hdr", file + ".aux.xml", file + ".pyr"};
}

std::string PyramidPathOf(const std::string& file) {
  return AbsoluteName(file) + ".pyr";
}

namespace {

/// The pyramid file that goes with a raster; empty for none.
std::string FindPyramid(const std::string& file) {
  if (file.find("://") != std::string::npos) return {};
  const std::string pyramid = PyramidPathOf(file);
  std::error_code fault;
  return std::filesystem::is_regular_file(pyramid, fault) ? pyramid : std::string();
}

}  // namespace

void AddOpenWithPyramid(JobDraft& draft, const std::string& name, const SourceOptions& source,
                        const char* levels) {
  JobWriterCommand& open = draft.Open(name, "OpenRasterCommand");
  open.AddInput("ConnStr", ConnStringsOf(source));
  open.AddInput("CheckSource", SourceCheck::kCompared);
  // A pyramid beside a file is of the raster that the file gives without further words.
  const bool isPlain = source.subdataset.empty() && source.file.find('|') == std::string::npos;
  const std::string pyramid = isPlain ? FindPyramid(source.file) : std::string();
  if (pyramid.empty()) return;
  open.AddInput("PyramidConnStr", ConnStrings({"Pyramid", String(pyramid)}));
  open.AddInput("PyramidCheck", PyramidCheck::kFitting);
  open.AddInput("Levels", String(levels));
}

void AddLevel(JobDraft& draft, const std::string& name, const String& raster, unsigned level) {
  JobWriterCommand& command = draft.Open(name, "GetRasterPyramidCommand", "PyramidURI");
  command.AddInput("URI", raster);
  command.AddInput("Level", level);
  command.AddInput("Placing", Form::kExact);
}

void AddBandView(JobDraft& draft, const std::string& name, const String& raster,
                 const Array<unsigned>& bands) {
  JobWriterCommand& view = draft.Open(name, "CreateSpectralSubsetRasterCommand");
  view.AddInput("SrcURI", raster);
  view.AddInput("Bands", bands);
}

std::string PathOf(const String& uri) {
  const std::string path = PathOfFileURI(ParseValue<URI>(uri));
  return path.substr(0, path.find('|'));  // a raster in a file
}

void AddQuery(JobDraft& draft, const std::string& name, const String& raster) {
  draft.Step(name + ".query", "ExtendedQueryRasterCommand").AddInput("URI", raster);
  draft.Step(name + ".georef", "GetRasterGeoRefCommand").AddInput("URI", raster);
}

RasterInfo ReadInfo(const JobResults& results, const std::string& name) {
  const Map<String, String>& query = results.Find(String(name + ".query")).returns;
  RasterInfo info;
  info.samples = ParseValue<unsigned>(query.Find("Samples"));
  info.lines = ParseValue<unsigned>(query.Find("Lines"));
  info.bands = ParseValue<unsigned>(query.Find("Bands"));
  info.dataType = ParseDataType(query.Find("DataType"));
  info.format = query.Find("Format");
  info.interleave = ParseValue<Interleave>(query.Find("Interleave"));
  info.tiles = ParseValue<TileDimensions>(query.Find("TileDimensions"));
  info.canWrite = ParseValue<bool>(query.Find("CanWrite"));
  info.hasPyramid = ParseValue<bool>(query.Find("PyramidExists"));
  info.pyramidType = query.Find("PyramidType");
  info.levelMin = ParseValue<unsigned>(query.Find("PyramidLevelMin"));
  info.levelMax = ParseValue<unsigned>(query.Find("PyramidLevelMax"));
  info.hasNoData = ParseValue<Array<bool>>(query.Find("HasNoDataValue"));
  info.noData = query.Find("NoDataValue");
  info.hasPalette = ParseValue<Array<bool>>(query.Find("HasPalette"));
  info.geoRefText = results.Find(String(name + ".georef")).returns.Find("GeoRef");
  info.geoRef = ParseValue<GeoRefPtr>(info.geoRefText);
  const bool hasPixels = info.samples != 0 && info.lines != 0 && info.bands != 0;
  if (!hasPixels || DataTypeBytes(info.dataType) == 0 || info.hasNoData.GetCount() != info.bands ||
      info.hasPalette.GetCount() != info.bands) {
    throw HostError(kExitFailed, "the raster holds no pixels");
  }
  if (info.geoRef) info.geoRef->SetDimensions(info.samples, info.lines);
  return info;
}

bool HoldsCodes(const RasterInfo& info, const Array<unsigned>& bands) {
  using Wide = TypeList<std::int32_t, std::uint32_t, std::int64_t, std::uint64_t>;
  return DispatchType(Wide{}, info.dataType, []<typename T>() { return true; }) ||
         std::any_of(bands.begin(), bands.end(),
                     [&](unsigned band) { return info.hasPalette[band]; });
}

Interleave ParseInterleave(const std::string& word) {
  return word == "bsq" ? Interleave::BSQ : word == "bil" ? Interleave::BIL : Interleave::BIP;
}

SubRect ParseRect(const std::string& text, const RasterInfo& info) {
  if (text.empty()) return info.GetRect();
  std::vector<unsigned> n;
  if (!ParseNumbers(text, n) || n.size() != 4 || n[0] > n[2] || n[1] > n[3]) {
    throw HostError(kExitUsage, "--rect: \"" + text +
                                    "\" is not left,top,right,bottom, counted from 0 and "
                                    "inclusive");
  }
  if (n[2] >= info.samples || n[3] >= info.lines) {
    throw HostError(kExitUsage, fmt::format("--rect: {} reaches over the raster's {} by {} pixels",
                                            text, info.samples, info.lines));
  }
  return {n[0], n[1], n[2], n[3]};
}

Array<unsigned> ParseBands(const std::string& text, const RasterInfo& info) {
  std::vector<unsigned> numbers;
  if (text.empty()) {
    for (unsigned band = 0; band < info.bands; ++band) numbers.push_back(band);
  } else if (!ParseNumbers(text, numbers)) {
    throw HostError(kExitUsage, "--bands: \"" + text + "\" is not a list of bands such as 0,2,1");
  }
  Array<unsigned> bands{ArrayDims(static_cast<unsigned>(numbers.size()))};
  for (unsigned i = 0; i < bands.GetCount(); ++i) {
    if (numbers[i] >= info.bands) {
      throw HostError(kExitUsage, fmt::format("--bands: the raster has no band {}, only 0 to {}",
                                              numbers[i], info.bands - 1));
    }
    bands[i] = numbers[i];
  }
  return bands;
}

}  // namespace lumo::host
