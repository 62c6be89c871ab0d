#pragma once

#include <algorithm>

#include "raster/block_shape.h"
#include "raster/raster_details.h"
#include "views/band_stack_raster.h"

namespace lumo {

namespace detail {

template <typename T>
RasterPtr<T> FirstOf(const Array<RasterPtr<T>>& members) {
  const auto first = std::find_if(members.begin(), members.end(),
                                  [](const RasterPtr<T>& member) { return bool(member); });
  return first != members.end() ? *first : RasterPtr<T>();
}

}  // namespace detail

template <typename T>
BandStackRaster<T>::BandStackRaster(const Array<RasterPtr<T>>& members, Form form)
    : ComputedRaster<T>(detail::FirstOf(members)) {
  for (const RasterPtr<T>& member : members) {
    if (!member) continue;
    const RasterDef def = member->GetRasterDef();
    const PyramidDef pyramid = member->GetPyramidDef();
    if (members_.empty()) {
      def_ = def;
      def_.noData.clear();
      pyramidDef_.levelMin = pyramid.levelMin;
      pyramidDef_.levelMax = pyramid.levelMax;
    }
    pyramidDef_.levelMin = std::max(pyramidDef_.levelMin, pyramid.levelMin);
    pyramidDef_.levelMax = std::min(pyramidDef_.levelMax, pyramid.levelMax);
    pyramidDef_.levelMin = std::min(pyramidDef_.levelMin, pyramidDef_.levelMax);
    if (form == Form::kExact && !members_.empty()) {
      AddBandDetails(def_.metadata, static_cast<unsigned>(sources_.size()), def.metadata);
    }
    const auto index = static_cast<unsigned>(members_.size());
    for (unsigned band = 0; band < member->Bands(); ++band) {
      const auto value = def.noData.find(band);
      if (value != def.noData.end()) {
        def_.noData[static_cast<unsigned>(sources_.size())] = value->second;
      }
      sources_.push_back({index, band});
    }
    members_.push_back(member);
  }
  def_.bands = static_cast<unsigned>(sources_.size());
  if (def_.bands == 0) def_.Clear();
}

/// Gives the result of `call(member, local band)` for a band of the stack; 0, false or empty for
/// one that it doesn't have.
template <typename T>
template <typename Call>
auto BandStackRaster<T>::AskMember(unsigned band, const Call& call) const {
  using Result = decltype(call(*members_[0], 0u));
  if (band >= sources_.size()) return Result();
  return call(*members_[sources_[band].member], sources_[band].band);
}

template <typename T>
bool BandStackRaster<T>::CanWrite() const {
  return !members_.empty() && std::all_of(members_.begin(), members_.end(),
                                          [](const auto& member) { return member->CanWrite(); });
}

template <typename T>
bool BandStackRaster<T>::PyramidExists() const {
  return !members_.empty() && std::all_of(members_.begin(), members_.end(), [](const auto& member) {
    return member->PyramidExists();
  });
}

template <typename T>
bool BandStackRaster<T>::PyramidDelete() {
  bool last = false;
  for (const auto& member : members_) last = member->PyramidDelete();
  return last;
}

template <typename T>
bool BandStackRaster<T>::PyramidRefresh() {
  bool last = false;
  for (const auto& member : members_) last = member->PyramidRefresh();
  return last;
}

template <typename T>
RasterPtr<T> BandStackRaster<T>::PyramidLevel(unsigned level) {
  Array<RasterPtr<T>> reduced{ArrayDims(static_cast<unsigned>(members_.size()))};
  for (unsigned i = 0; i < reduced.GetCount(); ++i) {
    reduced[i] = members_[i]->PyramidLevel(level);
    if (!reduced[i]) return {};
  }
  return reduced.GetCount() != 0 ? RasterPtr<T>(new BandStackRaster(reduced)) : RasterPtr<T>();
}

template <typename T>
bool BandStackRaster<T>::StatsExist(unsigned band, unsigned mask) const {
  if ((mask & StatsMask::Pairs) != 0 &&
      !ComputedRaster<T>::StatsExist(band, mask & StatsMask::Pairs))
    return false;
  return AskMember(band, [&](Raster<T>& member, unsigned local) {
    return member.StatsExist(local, mask & ~StatsMask::Pairs);
  });
}

template <typename T>
StatValue<T> BandStackRaster<T>::StatOf(StatsMask::Code stat, unsigned band, unsigned otherBand,
                                        const IPC& ipc) {
  if ((stat & StatsMask::Pairs) != 0) return ComputedRaster<T>::StatOf(stat, band, otherBand, ipc);
  return AskMember(
      band, [&](Raster<T>& member, unsigned local) { return member.StatOf(stat, local, 0, ipc); });
}

template <typename T>
bool BandStackRaster<T>::HasNoDataValue(unsigned band) const {
  return AskMember(band,
                   [&](Raster<T>& member, unsigned local) { return member.HasNoDataValue(local); });
}

template <typename T>
T BandStackRaster<T>::NoDataValue(unsigned band) const {
  return AskMember(band,
                   [&](Raster<T>& member, unsigned local) { return member.NoDataValue(local); });
}

template <typename T>
bool BandStackRaster<T>::HasPalette(unsigned band) const {
  return AskMember(band,
                   [&](Raster<T>& member, unsigned local) { return member.HasPalette(local); });
}

template <typename T>
PalettePtr BandStackRaster<T>::Palette(unsigned band) const {
  return AskMember(band, [&](Raster<T>& member, unsigned local) { return member.Palette(local); });
}

template <typename T>
bool BandStackRaster<T>::WritePalette(unsigned band, const PalettePtr& palette) {
  return AskMember(
      band, [&](Raster<T>& member, unsigned local) { return member.WritePalette(local, palette); });
}

template <typename T>
bool BandStackRaster<T>::DeletePalette(unsigned band) {
  return AskMember(band,
                   [&](Raster<T>& member, unsigned local) { return member.DeletePalette(local); });
}

template <typename T>
bool BandStackRaster<T>::WriteStats() {
  bool last = false;
  for (const auto& member : members_) last = member->WriteStats();
  return last;
}

template <typename T>
bool BandStackRaster<T>::WriteHistogram() {
  bool all = !members_.empty();
  for (const auto& member : members_) all = member->WriteHistogram() && all;
  return all;
}

template <typename T>
RasterBandStats<T> BandStackRaster<T>::BandStats(unsigned band) const {
  RasterBandStats<T> stats =
      AskMember(band, [](Raster<T>& member, unsigned local) { return member.BandStats(local); });
  const RasterBandStats<T> own = ComputedRaster<T>::BandStats(band);
  stats.band = band;
  stats.sumXY = own.sumXY;
  stats.cov = own.cov;
  stats.mask = (stats.mask & ~StatsMask::Pairs) | (own.mask & StatsMask::Pairs);
  return stats;
}

template <typename T>
std::uint64_t BandStackRaster<T>::WriteCount() const {
  std::uint64_t writes = 0;  // no sum comes twice, since none of them ever falls
  for (const auto& member : members_) writes += member->WriteCount();
  return writes;
}

template <typename T>
lumo::TileDimensions BandStackRaster<T>::TileDimensions() const {
  lumo::TileDimensions tiles;
  tiles.width = this->Samples();
  tiles.height = this->Samples() != 0 ? 1 : 0;
  return tiles;
}

template <typename T>
bool BandStackRaster<T>::Knows(const Array<unsigned>& bands) const {
  return bands.GetCount() != 0 && std::all_of(bands.begin(), bands.end(), [&](unsigned band) {
           return band < sources_.size();
         });
}

template <typename T>
typename BandStackRaster<T>::Share BandStackRaster<T>::ShareOf(unsigned member,
                                                               const Array<unsigned>& bands) const {
  Share share;
  const ArrayDims most(bands.GetCount());
  share.bands.Resize(most);
  share.places.Resize(most);
  unsigned count = 0;
  for (unsigned place = 0; place < bands.GetCount(); ++place) {
    const Source& source = sources_[bands[place]];
    if (source.member != member) continue;
    share.bands[count] = source.band;
    share.places[count++] = place;
  }
  share.bands.Resize(ArrayDims(count));
  share.places.Resize(ArrayDims(count));
  return share;
}

template <typename T>
bool BandStackRaster<T>::GetSubRect(const SubRect& rect, const Array<unsigned>& bands,
                                    Interleave interleave, Array<T>& pixels,
                                    Array<unsigned char>& state) {
  const BlockShape block(rect, bands, interleave);
  if (!Knows(block.bands)) return false;
  const Share first = ShareOf(sources_[block.bands[0]].member, block.bands);
  if (first.bands.GetCount() == block.count) {  // all of one member
    return members_[sources_[block.bands[0]].member]->GetSubRect(rect, first.bands, interleave,
                                                                 pixels, state);
  }
  const std::size_t plane = std::size_t{block.width} * block.height;
  Array<T> planes, part;
  Array<unsigned char> planeStates, partState;
  const ArrayDims flat(block.dims.count);
  if (!block.Size(pixels, state) || !planes.Resize(flat) || !planeStates.Resize(flat)) return false;
  for (unsigned member = 0; member < members_.size(); ++member) {
    const Share share = ShareOf(member, block.bands);
    if (share.bands.GetCount() == 0) continue;
    if (!members_[member]->GetSubRect(rect, share.bands, Interleave::BSQ, part, partState) ||
        part.GetCount() < plane * share.bands.GetCount()) {  // the member has cut the block
      return false;
    }
    for (unsigned i = 0; i < share.places.GetCount(); ++i) {
      std::copy_n(&part[i * plane], plane, &planes[share.places[i] * plane]);
      std::copy_n(&partState[i * plane], plane, &planeStates[share.places[i] * plane]);
    }
  }
  return block.Convert(planes, planeStates, Interleave::BSQ, pixels, state, interleave);
}

template <typename T>
bool BandStackRaster<T>::PutSubRect(const SubRect& rect, const Array<unsigned>& bands,
                                    Interleave interleave, Array<T>& pixels,
                                    Array<unsigned char>& state) {
  const BlockShape block(rect, bands, interleave);
  const std::size_t plane = std::size_t{block.width} * block.height;
  const ArrayDims flat(block.dims.count);
  Array<T> planes;
  Array<unsigned char> planeStates;
  if (!Knows(block.bands) || !block.IsHeldBy(pixels, state) || !planes.Resize(flat) ||
      !planeStates.Resize(flat) ||
      !block.Convert(pixels, state, interleave, planes, planeStates, Interleave::BSQ)) {
    return false;
  }
  // In the order of the list, neighbours of one member together: two members may stand on the same
  // pixels, and then the last in the list stays.
  for (unsigned first = 0, next = 0; first < block.count; first = next) {
    const unsigned member = sources_[block.bands[first]].member;
    while (next < block.count && sources_[block.bands[next]].member == member) ++next;
    Array<unsigned> local{ArrayDims(next - first)};
    for (unsigned i = first; i < next; ++i) local[i - first] = sources_[block.bands[i]].band;
    const ArrayDims dims = BlockDims(Interleave::BSQ, block.width, block.height, next - first);
    Array<T> part(&planes[first * plane], dims);
    Array<unsigned char> partState(&planeStates[first * plane], dims);
    if (!members_[member]->PutSubRect(rect, local, Interleave::BSQ, part, partState)) return false;
  }
  return true;
}

}  // namespace lumo
