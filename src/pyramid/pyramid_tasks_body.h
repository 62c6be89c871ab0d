#pragma once

#include <algorithm>
#include <bit>

#include "foundation/fault.h"
#include "foundation/scalar.h"
#include "pyramid/pyramid_tasks.h"
#include "raster/valid_pixels.h"
#include "tasks/task_errors.h"

namespace lumo {

template <typename T>
LevelRowSink<T> MakeRowSink(const RasterPtr<T>& level, const LevelShape& shape,
                            const Array<unsigned>& bands) {
  const auto iterator = std::make_shared<RasterIterator<T>>(
      level, TileDimensions{shape.width, shape.tileSide}, bands);
  return [iterator](unsigned row, Tile<T>& tiles) { return iterator->Write(0, row, tiles); };
}

template <typename T>
LevelStripWriter<T>::LevelStripWriter(const RasterPtr<T>& level, const LevelShape& shape,
                                      unsigned samples)
    : LevelStripWriter(MakeRowSink(level, shape, AllBands(*level)), shape, samples, 0,
                       shape.Rows()) {}

template <typename T>
bool LevelStripWriter<T>::Take(const Tile<T>& block) {
  const LevelShape& shape = strip_.Shape();
  const auto [x, y] = block.Origin();
  const bool endsRow = x + block.Width() == samples_;
  const unsigned end = std::min(shape.FirstFrom(std::uint64_t{y} + block.Height()), shape.height);
  while (row_ < endRow_ && row_ * shape.tileSide < end) {
    if (!isBegun_ && !strip_.Begin(0, shape.Columns(), row_, block.Bands())) return false;
    isBegun_ = true;
    strip_.Take(block);
    if (!endsRow || end < row_ * shape.tileSide + shape.RowHeight(row_)) return true;
    if (!sink_(row_, strip_.Pixels())) return false;
    isBegun_ = false;
    ++row_;
  }
  return true;
}

template <typename T>
LevelTask<T>::LevelTask(const char* name, ArgList& setup) : SequentialTask(name) {
  const RasterPtr<T> raster(setup.Get(0));
  const unsigned* const level = FindScalarValue<unsigned>(setup.Get(1));
  const unsigned* const side = FindScalarValue<unsigned>(setup.Get(2));
  if (raster.IsNull() || level == nullptr || side == nullptr || *side == 0) {
    SetErrorState(TaskErrorBadParams());
    return;
  }
  samples_ = raster->Samples();
  lines_ = raster->Lines();
  shape_ = LevelShape(samples_, lines_, *level, *side);
  level_ = raster->StoredPyramidLevel(*level);
  if (level_.IsNull()) SetErrorState(TaskErrorBadParams());
}

template <typename T>
void LevelTask<T>::UseTiles(unsigned side) {
  shape_ = LevelShape(samples_, lines_, shape_.level, side);
}

template <typename T>
TilePtr<T> LevelTask<T>::BlockOf(ArgList& args) {
  if (HasError()) return {};
  const TilePtr<T> block(args.Get(0));
  if (!block.IsNull() && block->IsValid()) return block;
  SetErrorState(TaskErrorBadArgs());
  return {};
}

template <typename T>
bool LevelTask<T>::Fail() {
  SetErrorState(TaskError());
  return false;
}

template <typename T>
RasterPyramidScanlineDecimateTask<T>::RasterPyramidScanlineDecimateTask(ArgList& setup)
    : LevelTask<T>("RasterPyramidScanlineDecimateTask", setup) {
  if (this->HasError() || this->Shape().IsEmpty()) return;
  writer_ =
      std::make_unique<LevelStripWriter<T>>(this->Level(), this->Shape(), this->FullSamples());
}

template <typename T>
bool RasterPyramidScanlineDecimateTask<T>::Execute(ArgList& args) {
  const TilePtr<T> block = this->BlockOf(args);
  if (!block || this->IsAborted()) return false;
  return writer_ == nullptr || writer_->Take(*block) || this->Fail();
}

template <typename T>
RasterPyramidRowDecimateTask<T>::RasterPyramidRowDecimateTask(ArgList& setup)
    : LevelTask<T>("RasterPyramidRowDecimateTask", setup) {
  const LevelShape& shape = this->Shape();
  if (this->HasError() || shape.IsEmpty()) return;
  if (shape.level == 0) {
    tiles_.Reset(
        new RasterIterator<T>(this->Level(), TileDimensions{shape.tileSide, shape.tileSide}));
  } else {
    writer_ = std::make_unique<LevelStripWriter<T>>(this->Level(), shape, this->FullSamples());
  }
}

template <typename T>
bool RasterPyramidRowDecimateTask<T>::Execute(ArgList& args) {
  const TilePtr<T> block = this->BlockOf(args);
  if (!block || this->IsAborted()) return false;
  if (this->Shape().IsEmpty()) return true;
  return (writer_ != nullptr ? writer_->Take(*block) : Copy(*block)) || this->Fail();
}

/// Writes a block as a tile of level 0.
template <typename T>
bool RasterPyramidRowDecimateTask<T>::Copy(const Tile<T>& block) {
  const auto [column, row] = block.Index();
  LevelWindow<T> tile(this->Shape());
  if (!tile.Begin(column, column + 1, row, block.Bands())) return false;
  tile.Take(block);
  return tiles_->Write(column, row, tile.Pixels());
}

template <typename T>
RasterMortenReadTask<T>::RasterMortenReadTask(ArgList& setup)
    : SequentialTask("RasterMortenReadTask"), raster_(setup.Get(0)) {
  const unsigned* const width = FindScalarValue<unsigned>(setup.Get(1));
  const unsigned* const height = FindScalarValue<unsigned>(setup.Get(2));
  if (raster_.IsNull() || width == nullptr || height == nullptr) {
    SetErrorState(TaskErrorBadParams());
    return;
  }
  tiles_.width = *width;
  tiles_.height = *height;
}

template <typename T>
bool RasterMortenReadTask<T>::BeginBand() {
  Array<unsigned> bands{ArrayDims(1)};
  bands[0] = band_;
  iterator_.Reset(new RasterIterator<T>(raster_, tiles_, bands));
  if (!iterator_->IsValid()) return false;
  bits_ = static_cast<unsigned>(
      std::bit_width(std::max({iterator_->Columns(), iterator_->Rows(), 1U}) - 1));
  index_ = 0;
  done_ = 0;
  return true;
}

/// The next position on the grid. A square of the walk that begins off the grid lies off it whole.
template <typename T>
ZPosition RasterMortenReadTask<T>::NextPosition() {
  for (;;) {
    const ZPosition at = PositionAlongZ(index_, bits_);
    if (at.x < iterator_->Columns() && at.y < iterator_->Rows()) {
      ++index_;
      return at;
    }
    const auto axisBits = static_cast<unsigned>(std::countr_zero(index_)) / 2;
    index_ += std::uint64_t{1} << (2 * axisBits);
  }
}

template <typename T>
bool RasterMortenReadTask<T>::Execute(ArgList& args) {
  if (HasError()) return false;
  if (iterator_.IsNull() && raster_->Bands() != 0 && !BeginBand()) {
    SetErrorState(TaskError());
    return false;
  }
  if (iterator_.IsNull() || iterator_->Columns() == 0 || iterator_->Rows() == 0) return false;
  if (done_ == std::uint64_t{iterator_->Columns()} * iterator_->Rows()) {
    if (band_ + 1 == raster_->Bands()) return false;
    ++band_;
    if (!BeginBand()) {
      SetErrorState(TaskError());
      return false;
    }
  }
  const ZPosition at = NextPosition();
  const TilePtr<T> tile = pool_.Take();
  if (!iterator_->Read(static_cast<unsigned>(at.x), static_cast<unsigned>(at.y), *tile)) {
    SetErrorState(TaskError());
    return false;
  }
  ++done_;
  return args.Set(0, tile);
}

template <typename T>
RasterPyramidMortenDecimateTask<T>::RasterPyramidMortenDecimateTask(ArgList& setup)
    : LevelTask<T>("RasterPyramidMortenDecimateTask", setup) {
  const unsigned* const width = FindScalarValue<unsigned>(setup.Get(3));
  const unsigned* const height = FindScalarValue<unsigned>(setup.Get(4));
  if (width == nullptr || height == nullptr || *width == 0 || *width != *height) {
    this->SetErrorState(TaskErrorBadParams());
    return;
  }
  blockSide_ = *width;
  this->UseTiles(blockSide_);
  const LevelShape blocks(this->FullSamples(), this->FullLines(), 0, blockSide_);
  if (this->HasError() || blocks.IsEmpty()) return;
  lastColumn_ = blocks.Columns() - 1;
  lastRow_ = blocks.Rows() - 1;
  tile_ = std::make_unique<LevelWindow<T>>(this->Shape());
}

template <typename T>
bool RasterPyramidMortenDecimateTask<T>::Execute(ArgList& args) {
  const TilePtr<T> block = this->BlockOf(args);
  if (!block || this->IsAborted()) return false;
  return tile_ == nullptr || this->Shape().IsEmpty() || TakeTile(*block) || this->Fail();
}

template <typename T>
bool RasterPyramidMortenDecimateTask<T>::BeginBand() {
  Array<unsigned> bands{ArrayDims(1)};
  bands[0] = band_;
  iterator_.Reset(
      new RasterIterator<T>(this->Level(), TileDimensions{blockSide_, blockSide_}, bands));
  return iterator_->IsValid();
}

/// The blocks of one tile of the level follow one another; the one that lies furthest right and
/// down is the last of them.
template <typename T>
bool RasterPyramidMortenDecimateTask<T>::TakeTile(const Tile<T>& block) {
  if (iterator_.IsNull() && !BeginBand()) return false;
  const LevelShape& shape = this->Shape();
  const auto [x, y] = block.Index();
  const unsigned column = x >> shape.level, row = y >> shape.level;
  const auto lastOf = [&](unsigned tile, unsigned lastBlock) {
    return std::min<std::uint64_t>(((std::uint64_t{tile} + 1) << shape.level) - 1, lastBlock);
  };
  // At the right and lower edge the level may have no pixel of these blocks.
  const bool isThere = column < shape.Columns() && row < shape.Rows();
  if (isThere) {
    if (!isBegun_ && !tile_->Begin(column, column + 1, row, 1)) return false;
    isBegun_ = true;
    tile_->Take(block);
    if (x == lastOf(column, lastColumn_) && y == lastOf(row, lastRow_)) {
      if (!iterator_->Write(column, row, tile_->Pixels())) return false;
      isBegun_ = false;
    }
  }
  if (x == lastColumn_ && y == lastRow_) {
    iterator_ = RasterIteratorPtr<T>();
    ++band_;
  }
  return true;
}

}  // namespace lumo
