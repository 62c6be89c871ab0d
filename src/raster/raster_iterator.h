#pragma once

#include <memory>
#include <mutex>
#include <vector>

#include "raster/raster.h"
#include "raster/tile.h"

namespace lumo {

/// How the pixels of a border that lie outside the raster are filled.
enum class BorderMode : unsigned {
  kNoDataValue = 0,  ///< with the band's no-data value, marked as no data
  kValue = 1,        ///< with a value, marked as no data
  kValidValue = 2,   ///< with a value, as valid pixels
};

/// The bytes of a tile with all its bands that an iterator aims at when it chooses the size.
inline constexpr unsigned kTileBudget = 0x800000;

// The rules by which the iterators choose their tiles. `elementBytes` is the size of a pixel's
// value; all give all bands, the same border on all sides, and no clamp. Without a raster all zero.

/// Bands of whole lines that fill the budget: at least one line.
VEXG_EXPORT TileDimensions WideTiles(const BasicRaster* raster, std::size_t elementBytes,
                                     unsigned budget, unsigned border);
/// Squares that fill the budget: at least one pixel.
VEXG_EXPORT TileDimensions SquareTiles(const BasicRaster* raster, std::size_t elementBytes,
                                       unsigned budget, unsigned border);
/// The blocks in which a whole raster is read once: rows of the source's true tiles, or of its
/// lines, as many as fill the budget; at least one tile, or a part of a line. Without borders.
/// @param bands  how many bands are read.
VEXG_EXPORT TileDimensions StreamTiles(const BasicRaster* raster, std::size_t elementBytes,
                                       unsigned budget, unsigned bands);
/// The same for a raster that is to be made.
VEXG_EXPORT TileDimensions StreamTiles(const RasterDef& def, std::size_t elementBytes,
                                       unsigned budget, unsigned bands);
/// SquareTiles for a raster whose source is stored in true tiles, else WideTiles.
VEXG_EXPORT TileDimensions SmartTiles(const BasicRaster* raster, std::size_t elementBytes,
                                      unsigned budget, unsigned border);

/// The order of the axes that costs the source least: its own, or BIP when it has none.
VEXG_EXPORT Interleave StreamOrder(const BasicRaster* raster);

/// Cuts a raster into a grid of tiles: the part of RasterIterator<T> that needs no pixel type.
class VEXG_EXPORT BasicRasterIterator : public Object {
 public:
  static const unsigned TypeCode;
  bool IsA(unsigned typeCode) const override;

  /// Tiles in a row of the grid; 0 when there is no raster, or it has no pixels.
  unsigned Columns() const;
  /// Tiles in a column of the grid; 0 as for Columns.
  unsigned Rows() const;
  /// The grid: tile size, borders, and band count of the raster.
  TileDimensions Dimensions() const { return dimensions_; }
  /// How borders are filled where there is no raster.
  lumo::BorderMode BorderMode() const { return borderMode_; }
  /// Bands of a tile.
  unsigned BandCount() const { return bands_.GetCount(); }
  /// The bands of the raster that a tile has, in its order.
  const Array<unsigned>& Bands() const { return bands_; }
  /// The order of the axes in which tiles are read: BIP, unless a derived class says otherwise.
  Interleave Order() const { return order_; }

 protected:
  /// The shape of the tile at a grid position, and the part of the raster that it takes.
  struct Placement {
    TileDimensions tile;
    unsigned x = 0;  ///< first pixel inside the borders, in raster coordinates
    unsigned y = 0;
    unsigned padLeft = 0;  ///< how much of each border the raster has
    unsigned padRight = 0;
    unsigned padTop = 0;
    unsigned padBottom = 0;

    std::uint64_t ReadWidth() const { return std::uint64_t{padLeft} + tile.width + padRight; }
    std::uint64_t ReadHeight() const { return std::uint64_t{padTop} + tile.height + padBottom; }
    SubRect ReadRect() const;
  };

  BasicRasterIterator() = default;
  /// Takes over the grid; an error is stored when the raster or a band can't be had.
  void SetUp(const BasicRaster* raster, const TileDimensions& dimensions,
             const Array<unsigned>* bands);
  /// False when the position is off the grid.
  bool Place(unsigned column, unsigned row, Placement& placement) const;

  lumo::BorderMode borderMode_ = lumo::BorderMode::kNoDataValue;
  Interleave order_ = Interleave::BIP;  // of tiles without borders

 private:
  const BasicRaster* grid_ = nullptr;  // held by the derived class
  TileDimensions dimensions_;
  Array<unsigned> bands_;
};

/// A scratch block with pixels and states of its own, pixel-interleaved.
template <typename T>
struct BipTileBuffer {
  unsigned width = 0;  ///< whole extent
  unsigned height = 0;
  unsigned bands = 0;
  unsigned padLeft = 0;  ///< how much of it lies outside the tile proper
  unsigned padRight = 0;
  unsigned padTop = 0;
  unsigned padBottom = 0;
  Array<T> pixels;
  Array<unsigned char> states;

  virtual ~BipTileBuffer() = default;
};

/// Cuts a raster into a grid of tiles, and reads and writes them by column and row. Exists for
/// TwelveTypes.
///
/// Ownership: shares the raster. Tiles are the caller's, and are used again from call to call.
/// Threads:   Read and Write may be called on any thread with tiles of their own; reads go one
///            after the other, and so do writes.
/// Failure:   an iterator whose raster is missing or not valid, or whose band list names a band
///            that isn't there, holds ObjectErrorNotConstructed.
///
///     RasterIteratorSmart<float> tiles(raster);
///     Tile<float> tile;
///     for (unsigned row = 0; row < tiles.Rows(); ++row) {
///       for (unsigned column = 0; column < tiles.Columns(); ++column) {
///         if (!tiles.Read(column, row, tile)) return false;
///         Use(tile.Pixel(0, 0, 0), tile.Origin());
///       }
///     }
template <typename T>
class RasterIterator : public BasicRasterIterator {
 public:
  static const unsigned TypeCode;

  /// All bands of the raster, in order.
  RasterIterator(const RasterPtr<T>& raster, const TileDimensions& dimensions);
  /// Some bands of the raster, in the order given; one may come twice. A tile has them as its bands
  /// from 0 on.
  RasterIterator(const RasterPtr<T>& raster, const TileDimensions& dimensions,
                 const Array<unsigned>& bands);

  bool IsA(unsigned typeCode) const override {
    return typeCode == TypeCode || BasicRasterIterator::IsA(typeCode);
  }

  /// Fills `tile` with the tile at a grid position. Tiles of the last column and row are cut to the
  /// raster. A border has the raster's pixels where there are any, else the border fill.
  /// @return false for a position off the grid, a tile that can't be sized, or a raster that fails;
  ///         the pixels then mean nothing.
  bool Read(unsigned column, unsigned row, Tile<T>& tile);

  /// Stores the inner part of `tile` at a grid position; borders are never written.
  /// @return false for a position off the grid, a tile that reaches over the raster's edge or has
  ///         another number of bands, or a raster that fails.
  bool Write(unsigned column, unsigned row, Tile<T>& tile);

  /// Sets how borders are filled where there is no raster. `value` is for the modes that have one.
  void SetBorderFill(lumo::BorderMode mode, T value);

  /// The raster; empty when it was made from none.
  const RasterPtr<T>& GetRaster() const { return raster_; }

 private:
  bool ReadBordered(const Placement& placement, Tile<T>& tile);
  void FillBorders(Tile<T>& tile) const;
  BipTileBuffer<T>* FindBuffer(const Placement& placement);

  RasterPtr<T> raster_;
  T borderValue_{};
  std::mutex readLock_;
  std::mutex writeLock_;
  std::vector<std::unique_ptr<BipTileBuffer<T>>> buffers_;  // under readLock_
  BipTileBuffer<T> inner_;                                  // under writeLock_
};

template <typename T>
using RasterIteratorPtr = Pointer<RasterIterator<T>>;

/// Reads one whole line at a time.
template <typename T>
class RasterIteratorScanline final : public RasterIterator<T> {
 public:
  explicit RasterIteratorScanline(const RasterPtr<T>& raster)
      : RasterIterator<T>(raster, WideTiles(raster.Get(), sizeof(T), 0, 0)) {}
};

/// Reads bands of whole lines, which suits sources that are stored line by line.
template <typename T>
class RasterIteratorWide final : public RasterIterator<T> {
 public:
  /// @param border  pixels on each side.
  /// @param budget  bytes of a tile without its borders.
  explicit RasterIteratorWide(const RasterPtr<T>& raster, unsigned border = 0,
                              unsigned budget = kTileBudget)
      : RasterIterator<T>(raster, WideTiles(raster.Get(), sizeof(T), budget, border)) {}
};

/// Reads squares, with a border of one pixel unless another is asked for, which suits
/// neighbourhoods.
template <typename T>
class RasterIteratorSquare final : public RasterIterator<T> {
 public:
  explicit RasterIteratorSquare(const RasterPtr<T>& raster, unsigned budget = kTileBudget,
                                unsigned border = 1)
      : RasterIterator<T>(raster, SquareTiles(raster.Get(), sizeof(T), budget, border)) {}
};

/// Reads tiles of 512 by 512 pixels, those at the right and lower edge cut.
template <typename T>
class RasterIteratorTile final : public RasterIterator<T> {
 public:
  static constexpr unsigned kSide = 512;
  explicit RasterIteratorTile(const RasterPtr<T>& raster)
      : RasterIterator<T>(raster, lumo::TileDimensions{kSide, kSide}) {}
};

/// Reads squares or bands of lines, as the source is stored: the choice for work that goes by the
/// coordinates of a tile.
template <typename T>
class RasterIteratorSmart final : public RasterIterator<T> {
 public:
  explicit RasterIteratorSmart(const RasterPtr<T>& raster, unsigned border = 0,
                               unsigned budget = kTileBudget)
      : RasterIterator<T>(raster, SmartTiles(raster.Get(), sizeof(T), budget, border)) {}
  RasterIteratorSmart(const RasterPtr<T>& raster, const Array<unsigned>& bands)
      : RasterIterator<T>(raster, SmartTiles(raster.Get(), sizeof(T), kTileBudget, 0), bands) {}
};

/// For an operation that reads a whole raster once, and takes its blocks as the source gives them
/// fastest: their size follows the source's storage, and their axes are in its order. The one place
/// where such operations get their blocks.
template <typename T>
class RasterIteratorStream final : public RasterIterator<T> {
 public:
  /// Measured: blocks of this size stay in the caches between the reader and the computation.
  static constexpr unsigned kBudget = 0x100000;

  explicit RasterIteratorStream(const RasterPtr<T>& raster, unsigned budget = kBudget)
      : RasterIterator<T>(raster, StreamTiles(raster.Get(), sizeof(T), budget,
                                              raster.IsNull() ? 0 : raster->Bands())) {
    this->order_ = StreamOrder(raster.Get());
  }
  RasterIteratorStream(const RasterPtr<T>& raster, const Array<unsigned>& bands,
                       unsigned budget = kBudget)
      : RasterIterator<T>(raster, StreamTiles(raster.Get(), sizeof(T), budget, bands.GetCount()),
                          bands) {
    this->order_ = StreamOrder(raster.Get());
  }
};

/// Reads a raster on the grid of another iterator, borders included, with all its bands, so that
/// tile (column, row) of both covers the same place. The rasters are of one size.
template <typename T>
class RasterIteratorFromTemplate final : public RasterIterator<T> {
 public:
  RasterIteratorFromTemplate(const RasterPtr<T>& raster, const BasicRasterIterator& grid)
      : RasterIterator<T>(raster, GridOf(grid)) {}

 private:
  static lumo::TileDimensions GridOf(const BasicRasterIterator& grid) {
    lumo::TileDimensions dimensions = grid.Dimensions();
    dimensions.bands = 0;
    return dimensions;
  }
};

/// Reads or writes a raster on the grid of another iterator without its borders, with all its
/// bands.
template <typename T>
class RasterIteratorFromTemplateSpatial final : public RasterIterator<T> {
 public:
  RasterIteratorFromTemplateSpatial(const RasterPtr<T>& raster, const BasicRasterIterator& grid)
      : RasterIterator<T>(raster, GridOf(grid.Dimensions())) {}

 private:
  static lumo::TileDimensions GridOf(const lumo::TileDimensions& grid) {
    lumo::TileDimensions dimensions;
    dimensions.width = grid.width;
    dimensions.height = grid.height;
    dimensions.borderClamp = grid.borderClamp;
    return dimensions;
  }
};

VEXG_EXTERN(TWELVE, RasterIterator);

}  // namespace lumo
