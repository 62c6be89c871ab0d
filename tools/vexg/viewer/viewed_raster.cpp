#include "viewer/viewed_raster.h"

#include <algorithm>
#include <cmath>
#include <cstring>
#include <filesystem>

#include <fmt/format.h>

#include "georef/derived_georef.h"
#include "raster/pixel_types.h"
#include "rasters/map_points.h"
#include "verb.h"

namespace lumo::host {
namespace {

constexpr unsigned kSmall = 256;  // pixels: the coarsest level is no larger

/// The text of a value; whole numbers and others with all digits that they have.
template <typename T>
std::string TextOf(const T& value) {
  return fmt::format("{}", value);
}
template <typename T>
std::string TextOf(const Complex<T>& value) {
  return fmt::format("{}{:+}i", value.real, value.imag);
}

std::string TextAt(const unsigned char* bytes, unsigned code) {
  std::string text;
  DispatchType(TwelveTypes{}, code, [&]<typename T>() {
    T value;
    std::memcpy(&value, bytes, sizeof value);
    if constexpr (sizeof(T) == 1) {
      text = fmt::format("{}", static_cast<int>(value));
    } else {
      text = TextOf(value);
    }
    return true;
  });
  return text;
}

bool IsComplex(unsigned code) {
  return !DispatchType(TenTypes{}, code, []<typename T>() { return true; });
}

/// True for types of which CreateSkipRasterCommand makes none.
bool IsLong(unsigned code) {
  return code == kDataTypeOf<std::int64_t> || code == kDataTypeOf<std::uint64_t>;
}

/// Stands a view on complex pixels that has their magnitudes.
void AddMagnitudes(RasterChain& chain, const std::string& prefix, unsigned bands) {
  chain.AddView(prefix + "magnitude", "CreateComplexMagnitudeRasterCommand");
  Array<unsigned> shown{ArrayDims(bands)};
  for (unsigned band = 0; band < bands; ++band) shown[band] = 3 * band;  // two parts stand between
  const String top = chain.GetTop();
  AddBandView(chain.GetDraft(), prefix + "shown", top, shown);
  chain.Take(prefix + "shown");
}

/// The geo-reference of a description, with its size; empty for none.
GeoRefPtr GeoRefOf(const Json& description) {
  const Json& own = description["geoRef"];
  if (!own.is_object()) return {};
  const auto model = ParseValue<GeoRefPtr>(String(own["text"].get<std::string>()));
  if (!model.IsNull()) model->SetDimensions(description["samples"], description["lines"]);
  return model;
}

bool IsSameGrid(const Json& description, const GeoRef& grid) {
  const Json& own = description["geoRef"];
  if (!own.is_object() || own["transform"].is_null()) return true;  // it has no place to go to
  const auto model = ParseValue<GeoRefPtr>(String(own["text"].get<std::string>()));
  return model.IsNull() ||
         (description["samples"] == grid.Samples() && description["lines"] == grid.Lines() &&
          model->IsEqual(CloneOf(GeoRefPtr(grid.Clone()))));
}

}  // namespace

ViewedRaster::ViewedRaster(JobDoor& door, const SourceOptions& source, const GeoRefPtr& grid,
                           Levels levels)
    : door_(door),
      name_(std::filesystem::path(FileOf(source)).filename().string()),
      source_(source),
      wanted_(levels),
      grid_(grid) {
  Open();
}

ViewedRaster::ViewedRaster(JobDoor& door, const String& uri, const GeoRefPtr& grid, Levels levels)
    : door_(door),
      name_(std::filesystem::path(PathOf(uri)).filename().string()),
      uri_(uri),
      wanted_(levels),
      grid_(grid) {
  Open();
}

ViewedRaster::ViewedRaster(JobDoor& door, const TreeCutRequest& request)
    : door_(door), name_(std::filesystem::path(request.tree).filename().string()), tree_(request) {
  Open();
}

void ViewedRaster::Open() {
  JobDraft draft;
  RasterChain chain(draft);
  AddSourceTo(chain, {});
  sourceDescription_ = door_.Describe(draft);
  sourceCode_ = sourceDescription_["code"];
  if (!grid_.IsNull() && IsSameGrid(sourceDescription_, *grid_)) grid_ = GeoRefPtr();
  description_ = door_.Describe(JobOf(0));
  code_ = description_["code"];
  samples_ = description_["samples"];
  lines_ = description_["lines"];
  bands_ = description_["bands"];
  geoRef_ = GeoRefOf(description_);
  while (std::max(samples_, lines_) >> (levelCount_ - 1) > kSmall &&
         std::min(samples_, lines_) >> levelCount_ != 0) {
    ++levelCount_;
  }
  FindLevels();
  FindStep();
}

/// Finds the levels of the source's pyramid that may be shown.
void ViewedRaster::FindLevels() {
  // A raster that is carried to another grid shows its source's pyramid, unless views below it
  // change the values: the pyramid holds the ones from before.
  const bool isChanged = IsComplex(sourceCode_) || IsLong(sourceCode_);
  if (!grid_.IsNull() && isChanged) return;
  const Json& pyramid = (grid_.IsNull() ? description_ : sourceDescription_)["pyramid"];
  if (!pyramid.is_object()) return;
  if (wanted_ == Levels::kPicked && pyramid["type"] != "ORVA") return;
  const unsigned side = std::min(sourceDescription_["samples"].get<unsigned>(),
                                 sourceDescription_["lines"].get<unsigned>());
  for (unsigned level = std::max(1U, pyramid["min"].get<unsigned>());
       level <= pyramid["max"].get<unsigned>() && side >> level != 0; ++level) {
    if (!grid_.IsNull() || level < levelCount_) levels_.push_back(level);
  }
}

/// Measures in the middle of the grid how far its pixels lie apart in the source.
void ViewedRaster::FindStep() {
  const GeoRefPtr source = GeoRefOf(sourceDescription_);
  if (grid_.IsNull() || source.IsNull()) return;
  Array<double> points{ArrayDims(3, 2)};
  const double x = samples_ / 2.0, y = lines_ / 2.0;
  const double places[] = {x, y, x + 1, y, x, y + 1};
  std::copy(std::begin(places), std::end(places), points.begin());
  ShiftPixels(points, FirstPixel(*grid_));
  if (!grid_->PixelToMap(points)) return;
  const bool isCarried =
      !grid_->CoordinateSystem().IsEmpty() && !source->CoordinateSystem().IsEmpty();
  MapToPixels(*source, isCarried ? grid_->CoordinateSystem() : CoordSys(), points);
  const double step = std::min(std::hypot(points[2] - points[0], points[3] - points[1]),
                               std::hypot(points[4] - points[0], points[5] - points[1]));
  if (std::isfinite(step)) step_ = step;
}

void ViewedRaster::AddSourceTo(RasterChain& chain, const std::string& prefix) const {
  JobDraft& draft = chain.GetDraft();
  if (tree_) {
    AddTreeLabels(draft, prefix + "raster", *tree_);
  } else if (IsFile()) {
    AddOpenWithPyramid(draft, prefix + "raster", source_);
  } else {
    draft.Open(prefix + "raster", "AccessRasterCommand").AddInput("SrcURI", uri_);
  }
  chain.Take(prefix + "raster");
}

/// Stands a view of every 2^level-th pixel on the source, by the nearest stored level below it.
void ViewedRaster::AddLevelTo(RasterChain& chain, unsigned level, const std::string& prefix) const {
  const auto behind = std::upper_bound(levels_.begin(), levels_.end(), level);
  const unsigned stored = behind == levels_.begin() ? 0 : *(behind - 1);
  if (stored != 0) {
    const String top = chain.GetTop();
    AddLevel(chain.GetDraft(), prefix + "level", top, stored);
    chain.Take(prefix + "level");
  }
  if (level > stored) {
    JobWriterCommand& skip = chain.AddView(prefix + "skip", "CreateSkipRasterCommand");
    skip.AddInput("SkipX", 1U << (level - stored));
    skip.AddInput("SkipY", 1U << (level - stored));
  }
}

/// Carries a level of the source to a level of the grid, so that little more of it is read than can
/// be seen. Its pixels are at most half as large: the first one of 2^n stands for all of them,
/// which must not be off by more than half a pixel that is seen.
void ViewedRaster::AddCarriedTo(RasterChain& chain, unsigned level,
                                const std::string& prefix) const {
  GeoRefPtr grid = grid_;
  if (level > 0) {
    const double factor = std::ldexp(1.0, static_cast<int>(level));
    grid = ReducedGeoRef(*grid_, factor, factor, samples_ >> level, lines_ >> level);
    const unsigned side = std::min(sourceDescription_["samples"].get<unsigned>(),
                                   sourceDescription_["lines"].get<unsigned>());
    unsigned below = 0;
    while (std::ldexp(1.0, static_cast<int>(below) + 2) <= step_ * factor &&
           side >> (below + 1) != 0) {
      ++below;
    }
    AddLevelTo(chain, below, prefix);
  }
  JobWriterCommand& carried = chain.AddView(prefix + "carried", "CreateProjectedRasterCommand");
  carried.AddInput("GeoRef", grid);
  carried.AddInput("ReprojectionMethod", String("Rigorous"));
  carried.AddInput("ResamplingMethod", String("Nearest"));
  carried.AddInput("Grid", Form::kExact);
  carried.AddInput("Kernel", String("Nearest"));
}

void ViewedRaster::AddTo(RasterChain& chain, unsigned level, const std::string& prefix) const {
  AddSourceTo(chain, prefix);
  if (IsComplex(sourceCode_)) AddMagnitudes(chain, prefix, sourceDescription_["bands"]);
  if (IsLong(sourceCode_)) {
    chain.AddView(prefix + "double", "CreateConvertedRasterCommand")
        .AddInput("DataType", String("Double"));
  }
  if (grid_.IsNull()) {
    AddLevelTo(chain, level, prefix);
  } else {
    AddCarriedTo(chain, level, prefix);
  }
}

JobDraft ViewedRaster::JobOf(unsigned level) const {
  JobDraft draft;
  RasterChain chain(draft);
  AddTo(chain, level);
  return draft;
}

ViewedRaster::Size ViewedRaster::SizeOf(unsigned level) const {
  {
    const std::lock_guard lock(mutex_);
    const auto at = sizes_.find(level);
    if (at != sizes_.end()) return at->second;
  }
  const Json description = door_.Describe(JobOf(level));
  const Size size{description["samples"], description["lines"]};
  const std::lock_guard lock(mutex_);
  sizes_.emplace(level, size);
  return size;
}

std::optional<ViewedTile> ViewedRaster::ReadTile(unsigned level, const SubRect& rect,
                                                 const std::vector<std::uint32_t>& bands) const {
  const Size size = SizeOf(level);
  if (rect.left >= size.samples || rect.top >= size.lines) return {};
  const SubRect cut = rect.Clip(size.samples - 1, size.lines - 1);
  const NamedBlock block = door_.Read(JobOf(level), cut, bands, code_);
  ViewedTile tile{cut.Width(), cut.Height(), {}};
  tile.bytes.reserve(block.pixels.size() + block.states.size());
  tile.bytes.append(reinterpret_cast<const char*>(block.pixels.data()), block.pixels.size());
  tile.bytes.append(reinterpret_cast<const char*>(block.states.data()), block.states.size());
  return tile;
}

Json ViewedRaster::ReadValues(unsigned x, unsigned y) const {
  JobDraft draft;
  RasterChain chain(draft);
  unsigned code = sourceCode_;
  if (grid_.IsNull()) {
    AddSourceTo(chain, {});
  } else {
    AddTo(chain);
    code = code_;
  }
  const unsigned count = grid_.IsNull() ? sourceDescription_["bands"].get<unsigned>() : bands_;
  std::vector<std::uint32_t> bands(count);
  for (unsigned band = 0; band < count; ++band) bands[band] = band;
  const NamedBlock block = door_.Read(draft, {x, y, x, y}, bands, code);
  const std::size_t bytes = DataTypeBytes(code);
  Json values = Json::array();
  for (unsigned band = 0; band < count; ++band) {
    if (block.states[band] != 0) {
      values.push_back(nullptr);
    } else {
      values.push_back(TextAt(&block.pixels[band * bytes], code));
    }
  }
  return values;
}

}  // namespace lumo::host
