#pragma once

#include "commands/division.h"
#include "raster/raster_iterator.h"
#include "raster/raster_view.h"

namespace lumo {

/// Shows some whole lines of its parent, for work that is done in shares. Its description is that
/// of the parent but for the number of lines.
template <typename T>
class RasterLines final : public RasterView<T> {
 public:
  /// @param first  line of the parent that the first line shows.
  RasterLines(const RasterPtr<T>& parent, unsigned first, unsigned lines)
      : RasterView<T>(parent), first_(first), lines_(lines) {}

  unsigned Lines() const override { return lines_; }
  RasterDef GetRasterDef() const override {
    RasterDef def = RasterView<T>::GetRasterDef();
    def.lines = lines_;
    return def;
  }

 protected:
  SubRect PlaceInParent(const SubRect& rect) const override {
    return {rect.left, rect.top + first_, rect.right, rect.bottom + first_};
  }

 private:
  const unsigned first_;
  const unsigned lines_;
};

/// Reads a share of the blocks that a RasterIteratorStream reads of a raster, in the same order and
/// shape: whole rows of them. Their index and origin count from the first line of the share.
template <typename T>
class RasterIteratorShare final : public RasterIterator<T> {
 public:
  RasterIteratorShare(const RasterIteratorStream<T>& whole, const Share& share)
      : RasterIterator<T>(LinesOf(whole, share), SizeOf(whole), whole.Bands()) {
    this->order_ = whole.Order();
  }

  /// True when the share has no block.
  static bool IsEmpty(const RasterIteratorStream<T>& whole, const Share& share) {
    return share.Begin(whole.Rows()) == share.End(whole.Rows());
  }

 private:
  static lumo::TileDimensions SizeOf(const RasterIteratorStream<T>& whole) {
    lumo::TileDimensions size;
    size.width = whole.Dimensions().width;
    size.height = whole.Dimensions().height;
    return size;
  }

  static RasterPtr<T> LinesOf(const RasterIteratorStream<T>& whole, const Share& share) {
    const std::uint64_t height = whole.Dimensions().height, lines = whole.GetRaster()->Lines();
    const std::uint64_t first = share.Begin(whole.Rows()) * height;
    const std::uint64_t end = std::min(share.End(whole.Rows()) * height, lines);
    return RasterPtr<T>(new RasterLines<T>(whole.GetRaster(), static_cast<unsigned>(first),
                                           static_cast<unsigned>(end - first)));
  }
};

}  // namespace lumo
