#pragma once

#include <atomic>

#include "foundation/containers.h"
#include "raster/pixel_types.h"
#include "raster/raster_enums.h"
#include "raster/tile_dimensions.h"

namespace lumo {

/// Two coordinates of a tile: x and y, or column and row.
using TilePosition = std::pair<unsigned, unsigned>;

/// A block of pixels with a state byte for each pixel and band, pixel-interleaved, with optional
/// borders around it: the part of Tile<T> that needs no pixel type.
///
/// Tile coordinates count from the first pixel inside the borders; in a border they are below 0, or
/// from Width() and Height() on. Access by coordinates has no bounds check.
///
/// An operation that reads a whole raster once may ask for tiles in another order of the axes, see
/// ResizeForOverwrite; it then goes by the arrays, and the access by coordinates is not for it.
///
/// Threads: a tile belongs to one thread at a time; parts of one may be worked on in parallel.
/// Failure: a tile that could not be sized is empty, with ObjectErrorNotConstructed stored.
class VEXG_EXPORT BasicTile : public Object {
 public:
  static const unsigned TypeCode;
  bool IsA(unsigned typeCode) const override;

  unsigned Width() const { return dimensions_.width; }    ///< samples, without borders
  unsigned Height() const { return dimensions_.height; }  ///< lines, without borders
  unsigned Bands() const { return dimensions_.bands; }    ///< values of a pixel
  unsigned BorderLeft() const { return dimensions_.borderLeft; }
  unsigned BorderRight() const { return dimensions_.borderRight; }
  unsigned BorderTop() const { return dimensions_.borderTop; }
  unsigned BorderBottom() const { return dimensions_.borderBottom; }
  unsigned BorderClamp() const { return dimensions_.borderClamp; }

  /// The first pixel inside the borders, in raster coordinates.
  void SetOrigin(const TilePosition& origin) { origin_ = origin; }
  TilePosition Origin() const { return origin_; }
  /// Column and row in the grid of the iterator.
  void SetIndex(const TilePosition& index) { index_ = index; }
  TilePosition Index() const { return index_; }

  /// Sizes the tile: states become 0, pixels keep whatever the storage holds. Storage is used again
  /// where it is large enough.
  /// @param left,right,top,bottom  pixels of the borders.
  /// @return false for a width, height or band count of 0, or a size that can't be had.
  bool Resize(unsigned width, unsigned height, unsigned bands, unsigned left, unsigned right,
              unsigned top, unsigned bottom);
  /// The same border on all sides.
  bool Resize(unsigned width, unsigned height, unsigned bands, unsigned border);
  /// No borders.
  bool Resize(unsigned width, unsigned height, unsigned bands);
  /// As the dimensions say.
  bool Resize(const TileDimensions& dimensions);
  /// Size and borders as they were last set.
  TileDimensions Dimensions() const { return dimensions_; }
  /// Sizes a tile that is written whole next: its pixels and its states keep whatever the storage
  /// holds.
  /// @param order  of the axes: the arrays have the shape of BlockDims; BIP where there are
  /// borders.
  bool ResizeForOverwrite(const TileDimensions& dimensions, Interleave order = Interleave::BIP);
  /// Sizes a tile whose pixels are written next and are valid unless somebody says otherwise: it
  /// has no state array of its own until somebody changes one of its states.
  bool ResizeAllValid(const TileDimensions& dimensions, Interleave order = Interleave::BIP);
  /// The order of the axes: BIP, unless ResizeForOverwrite or ResizeAllValid sized the tile last.
  Interleave Order() const { return order_; }

  // For each bit of the state: set in every band (true without bands), in some band, in one band;
  // and its changes.
  bool AllNoData(int x, int y) const { return AllHave(x, y, PixelValueState::NoData); }
  bool AnyNoData(int x, int y) const { return AnyHas(x, y, PixelValueState::NoData); }
  bool IsNoData(int x, int y, unsigned band) const {
    return Has(x, y, band, PixelValueState::NoData);
  }
  void SetNoData(int x, int y, unsigned band, bool on) {
    Set(x, y, band, PixelValueState::NoData, on);
  }
  void SetNoDataAll(int x, int y, bool on) { SetAll(x, y, PixelValueState::NoData, on); }
  bool AllMasked(int x, int y) const { return AllHave(x, y, PixelValueState::Masked); }
  bool AnyMasked(int x, int y) const { return AnyHas(x, y, PixelValueState::Masked); }
  bool IsMasked(int x, int y, unsigned band) const {
    return Has(x, y, band, PixelValueState::Masked);
  }
  void SetMasked(int x, int y, unsigned band, bool on) {
    Set(x, y, band, PixelValueState::Masked, on);
  }
  void SetMaskedAll(int x, int y, bool on) { SetAll(x, y, PixelValueState::Masked, on); }
  bool AllOutsideROI(int x, int y) const { return AllHave(x, y, PixelValueState::OutsideROI); }
  bool AnyOutsideROI(int x, int y) const { return AnyHas(x, y, PixelValueState::OutsideROI); }
  bool IsOutsideROI(int x, int y, unsigned band) const {
    return Has(x, y, band, PixelValueState::OutsideROI);
  }
  void SetOutsideROI(int x, int y, unsigned band, bool on) {
    Set(x, y, band, PixelValueState::OutsideROI, on);
  }
  void SetOutsideROIAll(int x, int y, bool on) { SetAll(x, y, PixelValueState::OutsideROI, on); }

  /// True while the tile needs no state array, since every pixel is valid. Asking for the array to
  /// change it ends this.
  bool HasNoStates() const { return std::atomic_ref(hasNoStates_).load(std::memory_order_acquire); }
  /// The state bytes, in the shape of the pixels. Where there are none these are zeros that all
  /// tiles share, and that can only be read.
  const Array<unsigned char>& StateArray() const { return HasNoStates() ? noStates_ : state_; }
  /// The same to be changed, made where there are none. Throws std::bad_alloc.
  Array<unsigned char>& StateArray() {
    if (HasNoStates()) MakeStates();
    return state_;
  }
  /// Memory for a state array, for who reads a tile that has none. HoldStates comes after, where
  /// the array has been filled.
  Array<unsigned char>& StateRoom() { return state_; }
  /// Makes what lies in StateRoom the tile's states. False where it hasn't the tile's shape.
  bool HoldStates();
  /// Sets all bits of a state at once.
  void SetPixelState(int x, int y, unsigned band, unsigned char state) {
    StateArray()[Offset(x, y) + band] = state;
  }
  /// The state of a pixel in a band, bits of PixelValueState.
  unsigned char PixelState(int x, int y, unsigned band) const {
    return StateArray()[Offset(x, y) + band];
  }

  /// Pixels of a whole row, borders included.
  std::size_t FullWidth() const {
    return std::size_t{dimensions_.width} + dimensions_.borderLeft + dimensions_.borderRight;
  }
  /// Lines of the whole tile, borders included.
  std::size_t FullHeight() const {
    return std::size_t{dimensions_.height} + dimensions_.borderTop + dimensions_.borderBottom;
  }
  /// Where band 0 of pixel (x, y) stands among the pixels and the states.
  std::size_t Offset(std::int64_t x, std::int64_t y) const {
    const auto full = static_cast<std::int64_t>(FullWidth());
    return static_cast<std::size_t>((dimensions_.borderTop + y) * full + dimensions_.borderLeft +
                                    x) *
           dimensions_.bands;
  }

 protected:
  BasicTile() = default;
  /// Sizes the pixels; the tile does the rest.
  virtual bool ResizePixels(const ArrayDims& dims) = 0;

 private:
  bool Size(const TileDimensions& dimensions, Interleave order, bool hasStates);
  bool ShareStates(const ArrayDims& dims);
  void MakeStates();
  bool AllHave(int x, int y, PixelValueState::Code bit) const;
  bool AnyHas(int x, int y, PixelValueState::Code bit) const;
  bool Has(int x, int y, unsigned band, PixelValueState::Code bit) const {
    return (PixelState(x, y, band) & bit) != 0;
  }
  void Set(int x, int y, unsigned band, PixelValueState::Code bit, bool on);
  void SetAll(int x, int y, PixelValueState::Code bit, bool on);

  TilePosition origin_;
  TilePosition index_;
  TileDimensions dimensions_;
  Interleave order_ = Interleave::BIP;
  Array<unsigned char> state_;
  Array<unsigned char> noStates_;     // wraps zeros, which nobody writes
  mutable bool hasNoStates_ = false;  // noStates_ counts; several threads may end it
};

/// A block of pixels of type T, one of TwelveTypes. Its storage is an array of lines by samples by
/// bands, borders included.
///
///     Tile<float> tile({256, 256, 3});
///     if (!tile.IsValid()) return false;
///     for (int y = 0; y < static_cast<int>(tile.Height()); ++y) {
///       for (int x = 0; x < static_cast<int>(tile.Width()); ++x) {
///         if (!tile.AnyNoData(x, y)) Use(tile.Pixel(x, y, 2));
///       }
///     }
///
/// Inner loops of quick code go by PixelArray and StateArray, see TileRow.
template <typename T>
class Tile : public BasicTile {
 public:
  static const unsigned TypeCode;

  /// An empty tile, to be sized by whoever fills it.
  Tile() = default;
  /// A tile sized by Resize; IsValid() is false when that fails.
  explicit Tile(const TileDimensions& dimensions) { BasicTile::Resize(dimensions); }

  bool IsA(unsigned typeCode) const override {
    return typeCode == TypeCode || BasicTile::IsA(typeCode);
  }

  /// All values with those of the borders, in the order of Order().
  Array<T>& PixelArray() { return pixels_; }
  const Array<T>& PixelArray() const { return pixels_; }

  /// The value of a pixel in a band, in tile coordinates, of a tile in the order BIP. Nothing
  /// checks the bounds.
  T& Pixel(int x, int y, unsigned band) { return pixels_[Offset(x, y) + band]; }
  const T& Pixel(int x, int y, unsigned band) const { return pixels_[Offset(x, y) + band]; }

 protected:
  bool ResizePixels(const ArrayDims& dims) final { return pixels_.Resize(dims); }

 private:
  Array<T> pixels_;
};

template <typename T>
using TilePtr = Pointer<Tile<T>>;

/// A tile made in the shape of another one of any pixel type. Its pixels are whatever the storage
/// holds. Exists for EightTypes.
template <typename T>
class TileFromTemplate final : public Tile<T> {
 public:
  /// The same dimensions, states and index.
  explicit TileFromTemplate(const BasicTile& shape);
  /// The same dimensions but `bands` bands. A state bit of a pixel, borders included, is set in
  /// every band when it is set in some band of `shape`.
  TileFromTemplate(const BasicTile& shape, unsigned bands);
};

/// A tile of one band for neighbourhood work: the width and height of another, with borders of its
/// own, which reach no further than the other's. A state bit is set when it is set in some band
/// there. Exists for double.
template <typename T>
class TileFromTemplateBorder final : public Tile<T> {
 public:
  TileFromTemplateBorder(const BasicTile& shape, unsigned left, unsigned right, unsigned top,
                         unsigned bottom);
};

VEXG_EXTERN(TWELVE, Tile);
VEXG_EXTERN(EIGHT, TileFromTemplate);
extern template class VEXG_EXPORT TileFromTemplateBorder<double>;

}  // namespace lumo
