#pragma once

#include "foundation/fault.h"
#include "pyramid/level_cascade_body.h"
#include "pyramid/line_planes.h"
#include "pyramid/packed_tiles.h"
#include "pyramid/reduced_levels.h"
#include "pyramid/shared_levels.h"
#include "raster/raster_lines.h"
#include "raster/tile_process.h"
#include "stats/raster_stats_process_body.h"

namespace lumo {

namespace detail {

/// Names the pieces of the file of a share.
enum class SharePiece : std::uint32_t {
  kRow = 1,    ///< a row of packed tiles
  kLine = 2,   ///< a line of the top level
  kStats = 3,  ///< the statistics of a block
  kEnd = 4     ///< of a group of bands
};

/// The numbers in front of a row of packed tiles.
struct ShareRow {
  std::uint32_t level, row, band, tiles;
};

/// Reads whole lines, or squares, of some lines of a raster.
template <typename T>
class ShareBlocks final : public RasterIterator<T> {
 public:
  ShareBlocks(const RasterPtr<T>& lines, const TileDimensions& tiles, const Array<unsigned>& bands,
              Interleave order)
      : RasterIterator<T>(lines, tiles, bands) {
    this->order_ = order;
  }
};

}  // namespace detail

/// The levels of a share, of one group of bands.
template <typename T>
class SharedLevels<T>::Part {
 public:
  Part(const SharedLevels& all, const Array<unsigned>& bands, Packing packing)
      : all_(all), bands_(bands), packing_(packing), out_(all.shares_.Out()) {
    const unsigned share = all.shares_.GetShare().index;
    first_ = all.cut_.First(share);
    end_ = all.cut_.End(share);
  }

  unsigned First() const { return first_; }
  unsigned End() const { return end_; }
  const Array<unsigned>& Bands() const { return bands_; }

  /// Keeps a row of tiles of a level.
  void PutRow(const LevelShape& shape, unsigned row, const Tile<T>& tiles) {
    const auto perTile = static_cast<unsigned>(bands_.GetCount());
    const std::vector<TileToStore> packed =
        PackTiles({shape, row, 0, shape.Columns(), perTile, sizeof(T),
                   reinterpret_cast<const unsigned char*>(tiles.PixelArray().GetData()),
                   tiles.StateArray().GetData()},
                  packing_);
    const bool isApart = perTile != all_.plan_.source->Bands();
    out_.Put(detail::SharePiece::kRow);
    out_.Put(detail::ShareRow{shape.level, row, isApart ? bands_[0] : 0, shape.Columns()});
    for (const TileToStore& tile : packed) out_.Put(tile.entry);
    for (const TileToStore& tile : packed) {
      out_.PutAll(tile.pixels.data(), tile.pixels.size());
      out_.PutAll(tile.states.data(), tile.states.size());
    }
  }

  LevelRowSink<T> SinkOf(const LevelShape& shape) {
    return [this, shape](unsigned row, Tile<T>& tiles) {
      PutRow(shape, row, tiles);
      return true;
    };
  }

  /// Keeps a line of the top level.
  void PutLine(const detail::LevelLine<T>& line) {
    out_.Put(detail::SharePiece::kLine);
    detail::PutLine(out_, line, all_.reduction_);
  }

  /// The rows of tiles of a level that the share has: the first, and that behind the last.
  std::pair<unsigned, unsigned> RowsOf(const LevelShape& shape) const {
    const unsigned end =
        end_ == all_.plan_.source->Lines() ? shape.Rows() : (end_ >> shape.level) / shape.tileSide;
    return {(first_ >> shape.level) / shape.tileSide, end};
  }

 private:
  const SharedLevels& all_;
  const Array<unsigned>& bands_;
  const Packing packing_;
  ShareWriter& out_;
  unsigned first_ = 0;
  unsigned end_ = 0;
};

/// Makes levels of every 2^level-th pixel out of blocks of any form.
template <typename T>
class SharedLevels<T>::NearestLevels {
 public:
  NearestLevels(const SharedLevels& all, Part& part) : part_(part) {
    const Raster<T>& source = *all.plan_.source;
    const unsigned top = all.cut_.Top();
    for (unsigned number = std::min(all.plan_.levelMin, top); number <= top; ++number) {
      const LevelShape shape(source.Samples(), source.Lines(), number, all.side_);
      const bool isStored = number >= all.plan_.levelMin;
      const bool handsOn = number == top && all.plan_.levelMax > top;
      if (shape.IsEmpty() || (!isStored && !handsOn)) continue;
      const auto [firstRow, endRow] = part.RowsOf(shape);
      const auto take = [this, shape, isStored, handsOn](unsigned row, Tile<T>& tiles) {
        if (isStored) part_.PutRow(shape, row, tiles);
        if (handsOn) PutLines(shape, row, tiles);
        return true;
      };
      writers_.emplace_back(take, shape, source.Samples(), firstRow, endRow);
    }
  }

  bool Take(const Tile<T>& block) {
    return std::ranges::all_of(writers_, [&](auto& writer) { return writer.Take(block); });
  }

 private:
  /// Keeps the lines of a row of tiles, which lie in it tile by tile.
  void PutLines(const LevelShape& shape, unsigned row, const Tile<T>& tiles) {
    const std::size_t bands = tiles.Bands(), height = shape.RowHeight(row);
    detail::LevelLine<T> line;
    line.Resize(shape.width * bands);
    for (std::size_t y = 0; y < height; ++y) {
      for (unsigned column = 0; column < shape.Columns(); ++column) {
        const std::size_t left = std::size_t{column} * shape.tileSide;
        const std::size_t width = shape.ColumnWidth(column);
        const std::size_t from = (left * height + y * width) * bands;
        std::copy_n(tiles.PixelArray().GetData() + from, width * bands,
                    line.values.begin() + static_cast<std::ptrdiff_t>(left * bands));
        std::copy_n(tiles.StateArray().GetData() + from, width * bands,
                    line.states.begin() + static_cast<std::ptrdiff_t>(left * bands));
      }
      part_.PutLine(line);
    }
  }

  Part& part_;
  std::deque<LevelStripWriter<T>> writers_;
};

template <typename T>
SharedLevels<T>::SharedLevels(const PyramidPlan<T>& plan, LevelReduction reduction,
                              ShareScope& shares, const ObjectPtr& stats, const IPC& ipc)
    : plan_(plan),
      reduction_(reduction),
      shares_(shares),
      stats_(stats),
      ipc_(ipc),
      side_(TilingOf(plan.source->Bands(), plan.tileSide).side),
      cut_(plan.source->Samples(), plan.source->Lines(), plan.levelMax, side_,
           shares.IsShare() ? shares.GetShare().count : shares.Count()) {}

/// The blocks in which one run reads the raster.
template <typename T>
TileDimensions SharedLevels<T>::Blocks() const {
  const bool isSquare = reduction_ == LevelReduction::kTold &&
                        ChoosePyramidPath(plan_.source->GetRasterDef()) == PyramidPath::kRow;
  if (isSquare) return TileDimensions{plan_.tileSide, plan_.tileSide};
  return WideTiles(plan_.source.Get(), sizeof(T), RasterIteratorStream<T>::kBudget, 0);
}

template <typename T>
bool SharedLevels<T>::MakeShare(Packing packing) {
  const auto groups = GroupsOfBands(plan_.source->Bands(), plan_.tileSide);
  if (reduction_ == LevelReduction::kTold && groups.size() != 1) {
    SetFault("every 2^level-th pixel of bands that are stored apart isn't made in shares");
    return false;
  }
  if (!shares_.StreamOut()) return false;
  for (const Array<unsigned>& bands : groups) {
    if (!MakeGroup(bands, packing)) return false;
    if (ipc_.abort->IsSet()) return true;
    shares_.Out().Put(detail::SharePiece::kEnd);
  }
  return groups.size() == 1 || MakeStats();
}

/// Makes the levels of some bands; with them the statistics, where all bands are together. Of the
/// blocks of one run those count that begin in the share.
template <typename T>
bool SharedLevels<T>::MakeGroup(const Array<unsigned>& bands, Packing packing) {
  Part part(*this, bands, packing);
  const unsigned first = part.First(), end = part.End();
  if (first >= end) return true;
  const TileDimensions blocks = Blocks();
  const unsigned lines = plan_.source->Lines();
  const unsigned begin = first / blocks.height * blocks.height;
  const auto behind = static_cast<unsigned>(std::min<std::uint64_t>(
      (std::uint64_t{end} + blocks.height - 1) / blocks.height * blocks.height, lines));

  const bool isTold = reduction_ == LevelReduction::kTold;
  std::optional<NearestLevels> nearest;
  std::optional<detail::LevelCascade<T>> cascade;
  if (isTold) {
    nearest.emplace(*this, part);
  } else {
    const unsigned top = cut_.Top();
    const bool handsOn = plan_.levelMax > top && top != 0;
    cascade.emplace(
        detail::CascadeDef{plan_.source->Samples(), lines, side_, plan_.levelMin, top, 0, first,
                           end},
        reduction_, detail::NoDataValuesOf(*plan_.source, bands),
        [&](const LevelShape& shape) { return part.SinkOf(shape); },
        [&part, handsOn](const detail::LevelLine<T>& line) {
          if (handsOn) part.PutLine(line);
          return true;
        });
  }
  const RasterPtr<T> shown(new RasterLines<T>(plan_.source, begin, behind - begin));
  TileProcess<> process("SharedLevels", ipc_);
  const auto slot = process.Read(RasterIteratorPtr<T>(new detail::ShareBlocks<T>(
      shown, blocks, bands, isTold ? StreamOrder(plan_.source.Get()) : Interleave::BIP)));
  const bool hasStats = bands.GetCount() == plan_.source->Bands();
  process.Add("SharedLevels", StageOrder::kOneByOne, [&](ArgList& token, const AbortFlag* abort) {
    const TilePtr<T> block = slot.In(token);
    if (!block || !block->IsValid()) return false;
    const auto [x, y] = block->Origin();
    block->SetOrigin({x, y + begin});
    if (!(isTold ? nearest->Take(*block) : cascade->Take(*block))) return false;
    if constexpr (std::is_arithmetic_v<T>) {
      const unsigned at = y + begin;
      if (!hasStats || at < first || at >= end) return true;
      const auto ofBlock = StatsOfTile(RasterStats<T>(bands.GetCount()), *block, abort);
      if (!ofBlock) return false;
      shares_.Out().Put(detail::SharePiece::kStats);
      ofBlock->Save(shares_.Out());
    }
    return true;
  });
  process.Close();
  return process.RunProcess(process.kHere);
}

/// Keeps the statistics of bands that are stored apart, of the blocks of a pass of their own.
template <typename T>
bool SharedLevels<T>::MakeStats() {
  if constexpr (std::is_arithmetic_v<T>) {
    const RasterIteratorStream<T> whole(plan_.source);
    if (RasterIteratorShare<T>::IsEmpty(whole, shares_.GetShare())) return true;
    const RasterIteratorPtr<T> tiles(new RasterIteratorShare<T>(whole, shares_.GetShare()));
    const RasterStatsPtr<T> stats(stats_);
    RasterStatsProcess<T, RasterStats<T>> process(tiles, stats, ipc_, &shares_.Out());
    return process.RunProcess(process.kHere);
  } else {
    return true;
  }
}

template <typename T>
bool SharedLevels<T>::Join(PackedLevels& store) {
  const auto groups = GroupsOfBands(plan_.source->Bands(), plan_.tileSide);
  for (const Array<unsigned>& bands : groups) {
    if (!JoinGroup(bands, store)) return false;
    if (ipc_.abort->IsSet()) return true;
  }
  return groups.size() == 1 || JoinStats();
}

template <typename T>
bool SharedLevels<T>::JoinGroup(const Array<unsigned>& bands, PackedLevels& store) {
  const unsigned samples = plan_.source->Samples(), lines = plan_.source->Lines();
  const unsigned top = cut_.Top(), levelMin = std::max(plan_.levelMin, top + 1);
  detail::LevelCascade<T> cascade({samples, lines, side_, levelMin, plan_.levelMax, top, 0, lines},
                                  reduction_, detail::NoDataValuesOf(*plan_.source, bands),
                                  detail::SinksOf(plan_.full, bands));
  detail::LevelLine<T> line;
  line.Resize(std::size_t{samples >> top} * bands.GetCount());
  const auto take = [&](ShareReader& in, detail::SharePiece piece) {
    if (piece == detail::SharePiece::kRow) return TakeRow(in, store);
    if (piece == detail::SharePiece::kStats) return TakeStats(in);
    return piece == detail::SharePiece::kLine && detail::GetLine(in, line, reduction_) &&
           cascade.TakeLine(line);
  };
  for (unsigned share = 0; share < cut_.Count(); ++share) {
    ShareReader* const in = shares_.In(share);
    if (in == nullptr) return false;
    const auto size = static_cast<double>(std::max<std::uint64_t>(in->Left(), 1));
    for (auto piece = detail::SharePiece::kRow; piece != detail::SharePiece::kEnd;) {
      if (ipc_.abort->IsSet()) return true;
      TakeFault();
      if (!in->Get(piece) || (piece != detail::SharePiece::kEnd && !take(*in, piece))) {
        SetFault(TakeFaultOr("the files of the shares don't hold the levels"));
        return false;
      }
      const double done = 1 - static_cast<double>(in->Left()) / size;
      ipc_.progress->Update((share + done) / cut_.Count());
    }
    in->Rest();
  }
  return true;
}

/// Hands a row of packed tiles to the store, which looks at them.
template <typename T>
bool SharedLevels<T>::TakeRow(ShareReader& in, PackedLevels& store) const {
  detail::ShareRow front{};
  if (!in.Get(front) || front.tiles > in.Left() / sizeof(StoredTile)) return false;
  PackedTileRow row{front.level, front.row, 0, front.band, std::vector<StoredTile>(front.tiles),
                    {}};
  if (!in.GetAll(row.tiles.data(), row.tiles.size())) return false;
  std::uint64_t bytes = 0;
  for (const StoredTile& tile : row.tiles)
    bytes += std::uint64_t{tile.pixelBytes} + tile.stateBytes;
  if (bytes > in.Left()) return false;
  row.bytes.Resize(bytes);
  return in.GetAll(row.bytes.Get(), bytes) && store.WritePackedTiles(row);
}

template <typename T>
bool SharedLevels<T>::TakeStats(ShareReader& in) const {
  if constexpr (std::is_arithmetic_v<T>) {
    const RasterStatsPtr<T> stats(stats_);
    RasterStats<T> ofBlock(stats->BandCount());
    return ofBlock.Restore(in) && stats->Merge(ofBlock);
  } else {
    return false;
  }
}

/// Takes the statistics of bands that are stored apart.
template <typename T>
bool SharedLevels<T>::JoinStats() {
  if constexpr (std::is_arithmetic_v<T>) {
    const RasterIteratorStream<T> whole(plan_.source);
    for (unsigned i = 0; i < cut_.Count(); ++i) {
      const Share share{i, cut_.Count()};
      ShareReader* const in = shares_.In(i);
      if (in == nullptr) return false;
      const std::uint64_t rows = share.End(whole.Rows()) - share.Begin(whole.Rows());
      for (std::uint64_t tile = 0; tile < rows * whole.Columns(); ++tile) {
        if (TakeStats(*in)) continue;
        SetFault("the files of the shares don't hold the statistics");
        return false;
      }
    }
  }
  return true;
}

}  // namespace lumo
