#include <cmath>
#include <iostream>
#include <memory>

#include <fmt/format.h>

#include "foundation/near_name.h"
#include "output/json_number.h"
#include "platform/memory_shortage.h"
#include "rasters/raster_source.h"
#include "rasters/vector_info.h"
#include "verb.h"

namespace lumo::host {
namespace {

struct Options {
  std::vector<std::string> files;
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

Json AsJson(const std::string& file, const RasterInfo& info) {
  return {{"file", file},
          {"format", info.format.ToUTF8()},
          {"samples", info.samples},
          {"lines", info.lines},
          {"bands", info.bands},
          {"dataType", DataTypeName(info.dataType).ToUTF8()},
          {"interleave", FormatValue(info.interleave).ToUTF8()},
          {"blockSize", Json::array({info.tiles.width, info.tiles.height})},
          {"noData", NoDataAsJson(info)},
          {"hasPalette", FlagsAsJson(info.hasPalette)},
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

std::string GeoRefAsText(const RasterInfo& info) {
  if (!info.geoRef) return "  geo-reference  none\n";
  const GeoRef& geoRef = *info.geoRef;
  const std::string name = geoRef.CoordinateSystem().Info()->name.ToUTF8();
  const std::string system = SystemText(geoRef).ToUTF8();
  std::string text = fmt::format("  geo-reference  {}\n", TypeWord(geoRef));
  text += fmt::format("  system         {}\n", !name.empty()     ? name
                                               : !system.empty() ? system
                                                                 : "none");
  text +=
      fmt::format("  pixel size     {:.10g} {:.10g}\n", geoRef.PixelSizeX(), geoRef.PixelSizeY());
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

std::string AsText(const std::string& file, const RasterInfo& info) {
  std::string text = fmt::format("{}\n", Printable(file));
  text += fmt::format("  format         {}\n", info.format.ToUTF8());
  text += fmt::format("  size           {} samples, {} lines, {} bands\n", info.samples, info.lines,
                      info.bands);
  text += fmt::format("  pixels         {}, {}\n", DataTypeName(info.dataType).ToUTF8(),
                      FormatValue(info.interleave).ToUTF8());
  text += fmt::format("  no data        {}\n", BandsAsText(NoDataAsJson(info)));
  if (info.hasPyramid) {
    text += fmt::format("  pyramid        {}, levels {} to {}\n", info.pyramidType.ToUTF8(),
                        info.levelMin, info.levelMax);
  }
  return text + GeoRefAsText(info);
}

JobDraft MakeDraft(const SourceOptions& source) {
  JobDraft draft;
  AddOpenWithPyramid(draft, "raster", source);
  AddQuery(draft, "raster", "$raster");
  draft.Close("close", "$raster");
  return draft;
}

int PrintJobs(const Options& options) {
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
void Tell(JobSession& session, const Options& options, const std::string& file, Json& all,
          std::string& text) {
  const char* const gap = text.empty() ? "" : "\n";
  if (IsVectorName(file)) {
    const std::vector<VectorLayerInfo> layers = ReadVectorLayers(session, file);
    options.json ? all.push_back(VectorAsJson(file, layers))
                 : void(text.append(gap).append(VectorAsText(file, layers)));
    return;
  }
  const RasterInfo info = ReadInfo(
      session.Run(MakeDraft({file, options.source.format, options.source.subdataset})), "raster");
  options.json ? all.push_back(AsJson(file, info))
               : void(text.append(gap).append(AsText(file, info)));
}

int Info(const Options& options) {
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

const VerbRegistration registration(
    "info", "Tells what a raster or vector file is and where it lies", [](OptionSet& line) {
      const auto options = std::make_shared<Options>();
      line.AddNote(
          "With --json, one file gives an object and several give a list of them; no-data values "
          "are a list with null for a band that has none, and \"nan\" or \"inf\" as a text. Of a "
          "vector file, which its ending tells, there are \"file\" and \"layers\".");
      line.AddExample("vexg info --json scene.tif");
      line.Add("files", options->files, "Rasters and vector files").IsFile().Required();
      line.Add("--json", options->json, "As JSON");
      options->source.AddFormatTo(line);
      options->job.AddTo(line);
      return VerbRegistration::Work([options] { return Info(*options); });
    });

}  // namespace
}  // namespace lumo::host
