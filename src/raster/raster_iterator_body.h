#pragma once

#include <algorithm>
#include <cstring>

#include "raster/block_states.h"
#include "raster/interleave.h"
#include "raster/raster_iterator.h"

namespace lumo {

template <typename T>
RasterIterator<T>::RasterIterator(const RasterPtr<T>& raster, const TileDimensions& dimensions)
    : raster_(raster) {
  SetUp(raster_.Get(), dimensions, nullptr);
}

template <typename T>
RasterIterator<T>::RasterIterator(const RasterPtr<T>& raster, const TileDimensions& dimensions,
                                  const Array<unsigned>& bands)
    : raster_(raster) {
  SetUp(raster_.Get(), dimensions, &bands);
}

template <typename T>
void RasterIterator<T>::SetBorderFill(lumo::BorderMode mode, T value) {
  const std::lock_guard lock(readLock_);
  borderMode_ = mode;
  borderValue_ = value;
}

template <typename T>
bool RasterIterator<T>::Read(unsigned column, unsigned row, Tile<T>& tile) {
  const std::lock_guard lock(readLock_);
  Placement placement;
  if (!IsValid() || !Place(column, row, placement)) return false;
  const TileDimensions& size = placement.tile;
  if (!(size.HasBorders() ? tile.Resize(size) : tile.ResizeAllValid(size, order_))) {
    return false;
  }
  tile.SetOrigin({placement.x, placement.y});
  tile.SetIndex({column, row});
  if (size.HasBorders()) return ReadBordered(placement, tile);

  const ArrayDims dims = tile.PixelArray().GetDims();
  BlockStates states(tile.StateRoom());
  return GetBlockOf(*raster_, placement.ReadRect(), Bands(), tile.Order(), tile.PixelArray(),
                    states) &&
         tile.PixelArray().GetDims() == dims && (!states.AreMade() || tile.HoldStates());
}

template <typename T>
bool RasterIterator<T>::ReadBordered(const Placement& placement, Tile<T>& tile) {
  BipTileBuffer<T>* const buffer = FindBuffer(placement);
  if (buffer == nullptr) return false;
  const ArrayDims dims = BlockDims(Interleave::BIP, buffer->width, buffer->height, buffer->bands);
  if (!buffer->pixels.Resize(dims) || !buffer->states.Resize(dims)) return false;
  FillBorders(tile);
  if (!raster_->GetSubRect(placement.ReadRect(), Bands(), Interleave::BIP, buffer->pixels,
                           buffer->states) ||
      buffer->pixels.GetDims() != dims || buffer->states.GetDims() != dims) {
    return false;
  }
  const std::size_t rowCount = std::size_t{buffer->width} * buffer->bands;
  for (std::size_t y = 0; y < buffer->height; ++y) {
    const std::size_t to =
        tile.Offset(-std::int64_t{buffer->padLeft}, static_cast<std::int64_t>(y) - buffer->padTop);
    std::copy_n(buffer->pixels.GetData() + y * rowCount, rowCount,
                tile.PixelArray().GetData() + to);
    std::copy_n(buffer->states.GetData() + y * rowCount, rowCount,
                tile.StateArray().GetData() + to);
  }
  return true;
}

template <typename T>
void RasterIterator<T>::FillBorders(Tile<T>& tile) const {
  if (borderMode_ > lumo::BorderMode::kValidValue) return;
  std::vector<T> fill(BandCount(), borderValue_);
  if (borderMode_ == lumo::BorderMode::kNoDataValue) {
    for (unsigned i = 0; i < BandCount(); ++i) fill[i] = raster_->NoDataValue(Bands()[i]);
  }
  const auto state = static_cast<unsigned char>(borderMode_ == lumo::BorderMode::kValidValue
                                                    ? PixelValueState::Valid
                                                    : PixelValueState::NoData);
  const auto strip = [&](std::int64_t x0, std::int64_t x1, std::int64_t y0, std::int64_t y1) {
    for (std::int64_t y = y0; y < y1; ++y) {
      std::size_t at = tile.Offset(x0, y);
      for (std::int64_t x = x0; x < x1; ++x, at += fill.size()) {
        std::ranges::copy(fill, tile.PixelArray().GetData() + at);
        std::fill_n(tile.StateArray().GetData() + at, fill.size(), state);
      }
    }
  };
  const TileDimensions d = tile.Dimensions();
  const std::int64_t width = d.width;
  const std::int64_t height = d.height;
  const std::int64_t top = -std::int64_t{d.borderTop};
  const std::int64_t bottom = height + d.borderBottom;
  strip(-std::int64_t{d.borderLeft}, 0, top, bottom);
  strip(width, width + d.borderRight, top, bottom);
  strip(0, width, top, 0);
  strip(0, width, height, bottom);
}

template <typename T>
BipTileBuffer<T>* RasterIterator<T>::FindBuffer(const Placement& placement) {
  const std::uint64_t width = placement.ReadWidth();
  const std::uint64_t height = placement.ReadHeight();
  auto found = std::ranges::find_if(buffers_, [&](const auto& buffer) {
    return buffer->width == width && buffer->height == height && buffer->bands == BandCount();
  });
  if (found == buffers_.end()) {
    auto fresh = std::make_unique<BipTileBuffer<T>>();
    fresh->width = static_cast<unsigned>(width);
    fresh->height = static_cast<unsigned>(height);
    fresh->bands = BandCount();
    found = buffers_.insert(buffers_.end(), std::move(fresh));
  }
  BipTileBuffer<T>& buffer = **found;
  buffer.padLeft = placement.padLeft;
  buffer.padRight = placement.padRight;
  buffer.padTop = placement.padTop;
  buffer.padBottom = placement.padBottom;
  return &buffer;
}

template <typename T>
bool RasterIterator<T>::Write(unsigned column, unsigned row, Tile<T>& tile) {
  const std::lock_guard lock(writeLock_);
  Placement placement;
  if (!IsValid() || !tile.IsValid() || !Place(column, row, placement)) return false;
  const std::uint64_t endX = std::uint64_t{placement.x} + tile.Width();
  const std::uint64_t endY = std::uint64_t{placement.y} + tile.Height();
  if (tile.Bands() != BandCount() || endX > raster_->Samples() || endY > raster_->Lines()) {
    return false;
  }
  const SubRect rect(placement.x, placement.y, static_cast<unsigned>(endX - 1),
                     static_cast<unsigned>(endY - 1));
  if (!tile.Dimensions().HasBorders()) {
    auto* const onDemand =
        tile.HasNoStates() ? dynamic_cast<StatesOnDemand<T>*>(raster_.Get()) : nullptr;
    if (onDemand != nullptr && onDemand->OnlyReadsStates()) {
      Array<unsigned char> none(std::as_const(tile).StateArray());  // wraps what the tile wraps
      return raster_->PutSubRect(rect, Bands(), tile.Order(), tile.PixelArray(), none);
    }
    return raster_->PutSubRect(rect, Bands(), tile.Order(), tile.PixelArray(), tile.StateArray());
  }
  const ArrayDims dims = BlockDims(Interleave::BIP, tile.Width(), tile.Height(), tile.Bands());
  if (!inner_.pixels.Resize(dims) || !inner_.states.Resize(dims)) return false;
  const std::size_t rowCount = std::size_t{tile.Width()} * tile.Bands();
  for (std::size_t y = 0; y < tile.Height(); ++y) {
    const std::size_t from = tile.Offset(0, static_cast<std::int64_t>(y));
    std::copy_n(tile.PixelArray().GetData() + from, rowCount,
                inner_.pixels.GetData() + y * rowCount);
    std::copy_n(tile.StateArray().GetData() + from, rowCount,
                inner_.states.GetData() + y * rowCount);
  }
  return raster_->PutSubRect(rect, Bands(), Interleave::BIP, inner_.pixels, inner_.states);
}

}  // namespace lumo
