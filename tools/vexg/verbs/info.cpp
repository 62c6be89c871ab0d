#include <cmath>
#include <iostream>
#include <memory>
#include <optional>

#include <fmt/format.h>

#include "foundation/near_name.h"
#include "output/json_number.h"
#include "platform/memory_shortage.h"
#include "rasters/band_notes.h"
#include "rasters/raster_source.h"
#include "rasters/vector_info.h"
#include "verb.h"

namespace lumo::host {
namespace {

struct InfoOptions {
  std::vector<std::string> files;
  bool compare = false;
  bool wkt = false;
  SourceOptions source;
  RasterJobOptions job;
  bool json = false;
};

/// A no-data value, which may be NaN or infinite: these are words, since null says that there is
/// none.
template <typename T>
Json NoDataValueAsJson(const T& value) {
  if constexpr (std::is_floating_point_v<T>) {
    if (!std::isfinite(value)) return FormatValue(value).ToUTF8();
  }
  return NumberAsJson(value);
}

/// For each band its no-data value, or null.
Json NoDataAsJson(const RasterInfo& info) {
  Json list = Json::array();
  DispatchType(TwelveTypes{}, info.dataType, [&]<typename T>() {
    const auto values = ParseValue<Array<T>>(info.noData);
    for (unsigned band = 0; band < info.bands; ++band) {
      const bool has = info.hasNoData[band] && band < values.GetCount();
      list.push_back(has ? NoDataValueAsJson(values[band]) : Json());
    }
    return true;
  });
  return list;
}

const char* TypeWord(const GeoRef& geoRef) {
  switch (geoRef.GetType()) {
    case GeoRef::kStd:
      return "Std";
    case GeoRef::kRpc:
      return "Rpc";
    case GeoRef::kStdRpc:
      return "StdRpc";
    default:
      return "Unknown";
  }
}

/// A corner of the raster, on the map and in longitude and latitude of its coordinate system.
struct Corner {
  const char* name;
  double x = NAN;
  double y = NAN;
  double longitude = NAN;
  double latitude = NAN;
};

std::vector<Corner> CornersOf(const RasterInfo& info) {
  // Cameras count from the centre of the first pixel, grids from its corner.
  const double first = info.geoRef->GetType() == GeoRef::kRpc ? -0.5 : 0.0;
  const double right = first + info.samples;
  const double bottom = first + info.lines;
  std::vector<Corner> corners{{"upperLeft", first, first},
                              {"upperRight", right, first},
                              {"lowerLeft", first, bottom},
                              {"lowerRight", right, bottom}};
  const CoordSys& system = info.geoRef->CoordinateSystem();
  for (Corner& corner : corners) {
    double x = NAN, y = NAN;
    if (!info.geoRef->PixelToMap(corner.x, corner.y, x, y)) x = y = NAN;
    corner.x = x;
    corner.y = y;
    if (system.Type() != 0) system.MapToGeo(x, y, corner.longitude, corner.latitude);
  }
  return corners;
}

String SystemText(const GeoRef& geoRef) {
  String text("");
  geoRef.CoordinateSystem().ToString(text);
  return text;
}

Json PairAsJson(double x, double y) {
  return Json::array({NumberAsJson(x), NumberAsJson(y)});
}

Json GeoRefAsJson(const RasterInfo& info) {
  if (!info.geoRef) return {};
  const GeoRef& geoRef = *info.geoRef;
  Json corners = Json::object();
  Json lonLat = Json::object();
  for (const Corner& corner : CornersOf(info)) {
    corners[corner.name] = PairAsJson(corner.x, corner.y);
    lonLat[corner.name] = PairAsJson(corner.longitude, corner.latitude);
  }
  return {{"type", TypeWord(geoRef)},
          {"pixelSize", PairAsJson(geoRef.PixelSizeX(), geoRef.PixelSizeY())},
          {"tieMap", PairAsJson(geoRef.TieMapX(), geoRef.TieMapY())},
          {"tiePixel", PairAsJson(geoRef.TiePixelX(), geoRef.TiePixelY())},
          {"rotation", geoRef.Rotation()},
          {"coordSys", SystemText(geoRef).ToUTF8()},
          {"coordSysName", geoRef.CoordinateSystem().Info()->name.ToUTF8()},
          {"corners", corners},
          {"cornersLonLat", geoRef.CoordinateSystem().Type() != 0 ? lonLat : Json()}};
}

Json FlagsAsJson(const Array<bool>& flags) {
  Json list = Json::array();
  for (const bool flag : flags) list.push_back(flag);
  return list;
}

Json NotesAsJson(const RasterNotes& notes) {
  const auto text = [](const std::string& of) { return of.empty() ? Json() : Json(of); };
  const auto number = [](const std::string& of) {
    return of.empty() ? Json() : NumberAsJson(ParseValue<double>(String(of)));
  };
  Json list = Json::array();
  for (const BandNotes& band : notes.bands) {
    list.push_back({{"name", text(band.name)},
                    {"meaning", text(band.meaning)},
                    {"unit", text(band.unit)},
                    {"scale", number(band.scale)},
                    {"offset", number(band.offset)}});
  }
  return list;
}

/// The blocks of the file, or those that reading goes by where it says nothing of them.
TileDimensions BlocksOf(const RasterInfo& info, const RasterNotes& notes) {
  return notes.blocks.width != 0 ? notes.blocks : info.tiles;
}

std::string BlocksAsText(const RasterInfo& info, const RasterNotes& notes) {
  const TileDimensions blocks = BlocksOf(info, notes);
  if (blocks.width == 0) return "none";
  if (blocks.width < info.samples) return fmt::format("{} x {}", blocks.width, blocks.height);
  const unsigned lines = std::min(blocks.height, info.lines);
  return lines <= 1 ? "single lines" : fmt::format("strips of {} lines", lines);
}

Json AsJson(const std::string& file, const RasterInfo& info, const RasterNotes& notes) {
  return {{"file", file},
          {"format", info.format.ToUTF8()},
          {"samples", info.samples},
          {"lines", info.lines},
          {"bands", info.bands},
          {"dataType", DataTypeName(info.dataType).ToUTF8()},
          {"interleave", FormatValue(info.interleave).ToUTF8()},
          {"blockSize", Json::array({BlocksOf(info, notes).width, BlocksOf(info, notes).height})},
          {"compression", notes.compression.empty() ? Json() : Json(notes.compression)},
          {"noData", NoDataAsJson(info)},
          {"hasPalette", FlagsAsJson(info.hasPalette)},
          {"bandDetails", NotesAsJson(notes)},
          {"alphaBand", notes.alpha ? Json(*notes.alpha) : Json()},
          {"epsg", notes.epsg != 0 ? Json(notes.epsg) : Json()},
          {"canWrite", info.canWrite},
          {"hasPyramid", info.hasPyramid},
          {"pyramidLevels", info.hasPyramid ? Json::array({info.levelMin, info.levelMax}) : Json()},
          {"geoRef", GeoRefAsJson(info)}};
}

/// All bands' entries on one line, or the one that they share.
std::string BandsAsText(const Json& list) {
  const auto text = [](const Json& entry) {
    return entry.is_null()     ? std::string("none")
           : entry.is_string() ? entry.get<std::string>()
                               : entry.dump();
  };
  bool same = true;
  for (const Json& entry : list) same = same && entry == list.front();
  if (same) return text(list.front());
  std::string all;
  for (const Json& entry : list) all.append(all.empty() ? "" : ", ").append(text(entry));
  return all;
}

/// The code and the name of a system, or for one without a name its projection.
std::string SystemAsText(const GeoRef& geoRef, const RasterNotes& notes) {
  if (SystemText(geoRef).GetLength() == 0) return "none";
  const CoordSysInfo& info = *geoRef.CoordinateSystem().Info();
  std::string name = info.name.ToUTF8();
  if (name.empty()) {
    const std::string projection = info.projectionName.ToUTF8(), datum = info.datumName.ToUTF8();
    name = fmt::format("without a name{}{}", projection.empty() ? "" : ", " + projection,
                       datum.empty() ? "" : ", " + datum);
  }
  return notes.epsg != 0 ? fmt::format("EPSG:{} {}", notes.epsg, name) : name;
}

std::string GeoRefAsText(const RasterInfo& info, const RasterNotes& notes, bool wkt) {
  if (!info.geoRef) return "  geo-reference  none\n";
  const GeoRef& geoRef = *info.geoRef;
  std::string text = fmt::format("  geo-reference  {}\n", TypeWord(geoRef));
  text += fmt::format("  system         {}\n", SystemAsText(geoRef, notes));
  if (wkt) text += fmt::format("  WKT            {}\n", SystemText(geoRef).ToUTF8());
  const bool hasUnit = SystemText(geoRef).GetLength() != 0;
  text += fmt::format("  pixel size     {:.10g} {:.10g}{}{}\n", geoRef.PixelSizeX(),
                      geoRef.PixelSizeY(), hasUnit ? " " : "",
                      hasUnit ? geoRef.CoordinateSystem().Info()->unitName.ToUTF8() : "");
  if (geoRef.GetType() != GeoRef::kRpc) {
    text += fmt::format("  tie point      pixel {} {} at {} {}\n", geoRef.TiePixelX(),
                        geoRef.TiePixelY(), geoRef.TieMapX(), geoRef.TieMapY());
    text += fmt::format("  rotation       {} degrees\n", geoRef.Rotation());
  }
  for (const Corner& corner : CornersOf(info)) {
    text += fmt::format("  {:<14} {:.10g} {:.10g}", corner.name, corner.x, corner.y);
    const bool placed = std::isfinite(corner.longitude) && std::isfinite(corner.latitude);
    if (placed) text += fmt::format("  ({:.8f} {:.8f})", corner.longitude, corner.latitude);
    text += '\n';
  }
  return text;
}

/// A line for each band that says something of itself.
std::string BandsAsText(const RasterNotes& notes, const RasterInfo& info) {
  std::string text;
  for (std::size_t i = 0; i < notes.bands.size(); ++i) {
    const BandNotes& band = notes.bands[i];
    const bool hasPalette = info.hasPalette[static_cast<unsigned>(i)];
    if (band.IsEmpty() && !hasPalette) continue;
    std::string words;
    const auto add = [&](const std::string& word) {
      if (!word.empty()) words.append(words.empty() ? "" : ", ").append(Printable(word));
    };
    add(band.name);
    add(band.meaning);
    if (hasPalette) add("colours of a palette");
    if (band.IsScaled()) add("value = " + band.GetScaling());
    if (!band.unit.empty()) add("in " + band.unit);
    text += fmt::format("  {:<14} {}\n", fmt::format("band {}", i), words);
  }
  return text;
}

std::string AsText(const std::string& file, const RasterInfo& info, const RasterNotes& notes,
                   bool wkt) {
  std::string text = fmt::format("{}\n", Printable(file));
  text += fmt::format("  format         {}\n", info.format.ToUTF8());
  text += fmt::format("  size           {} samples, {} lines, {} bands\n", info.samples, info.lines,
                      info.bands);
  text += fmt::format("  pixels         {}, {}\n", DataTypeName(info.dataType).ToUTF8(),
                      FormatValue(info.interleave).ToUTF8());
  text += fmt::format("  blocks         {}\n", BlocksAsText(info, notes));
  if (!notes.compression.empty()) {
    text += fmt::format("  compression    {}\n", Printable(notes.compression));
  }
  text += fmt::format("  no data        {}\n", BandsAsText(NoDataAsJson(info)));
  text += BandsAsText(notes, info);
  if (notes.alpha) {
    text += fmt::format("  valid pixels   where band {}, alpha, is not 0\n", *notes.alpha);
  }
  if (info.hasPyramid) {
    text += fmt::format("  pyramid        {}, levels {} to {}\n", info.pyramidType.ToUTF8(),
                        info.levelMin, info.levelMax);
  }
  return text + GeoRefAsText(info, notes, wkt);
}

JobDraft MakeDraft(const SourceOptions& source) {
  JobDraft draft;
  AddOpenWithPyramid(draft, "raster", source);
  AddQuery(draft, "raster", "$raster");
  AddNotesQuery(draft, "$raster");
  draft.Close("close", "$raster");
  return draft;
}

/// The job that compares two rasters.
JobDraft MakeComparison(const InfoOptions& options) {
  JobDraft draft;
  const char* const names[] = {"first", "second"};
  for (unsigned i = 0; i < 2; ++i) {
    AddOpen(draft, names[i], {options.files[i], options.source.format, {}});
    AddQuery(draft, names[i], String(fmt::format("${}", names[i])));
  }
  JobWriterCommand& compare = draft.Step("compare", "CompareRasterGridsCommand");
  compare.AddInput("URI", String("$first"));
  compare.AddInput("OtherURI", String("$second"));
  draft.Close("close.second", "$second");
  draft.Close("close.first", "$first");
  return draft;
}

/// How the first raster lies in the second.
Json ComparisonAsJson(const InfoOptions& options, const JobResults& results) {
  const Map<String, String>& found = results.Find("compare").returns;
  const RasterInfo first = ReadInfo(results, "first"), second = ReadInfo(results, "second");
  const auto flag = [&](const char* name) { return ParseValue<bool>(found.Find(name)); };
  const auto number = [&](const char* name) {
    return found.HasKey(name) ? NumberAsJson(ParseValue<double>(found.Find(name))) : Json();
  };
  constexpr double kRounding = 0.01;  // pixels
  const bool hasPlace = found.HasKey("LargestOffset");
  const bool isInPlace = hasPlace ? ParseValue<double>(found.Find("LargestOffset")) <= kRounding
                                  : first.geoRefText == second.geoRefText;
  const auto sizeOf = [](const RasterInfo& info) {
    return Json::array({info.samples, info.lines, info.bands});
  };
  return {{"files", options.files},
          {"sameGrid", flag("SameSize") && flag("SameSystem") && isInPlace},
          {"sizes", Json::array({sizeOf(first), sizeOf(second)})},
          {"dataTypes", Json::array({DataTypeName(first.dataType).ToUTF8(),
                                     DataTypeName(second.dataType).ToUTF8()})},
          {"sameSystem", flag("SameSystem")},
          {"shift", hasPlace ? Json::array({number("ShiftX"), number("ShiftY")}) : Json()},
          {"scale", hasPlace ? Json::array({number("ScaleX"), number("ScaleY")}) : Json()},
          {"rotation", number("Rotation")},
          {"largestOffset", number("LargestOffset")}};
}

std::string ComparisonAsText(const Json& all) {
  const auto number = [](const Json& of) {
    return of.is_number() ? fmt::format("{:.6g}", of.get<double>()) : std::string("unknown");
  };
  const auto size = [](const Json& of) {
    return fmt::format("{} samples, {} lines, {} bands", of[0].dump(), of[1].dump(), of[2].dump());
  };
  std::string text = fmt::format("{}\n{}\n", Printable(all["files"][0].get<std::string>()),
                                 Printable(all["files"][1].get<std::string>()));
  text += fmt::format("  grids          {}\n", all["sameGrid"].get<bool>() ? "the same" : "differ");
  for (const Json& of : all["sizes"]) text += fmt::format("  size           {}\n", size(of));
  text += fmt::format("  pixels         {}, {}\n", all["dataTypes"][0].get<std::string>(),
                      all["dataTypes"][1].get<std::string>());
  text +=
      fmt::format("  system         {}\n", all["sameSystem"].get<bool>() ? "the same" : "differ");
  if (all["shift"].is_null()) return text + "  place          unknown\n";
  text += fmt::format("  shift          {} samples, {} lines\n", number(all["shift"][0]),
                      number(all["shift"][1]));
  text += fmt::format("  scale          {} {}\n", number(all["scale"][0]), number(all["scale"][1]));
  text += fmt::format("  rotation       {} degrees\n", number(all["rotation"]));
  return text + fmt::format("  offset         {} pixels at most\n", number(all["largestOffset"]));
}

int Compare(const InfoOptions& options) {
  if (options.files.size() != 2) throw HostError(kExitUsage, "--compare: takes two rasters");
  const JobDraft draft = MakeComparison(options);
  if (options.job.printJob) {
    std::cout << draft.Write().ToUTF8() << '\n';
    return kExitSuccess;
  }
  JobSession session(options.job);
  const Json all = ComparisonAsJson(options, session.Run(draft));
  std::cout << (options.json ? all.dump(2) + "\n" : ComparisonAsText(all));
  return all["sameGrid"].get<bool>() ? kExitSuccess : kExitFailed;
}

int PrintJobs(const InfoOptions& options) {
  for (const std::string& file : options.files) {
    if (IsVectorName(file)) {
      std::cout << MakeVectorQuery(file, 0).Write().ToUTF8() << '\n';
      continue;
    }
    std::cout
        << MakeDraft({file, options.source.format, options.source.subdataset}).Write().ToUTF8()
        << '\n';
  }
  return kExitSuccess;
}

/// Adds what a file is to one of the two.
void Tell(JobSession& session, const InfoOptions& options, const std::string& file, Json& all,
          std::string& text) {
  const char* const gap = text.empty() ? "" : "\n";
  if (IsVectorName(file)) {
    const std::vector<VectorLayerInfo> layers = ReadVectorLayers(session, file);
    options.json ? all.push_back(VectorAsJson(file, layers))
                 : void(text.append(gap).append(VectorAsText(file, layers)));
    return;
  }
  const JobResults results =
      session.Run(MakeDraft({file, options.source.format, options.source.subdataset}));
  const RasterInfo info = ReadInfo(results, "raster");
  const RasterNotes notes = ReadNotes(results, info.bands);
  options.json ? all.push_back(AsJson(file, info, notes))
               : void(text.append(gap).append(AsText(file, info, notes, options.wkt)));
}

int Info(const InfoOptions& options) {
  if (options.job.printJob) return PrintJobs(options);
  JobSession session(options.job);
  ExitCode code = kExitSuccess;
  Json all = Json::array();
  std::string text;
  for (const std::string& file : options.files) {
    try {
      Tell(session, options, file, all, text);
    } catch (const HostError& error) {
      if (error.code == kExitNoServer || platform::CountMemoryShortages() != 0) throw;
      session.CheckInterrupt();
      Say(error.what());
      code = std::max(code, error.code);
    }
  }
  // One file's object stands by itself; of several there is a list.
  if (options.json && options.files.size() > 1) text = all.dump(2) + "\n";
  if (options.json && options.files.size() == 1 && !all.empty()) text = all.front().dump(2) + "\n";
  std::cout << text;
  return code;
}

const VerbRegistration infoRegistration(
    "info", "Tells what a raster or vector file is and where it lies", [](OptionSet& line) {
      const auto options = std::make_shared<InfoOptions>();
      line.AddNote(
          "With --json, one file gives an object and several give a list of them; no-data values "
          "are a list with null for a band that has none, and \"nan\" or \"inf\" as a text. Of a "
          "vector file, which its ending tells, there are \"file\" and \"layers\".");
      line.AddExample("vexg info --json scene.tif");
      line.Add("files", options->files, "Rasters and vector files").IsFile().Required();
      line.Add(
          "--compare", options->compare,
          "Tell how the grid of the first raster lies in that of the second; exit code 1 where "
          "they differ");
      line.Add("--wkt", options->wkt, "With the text of the coordinate system");
      line.Add("--json", options->json, "As JSON");
      options->source.AddFormatTo(line);
      options->job.AddTo(line);
      return VerbRegistration::Work(
          [options] { return options->compare ? Compare(*options) : Info(*options); });
    });

}  // namespace
}  // namespace lumo::host
