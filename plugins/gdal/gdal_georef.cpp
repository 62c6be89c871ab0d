#include "gdal_georef.h"

#include <algorithm>
#include <cmath>
#include <cstdio>
#include <gdal_alg.h>
#include <optional>
#include <string>

#include "gdal_common/coordsys.h"
#include "georef/std_rpc_georef.h"

namespace lumo::gdal {
namespace {

/// Pixel size and rotation of a grid; see StdGeoRef for their meaning.
struct GridAxes {
  double sizeX, sizeY, degrees;
};

GridAxes AxesOf(const GridTransform& t) {
  if (t[2] == 0 && t[4] == 0) return {t[1], -t[5], 0};
  const double angle = std::atan2(t[4], t[1]);
  // The second axis is at right angles to the first, either way round.
  return {std::hypot(t[1], t[4]), t[2] * std::sin(angle) - t[5] * std::cos(angle),
          angle / StdGeoRef::kRadiansPerDegree};
}

GridTransform TransformOf(const StdGeoRef& model) {
  const double angle = model.Rotation() * StdGeoRef::kRadiansPerDegree;
  const double cosine = model.Rotation() == 0 ? 1 : std::cos(angle);
  const double sine = model.Rotation() == 0 ? 0 : std::sin(angle);
  GridTransform t{0, cosine * model.PixelSizeX(), sine * model.PixelSizeY(),
                  0, sine * model.PixelSizeX(),   -cosine * model.PixelSizeY()};
  t[0] = model.TieMapX() - model.TiePixelX() * t[1] - model.TiePixelY() * t[2];
  t[3] = model.TieMapY() - model.TiePixelX() * t[4] - model.TiePixelY() * t[5];
  return t;
}

/// Fills a grid. False when it would be off by more than a hundredth of a pixel somewhere.
bool FillGrid(const GridTransform& t, unsigned samples, unsigned lines, StdGeoRef& grid) {
  const GridAxes axes = AxesOf(t);
  const bool isUsable = std::all_of(t.begin(), t.end(), [](double v) { return std::isfinite(v); });
  if (!isUsable || axes.sizeX == 0 || axes.sizeY == 0) return false;
  grid.SetPixelSize(axes.sizeX, axes.sizeY);
  grid.SetRotation(axes.degrees);
  grid.SetTieMap(t[0], t[3]);
  const GridTransform made = TransformOf(grid);
  const double offX = (made[1] - t[1]) * samples + (made[2] - t[2]) * lines;
  const double offY = (made[4] - t[4]) * samples + (made[5] - t[5]) * lines;
  constexpr double kTolerance = 0.01;
  const double pixel = std::min(std::abs(axes.sizeX), std::abs(axes.sizeY));
  return std::abs(offX) <= kTolerance * pixel && std::abs(offY) <= kTolerance * pixel;
}

bool ReadGrid(GDALDatasetH dataset, StdGeoRef& grid) {
  GridTransform t{};
  return GDALGetGeoTransform(dataset, t.data()) == CE_None &&
         FillGrid(t, static_cast<unsigned>(GDALGetRasterXSize(dataset)),
                  static_cast<unsigned>(GDALGetRasterYSize(dataset)), grid);
}

/// GDAL counts samples and lines as our model does, from the centre of the first pixel.
std::optional<RpcCoefficients> ReadCamera(GDALDatasetH dataset) {
  GDALRPCInfoV2 info{};
  char** const items = GDALGetMetadata(dataset, "RPC");
  if (items == nullptr || GDALExtractRPCInfoV2(items, &info) == FALSE) return std::nullopt;
  RpcCoefficients rpc;
  rpc.lineOffset = info.dfLINE_OFF;
  rpc.sampleOffset = info.dfSAMP_OFF;
  rpc.latitudeOffset = info.dfLAT_OFF;
  rpc.longitudeOffset = info.dfLONG_OFF;
  rpc.heightOffset = info.dfHEIGHT_OFF;
  rpc.lineScale = info.dfLINE_SCALE;
  rpc.sampleScale = info.dfSAMP_SCALE;
  rpc.latitudeScale = info.dfLAT_SCALE;
  rpc.longitudeScale = info.dfLONG_SCALE;
  rpc.heightScale = info.dfHEIGHT_SCALE;
  std::copy_n(info.adfLINE_NUM_COEFF, RpcCoefficients::kTerms, rpc.lineNumerator.begin());
  std::copy_n(info.adfLINE_DEN_COEFF, RpcCoefficients::kTerms, rpc.lineDenominator.begin());
  std::copy_n(info.adfSAMP_NUM_COEFF, RpcCoefficients::kTerms, rpc.sampleNumerator.begin());
  std::copy_n(info.adfSAMP_DEN_COEFF, RpcCoefficients::kTerms, rpc.sampleDenominator.begin());
  return rpc;
}

std::string Number(double value) {
  char text[40];
  std::snprintf(text, sizeof text, "%.17g", value);
  return text;
}

std::string Numbers(const RpcCoefficients::Polynomial& polynomial) {
  std::string text;
  for (const double value : polynomial) text.append(Number(value)).append(" ");
  text.pop_back();
  return text;
}

/// The camera in a model; null when it has none.
const RpcGeoRef* CameraOf(const GeoRef& model) {
  const auto* const both = dynamic_cast<const StdRpcGeoRef*>(&model);
  const auto* const camera =
      both != nullptr ? &both->Rpc() : dynamic_cast<const RpcGeoRef*>(&model);
  const bool isSet =
      camera != nullptr && camera->Coefficients().lineOffset != RpcCoefficients::kNeverSet;
  return isSet ? camera : nullptr;
}

bool WriteCoordSys(GDALDatasetH dataset, const CoordSys& system) {
  if (system.IsEmpty()) return true;
  OGRSpatialReferenceH const reference = MakeSpatialReference(system);
  if (reference == nullptr) return false;
  const bool written = GDALSetSpatialRef(dataset, reference) == CE_None;
  OSRRelease(reference);
  return written;
}

}  // namespace

GeoRefPtr ReadGeoRef(GDALDatasetH dataset, bool hasSystem) {
  const std::optional<RpcCoefficients> rpc = ReadCamera(dataset);
  auto* const both = rpc ? new StdRpcGeoRef : nullptr;
  StdGeoRef* const grid = rpc ? both : new StdGeoRef;
  GeoRefPtr owner(grid);
  const bool hasGrid = ReadGrid(dataset, *grid);
  if (rpc) {  // making a camera opens the registry of systems: only rasters with one pay for it
    RpcGeoRef camera;
    camera.SetCoefficients(*rpc);
    if (!hasGrid) return GeoRefPtr(camera.Clone());
    both->SetRpc(camera);
  }
  if (!hasGrid) return {};
  if (hasSystem) grid->SetCoordinateSystem(ReadCoordSys(GDALGetSpatialRef(dataset)));
  return owner;
}

bool GridOf(const GeoRef& model, GridTransform& transform) {
  const auto* const grid = dynamic_cast<const StdGeoRef*>(&model);
  if (grid != nullptr) transform = TransformOf(*grid);
  return grid != nullptr;
}

/// The origin and the factors of a subset go into the offsets and scales of samples and lines.
CPLStringList CameraItemsOf(const GeoRef& model) {
  CPLStringList list;
  const RpcGeoRef* const camera = CameraOf(model);
  if (camera == nullptr) return list;
  const RpcCoefficients& rpc = camera->Coefficients();
  const std::pair<const char*, std::string> items[] = {
      {"LINE_OFF", Number((rpc.lineOffset - camera->LineOffset()) * camera->LineScale())},
      {"SAMP_OFF", Number((rpc.sampleOffset - camera->SampleOffset()) * camera->SampleScale())},
      {"LAT_OFF", Number(rpc.latitudeOffset)},
      {"LONG_OFF", Number(rpc.longitudeOffset)},
      {"HEIGHT_OFF", Number(rpc.heightOffset)},
      {"LINE_SCALE", Number(rpc.lineScale * camera->LineScale())},
      {"SAMP_SCALE", Number(rpc.sampleScale * camera->SampleScale())},
      {"LAT_SCALE", Number(rpc.latitudeScale)},
      {"LONG_SCALE", Number(rpc.longitudeScale)},
      {"HEIGHT_SCALE", Number(rpc.heightScale)},
      {"LINE_NUM_COEFF", Numbers(rpc.lineNumerator)},
      {"LINE_DEN_COEFF", Numbers(rpc.lineDenominator)},
      {"SAMP_NUM_COEFF", Numbers(rpc.sampleNumerator)},
      {"SAMP_DEN_COEFF", Numbers(rpc.sampleDenominator)},
  };
  for (const auto& [name, value] : items) list.SetNameValue(name, value.c_str());
  return list;
}

bool WriteGeoRef(GDALDatasetH dataset, const GeoRef& model) {
  CPLStringList camera = CameraItemsOf(model);
  if (camera.Count() != 0 && GDALSetMetadata(dataset, camera.List(), "RPC") != CE_None) {
    return false;
  }
  GridTransform transform{};
  if (!GridOf(model, transform)) return true;
  return GDALSetGeoTransform(dataset, transform.data()) == CE_None &&
         WriteCoordSys(dataset, model.CoordinateSystem());
}

}  // namespace lumo::gdal
