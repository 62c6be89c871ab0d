#include "georef/rpc_georef.h"

#include <algorithm>
#include <bit>
#include <cmath>
#include <vector>

#include "georef/carry_points.h"
#include "georef/georef_text.h"
#include "georef/height_reader.h"
#include "georef/rpc_model.h"

namespace lumo {
namespace {

constexpr double kHeightTolerance = 1.0;
constexpr int kMostHeightRounds = 50;

using RpcValues = std::array<double, sizeof(RpcCoefficients) / sizeof(double)>;
static_assert(std::tuple_size_v<RpcValues> == 90);

/// x and y of `points`, whatever its width.
Array<double> TakePairs(const Array<double>& points) {
  const unsigned width = points.GetExtent(1);
  Array<double> pairs{ArrayDims(points.GetExtent(0), 2)};
  for (unsigned i = 0; i < points.GetExtent(0); ++i) {
    pairs[2 * i] = points[i * width];
    pairs[2 * i + 1] = points[i * width + 1];
  }
  return pairs;
}

/// Writes `pairs` back, and the heights where there is a column for them.
void PutPairs(const Array<double>& pairs, const std::vector<double>& heights,
              Array<double>& points) {
  const unsigned width = points.GetExtent(1);
  for (unsigned i = 0; i < points.GetExtent(0); ++i) {
    points[i * width] = pairs[2 * i];
    points[i * width + 1] = pairs[2 * i + 1];
    if (width == 3) points[i * width + 2] = heights[i];
  }
}

std::vector<double> TakeHeights(const Array<double>& points, double standard) {
  const unsigned width = points.GetExtent(1);
  std::vector<double> heights(points.GetExtent(0), standard);
  for (unsigned i = 0; width == 3 && i < points.GetExtent(0); ++i) heights[i] = points[i * 3 + 2];
  return heights;
}

/// Ground positions on the pixels of an elevation model.
void PlaceOnGrid(Array<double>& positions, const CoordSys& ground, const MapRect& extent,
                 const GeoRef& grid) {
  if (!ground.IsEqual(grid.CoordinateSystem())) {
    CarryPoints(positions, ground, grid.CoordinateSystem(), [&extent] {
      Array<double> area{ArrayDims(4)};
      area[0] = extent.minX;
      area[1] = extent.minY;
      area[2] = extent.maxX;
      area[3] = extent.maxY;
      return area;
    });
  }
  grid.MapToPixel(positions);
}

unsigned Truncated(double value) {
  constexpr double kMost = 4294967295.0;
  return value >= 0 ? static_cast<unsigned>(std::min(value, kMost)) : 0;
}

}  // namespace

const unsigned RpcGeoRef::TypeCode = kRpc;

RpcGeoRef::RpcGeoRef() {
  type_ = kRpc;
  groundCoordSys_.SetGeographic();
}

bool RpcGeoRef::CanConvert(Array<double>& points) const {
  const unsigned width = points.GetExtent(1);
  if (points.GetRank() == 2 && (width == 2 || width == 3)) return true;
  std::fill(points.begin(), points.end(), 0.0);
  return false;
}

MapRect RpcGeoRef::GroundExtent() const {
  return {rpc_.longitudeOffset - rpc_.longitudeScale, rpc_.latitudeOffset - rpc_.latitudeScale,
          rpc_.longitudeOffset + rpc_.longitudeScale, rpc_.latitudeOffset + rpc_.latitudeScale};
}

/// Between the model's coordinate system and the ground's, in place; nothing when they are equal or
/// this model has none.
bool RpcGeoRef::Carry(Array<double>& points, const CoordSys& from, const CoordSys& to) const {
  if (coordSys_.IsEmpty() || groundCoordSys_.IsEmpty() || from.IsEqual(to)) return true;
  return CarryPoints(points, from, to, [&] {
    const MapRect ground = GroundExtent();
    double corners[] = {ground.minX, ground.minY, ground.maxX, ground.maxY};
    Array<double> extent(corners, ArrayDims(4));
    if (&from == &coordSys_) {
      groundCoordSys_.Unproject(extent);
      coordSys_.Project(extent);
    }
    Array<double> copy{ArrayDims(4)};
    std::copy(extent.begin(), extent.end(), copy.begin());
    return copy;
  });
}

bool RpcGeoRef::MapToPixel(Array<double>& points) const {
  if (!CanConvert(points)) return false;
  const unsigned count = points.GetExtent(0);
  Array<double> ground = TakePairs(points);
  std::vector<double> heights = TakeHeights(points, RpcModel::kNoHeight);
  const bool carried = Carry(ground, coordSys_, groundCoordSys_);
  if (!dem_.IsNull() && dem_->Reference() != nullptr) {
    Array<double> grid = ground;
    PlaceOnGrid(grid, groundCoordSys_, GroundExtent(), *dem_->Reference());
    HeightReader reader(*dem_);
    for (unsigned i = 0; i < count; ++i) {
      if (reader.Nearest(grid[2 * i], grid[2 * i + 1], heights[i])) heights[i] += demHeightOffset_;
    }
  }
  const RpcModel model(rpc_);
  RpcBlock block;
  for (unsigned first = 0; first < count; first += RpcBlock::kPoints) {
    block.count = std::min<std::size_t>(count - first, RpcBlock::kPoints);
    for (unsigned i = 0; i < block.count; ++i) {
      block.longitude[i] = ground[2 * (first + i)];
      block.latitude[i] = ground[2 * (first + i) + 1];
      block.height[i] = model.NormalisedHeight(heights[first + i]);
    }
    model.Project(block);
    for (unsigned i = 0; i < block.count; ++i) {
      ground[2 * (first + i)] = (block.sample[i] - sampleOffset_) * sampleScale_;
      ground[2 * (first + i) + 1] = (block.line[i] - lineOffset_) * lineScale_;
    }
  }
  if (!carried) MarkUncarried(ground);
  PutPairs(ground, heights, points);
  return carried;
}

/// One conversion of pixels to ground positions, which may follow the terrain.
class RpcGeoRef::Inverse {
 public:
  Inverse(const RpcGeoRef& owner, Array<double>& points)
      : owner_(owner),
        model_(owner.rpc_),
        pixels_(TakePairs(points)),
        ground_(pixels_),
        heights_(TakeHeights(points, owner.rpc_.heightOffset)),
        open_(points.GetExtent(0)) {
    for (unsigned i = 0; i < open_.size(); ++i) {
      open_[i] = i;
      pixels_[2 * i] = pixels_[2 * i] / owner.sampleScale_ + owner.sampleOffset_;
      pixels_[2 * i + 1] = pixels_[2 * i + 1] / owner.lineScale_ + owner.lineOffset_;
      SetToOffset(i);
    }
  }

  void Run() {
    const ElevationModel* const dem = owner_.dem_.Get();
    if (dem == nullptr || dem->Reference() == nullptr) {
      Locate();
      return;
    }
    HeightReader reader(*dem);
    for (int round = 0; round < kMostHeightRounds && !open_.empty(); ++round) {
      Locate();
      FollowTerrain(*dem, reader);
    }
    for (const unsigned i : open_) SetToOffset(i);
  }

  Array<double>& Ground() { return ground_; }
  const std::vector<double>& Heights() const { return heights_; }

 private:
  void SetToOffset(unsigned i) {
    ground_[2 * i] = owner_.rpc_.longitudeOffset;
    ground_[2 * i + 1] = owner_.rpc_.latitudeOffset;
  }

  /// Moves the open points onto their pixels at the heights that they have.
  void Locate() {
    RpcBlock block;
    for (std::size_t first = 0; first < open_.size(); first += RpcBlock::kPoints) {
      block.count = std::min(open_.size() - first, RpcBlock::kPoints);
      for (std::size_t i = 0; i < block.count; ++i) {
        const unsigned point = open_[first + i];
        block.longitude[i] = ground_[2 * point];
        block.latitude[i] = ground_[2 * point + 1];
        block.sample[i] = pixels_[2 * point];
        block.line[i] = pixels_[2 * point + 1];
        block.height[i] = model_.NormalisedHeight(heights_[point]);
      }
      model_.Locate(block);
      for (std::size_t i = 0; i < block.count; ++i) {
        const unsigned point = open_[first + i];
        ground_[2 * point] = block.longitude[i];
        ground_[2 * point + 1] = block.latitude[i];
      }
    }
  }

  /// Gives the open points the heights of the terrain where they are; those whose height hardly
  /// changed are done.
  void FollowTerrain(const ElevationModel& dem, HeightReader& reader) {
    Array<double> grid{ArrayDims(static_cast<unsigned>(open_.size()), 2)};
    for (std::size_t i = 0; i < open_.size(); ++i) {
      grid[2 * i] = ground_[2 * open_[i]];
      grid[2 * i + 1] = ground_[2 * open_[i] + 1];
    }
    PlaceOnGrid(grid, owner_.groundCoordSys_, owner_.GroundExtent(), *dem.Reference());
    std::size_t left = 0;
    for (std::size_t i = 0; i < open_.size(); ++i) {
      const unsigned point = open_[i];
      const double before = heights_[point];
      if (reader.Bilinear(grid[2 * i], grid[2 * i + 1], heights_[point])) {
        heights_[point] += owner_.demHeightOffset_;
      }
      if (std::abs(heights_[point] - before) > kHeightTolerance) open_[left++] = point;
    }
    open_.resize(left);
  }

  const RpcGeoRef& owner_;
  const RpcModel model_;
  Array<double> pixels_;
  Array<double> ground_;
  std::vector<double> heights_;
  std::vector<unsigned> open_;  // points that are not done
};

bool RpcGeoRef::PixelToMap(Array<double>& points) const {
  if (!CanConvert(points)) return false;
  Inverse inverse(*this, points);
  inverse.Run();
  const bool carried = Carry(inverse.Ground(), groundCoordSys_, coordSys_);
  PutPairs(inverse.Ground(), inverse.Heights(), points);
  return carried;
}

bool RpcGeoRef::PixelToMap(double x, double y, double& mapX, double& mapY) const {
  return ConvertPoint(x, y, mapX, mapY, ToMap, *this);
}

bool RpcGeoRef::MapToPixel(double mapX, double mapY, double& x, double& y) const {
  return ConvertPoint(mapX, mapY, x, y, ToPixel, *this);
}

void RpcGeoRef::SetDimensions(unsigned samples, unsigned lines) {
  samples_ = samples;
  lines_ = lines;
  Changed();
  if (samples == 0 || lines == 0) return;
  const MapRect extent = cache_.Extent();
  pixelSizeX_ = (extent.maxX - extent.minX) / samples;
  pixelSizeY_ = (extent.maxY - extent.minY) / lines;
}

double RpcGeoRef::CenterLatitude(bool) const {
  double x = 0, y = 0;
  PixelToMap(samples_ / 2, lines_ / 2, x, y);
  cache_.SetCenterLatitude(y);
  return y;
}

Array<double> RpcGeoRef::MapExtent(bool force) const {
  if (rpc_.lineOffset == RpcCoefficients::kNeverSet) return cache_.ExtentArray();
  return CachedExtent(cache_, force);
}

GeoRefPtr RpcGeoRef::SubRectGeoRef(const SubRect& rect) const {
  RpcGeoRef* const part = Clone();
  const GeoRefPtr owner(part);
  part->sampleOffset_ += rect.left;
  part->lineOffset_ += rect.top;
  part->SetDimensions(rect.Width(), rect.Height());
  return owner;
}

GeoRefPtr RpcGeoRef::ResampledGeoRef(double pixelSizeX, double pixelSizeY) const {
  RpcGeoRef* const resampled = Clone();
  const GeoRefPtr owner(resampled);
  const double fx = pixelSizeX / pixelSizeX_;
  const double fy = pixelSizeY / pixelSizeY_;
  resampled->Divide(fx, fy);
  resampled->SetDimensions(Truncated(samples_ / fx), Truncated(lines_ / fy));
  return owner;
}

void RpcGeoRef::Divide(double factorX, double factorY) {
  rpc_.sampleOffset /= factorX;
  rpc_.sampleScale /= factorX;
  sampleOffset_ /= factorX;
  rpc_.lineOffset /= factorY;
  rpc_.lineScale /= factorY;
  lineOffset_ /= factorY;
}

void RpcGeoRef::Resample(double factorX, double factorY) {
  if (rpc_.lineOffset == RpcCoefficients::kNeverSet) return;
  Divide(factorX, factorY);
  SetDimensions(samples_, lines_);
}

void RpcGeoRef::SetCoefficients(const RpcCoefficients& coefficients) {
  rpc_ = coefficients;
  SetDimensions(samples_, lines_);
}

void RpcGeoRef::SetSubset(double sampleOffset, double lineOffset, double sampleScale,
                          double lineScale) {
  sampleOffset_ = sampleOffset;
  lineOffset_ = lineOffset;
  sampleScale_ = sampleScale;
  lineScale_ = lineScale;
  SetDimensions(samples_, lines_);
}

void RpcGeoRef::SetDem(const ElevationModelPtr& dem, double heightOffset) {
  dem_ = dem;
  demHeightOffset_ = heightOffset;
  SetDimensions(samples_, lines_);
}

void RpcGeoRef::SetGroundCoordinateSystem(const CoordSys& coordSys) {
  groundCoordSys_ = coordSys;
  SetDimensions(samples_, lines_);
}

void RpcGeoRef::Write(std::ostream& out) const {
  WriteNumbers(out, std::bit_cast<RpcValues>(rpc_));
  const double subset[] = {sampleOffset_, lineOffset_, sampleScale_, lineScale_, demHeightOffset_};
  WriteNumbers(out, subset);
  cache_.Write(out);
  if (!dem_.IsNull()) out << dem_->GetURI().ToUTF8();
  out << "|  ";
  GeoRef::Write(out);
}

void RpcGeoRef::Read(std::istream& in) {
  RpcValues values;
  ReadNumbers(in, values);
  rpc_ = std::bit_cast<RpcCoefficients>(values);
  double subset[5];
  ReadNumbers(in, subset);
  sampleOffset_ = subset[0];
  lineOffset_ = subset[1];
  sampleScale_ = subset[2];
  lineScale_ = subset[3];
  demHeightOffset_ = subset[4];
  cache_.Read(in);
  const String uri = ReadUpToBar(in);
  dem_ = in.fail() || uri.GetLength() == 0 ? ElevationModelPtr() : ElevationModel::Find(URI(uri));
  GeoRef::Read(in);
}

}  // namespace lumo
