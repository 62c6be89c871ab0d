#include "regions/zonal_pass.h"

#include <algorithm>
#include <numeric>

#include "foundation/fault.h"
#include "raster/raster_def.h"
#include "regions/coverage_block.h"
#include "tasks/parallel.h"

namespace lumo {
namespace {

/// Where the pixels of a band lie in a block.
struct BandLayout {
  std::size_t first;  // pixel of the block
  std::size_t lineStep;
  std::size_t step;
};

BandLayout LayoutOf(const BasicTile& block, std::size_t band) {
  const std::size_t width = block.Width(), bands = block.Bands();
  switch (block.Order()) {
    case Interleave::BIL:
      return {band * width, bands * width, 1};
    case Interleave::BSQ:
      return {band * width * block.Height(), width, 1};
    default:
      return {band, width * bands, bands};
  }
}

/// The window with the pixels that vertices may cover.
RegionWindow Within(const RegionWindow& window, const std::vector<ScanVertices>& rings) {
  double left = 1e16, top = 1e16, right = -1e16, bottom = -1e16;
  for (const ScanVertices& ring : rings) {
    for (const Point2D<double>& vertex : ring) {
      left = std::min(left, vertex.x);
      right = std::max(right, vertex.x);
      top = std::min(top, vertex.y);
      bottom = std::max(bottom, vertex.y);
    }
  }
  const auto at = [](double value) { return static_cast<std::int64_t>(std::floor(value)); };
  const std::int64_t x = std::max(window.left, at(left));
  const std::int64_t y = std::max(window.top, at(top));
  const std::int64_t width = std::min(window.Right(), at(right)) - x + 1;
  const std::int64_t height = std::min(window.Bottom(), at(bottom)) - y + 1;
  if (width <= 0 || height <= 0) return {};
  return {x, y, static_cast<unsigned>(width), static_cast<unsigned>(height)};
}

}  // namespace

/// Takes the zones of a block, several at the same time.
template <typename T>
class ZonalPass<T>::ZonesOfBlock final : public IParallelFor<unsigned>, public ParallelResult {
 public:
  ZonesOfBlock(ZonalPass& pass, const Tile<T>& block, const RegionWindow& window)
      : pass_(pass), block_(block), window_(window), zones_(pass.ZonesIn(window)) {}

  unsigned Begin() const override { return 0; }
  unsigned End() const override { return static_cast<unsigned>(zones_.size()); }
  void Body(unsigned begin, unsigned end) override {
    for (unsigned i = begin; i < end && !Failed(); ++i) {
      if (!pass_.TakeZone(zones_[i], block_, window_)) Fail();
    }
  }

 private:
  ZonalPass& pass_;
  const Tile<T>& block_;
  const RegionWindow& window_;
  const std::vector<std::int32_t> zones_;
};

template <typename T>
ZonalPass<T>::ZonalPass(const RasterPtr<T>& raster, const ZonalPlan& plan)
    : raster_(raster),
      plan_(plan),
      geoRef_(raster->GetRasterDef().geoRef),
      shapes_(ShownOnGrid(plan.geometry, geoRef_, plan.options), geoRef_, raster->Samples(),
              raster->Lines(), plan.options),
      onGrid_(ShownOnGrid(plan.geometry, geoRef_, plan.options)) {
  withValues_ =
      std::any_of(plan.requests.begin(), plan.requests.end(),
                  [](const ZonalRequest& request) { return NeedsValues(request.figure); });
}

template <typename T>
bool ZonalPass<T>::Run(const IPC& ipc) {
  const RasterIteratorPtr<T> iterator(new RasterIteratorStream<T>(raster_, plan_.bands));
  Begin(*iterator);
  TileProcess<> process("ZonalStatistics", ipc);
  return RunOver(process, process.Read(iterator), ipc);
}

template <typename T>
bool ZonalPass<T>::RunShare(const Share& share, const IPC& ipc) {
  const RasterIteratorPtr<T> iterator(new RasterIteratorStream<T>(raster_, plan_.bands));
  ChooseZones(*iterator, share);
  Begin(*iterator);
  if (blocks_.empty()) return true;
  ChosenBlocks process("ZonalStatistics", blocks_, ipc);
  const auto slot = process.ReadChosen(iterator);
  return RunOver(process, slot, ipc);
}

template <typename T>
void ZonalPass<T>::Begin(const RasterIterator<T>& iterator) {
  const std::size_t zones = plan_.geometry->RecordCount();
  zones_ = std::vector<std::unique_ptr<Zone>>(zones);
  figures_.assign(zones * plan_.bands.GetCount() * plan_.requests.size(), std::nan(""));
  CountBlocks(iterator);
  for (std::size_t zone = 0; zone < zones; ++zone) {
    if (blocksLeft_[zone] == 0) Finish(static_cast<std::int32_t>(zone));  // off the raster
  }
}

/// Runs the stages behind the one that reads blocks.
template <typename T>
bool ZonalPass<T>::RunOver(TileProcess<>& process, const TileSlot<T>& slot, const IPC& ipc) {
  process.Add("ZonalStatistics", StageOrder::kOneByOne,
              [this, slot](ArgList& token, const AbortFlag*) {
                const TilePtr<T> block = slot.In(token);
                return block && block->IsValid() && TakeBlock(*block);
              });
  process.Close();
  const bool hasRun = process.RunProcess(process.kHere);
  if (hasRun && !ipc.abort->IsSet()) return true;
  SetFault(hasRun ? String("the statistics were aborted") : process.GetFault());
  return false;
}

/// The zones that may have pixels in a window, without those of other shares.
template <typename T>
std::vector<std::int32_t> ZonalPass<T>::ZonesIn(const RegionWindow& window) {
  std::vector<std::int32_t> zones = shapes_.FindRecords(window);
  if (!isLeftOut_.empty()) {
    std::erase_if(zones,
                  [&](std::int32_t zone) { return isLeftOut_[static_cast<std::size_t>(zone)]; });
  }
  return zones;
}

/// Chooses the zones of a share in the order of their first blocks, and finds the blocks that these
/// touch.
template <typename T>
void ZonalPass<T>::ChooseZones(const RasterIterator<T>& iterator, const Share& share) {
  CountBlocks(iterator);
  const std::size_t count = plan_.geometry->RecordCount();
  std::vector<std::uint32_t> order(count);
  std::iota(order.begin(), order.end(), 0U);
  std::stable_sort(order.begin(), order.end(), [&](std::uint32_t a, std::uint32_t b) {
    return firstBlocks_[a] < firstBlocks_[b];
  });
  isLeftOut_.assign(count, true);
  for (std::uint64_t i = share.Begin(count); i < share.End(count); ++i) {
    zonesOfShare_.push_back(order[i]);
    isLeftOut_[order[i]] = false;
  }
  ForEachBlock(iterator, [&](unsigned column, unsigned row, const RegionWindow& window) {
    if (!ZonesIn(window).empty()) blocks_.push_back({column, row});
  });
}

/// Calls `visit(column, row, window)` for each block of the raster.
template <typename T>
template <typename Visit>
void ZonalPass<T>::ForEachBlock(const RasterIterator<T>& iterator, const Visit& visit) const {
  const TileDimensions size = iterator.Dimensions();
  for (unsigned row = 0; row < iterator.Rows(); ++row) {
    for (unsigned column = 0; column < iterator.Columns(); ++column) {
      const unsigned left = column * size.width, top = row * size.height;
      visit(column, row,
            RegionWindow{left, top, std::min(size.width, raster_->Samples() - left),
                         std::min(size.height, raster_->Lines() - top)});
    }
  }
}

/// Counts for each zone the blocks that it may touch, and notes the first of them.
template <typename T>
void ZonalPass<T>::CountBlocks(const RasterIterator<T>& iterator) {
  const std::size_t zones = plan_.geometry->RecordCount();
  blocksLeft_.assign(zones, 0);
  firstBlocks_.assign(zones, 0);
  std::uint32_t block = 0;
  ForEachBlock(iterator, [&](unsigned, unsigned, const RegionWindow& window) {
    for (const std::int32_t zone : ZonesIn(window)) {
      const auto at = static_cast<std::size_t>(zone);
      if (blocksLeft_[at]++ == 0) firstBlocks_[at] = block;
    }
    ++block;
  });
}

template <typename T>
bool ZonalPass<T>::TakeBlock(const Tile<T>& block) {
  const auto [left, top] = block.Origin();
  const RegionWindow window{left, top, block.Width(), block.Height()};
  ZonesOfBlock zones(*this, block, window);
  RunParallelFor(zones, 1);
  return zones.Close();
}

template <typename T>
typename ZonalPass<T>::Zone& ZonalPass<T>::ZoneOf(std::int32_t zone) {
  std::unique_ptr<Zone>& held = zones_[static_cast<std::size_t>(zone)];
  if (!held) held.reset(new Zone{std::vector<ZoneValues<T>>(plan_.bands.GetCount())});
  return *held;
}

template <typename T>
bool ZonalPass<T>::TakeZone(std::int32_t zone, const Tile<T>& block, const RegionWindow& window) {
  const bool isTaken = plan_.weights == ZonalWeights::kCoverage ? AddShares(zone, block, window)
                                                                : AddPixels(zone, block, window);
  if (!isTaken) return false;
  if (--blocksLeft_[static_cast<std::size_t>(zone)] == 0) Finish(zone);
  return true;
}

/// Adds the pixels that the scan gives a zone.
template <typename T>
bool ZonalPass<T>::AddPixels(std::int32_t zone, const Tile<T>& block, const RegionWindow& window) {
  const std::shared_ptr<const SpanRows> rows = shapes_.RowsOf(zone, window);
  if (!rows) return false;
  Zone& into = ZoneOf(zone);
  const std::int64_t last = std::min(rows->LastRow(), window.Bottom());
  for (std::int64_t row = std::max(rows->FirstRow(), window.top); row <= last; ++row) {
    const ColumnSpan* const end = rows->End(row);
    for (const ColumnSpan* span = rows->Begin(row); span != end; ++span) {
      const std::int64_t from = std::max<std::int64_t>(span->first, window.left);
      const std::int64_t to = std::min<std::int64_t>(span->last, window.Right());
      if (from > to) continue;
      AddRun(into, block, static_cast<std::size_t>(row - window.top),
             static_cast<std::size_t>(from - window.left), static_cast<std::size_t>(to - from + 1),
             nullptr);
    }
  }
  return true;
}

/// Adds the shares of pixels that lie inside a zone.
template <typename T>
bool ZonalPass<T>::AddShares(std::int32_t zone, const Tile<T>& block, const RegionWindow& window) {
  const auto record = static_cast<std::uint32_t>(zone);
  std::vector<ScanVertices> rings;
  std::vector<bool> holes;
  for (const int part : onGrid_->PartIds(record)) {
    const auto id = static_cast<std::uint32_t>(part);
    rings.emplace_back();
    holes.push_back(onGrid_->IsHole(record, id));
    if (!CarryPart(*onGrid_, record, id, geoRef_, plan_.options.coordinates, rings.back())) {
      return false;
    }
  }
  const RegionWindow covered = Within(window, rings);
  if (covered.PixelCount() == 0) return true;
  CoverageBlock coverage(covered);
  for (std::size_t i = 0; i < rings.size(); ++i) coverage.AddRing(rings[i], holes[i]);
  Zone& into = ZoneOf(zone);
  std::vector<double> shares;
  for (unsigned line = 0; line < covered.height; ++line) {
    coverage.GetLine(line, shares);
    AddRun(into, block, static_cast<std::size_t>(covered.top - window.top) + line,
           static_cast<std::size_t>(covered.left - window.left), covered.width, shares.data());
  }
  return true;
}

/// Adds pixels of a line, in all bands.
template <typename T>
void ZonalPass<T>::AddRun(Zone& zone, const Tile<T>& block, std::size_t line, std::size_t first,
                          std::size_t count, const double* weights) {
  for (std::size_t band = 0; band < zone.bands.size(); ++band) {
    const BandLayout layout = LayoutOf(block, band);
    const std::size_t at = layout.first + line * layout.lineStep + first * layout.step;
    const ZoneRun<T> run{block.PixelArray().GetData() + at, block.StateArray().GetData() + at,
                         layout.step, count};
    if (weights != nullptr) {
      zone.bands[band].AddWeighted(run, weights, withValues_);
    } else {
      zone.bands[band].Add(run, withValues_);
    }
  }
}

/// Turns what was gathered for a zone into its figures.
template <typename T>
void ZonalPass<T>::Finish(std::int32_t zone) {
  const bool isWeighted = plan_.weights == ZonalWeights::kCoverage;
  Zone& from = ZoneOf(zone);
  double* figure = figures_.data() +
                   static_cast<std::size_t>(zone) * plan_.bands.GetCount() * plan_.requests.size();
  for (ZoneValues<T>& band : from.bands) {
    for (const ZonalRequest& request : plan_.requests) *figure++ = band.Get(request, isWeighted);
  }
  zones_[static_cast<std::size_t>(zone)].reset();
}

VEXG_INSTANCES(EIGHT, ZonalPass);

}  // namespace lumo
