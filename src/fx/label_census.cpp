#include "fx/label_census.h"

#include <algorithm>

#include "foundation/fault.h"
#include "fx/strip_regions.h"
#include "raster/tile_functions.h"
#include "tasks/scratch_pool.h"

namespace lumo {
namespace {

/// The labels of a strip.
struct StripLabels {
  std::uint32_t strip = 0;
  std::vector<std::uint32_t> labels;
};

/// Lists the labels of the strips of a tile; nothing, with the fault set, at a negative one.
template <typename L>
std::optional<std::vector<StripLabels>> ListLabels(const Tile<L>& tile, StripRegions& regions) {
  std::vector<StripLabels> strips;
  for (unsigned from = 0; from < tile.Height(); from += kStripLines) {
    const unsigned to = std::min(from + kStripLines, tile.Height());
    regions.Clear();
    for (unsigned y = from; y < to; ++y) {
      const std::size_t at = tile.Offset(0, y);
      if (regions.AddLine(tile.PixelArray().GetData() + at, tile.StateArray().GetData() + at,
                          nullptr, tile.Width())) {
        continue;
      }
      SetFault(String("LabelURI: there is a label " + std::to_string(regions.NegativeLabel()) +
                      " in line " + std::to_string(tile.Origin().second + y) +
                      "; labels are 0 or above"));
      return std::nullopt;
    }
    strips.push_back({(tile.Origin().second + from) / kStripLines, regions.Labels()});
  }
  return strips;
}

}  // namespace

TileDimensions StripTiles(const BasicRaster& raster, std::size_t lineBytes) {
  constexpr std::size_t kBudget = 0x100000;
  constexpr std::size_t kMost = 0x1000000;  // for the sake of blocks that are read once
  const std::size_t line = std::max<std::size_t>(lineBytes, 1);
  std::size_t lines = kBudget / line;
  const TileDimensions blocks = raster.TileDimensions();
  if (blocks.height > 1 && blocks.height <= kMost / line) {
    lines = std::max<std::size_t>(lines / blocks.height, 1) * blocks.height;
  }
  lines = (std::max<std::size_t>(lines, 1) + kStripLines - 1) / kStripLines * kStripLines;
  TileDimensions tiles;
  tiles.width = raster.Samples();
  tiles.height = static_cast<unsigned>(
      std::min<std::size_t>(lines, (raster.Lines() / kStripLines + 1) * std::size_t{kStripLines}));
  return tiles;
}

bool LabelCensus::Run(const BasicRasterPtr& labels, const IPC& ipc) {
  bool isDone = false;
  const bool isKnown = DispatchType(LabelTypes{}, labels->DataType(), [&]<typename L>() {
    isDone = RunTyped(RasterPtr<L>(labels), ipc);
    return true;
  });
  if (!isKnown) SetFault("LabelURI: the raster is of neither type Int nor UInt");
  return isDone;
}

template <typename L>
bool LabelCensus::RunTyped(const RasterPtr<L>& labels, const IPC& ipc) {
  extents_ = {};
  count_ = 0;
  const TileDimensions tiles = StripTiles(*labels, labels->Samples() * sizeof(L));
  ScratchPool<StripRegions> pool;
  const bool hasRun = ReduceTiles(
      "LabelCensus", TilesBy(LabelTiles(labels, tiles)), *this,
      [&pool](const Tile<L>& tile) {
        const auto regions = pool.Borrow();
        return ListLabels(tile, *regions);
      },
      [](LabelCensus& census, const std::vector<StripLabels>& strips) {
        for (const StripLabels& strip : strips) census.Note(strip.strip, strip.labels);
      },
      ipc);
  if (hasRun && !ipc.abort->IsSet()) return true;
  if (hasRun) SetFault("the work was aborted");
  return false;
}

void LabelCensus::Note(std::uint32_t strip, const std::vector<std::uint32_t>& labels) {
  for (const std::uint32_t label : labels) {
    Extent& extent = extents_[label];
    if (extent.last == 0) {
      extent.first = strip + 1;
      ++count_;
    }
    extent.last = strip + 1;
  }
}

}  // namespace lumo
