#include "gdal_georef.h"

#include <algorithm>
#include <array>
#include <cmath>
#include <cpl_string.h>
#include <cstdio>
#include <gdal_alg.h>
#include <limits>
#include <map>
#include <string>

#include "common/coordsys.h"
#include "georef/std_rpc_georef.h"

namespace lumo::gdal {
namespace {

using Transform = std::array<double, 6>;

/// Pixel size and rotation of a grid; see StdGeoRef for their meaning.
struct GridAxes {
  double sizeX, sizeY, degrees;
};

GridAxes AxesOf(const Transform& t) {
  if (t[2] == 0 && t[4] == 0) return {t[1], -t[5], 0};
  const double angle = std::atan2(t[4], t[1]);
  // The second axis is at right angles to the first, either way round.
  return {std::hypot(t[1], t[4]), t[2] * std::sin(angle) - t[5] * std::cos(angle),
          angle / StdGeoRef::kRadiansPerDegree};
}

Transform TransformOf(const StdGeoRef& model) {
  const double angle = model.Rotation() * StdGeoRef::kRadiansPerDegree;
  const double cosine = model.Rotation() == 0 ? 1 : std::cos(angle);
  const double sine = model.Rotation() == 0 ? 0 : std::sin(angle);
  Transform t{0, cosine * model.PixelSizeX(), sine * model.PixelSizeY(),
              0, sine * model.PixelSizeX(),   -cosine * model.PixelSizeY()};
  t[0] = model.TieMapX() - model.TiePixelX() * t[1] - model.TiePixelY() * t[2];
  t[3] = model.TieMapY() - model.TiePixelX() * t[4] - model.TiePixelY() * t[5];
  return t;
}

/// Fills a grid. False when it would be off by more than a hundredth of a pixel somewhere.
bool FillGrid(const Transform& t, unsigned samples, unsigned lines, StdGeoRef& grid) {
  const GridAxes axes = AxesOf(t);
  const bool isUsable = std::all_of(t.begin(), t.end(), [](double v) { return std::isfinite(v); });
  if (!isUsable || axes.sizeX == 0 || axes.sizeY == 0) return false;
  grid.SetPixelSize(axes.sizeX, axes.sizeY);
  grid.SetRotation(axes.degrees);
  grid.SetTieMap(t[0], t[3]);
  const Transform made = TransformOf(grid);
  const double offX = (made[1] - t[1]) * samples + (made[2] - t[2]) * lines;
  const double offY = (made[4] - t[4]) * samples + (made[5] - t[5]) * lines;
  constexpr double kTolerance = 0.01;
  const double pixel = std::min(std::abs(axes.sizeX), std::abs(axes.sizeY));
  return std::abs(offX) <= kTolerance * pixel && std::abs(offY) <= kTolerance * pixel;
}

bool ReadGrid(GDALDatasetH dataset, StdGeoRef& grid) {
  Transform t{};
  return GDALGetGeoTransform(dataset, t.data()) == CE_None &&
         FillGrid(t, static_cast<unsigned>(GDALGetRasterXSize(dataset)),
                  static_cast<unsigned>(GDALGetRasterYSize(dataset)), grid);
}

/// GDAL counts samples and lines as our model does, from the centre of the first pixel.
bool ReadCamera(GDALDatasetH dataset, RpcGeoRef& camera) {
  GDALRPCInfoV2 info{};
  char** const items = GDALGetMetadata(dataset, "RPC");
  if (items == nullptr || GDALExtractRPCInfoV2(items, &info) == FALSE) return false;
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
  camera.SetCoefficients(rpc);
  return true;
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

/// The origin and the factors of a subset go into the offsets and scales of samples and lines.
bool WriteCamera(GDALDatasetH dataset, const RpcGeoRef& camera) {
  const RpcCoefficients& rpc = camera.Coefficients();
  if (rpc.lineOffset == RpcCoefficients::kNeverSet) return true;
  const std::map<std::string, std::string> items = {
      {"LINE_OFF", Number((rpc.lineOffset - camera.LineOffset()) * camera.LineScale())},
      {"SAMP_OFF", Number((rpc.sampleOffset - camera.SampleOffset()) * camera.SampleScale())},
      {"LAT_OFF", Number(rpc.latitudeOffset)},
      {"LONG_OFF", Number(rpc.longitudeOffset)},
      {"HEIGHT_OFF", Number(rpc.heightOffset)},
      {"LINE_SCALE", Number(rpc.lineScale * camera.LineScale())},
      {"SAMP_SCALE", Number(rpc.sampleScale * camera.SampleScale())},
      {"LAT_SCALE", Number(rpc.latitudeScale)},
      {"LONG_SCALE", Number(rpc.longitudeScale)},
      {"HEIGHT_SCALE", Number(rpc.heightScale)},
      {"LINE_NUM_COEFF", Numbers(rpc.lineNumerator)},
      {"LINE_DEN_COEFF", Numbers(rpc.lineDenominator)},
      {"SAMP_NUM_COEFF", Numbers(rpc.sampleNumerator)},
      {"SAMP_DEN_COEFF", Numbers(rpc.sampleDenominator)},
  };
  CPLStringList list;
  for (const auto& [name, value] : items) list.SetNameValue(name.c_str(), value.c_str());
  return GDALSetMetadata(dataset, list.List(), "RPC") == CE_None;
}

bool WriteGrid(GDALDatasetH dataset, const StdGeoRef& grid) {
  Transform t = TransformOf(grid);
  return GDALSetGeoTransform(dataset, t.data()) == CE_None;
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

GeoRefPtr ReadGeoRef(GDALDatasetH dataset) {
  RpcGeoRef camera;
  const bool hasCamera = ReadCamera(dataset, camera);
  auto* const both = hasCamera ? new StdRpcGeoRef : nullptr;
  StdGeoRef* const grid = hasCamera ? both : new StdGeoRef;
  GeoRefPtr owner(grid);
  if (!ReadGrid(dataset, *grid)) return hasCamera ? GeoRefPtr(camera.Clone()) : GeoRefPtr();
  if (hasCamera) both->SetRpc(camera);
  grid->SetCoordinateSystem(ReadCoordSys(GDALGetSpatialRef(dataset)));
  return owner;
}

bool WriteGeoRef(GDALDatasetH dataset, const GeoRef& model) {
  const auto* const grid = dynamic_cast<const StdGeoRef*>(&model);
  if (const auto* const both = dynamic_cast<const StdRpcGeoRef*>(&model)) {
    if (!WriteCamera(dataset, both->Rpc())) return false;
  } else if (const auto* const camera = dynamic_cast<const RpcGeoRef*>(&model)) {
    return WriteCamera(dataset, *camera);
  }
  return grid != nullptr && WriteGrid(dataset, *grid) &&
         WriteCoordSys(dataset, model.CoordinateSystem());
}

}  // namespace lumo::gdal
