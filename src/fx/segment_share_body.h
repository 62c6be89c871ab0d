#pragma once

#include "foundation/fault.h"
#include "fx/segment_share.h"
#include "fx/shared_basins.h"
#include "fx/strip_process.h"
#include "fx/watershed_task.h"

namespace lumo {

template <typename T>
SegmentShare<T>::SegmentShare(const RasterPtr<T>& segment, const RasterPtr<T>& merge,
                              const SegmentRequest& request, const SegmentShares& done,
                              const IPC& ipc)
    : segment_(segment),
      merge_(merge),
      request_(request),
      done_(done),
      ipc_(ipc),
      cut_(CutOf(*segment, sizeof(T), request, done.Count())) {}

template <typename T>
bool SegmentShare<T>::Run(unsigned share, const std::string& file) {
  constexpr std::uint64_t kMostPixels = 1U << 30U;  // of a share
  if (cut_.width == 0 || cut_.height == 0) {
    SetFault("SegmentURI: the raster has no pixels");
    return false;
  }
  if (std::uint64_t{cut_.width} * cut_.shareLines > kMostPixels || cut_.width > kMostPixels / 2) {
    SetFault("a share has too many pixels; more shares have fewer");
    return false;
  }
  ShareWriter out;
  if (share < cut_.Shares()) {
    const unsigned round = done_.Rounds();
    const bool isDone = round == 0   ? Flood(share, out)
                        : round == 1 ? Settle(share, out)
                                     : Gather(share, out);
    if (!isDone) return false;
    if (IsAborted()) return true;
  }
  return done_.Write(out, file, share);
}

/// Places the stage that reads the strips of a share.
template <typename T>
TileSlot<T> SegmentShare<T>::ReadStrips(detail::StripProcess& process, const RasterPtr<T>& raster,
                                        unsigned share, unsigned border) const {
  return process.ReadSome(
      RasterIteratorPtr<T>(
          new RasterIterator<T>(raster, detail::StripTiles(*raster, cut_.stripLines, border))),
      {cut_.FirstLineOf(share) / cut_.stripLines, (cut_.LinesOf(share) - 1) / cut_.stripLines + 1});
}

template <typename T>
bool SegmentShare<T>::Flood(unsigned share, ShareWriter& out) {
  std::vector<StripDrains::Cell> cells(cut_.PixelsOf(share));
  std::vector<std::int32_t> levels(IsRanked() ? cells.size() : 0);
  detail::StripProcess process("SegmentShareLevels", ipc_);
  const ArgID slot =
      ReadStrips(process, segment_, share, detail::GradientBorder(request_.algorithm, 1)).id;
  detail::AddLevels<T>(process, request_, slot);
  process.Add("Cells", StageOrder::kSeveralAtOnce, [&](ArgList& token, const AbortFlag*) {
    const TilePtr<std::int32_t> tile = TileSlot<std::int32_t>{slot}.In(token);
    if (!tile || !tile->IsValid()) return false;
    const std::uint32_t line = tile->Index().second * cut_.stripLines;
    const std::uint32_t lines = std::min(cut_.stripLines, cut_.height - line);
    const bool hasAbove = line > 0;
    const std::int32_t* const from = tile->PixelArray().GetData();
    const std::size_t at = std::size_t{cut_.width} * (line - cut_.FirstLineOf(share));
    StripDrains::MarkLines({from, FindExcluded(*tile), lines, hasAbove, line + lines < cut_.height},
                           cut_.width, cells.data() + at);
    if (IsRanked()) {
      std::copy_n(from + (hasAbove ? cut_.width : 0), std::size_t{cut_.width} * lines,
                  levels.data() + at);
    }
    return true;
  });
  process.Close();
  if (!process.RunProcess(process.kHere)) return false;
  if (IsAborted()) return true;
  SeamStrip seams;
  seams.first.resize(cut_.width);
  seams.last.resize(cut_.width);
  for (std::uint32_t x = 0; x < cut_.width; ++x) {
    seams.isSameAbove.push_back((cells[x] & StripDrains::SameBit(StripDrains::kUp)) != 0 ? 1 : 0);
  }
  StripDrains drains;
  drains.Begin(std::vector(cells), cut_.width);
  drains.DrainPlateaus({}, seams.first.data(), seams.last.data());
  std::vector<StripMinimum> minima;
  if (IsRanked()) {
    drains.ForEachMinimum([&](std::uint32_t first) { minima.push_back({first, levels[first]}); });
  }
  levels = {};
  seams.zone = SeamZone::Find(cells, cut_.width);
  PutSeams(out, seams);
  out.EndSection();
  PutList(out, cells);
  PutList(out, minima);
  return true;
}

/// Reads the cells that a share has come to in a round.
template <typename T>
bool SegmentShare<T>::ReadCells(unsigned round, unsigned share,
                                std::vector<StripDrains::Cell>& cells, ShareReader& from) const {
  if (!done_.Open(round, share, 1, from)) return false;
  return (GetList(from, cells) && cells.size() == cut_.PixelsOf(share)) ||
         done_.Refuse(round, share);
}

template <typename T>
bool SegmentShare<T>::Settle(unsigned share, ShareWriter& out) {
  std::vector<SeamStrip> strips;
  if (!ReadSettledSeams(done_, cut_, strips)) return false;
  std::vector<StripDrains::Cell> cells;
  std::vector<StripMinimum> minima;
  ShareReader from;
  if (!ReadCells(0, share, cells, from)) return false;
  if (!GetList(from, minima)) return done_.Refuse(0, share);
  StripDrains::Beyond beyond;
  if (share > 0) beyond.above = strips[share - 1].last.data();
  if (share + 1 < strips.size()) beyond.below = strips[share + 1].first.data();
  StripDrains drains;
  drains.Begin(std::move(cells), cut_.width);
  std::vector<std::uint32_t> first(cut_.width), last(cut_.width);
  drains.DrainPlateaus(beyond, first.data(), last.data());
  ShareWays ways;
  ways.ways = StripWays::Find(drains, cut_.width, IsRanked() ? &minima : nullptr);
  for (std::uint32_t x = 0; x < cut_.width; ++x) {
    ways.isFirstFar.push_back(first[x] == StripDrains::kFar ? 1 : 0);
    ways.isLastFar.push_back(last[x] == StripDrains::kFar ? 1 : 0);
  }
  if (IsRanked()) {
    for (const StripMinimum& minimum : minima) ways.levels.push_back(minimum.level);
  }
  PutWays(out, ways);
  out.EndSection();
  PutList(out, drains.Cells());
  return true;
}

template <typename T>
bool SegmentShare<T>::Gather(unsigned share, ShareWriter& out) {
  SharedSeams seams;
  if (!seams.Read(done_, cut_, false)) return false;
  std::vector<std::int32_t> labels(cut_.PixelsOf(share));
  {
    std::vector<StripDrains::Cell> cells;
    ShareReader from;
    if (!ReadCells(1, share, cells, from)) return false;
    StripDrains drains;
    drains.Begin(std::move(cells), cut_.width);
    LabelStrip(drains, {seams.Numbers(), share}, seams.LabelsAbove(share), seams.LabelsBelow(share),
               labels.data());
  }
  PutLabels(out, labels.data(), cut_.width, cut_.LinesOf(share));
  SharedGraph<T> graph;
  {
    StripBasins basins;
    LabelPairs pairs;
    const MinimumNumbers::Labels own = seams.Numbers().LabelsOf(share);
    basins.FindInParts(
        {labels.data(), labels.size(), cut_.width, seams.LabelsBelow(share), share > 0},
        {own.first, own.count}, pairs);
    graph.Begin(std::move(basins), SumsOf(*merge_, request_));
  }
  detail::StripProcess process("SegmentShareGraph", ipc_);
  const auto tiles = ReadStrips(process, merge_, share, 0);
  process.Add("Sums", StageOrder::kOneByOne, [&](ArgList& token, const AbortFlag*) {
    const TilePtr<T> tile = tiles.In(token);
    if (!tile || !tile->IsValid()) return false;
    const std::uint32_t line = tile->Index().second * cut_.stripLines - cut_.FirstLineOf(share);
    graph.Add(labels.data() + std::size_t{cut_.width} * line,
              std::size_t{cut_.width} * tile->Height(), tile->PixelArray().GetData(),
              tile->StateArray().GetData());
    return true;
  });
  process.Close();
  if (!process.RunProcess(process.kHere)) return false;
  if (!IsAborted()) graph.Put(out);
  return true;
}

}  // namespace lumo
