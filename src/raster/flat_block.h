#pragma once

#include <cstddef>
#include <cstdint>
#include <vector>

#include "raster/raster_enums.h"

namespace lumo {

/// Describes a raster whose elements lie one after the other, in a file or in memory: without gaps,
/// in the order of an interleave.
struct FlatLayout {
  Interleave interleave = Interleave::BSQ;  ///< not None, which one band does not need
  unsigned samples = 0;
  unsigned lines = 0;
  unsigned bands = 0;

  /// Number of the element at a place.
  std::uint64_t At(std::uint64_t sample, std::uint64_t line, std::uint64_t band) const {
    switch (interleave) {
      case Interleave::BIP:
        return (line * samples + sample) * bands + band;
      case Interleave::BIL:
        return (line * bands + band) * samples + sample;
      default:
        return (band * lines + line) * samples + sample;
    }
  }

  /// Bytes of all elements. False when 63 bits can't count them.
  VEXG_EXPORT bool GetBytes(unsigned elementBytes, std::uint64_t& bytes) const;
};

/// A block of a flat raster, as rows: runs that lie together in the raster, in the order in which
/// they follow one another in a block of the same interleave.
///
/// Where bands are chosen from a pixel-interleaved raster the elements of a row don't lie together.
/// A row then spans pixels from the lowest band chosen to the highest, and PickBands and PlaceBands
/// carry it to the block and back.
class VEXG_EXPORT FlatBlock {
 public:
  /// @param left,top,width,height  in pixels of the raster.
  /// @param bands  in the order of the block; one may come twice.
  FlatBlock(const FlatLayout& layout, unsigned left, unsigned top, unsigned width, unsigned height,
            const Array<unsigned>& bands);

  /// True when the block has an element, and all of them lie in the raster.
  bool IsInside() const;

  /// Cuts rows that have to be picked, so that none spans more than `rowElements`; and where a
  /// pixel has more than `pixelElements`, which is not more, into rows of one element, which need
  /// no picking.
  void LimitRows(std::uint64_t pixelElements, std::uint64_t rowElements);

  bool Picks() const { return picks_; }  ///< rows have to be picked
  /// True when picking would take every band; placing then leaves nothing of what was there.
  bool TakesAllBands() const;

  std::uint64_t Elements() const;                      ///< of the block
  std::uint64_t Rows() const { return rows_; }         ///< at least one for a block that IsInside
  std::uint64_t RowBegin(std::uint64_t row) const;     ///< its first element, in the raster
  std::uint64_t RowSpan(std::uint64_t row) const;      ///< elements that it spans in the raster
  std::uint64_t RowElements(std::uint64_t row) const;  ///< elements that it has in the block
  std::uint64_t BlockBegin(std::uint64_t row) const;   ///< its first element, in the block

  /// Carries a row of a block that Picks() from what it spans in the raster to its elements in the
  /// block, or back, where the other bands stay as they are.
  /// @param elementBytes  1, 2, 4, 8 or 16.
  void PickBands(std::uint64_t row, const void* span, void* elements, unsigned elementBytes) const;
  void PlaceBands(std::uint64_t row, const void* elements, void* span, unsigned elementBytes) const;

 private:
  std::uint64_t RowPixels(std::uint64_t row) const;

  FlatLayout layout_;
  unsigned left_, top_, width_, height_;
  std::vector<unsigned> bands_;
  unsigned lowBand_ = 0;  // of those chosen
  unsigned highBand_ = 0;
  bool inside_ = false;
  bool picks_ = false;
  bool elementRows_ = false;   // rows of one element
  unsigned pixelsPerRow_ = 0;  // of a row that isn't the last of its line, when BIP
  unsigned rowsPerLine_ = 1;   // when BIP
  std::uint64_t rows_ = 0;
};

}  // namespace lumo
