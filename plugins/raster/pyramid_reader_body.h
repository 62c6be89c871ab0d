#pragma once

#include <algorithm>
#include <atomic>
#include <cerrno>
#include <mutex>
#include <optional>

#include "data/merge_values.h"
#include "foundation/fault.h"
#include "platform/random_access_file.h"
#include "pyramid_reader.h"
#include "raster/no_data_marker.h"
#include "raster/raster_details.h"
#include "tasks/parallel.h"

namespace lumo::pyramid {

template <typename T>
bool Reader<T>::LoadValues() {
  Values<T> loaded;
  const std::string text = pyramid_.File() != nullptr ? pyramid_.File()->Values() : std::string();
  if (!loaded.Read(text, pyramid_.Def().bands)) {
    return pyramid_.Fail("the values of its bands can't be read");
  }
  if (isInherited_) {
    loaded.noData = values_.noData;
    loaded.geoRef = values_.geoRef;
  }
  values_ = std::move(loaded);
  return true;
}

template <typename T>
lumo::RasterDef Reader<T>::RasterDef() {
  lumo::RasterDef def = pyramid_.Def();
  if (!def.geoRef && values_.geoRef) def.SetGeoRef(values_.geoRef);
  if (!values_.fileState.empty()) {
    def.metadata.Set(FileStatePath(), String(values_.fileState));
  }
  def.noData.clear();
  for (const auto& [band, value] : values_.noData) {
    if constexpr (std::is_arithmetic_v<T>) {
      def.noData[band] = static_cast<double>(value);
    } else {
      def.noData[band] = static_cast<double>(value.real);
    }
  }
  return def;
}

/// True for the raster itself, and the levels that can be read or are being built.
template <typename T>
bool Reader<T>::HasSize(unsigned level) const {
  return level == 0 ||
         (pyramid_.File() != nullptr && pyramid_.File()->GetHeader().HasLevel(level)) ||
         (pyramid_.GetBuild() != nullptr && pyramid_.GetBuild()->GetHeader().HasLevel(level));
}

template <typename T>
unsigned Reader<T>::Samples(unsigned level) {
  return HasSize(level) ? pyramid_.Def().samples >> level : 0;
}

template <typename T>
unsigned Reader<T>::Lines(unsigned level) {
  return HasSize(level) ? pyramid_.Def().lines >> level : 0;
}

template <typename T>
std::int32_t Reader<T>::PyramidResamplingMethod() {
  return PyramidExists() ? static_cast<std::int32_t>(pyramid_.File()->GetHeader().resamplingMethod)
                         : 0;
}

template <typename T>
std::int32_t Reader<T>::PyramidLevelMin() {
  return PyramidExists() ? static_cast<std::int32_t>(pyramid_.File()->GetHeader().levelMin) : 0;
}

template <typename T>
std::int32_t Reader<T>::PyramidLevelMax() {
  return PyramidExists() ? static_cast<std::int32_t>(pyramid_.File()->GetHeader().levelMax) : 0;
}

template <typename T>
bool Reader<T>::PyramidBuild(std::int32_t levelMin, std::int32_t levelMax,
                             std::int32_t resamplingMethod, const TileDimensions& tiles) {
  Header wanted;
  wanted.levelMin = static_cast<std::uint32_t>(levelMin);
  wanted.levelMax = static_cast<std::uint32_t>(levelMax);
  wanted.resamplingMethod = static_cast<std::uint32_t>(resamplingMethod);
  wanted.tileSide = tiles.height;
  return pyramid_.BeginBuild(wanted);
}

template <typename T>
bool Reader<T>::PyramidRebuild() {
  return pyramid_.Fail("a pyramid is built from its raster");
}

template <typename T>
bool Reader<T>::PyramidDelete() {
  if (!pyramid_.Delete()) return false;
  values_.stats.clear();
  values_.histograms.clear();
  return true;
}

template <typename T>
bool Reader<T>::PyramidRefresh() {
  Values<T> fresh;  // statistics come once they are computed
  fresh.noData = values_.noData;
  fresh.geoRef = values_.geoRef;
  fresh.fileState = inheritedState_;
  const bool isThere = pyramid_.Refresh(fresh.Write(), kHasStats);
  return LoadValues() && isThere;
}

template <typename T>
bool Reader<T>::CanChangeValues() const {
  using platform::RandomAccessFile;
  if (pyramid_.File() == nullptr) return false;
  errno = 0;
  if (RandomAccessFile::Open(pyramid_.PathShown(), RandomAccessFile::Access::kUpdate) != nullptr) {
    return true;
  }
  // Any other reason is one for a write to fail by.
  return errno != EACCES && errno != EPERM && errno != EROFS;
}

/// Lets `change` change the values that the file has now, and keeps them when they are stored.
template <typename T>
template <typename F>
bool Reader<T>::Change(F&& change) {
  if (pyramid_.File() == nullptr) return pyramid_.Fail("there is no pyramid");
  const bool stored = pyramid_.ChangeValues([&](const std::string& before, std::string& after) {
    Values<T> values;
    if (!values.Read(before, pyramid_.Def().bands)) {
      return pyramid_.Fail("the values of its bands can't be read");
    }
    change(values);
    after = values.Write();
    return true;
  });
  return stored && PyramidRefresh();
}

template <typename T>
RasterBandStats<T> Reader<T>::ReadStats(unsigned band) {
  const auto found = values_.stats.find(band);
  return found != values_.stats.end() ? found->second : RasterBandStats<T>();
}

template <typename T>
bool Reader<T>::WriteStats(const Array<RasterBandStats<T>>& stats) {
  if (!kHasStats) return pyramid_.Fail("complex pixels have no statistics");
  for (const RasterBandStats<T>& band : stats) {
    if (band.band >= this->Bands()) return pyramid_.Fail("statistics of a band that isn't there");
  }
  return Change([&](Values<T>& values) { MergeStats(stats, values_.stats, values.stats); });
}

template <typename T>
Array<RasterBandHistogram<T>> Reader<T>::Histogram(unsigned band) {
  const auto ofBand = [band](const auto& histogram) { return histogram.band == band; };
  const auto count = static_cast<unsigned>(std::ranges::count_if(values_.histograms, ofBand));
  Array<RasterBandHistogram<T>> result;
  if (count != 0 && result.Resize(ArrayDims(count))) {
    std::ranges::copy_if(values_.histograms, result.begin(), ofBand);
  }
  return result;
}

template <typename T>
bool Reader<T>::WriteHistogram(const Array<RasterBandHistogram<T>>& histograms) {
  if (!kHasStats) return pyramid_.Fail("complex pixels have no histograms");
  for (const RasterBandHistogram<T>& histogram : histograms) {
    if (histogram.band >= this->Bands() || histogram.counts.GetCount() != histogram.binCount) {
      return pyramid_.Fail("a histogram that can't be one of its bands");
    }
  }
  return Change([&](Values<T>& values) {
    MergeHistograms(histograms, values_.histograms, values.histograms);
  });
}

template <typename T>
T Reader<T>::NoDataValue(unsigned band) {
  const auto found = values_.noData.find(band);
  return found != values_.noData.end() ? found->second : T{};
}

template <typename T>
void Reader<T>::InheritNoDataValues(const lumo::RasterDef& from) {
  isInherited_ = true;
  values_.noData.clear();
  for (const auto& [band, value] : from.noData) {
    if (band >= pyramid_.Def().bands) continue;
    if constexpr (std::is_arithmetic_v<T>) {
      values_.noData[band] = static_cast<T>(value);
    } else {
      values_.noData[band] = {static_cast<decltype(T().real)>(value), 0};
    }
  }
  values_.geoRef = CloneOf(from.geoRef);
  inheritedState_ = FindDetail(from.metadata, FileStatePath());
}

template <typename T>
bool Reader<T>::CanWritePixels(unsigned level) {
  return pyramid_.GetBuild() != nullptr && pyramid_.GetBuild()->GetHeader().HasLevel(level);
}

template <typename T>
bool Reader<T>::WritePixels(unsigned left, unsigned top, unsigned width, unsigned height,
                            const Array<unsigned>& bands, unsigned level, const T* pixels,
                            const unsigned char* state) {
  if (!CanWritePixels(level)) return pyramid_.Fail("the level isn't being built");
  Build& build = *pyramid_.GetBuild();
  const Header& header = build.GetHeader();
  const LevelShape shape = header.Shape(level);
  const LevelTiling tiling = header.Tiling();
  const unsigned column = left / tiling.side, row = top / tiling.side;
  const std::uint64_t right = std::uint64_t{left} + width;
  const bool isWhole = left % tiling.side == 0 && top % tiling.side == 0 && width != 0 &&
                       row < shape.Rows() && height == shape.RowHeight(row) &&
                       (right == shape.width || (right < shape.width && right % tiling.side == 0));
  bool areBands = bands.GetCount() == tiling.bands;
  for (unsigned i = 0; areBands && i < bands.GetCount(); ++i) {
    areBands = tiling.bands == 1 ? bands[i] < header.bands : bands[i] == i;
  }
  if (!isWhole || !areBands) return pyramid_.Fail("only whole tiles can be written");
  const unsigned band = header.BandGroups() == 1 ? 0 : bands[0];
  const auto columns = static_cast<unsigned>((right - 1) / tiling.side) - column + 1;
  return build.Write(band,
                     {shape, row, column, columns, tiling.bands, DataTypeBytes(header.dataType),
                      reinterpret_cast<const unsigned char*>(pixels), state},
                     &pyramid_);
}

template <typename T>
bool Reader<T>::WritePackedTiles(const PackedTileRow& row) {
  if (!CanWritePixels(row.level)) return pyramid_.Fail("the level isn't being built");
  return pyramid_.GetBuild()->Write(row, &pyramid_);
}

/// A block to read: where it lies in the level, and in the caller's memory.
template <typename T>
struct Reader<T>::Block {
  unsigned left, top, width, height;
  const Array<unsigned>& bands;
  unsigned level;
  T* pixels;
  unsigned char* states;
};

template <typename T>
bool Reader<T>::ReadPixels(unsigned left, unsigned top, unsigned width, unsigned height,
                           const Array<unsigned>& bands, unsigned level, T* pixels,
                           unsigned char* state) {
  PyramidFile* const file = pyramid_.File();
  if (file == nullptr) return pyramid_.Fail("there is no pyramid yet");
  if (!file->LoadIndex(level)) return false;
  const LevelShape shape = file->GetHeader().Shape(level);
  const unsigned count = this->Bands();
  const bool isInside = width != 0 && height != 0 && std::uint64_t{left} + width <= shape.width &&
                        std::uint64_t{top} + height <= shape.height &&
                        std::ranges::all_of(bands, [&](unsigned band) { return band < count; });
  if (!isInside) return pyramid_.Fail("a block outside the level");
  if (!CopyTiles({left, top, width, height, bands, level, pixels, state})) return false;

  std::vector<std::optional<T>> values;
  for (const unsigned band : bands) {
    values.push_back(HasNoDataValue(band) ? std::optional(NoDataValue(band)) : std::nullopt);
  }
  const NoDataMarker<T> marker(std::move(values), Interleave::BIP, width, height);
  const std::uint64_t elements = std::uint64_t{width} * height * bands.GetCount();
  if (marker.IsNeeded()) marker.Mark(0, elements, pixels, state);
  return true;
}

/// Fetches the tiles that a block touches, several at once, and copies what it wants of them.
template <typename T>
bool Reader<T>::CopyTiles(const Block& block) {
  const Header& header = pyramid_.File()->GetHeader();
  const unsigned side = header.Tiling().side;
  std::vector<unsigned> groups{0};
  if (header.BandGroups() != 1) {
    groups.assign(block.bands.begin(), block.bands.end());
    std::ranges::sort(groups);
    groups.erase(std::unique(groups.begin(), groups.end()), groups.end());
  }
  std::vector<TilePlace> places;
  for (unsigned row = block.top / side; row <= (block.top + block.height - 1) / side; ++row)
    for (unsigned column = block.left / side; column <= (block.left + block.width - 1) / side;
         ++column)
      for (const unsigned band : groups) places.push_back({block.level, column, row, band});

  std::mutex lock;  // of the fault
  std::string fault;
  std::atomic<bool> failed{false};
  ParallelFor(static_cast<unsigned>(places.size()), nullptr, [&](unsigned i) {
    std::string why;
    if (failed || CopyTile(block, places[i], why)) return;
    failed = true;
    const std::lock_guard guard(lock);
    fault = why;
  });
  if (failed) SetFault(fault);
  return !failed;
}

namespace detail {

/// Copies a part of a tile, for each of some of its bands, into a block; both pixel-interleaved.
/// @param pairs  a band of the tile, and its place in the block.
template <typename E>
void CopyBands(const E* from, std::size_t fromStride, unsigned fromBands, E* to,
               std::size_t toStride, unsigned toBands, unsigned width, unsigned height,
               const std::vector<std::pair<unsigned, unsigned>>& pairs) {
  bool isWhole = fromBands == toBands && pairs.size() == fromBands;
  for (unsigned i = 0; isWhole && i < pairs.size(); ++i) isWhole = pairs[i] == std::pair(i, i);
  for (unsigned y = 0; y < height; ++y, from += fromStride, to += toStride) {
    if (isWhole) {
      std::copy_n(from, std::size_t{width} * fromBands, to);
      continue;
    }
    for (const auto& [band, place] : pairs) {
      for (std::size_t x = 0; x < width; ++x) to[x * toBands + place] = from[x * fromBands + band];
    }
  }
}

}  // namespace detail

template <typename T>
bool Reader<T>::CopyTile(const Block& block, const TilePlace& place, std::string& fault) {
  const Header& header = pyramid_.File()->GetHeader();
  const unsigned side = header.Tiling().side;
  std::shared_ptr<const Tile> tile = pyramid_.Cache().Find(place);
  const unsigned tileLeft = place.column * side, tileTop = place.row * side;
  if (tile == nullptr) {
    const auto fresh = std::make_shared<Tile>();
    if (!pyramid_.File()->ReadTile(place, *fresh, fault)) return false;
    tile = fresh;
    const bool isTakenWhole = tileLeft >= block.left && tileTop >= block.top &&
                              tileLeft + tile->width <= block.left + block.width &&
                              tileTop + tile->height <= block.top + block.height;
    if (!isTakenWhole) pyramid_.Cache().Keep(place, tile);
  }
  const unsigned left = std::max(tileLeft, block.left), top = std::max(tileTop, block.top);
  const unsigned right = std::min(tileLeft + tile->width, block.left + block.width);
  const unsigned bottom = std::min(tileTop + tile->height, block.top + block.height);
  const unsigned count = block.bands.GetCount();
  std::vector<std::pair<unsigned, unsigned>> pairs;
  for (unsigned i = 0; i < count; ++i) {
    if (header.BandGroups() == 1) {
      pairs.emplace_back(block.bands[i], i);
    } else if (block.bands[i] == place.band) {
      pairs.emplace_back(0, i);
    }
  }
  const std::size_t from =
      (std::size_t{top - tileTop} * tile->width + (left - tileLeft)) * tile->bands;
  const std::size_t to = (std::size_t{top - block.top} * block.width + (left - block.left)) * count;
  const std::size_t fromStride = std::size_t{tile->width} * tile->bands;
  const std::size_t toStride = std::size_t{block.width} * count;
  detail::CopyBands(reinterpret_cast<const T*>(tile->pixels.Get()) + from, fromStride, tile->bands,
                    block.pixels + to, toStride, count, right - left, bottom - top, pairs);
  if (tile->states.Count() != 0) {
    detail::CopyBands<unsigned char>(tile->states.Get() + from, fromStride, tile->bands,
                                     block.states + to, toStride, count, right - left, bottom - top,
                                     pairs);
  }
  return true;
}

}  // namespace lumo::pyramid
