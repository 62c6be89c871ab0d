#pragma once

#include "mosaic/mosaic_raster_body.h"

// How the pixels of a mosaic are put together from those of its scenes.

namespace lumo {

/// Holds all that pixels are made with, as it is at one revision of the definition.
template <typename T>
struct MosaicRaster<T>::Shown {
  std::uint64_t revision;
  MosaicMasks masks;
  SceneTables<T> tables;
};

/// A block that is asked for, while it is filled.
template <typename T>
struct MosaicRaster<T>::Block {
  Block(const SubRect& rectangle, const Array<unsigned>& named, Interleave order, Array<T>& values,
        Array<unsigned char>& marks)
      : rect(rectangle),
        shape(rectangle, named, order),
        strides(order, shape.width, shape.height, shape.count),
        pixels(values),
        state(marks) {}

  std::size_t PixelOf(unsigned x, unsigned y) const {
    return std::size_t{y - rect.top} * shape.width + (x - rect.left);
  }
  std::size_t ElementOf(unsigned x, unsigned y) const {
    return (y - rect.top) * strides.line + (x - rect.left) * strides.pixel;
  }
  /// Begins to keep count of the pixels that are there.
  void Count() {
    if (taken.empty()) taken.resize(std::size_t{shape.width} * shape.height);
  }
  /// Takes pixels of a line over that no scene has given yet, where they are valid in some band.
  /// @param given  where the first of them stands in what a scene has given, which may be the
  /// block.
  struct Given {
    const T* pixels;
    const unsigned char* state;
    BlockStrides strides;
  };
  void Take(unsigned y, unsigned first, unsigned last, const Given& given);

  const SubRect rect;
  const BlockShape shape;
  const BlockStrides strides;
  Array<T>& pixels;
  Array<unsigned char>& state;
  std::vector<unsigned char> taken;  // for each pixel, 1 once a scene has given it
  std::size_t left = 0;              // pixels that none has given
};

namespace detail {

/// Calls `take(begin, end)` for the runs of bytes from 0 to below `count` that are 0.
template <typename Take>
void ForEachZeroRun(const unsigned char* bytes, std::size_t count, const Take& take) {
  for (std::size_t at = 0; at < count;) {
    const void* const zero = std::memchr(bytes + at, 0, count - at);
    if (zero == nullptr) return;
    const auto begin = static_cast<std::size_t>(static_cast<const unsigned char*>(zero) - bytes);
    const void* const one = std::memchr(bytes + begin, 1, count - begin);
    const std::size_t end =
        one == nullptr ? count
                       : static_cast<std::size_t>(static_cast<const unsigned char*>(one) - bytes);
    take(begin, end);
    at = end;
  }
}

/// True when no value of some pixels of a line is invalid.
inline bool AllValidIn(const unsigned char* state, std::size_t pixels, unsigned bands,
                       const BlockStrides& strides) {
  if (strides.band == 1) return AllValid(state, pixels * bands);
  for (unsigned i = 0; i < bands; ++i) {
    if (!AllValid(state + i * strides.band, pixels)) return false;
  }
  return true;
}

/// Copies pixels of a line from one block into another of the same order of axes.
template <typename V>
void CopyLine(const V* from, const BlockStrides& fromStrides, V* to, const BlockStrides& toStrides,
              std::size_t pixels, unsigned bands) {
  if (fromStrides.band == 1) {
    std::copy(from, from + pixels * bands, to);
    return;
  }
  for (unsigned i = 0; i < bands; ++i) {
    const V* const line = from + i * fromStrides.band;
    std::copy(line, line + pixels, to + i * toStrides.band);
  }
}

}  // namespace detail

template <typename T>
void MosaicRaster<T>::Block::Take(unsigned y, unsigned first, unsigned last, const Given& given) {
  unsigned char* const marks = &taken[PixelOf(first, y)];
  const std::size_t target = ElementOf(first, y);
  const unsigned bands = shape.count;
  detail::ForEachZeroRun(marks, last - first + 1, [&](std::size_t begin, std::size_t end) {
    const std::size_t at = begin * given.strides.pixel;
    if (detail::AllValidIn(given.state + at, end - begin, bands, given.strides)) {
      const std::size_t to = target + begin * strides.pixel;
      if (given.pixels + at != pixels.GetData() + to) {
        detail::CopyLine(given.pixels + at, given.strides, pixels.GetData() + to, strides,
                         end - begin, bands);
        detail::CopyLine(given.state + at, given.strides, state.GetData() + to, strides,
                         end - begin, bands);
      }
      std::memset(marks + begin, 1, end - begin);
      left -= end - begin;
      return;
    }
    for (std::size_t x = begin; x < end; ++x) {
      const std::size_t from = x * given.strides.pixel;
      bool isThere = false;
      for (unsigned i = 0; i < bands && !isThere; ++i) {
        isThere = IsValidState(given.state[from + i * given.strides.band]);
      }
      if (!isThere) continue;
      const std::size_t to = target + x * strides.pixel;
      for (unsigned i = 0; i < bands; ++i) {
        pixels.GetData()[to + i * strides.band] = given.pixels[from + i * given.strides.band];
        state.GetData()[to + i * strides.band] = given.state[from + i * given.strides.band];
      }
      marks[x] = 1;
      --left;
    }
  });
}

template <typename T>
std::shared_ptr<typename MosaicRaster<T>::Shown> MosaicRaster<T>::Show() {
  const std::lock_guard lock(shownLock_);
  const std::shared_ptr<const MosaicSideFiles> files = definition_->SideFiles();
  if (!shown_ || shown_->revision != files->revision) {
    const std::optional<T> noData =
        HasNoDataValue(0) ? std::optional<T>(NoDataValue(0)) : std::nullopt;
    shown_ = std::shared_ptr<Shown>(
        new Shown{files->revision,
                  {*definition_, *files, models_, def_.geoRef, scaleX_, scaleY_, kDataTypeOf<T>},
                  SceneTables<T>(*definition_, *files, def_.bands, noData)});
  }
  return shown_;
}

/// A scene in the grid of the mosaic.
template <typename T>
RasterPtr<T> MosaicRaster<T>::OnGrid(unsigned scene) {
  return onGrid_->Get(scene, [&]() -> RasterPtr<T> {
    const MosaicSettings& settings = definition_->Settings();
    const ProjectedRasterOptions options{ProjectedGrid::kExact, WarpSampling::kCentred,
                                         settings.noData, KernelOf(settings.resampling)};
    const RasterPtr<T> view(new ProjectedRaster<T>(definition_->Scenes()[scene], def_.geoRef,
                                                   ReprojectionMethod::kPolynomial,
                                                   settings.resampling, options));
    return view->IsValid() ? view : RasterPtr<T>();
  });
}

/// Reads a part of the grid from a scene, with its colours turned.
template <typename T>
bool MosaicRaster<T>::ReadScene(Shown& shown, unsigned scene, const SubRect& part,
                                const Block& block, Array<T>& pixels, Array<unsigned char>& state) {
  const Place& place = places_[scene];
  bool isRead = false;
  if (place.isOnGrid) {
    const auto moved = [](unsigned at, std::int64_t by) {
      return static_cast<unsigned>(std::int64_t{at} + by);
    };
    const SubRect inScene(moved(part.left, place.toX), moved(part.top, place.toY),
                          moved(part.right, place.toX), moved(part.bottom, place.toY));
    isRead = definition_->Scenes()[scene]->GetSubRect(inScene, block.shape.bands,
                                                      block.shape.interleave, pixels, state);
  } else if (const RasterPtr<T> view = OnGrid(scene)) {
    isRead = view->GetSubRect(part, block.shape.bands, block.shape.interleave, pixels, state);
  }
  if (!isRead) return false;
  const auto tables = shown.tables.Of(scene);
  if (!tables) return false;
  const std::size_t width = part.Width(), height = part.Height();
  const BlockStrides strides(block.shape.interleave, width, height, block.shape.count);
  for (unsigned i = 0; i < block.shape.count && !tables->empty(); ++i) {
    const ColourTable<T>& table = (*tables)[block.shape.bands[i]];
    for (std::size_t y = 0; y < height; ++y) {
      const std::size_t at = i * strides.band + y * strides.line;
      table.Apply(pixels.GetData() + at, state.GetData() + at, width, strides.pixel);
    }
  }
  return true;
}

namespace detail {

/// Calls `take(y, first, last)` for the runs of columns of a rectangle that lie in a shape, or for
/// its whole lines without one.
template <typename Take>
void ForEachRun(const SubRect& part, const MaskShape* shape, const Take& take) {
  for (unsigned y = part.top; y <= part.bottom; ++y) {
    if (shape == nullptr) {
      take(y, part.left, part.right);
      continue;
    }
    const SpanRows& rows = shape->Rows();
    for (const ColumnSpan* span = rows.Begin(y); span != rows.End(y); ++span) {
      const std::int64_t first = std::max<std::int64_t>(span->first, part.left);
      const std::int64_t last = std::min<std::int64_t>(span->last, part.right);
      if (first <= last) take(y, static_cast<unsigned>(first), static_cast<unsigned>(last));
    }
  }
}

/// The box around pixels that are added run by run.
struct PixelBox {
  unsigned left = ~0U, top = ~0U, right = 0, bottom = 0;

  bool IsEmpty() const { return left > right; }
  void Add(unsigned y, unsigned first, unsigned last) {
    left = std::min(left, first);
    right = std::max(right, last);
    top = std::min(top, y);
    bottom = y;
  }
  SubRect Rect() const { return {left, top, right, bottom}; }
};

}  // namespace detail

/// Fills the block from the scenes in their order: first by the seam polygons, then, where there
/// are any, the gaps by the footprints.
template <typename T>
bool MosaicRaster<T>::Compose(Shown& shown, const std::vector<std::int32_t>& scenes, Block& block) {
  const BlockShape& shape = block.shape;
  block.left = std::size_t{shape.width} * shape.height;
  Array<T> pixels;
  Array<unsigned char> state;
  bool isUntouched = true;
  const auto take = [&](unsigned scene, const MaskShape* mask) {
    const Place& place = places_[scene];
    SubRect part;
    if (!detail::Cut(block.rect, place.left, place.top, place.right, place.bottom, part)) {
      return true;
    }
    detail::PixelBox wanted;
    if (mask == nullptr && block.taken.empty()) {
      wanted = {part.left, part.top, part.right, part.bottom};
    } else {
      detail::ForEachRun(part, mask, [&](unsigned y, unsigned first, unsigned last) {
        if (!block.taken.empty()) {
          const unsigned char* const row = &block.taken[block.PixelOf(part.left, y)] - part.left;
          while (first <= last && row[first] != 0) ++first;
          while (last > first && row[last] != 0) --last;
          if (first > last) return;
        }
        wanted.Add(y, first, last);
      });
    }
    if (wanted.IsEmpty()) return true;
    const SubRect need = wanted.Rect();
    const bool isWhole = need.Width() == shape.width && need.Height() == shape.height;
    if (isWhole && isUntouched && mask == nullptr) {
      // All of the block, as it is given.
      if (!ReadScene(shown, scene, need, block, block.pixels, block.state)) return false;
      isUntouched = false;
      if (AllValid(block.state.GetData(), block.state.GetCount())) {
        block.left = 0;
        return true;
      }
      block.Count();
      for (unsigned y = need.top; y <= need.bottom; ++y) {
        const std::size_t at = block.ElementOf(need.left, y);
        block.Take(y, need.left, need.right,
                   {block.pixels.GetData() + at, block.state.GetData() + at, block.strides});
      }
      return true;
    }
    block.Count();
    isUntouched = false;
    if (!ReadScene(shown, scene, need, block, pixels, state)) return false;
    const BlockStrides from(shape.interleave, need.Width(), need.Height(), shape.count);
    detail::ForEachRun(need, mask, [&](unsigned y, unsigned first, unsigned last) {
      const std::size_t at = (y - need.top) * from.line + (first - need.left) * from.pixel;
      block.Take(y, first, last, {pixels.GetData() + at, state.GetData() + at, from});
    });
    return true;
  };
  MosaicMasks& masks = shown.masks;
  for (const std::int32_t number : scenes) {
    const auto scene = static_cast<unsigned>(number);
    MosaicMasks::Shape mask;
    if (masks.HasSeam(scene)) {
      mask = masks.Seam(scene);
      if (!mask) return false;
    } else if (masks.HasFootprint(scene)) {
      mask = masks.Footprint(scene);
      if (!mask) return false;
    }
    if (!take(scene, mask.get())) return false;
    if (block.left == 0) return true;
  }
  for (const std::int32_t number : scenes) {
    const auto scene = static_cast<unsigned>(number);
    if (!masks.HasSeam(scene) || !masks.HasFootprint(scene)) continue;
    const MosaicMasks::Shape mask = masks.Footprint(scene);
    if (!mask || !take(scene, mask.get())) return false;
    if (block.left == 0) return true;
  }
  // The rest is in no scene.
  constexpr auto kNoData = static_cast<unsigned char>(PixelValueState::NoData);
  block.Count();
  for (unsigned y = block.rect.top; y <= block.rect.bottom; ++y) {
    const unsigned char* const taken = &block.taken[block.PixelOf(block.rect.left, y)];
    const std::size_t line = block.ElementOf(block.rect.left, y);
    detail::ForEachZeroRun(taken, shape.width, [&](std::size_t begin, std::size_t end) {
      const std::size_t to = line + begin * block.strides.pixel, count = end - begin;
      if (block.strides.band == 1) {  // all bands have one value
        std::fill_n(block.pixels.GetData() + to, count * shape.count, NoDataValue(0));
        std::fill_n(block.state.GetData() + to, count * shape.count, kNoData);
        return;
      }
      for (unsigned i = 0; i < shape.count; ++i) {
        std::fill_n(block.pixels.GetData() + to + i * block.strides.band, count, NoDataValue(0));
        std::fill_n(block.state.GetData() + to + i * block.strides.band, count, kNoData);
      }
    });
  }
  return true;
}

/// Replaces the pixels of the block that lie near seams.
template <typename T>
bool MosaicRaster<T>::Feather(Shown& shown, Block& block) {
  constexpr unsigned kSide = detail::kFeatherSide;
  for (unsigned row = block.rect.top / kSide; row <= block.rect.bottom / kSide; ++row) {
    for (unsigned column = block.rect.left / kSide; column <= block.rect.right / kSide; ++column) {
      const SubRect square(std::max(column * kSide, block.rect.left),
                           std::max(row * kSide, block.rect.top),
                           std::min(column * kSide + kSide - 1, block.rect.right),
                           std::min(row * kSide + kSide - 1, block.rect.bottom));
      if (!FeatherPart(shown, block, square)) return false;
    }
  }
  return true;
}

/// The scenes whose polygons may reach a rectangle, or come nearer to it than half the feathering
/// width: whatever else lies around has no influence on its pixels.
template <typename T>
std::vector<std::int32_t> MosaicRaster<T>::ScenesNear(const SubRect& rect) const {
  const double margin = definition_->Settings().featherWidth * scaleX_ / 2 + 2;
  const auto by = static_cast<std::int64_t>(margin);
  const RegionWindow window{std::int64_t{rect.left} - by, std::int64_t{rect.top} - by,
                            static_cast<unsigned>(rect.Width() + 2 * by),
                            static_cast<unsigned>(rect.Height() + 2 * by), 0};
  return index_->Find(window);
}

template <typename T>
bool MosaicRaster<T>::FeatherPart(Shown& shown, Block& block, const SubRect& strip) {
  const auto width = static_cast<float>(definition_->Settings().featherWidth * scaleX_);
  const float limit = width / 2;
  const std::size_t count = std::size_t{strip.Width()} * strip.Height();
  MosaicMasks& masks = shown.masks;

  // Where no seam is near all pixels are those of one scene.
  const std::vector<std::int32_t> scenes = ScenesNear(strip);
  std::vector<std::pair<unsigned, MosaicMasks::Shape>> seams;
  bool isAnyNear = false;
  for (const std::int32_t number : scenes) {
    const auto scene = static_cast<unsigned>(number);
    if (!masks.HasSeam(scene)) continue;
    seams.emplace_back(scene, masks.Seam(scene));
    if (!seams.back().second) return false;
    isAnyNear = isAnyNear || seams.back().second->MayBeNear(strip, double(limit));
  }
  if (!isAnyNear || seams.size() < 2) return true;

  // How far each pixel lies in each scene's polygon, without those of earlier scenes.
  struct Layer {
    unsigned scene;
    std::vector<float> weights;  // distances at first
  };
  std::vector<Layer> layers;
  std::vector<unsigned char> isNear(count);
  isAnyNear = false;
  for (const auto& [scene, seam] : seams) {
    Layer layer{scene, std::vector<float>(count)};
    if (seam->Distances(strip, limit, layer.weights.data())) {
      isAnyNear = true;
      for (std::size_t i = 0; i < count; ++i) isNear[i] |= std::abs(layer.weights[i]) < limit;
    }
    for (const Layer& earlier : layers) {
      for (std::size_t i = 0; i < count; ++i) {
        layer.weights[i] = std::min(layer.weights[i], -earlier.weights[i]);
      }
    }
    layers.push_back(std::move(layer));
  }
  if (!isAnyNear) return true;

  const unsigned bands = block.shape.count;
  std::vector<double> weightSums(count * bands), sums(count * bands);
  std::vector<unsigned char> contributors(count * bands);
  std::vector<float> fromBorder(count);
  Array<T> pixels;
  Array<unsigned char> state;
  for (Layer& layer : layers) {
    if (masks.HasFootprint(layer.scene)) {
      const MosaicMasks::Shape footprint = masks.Footprint(layer.scene);
      if (!footprint) return false;
      footprint->Distances(strip, limit, fromBorder.data());
    } else {
      std::fill(fromBorder.begin(), fromBorder.end(), limit);
    }
    const Place& place = places_[layer.scene];
    SubRect part;
    if (!detail::Cut(strip, place.left, place.top, place.right, place.bottom, part)) continue;
    detail::PixelBox wanted;
    for (unsigned y = part.top; y <= part.bottom; ++y) {
      for (unsigned x = part.left; x <= part.right; ++x) {
        const std::size_t i = std::size_t{y - strip.top} * strip.Width() + (x - strip.left);
        const float ramp = std::min(layer.weights[i] + limit, 2 * fromBorder[i]) / width;
        layer.weights[i] = isNear[i] != 0 ? std::clamp(ramp, 0.0F, 1.0F) : 0.0F;
        if (layer.weights[i] > 0) {
          wanted.left = std::min(wanted.left, x);
          wanted.right = std::max(wanted.right, x);
          wanted.top = std::min(wanted.top, y);
          wanted.bottom = y;
        }
      }
    }
    if (wanted.IsEmpty()) continue;
    const SubRect need = wanted.Rect();
    if (!ReadScene(shown, layer.scene, need, block, pixels, state)) return false;
    const BlockStrides from(block.shape.interleave, need.Width(), need.Height(), bands);
    for (unsigned y = need.top; y <= need.bottom; ++y) {
      for (unsigned x = need.left; x <= need.right; ++x) {
        const std::size_t i = std::size_t{y - strip.top} * strip.Width() + (x - strip.left);
        const double weight = layer.weights[i];
        if (!(weight > 0)) continue;
        const std::size_t at = (y - need.top) * from.line + (x - need.left) * from.pixel;
        for (unsigned band = 0; band < bands; ++band) {
          if (!IsValidState(state.GetData()[at + band * from.band])) continue;
          const auto value = static_cast<double>(pixels.GetData()[at + band * from.band]);
          const std::size_t sum = i * bands + band;
          weightSums[sum] += weight;
          sums[sum] += weight * value;
          if (contributors[sum] < 2) ++contributors[sum];
        }
      }
    }
  }
  for (unsigned y = strip.top; y <= strip.bottom; ++y) {
    for (unsigned x = strip.left; x <= strip.right; ++x) {
      const std::size_t i = std::size_t{y - strip.top} * strip.Width() + (x - strip.left);
      if (isNear[i] == 0) continue;
      for (unsigned band = 0; band < bands; ++band) {
        const std::size_t sum = i * bands + band;
        if (contributors[sum] < 2) continue;  // as it is
        const std::size_t to = block.ElementOf(x, y) + band * block.strides.band;
        const unsigned number = block.shape.bands[band];
        const double mean = sums[sum] / weightSums[sum];
        T value = NearestPixel<T>(mean);
        if (HasNoDataValue(number) && value == NoDataValue(number)) {
          value = BesideNoData(value, mean);
        }
        block.pixels.GetData()[to] = value;
        block.state.GetData()[to] = PixelValueState::Valid;
      }
    }
  }
  return true;
}

template <typename T>
bool MosaicRaster<T>::GetSubRect(const SubRect& rect, const Array<unsigned>& bands,
                                 Interleave interleave, Array<T>& pixels,
                                 Array<unsigned char>& state) {
  if (!IsValid()) return false;
  if (stored_) return stored_->GetSubRect(rect, bands, interleave, pixels, state);
  Block block(rect, bands, interleave, pixels, state);
  const bool isInside = rect.right < def_.samples && rect.bottom < def_.lines;
  if (!isInside || !block.shape.Size(pixels, state)) return false;
  for (const unsigned band : block.shape.bands) {
    if (band >= def_.bands) return false;
  }
  const std::shared_ptr<Shown> shown = Show();
  const std::vector<std::int32_t> scenes = ScenesIn(rect);
  if (!Compose(*shown, scenes, block)) return false;
  const bool isFeathered = definition_->Settings().featherWidth > 0 && shown->masks.HaveSeams();
  return !isFeathered || Feather(*shown, block);
}

}  // namespace lumo
