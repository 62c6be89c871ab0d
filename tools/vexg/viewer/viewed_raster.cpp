#include "viewer/viewed_raster.h"

#include <algorithm>
#include <cstring>
#include <filesystem>

#include <fmt/format.h>

#include "raster/pixel_types.h"
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

bool IsSameGrid(const Json& description, const GeoRef& grid) {
  const Json& own = description["geoRef"];
  if (!own.is_object() || own["transform"].is_null()) return true;  // it has no place to go to
  const auto model = ParseValue<GeoRefPtr>(String(own["text"].get<std::string>()));
  return model.IsNull() ||
         (description["samples"] == grid.Samples() && description["lines"] == grid.Lines() &&
          model->IsEqual(CloneOf(GeoRefPtr(grid.Clone()))));
}

}  // namespace

ViewedRaster::ViewedRaster(const SourceOptions& source, const GeoRefPtr& grid, Levels levels)
    : name_(std::filesystem::path(FileOf(source)).filename().string()),
      source_(source),
      wanted_(levels),
      grid_(grid) {
  Open();
}

ViewedRaster::ViewedRaster(const TreeCutRequest& request)
    : name_(std::filesystem::path(request.tree).filename().string()), tree_(request) {
  Open();
}

void ViewedRaster::Open() {
  JobDraft draft;
  RasterChain chain(draft);
  AddSourceTo(chain, {});
  sourceDescription_ = DescribeNamed(draft.Write().ToUTF8());
  sourceCode_ = sourceDescription_["code"];
  if (!grid_.IsNull() && IsSameGrid(sourceDescription_, *grid_)) grid_ = GeoRefPtr();
  description_ = DescribeNamed(JobOf(0));
  code_ = description_["code"];
  samples_ = description_["samples"];
  lines_ = description_["lines"];
  bands_ = description_["bands"];
  const Json& place = description_["geoRef"];
  if (place.is_object()) {
    geoRef_ = ParseValue<GeoRefPtr>(String(place["text"].get<std::string>()));
    if (!geoRef_.IsNull()) geoRef_->SetDimensions(samples_, lines_);
  }
  while (std::max(samples_, lines_) >> (levelCount_ - 1) > kSmall &&
         std::min(samples_, lines_) >> levelCount_ != 0) {
    ++levelCount_;
  }
  const Json& pyramid = description_["pyramid"];
  if (!pyramid.is_object()) return;
  if (wanted_ == Levels::kPicked && pyramid["type"] != "ORVA") return;
  for (unsigned level = std::max(1U, pyramid["min"].get<unsigned>());
       level <= pyramid["max"].get<unsigned>() && level < levelCount_; ++level) {
    levels_.push_back(level);
  }
}

void ViewedRaster::AddSourceTo(RasterChain& chain, const std::string& prefix) const {
  if (tree_) {
    AddTreeLabels(chain.GetDraft(), prefix + "raster", *tree_);
  } else {
    AddOpenWithPyramid(chain.GetDraft(), prefix + "raster", source_);
  }
  chain.Take(prefix + "raster");
}

void ViewedRaster::AddTo(RasterChain& chain, unsigned level, const std::string& prefix) const {
  AddSourceTo(chain, prefix);
  if (!grid_.IsNull()) {
    JobWriterCommand& carried = chain.AddView(prefix + "carried", "CreateProjectedRasterCommand");
    carried.AddInput("GeoRef", grid_);
    carried.AddInput("ReprojectionMethod", String("Rigorous"));
    carried.AddInput("ResamplingMethod", String("Nearest"));
    carried.AddInput("Grid", Form::kExact);
    carried.AddInput("Kernel", String("Nearest"));
  }
  if (IsComplex(sourceCode_)) AddMagnitudes(chain, prefix, sourceDescription_["bands"]);
  if (IsLong(sourceCode_)) {
    chain.AddView(prefix + "double", "CreateConvertedRasterCommand")
        .AddInput("DataType", String("Double"));
  }
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

std::string ViewedRaster::JobOf(unsigned level) const {
  JobDraft draft;
  RasterChain chain(draft);
  AddTo(chain, level);
  return draft.Write().ToUTF8();
}

ViewedRaster::Size ViewedRaster::SizeOf(unsigned level) const {
  {
    const std::lock_guard lock(mutex_);
    const auto at = sizes_.find(level);
    if (at != sizes_.end()) return at->second;
  }
  const Json description = DescribeNamed(JobOf(level));
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
  const NamedBlock block = ReadNamed(JobOf(level), cut, bands, code_);
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
  const NamedBlock block = ReadNamed(draft.Write().ToUTF8(), {x, y, x, y}, bands, code);
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
