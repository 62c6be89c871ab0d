#include "c/block_transfer.h"

#include <algorithm>
#include <cstring>
#include <limits>
#include <numeric>
#include <vector>

#include <fmt/format.h>

#include "foundation/fault.h"
#include "raster/block_shape.h"
#include "raster/pixel_types.h"
#include "raster/raster_def.h"
#include "views/sources/source_raster.h"

namespace lumo {
namespace {

constexpr std::uint64_t kPieceBytes = 4 << 20;

/// Looks whether the block lies in the raster and its memory holds it.
bool CheckBlock(const BasicRaster& raster, const vexg_block& block) {
  const vexg_rect& rect = block.rect;
  const unsigned samples = raster.Samples(), lines = raster.Lines(), bands = raster.Bands();
  if (rect.left > rect.right || rect.top > rect.bottom || rect.right >= samples ||
      rect.bottom >= lines) {
    return Refuse(
        fmt::format("the rectangle {} {} {} {} is not inside the raster's {} by {} pixels",
                    rect.left, rect.top, rect.right, rect.bottom, samples, lines));
  }
  if (block.bands == nullptr || block.band_count == 0) return Refuse("the block has no bands");
  for (std::uint32_t i = 0; i < block.band_count; ++i) {
    if (block.bands[i] < bands) continue;
    return Refuse(
        fmt::format("the raster has no band {}, only 0 to {}", block.bands[i], bands - 1));
  }
  if (block.order < VEXG_BIP || block.order > VEXG_BSQ) return Refuse("there is no such order");
  if (block.data_type != raster.DataType()) {
    return Refuse(fmt::format("the pixels are of type {}, and not {}",
                              DataTypeName(raster.DataType()).ToUTF8(),
                              DataTypeName(block.data_type).ToUTF8()));
  }
  const std::uint64_t values =
      (std::uint64_t{rect.right} - rect.left + 1) * (std::uint64_t{rect.bottom} - rect.top + 1);
  const std::uint64_t valueBytes = std::uint64_t{DataTypeBytes(block.data_type)} * block.band_count;
  if (values > std::numeric_limits<std::uint64_t>::max() / valueBytes ||
      block.size < values * valueBytes) {
    return Refuse("the memory is too small for the block");
  }
  return block.pixels != nullptr || Refuse("the block has no memory");
}

/// The lines of a piece: as many as kPieceBytes hold, in whole rows of the source's tiles, so that
/// no tile is read twice.
unsigned LinesAtOnce(const BasicRaster& raster, std::uint64_t lineBytes) {
  const auto lines = static_cast<unsigned>(
      std::clamp<std::uint64_t>(kPieceBytes / std::max<std::uint64_t>(lineBytes, 1), 1, 1 << 16));
  const unsigned row = raster.TileDimensions().height;
  if (row < 2 || row > 4096) return lines;
  return std::max(lines / row, 1U) * row;
}

/// Cuts a block into pieces of whole lines and moves each. A piece begins where a row of the
/// source's tiles does, but for the first.
///
/// The memory of a piece lies in one stretch, unless bands stand one after the other: these are
/// moved through an array of their own.
template <typename T>
class Transfer {
 public:
  Transfer(Raster<T>& raster, const vexg_block& block, const AbortFlag& abort)
      : raster_(raster),
        block_(block),
        abort_(abort),
        width_(block.rect.right - block.rect.left + 1),
        height_(block.rect.bottom - block.rect.top + 1) {}

  bool Read() {
    // A raster always gives states: memory for them that was touched before costs least.
    static thread_local Array<std::uint8_t> kept;
    states_ = std::move(kept);
    const bool isRead = ForEachPiece([this](const Piece& piece) { return ReadPiece(piece); });
    if (states_.GetCapacity() <= 2 * kPieceBytes) kept = std::move(states_);
    return isRead;
  }
  bool Write() {
    return ForEachPiece([this](const Piece& piece) { return WritePiece(piece); });
  }

 private:
  struct Piece {
    unsigned line;       // of the block
    unsigned lines;      // of the piece
    unsigned firstBand;  // position in the bands of the block
    unsigned bands;
    bool isWhole;  // its values lie in one stretch of the block
  };

  template <typename Move>
  bool ForEachPiece(const Move& move) {
    const bool isSequential = block_.order == VEXG_BSQ && block_.band_count > 1;
    const bool byBand = isSequential && IsSequentialSource();
    const unsigned bands = byBand ? 1 : block_.band_count;
    const unsigned most = LinesAtOnce(raster_, std::uint64_t{width_} * bands * sizeof(T));
    for (unsigned band = 0; band < block_.band_count; band += bands) {
      for (unsigned line = 0; line < height_;) {
        if (abort_.IsSet()) return Refuse("aborted");
        const unsigned into = (block_.rect.top + line) % most;
        const unsigned lines = std::min(most - into, height_ - line);
        const bool isWhole = !isSequential || byBand || lines == height_;
        if (!move(Piece{line, lines, band, bands, isWhole})) return false;
        line += lines;
      }
    }
    return true;
  }

  /// True for a raster right on a source that stores its bands one after the other.
  bool IsSequentialSource() const {
    return dynamic_cast<const SourceRaster*>(&raster_) != nullptr &&
           raster_.GetRasterDef().interleave == Interleave::BSQ;
  }

  SubRect RectOf(const Piece& piece) const {
    const unsigned top = block_.rect.top + piece.line;
    return {block_.rect.left, top, block_.rect.right, top + piece.lines - 1};
  }

  Array<unsigned> BandsOf(const Piece& piece) const {
    Array<unsigned> bands{ArrayDims(piece.bands)};
    std::copy_n(block_.bands + piece.firstBand, piece.bands, bands.begin());
    return bands;
  }

  /// Where the first band of a piece begins in the arrays of the block.
  std::size_t PlaceOf(const Piece& piece) const {
    const std::size_t perLine =
        std::size_t{width_} * (block_.order == VEXG_BSQ ? 1 : block_.band_count);
    return std::size_t{piece.firstBand} * width_ * height_ + piece.line * perLine;
  }

  bool ReadPiece(const Piece& piece) {
    const SubRect rect = RectOf(piece);
    const Array<unsigned> bands = BandsOf(piece);
    const BlockShape shape(rect, bands, static_cast<Interleave>(block_.order));
    if (!shape.IsValid())
      return Refuse("a line of the block has more values than an array can have");
    T* const pixels = static_cast<T*>(block_.pixels) + PlaceOf(piece);
    std::uint8_t* const states = block_.states ? block_.states + PlaceOf(piece) : nullptr;

    // Where the memory of the piece is whole the raster fills it, unless it takes another array.
    Array<T> readPixels = piece.isWhole ? Array<T>(pixels, shape.dims) : std::move(pixels_);
    Array<std::uint8_t> readStates = piece.isWhole && states != nullptr
                                         ? Array<std::uint8_t>(states, shape.dims)
                                         : std::move(states_);
    const bool isRead = raster_.GetSubRect(rect, bands, shape.interleave, readPixels, readStates) &&
                        readPixels.GetCount() == shape.dims.count &&
                        readStates.GetCount() == shape.dims.count;
    if (isRead) {
      CopyOut(piece, readPixels.GetData(), pixels);
      if (states != nullptr) CopyOut(piece, readStates.GetData(), states);
    }
    if (readPixels.OwnsData()) pixels_ = std::move(readPixels);
    if (readStates.OwnsData()) states_ = std::move(readStates);
    return isRead || Refuse(TakeFaultOr("the block could not be read").ToUTF8());
  }

  bool WritePiece(const Piece& piece) {
    const SubRect rect = RectOf(piece);
    const Array<unsigned> bands = BandsOf(piece);
    const BlockShape shape(rect, bands, static_cast<Interleave>(block_.order));
    // A raster may change what it is given, and the caller's memory is not to change.
    if (!shape.Size(pixels_, states_)) return Refuse("there is no memory for the block");
    CopyIn(piece, static_cast<const T*>(block_.pixels) + PlaceOf(piece), pixels_.GetData());
    if (block_.states != nullptr) {
      CopyIn(piece, block_.states + PlaceOf(piece), states_.GetData());
    } else {
      std::fill(states_.begin(), states_.end(), std::uint8_t{0});
    }
    return raster_.PutSubRect(rect, bands, shape.interleave, pixels_, states_) ||
           Refuse(TakeFaultOr("the block could not be written").ToUTF8());
  }

  /// Values of a band of a piece that is not whole, else of all of it, and how many there are of
  /// such stretches.
  std::size_t StretchOf(const Piece& piece) const {
    return std::size_t{width_} * piece.lines * (piece.isWhole ? piece.bands : 1);
  }
  std::size_t StretchesOf(const Piece& piece) const { return piece.isWhole ? 1 : piece.bands; }

  template <typename V>
  void CopyOut(const Piece& piece, const V* from, V* to) const {
    const std::size_t stretch = StretchOf(piece);
    for (std::size_t i = 0; i < StretchesOf(piece); ++i) {
      V* const place = to + i * width_ * height_;
      if (place != from) std::memcpy(place, from + i * stretch, stretch * sizeof(V));
    }
  }
  template <typename V>
  void CopyIn(const Piece& piece, const V* from, V* to) const {
    const std::size_t stretch = StretchOf(piece);
    for (std::size_t i = 0; i < StretchesOf(piece); ++i) {
      std::memcpy(to + i * stretch, from + i * width_ * height_, stretch * sizeof(V));
    }
  }

  Raster<T>& raster_;
  const vexg_block& block_;
  const AbortFlag& abort_;
  const unsigned width_;
  const unsigned height_;
  Array<T> pixels_;
  Array<std::uint8_t> states_;
};

template <typename Move>
bool Transferred(BasicRaster& raster, const vexg_block& block, const Move& move) {
  if (!CheckBlock(raster, block)) return false;
  return DispatchType(TwelveTypes{}, raster.DataType(), [&]<typename T>() {
    if (reinterpret_cast<std::uintptr_t>(block.pixels) % alignof(T) != 0) {
      return Refuse("the memory is not aligned for pixels of the type");
    }
    auto* const typed = dynamic_cast<Raster<T>*>(&raster);
    return typed != nullptr && move(*typed);
  });
}

}  // namespace

bool ReadBlock(BasicRaster& raster, const vexg_block& block, const AbortFlag& abort) {
  return Transferred(raster, block, [&]<typename T>(Raster<T>& typed) {
    return Transfer<T>(typed, block, abort).Read();
  });
}

bool WriteBlock(BasicRaster& raster, const vexg_block& block, const AbortFlag& abort) {
  if (!raster.CanWrite()) return Refuse("the raster can't be written");
  return Transferred(raster, block, [&]<typename T>(Raster<T>& typed) {
    return Transfer<T>(typed, block, abort).Write();
  });
}

}  // namespace lumo
