#include "raster/flat_block.h"

#include <algorithm>
#include <cstring>
#include <limits>

namespace lumo {
namespace {

constexpr std::uint64_t kMaxBytes = std::numeric_limits<std::int64_t>::max();

/// An element as bytes that are copied in one piece.
template <std::size_t kBytes>
struct Element {
  unsigned char bytes[kBytes];
};

/// Calls `move(place in the span, place in the block)` for `kCount` elements of each pixel, so many
/// as the bands chosen. Their number is known to the compiler, which unrolls the inner loop.
template <std::size_t kCount, typename Move>
void ForEachOfSome(std::uint64_t pixels, std::size_t stride, const std::vector<unsigned>& bands,
                   unsigned lowBand, Move&& move) {
  std::size_t offsets[kCount];
  for (std::size_t k = 0; k < kCount; ++k) offsets[k] = bands[k] - lowBand;
  for (std::uint64_t i = 0; i < pixels; ++i)
    for (std::size_t k = 0; k < kCount; ++k) move(i * stride + offsets[k], i * kCount + k);
}

template <typename Move>
void ForEachElement(std::uint64_t pixels, std::size_t stride, const std::vector<unsigned>& bands,
                    unsigned lowBand, Move&& move) {
  const std::size_t count = bands.size();
  switch (count) {
    case 1:
      return ForEachOfSome<1>(pixels, stride, bands, lowBand, move);
    case 2:
      return ForEachOfSome<2>(pixels, stride, bands, lowBand, move);
    case 3:
      return ForEachOfSome<3>(pixels, stride, bands, lowBand, move);
    case 4:
      return ForEachOfSome<4>(pixels, stride, bands, lowBand, move);
    default:
      break;
  }
  for (std::uint64_t i = 0; i < pixels; ++i)
    for (std::size_t k = 0; k < count; ++k) move(i * stride + (bands[k] - lowBand), i * count + k);
}

/// Calls `body` for the element size.
template <typename Body>
void ForElementBytes(unsigned elementBytes, Body&& body) {
  switch (elementBytes) {
    case 1:
      return body.template operator()<1>();
    case 2:
      return body.template operator()<2>();
    case 4:
      return body.template operator()<4>();
    case 8:
      return body.template operator()<8>();
    default:
      return body.template operator()<16>();
  }
}

}  // namespace

bool FlatLayout::GetBytes(unsigned elementBytes, std::uint64_t& bytes) const {
  const std::uint64_t plane = std::uint64_t{samples} * lines;  // fits: 32 bits each
  const std::uint64_t pixelBytes = std::uint64_t{bands} * elementBytes;
  if (pixelBytes != 0 && plane > kMaxBytes / pixelBytes) return false;
  bytes = plane * pixelBytes;
  return true;
}

FlatBlock::FlatBlock(const FlatLayout& layout, unsigned left, unsigned top, unsigned width,
                     unsigned height, const Array<unsigned>& bands)
    : layout_(layout),
      left_(left),
      top_(top),
      width_(width),
      height_(height),
      bands_(bands.begin(), bands.end()) {
  if (bands_.empty() || width == 0 || height == 0) return;
  const auto [low, high] = std::minmax_element(bands_.begin(), bands_.end());
  lowBand_ = *low;
  highBand_ = *high;
  inside_ = highBand_ < layout.bands && std::uint64_t{left} + width <= layout.samples &&
            std::uint64_t{top} + height <= layout.lines;
  if (layout.interleave != Interleave::BIP) {
    rows_ = std::uint64_t{height} * bands_.size();
    return;
  }
  bool allInOrder = bands_.size() == layout.bands;
  for (std::size_t i = 0; i < bands_.size(); ++i) allInOrder = allInOrder && bands_[i] == i;
  picks_ = !allInOrder;
  pixelsPerRow_ = width;
  rows_ = height;
}

bool FlatBlock::IsInside() const {
  return inside_;
}

void FlatBlock::LimitRows(std::uint64_t pixelElements, std::uint64_t rowElements) {
  if (!picks_) return;
  if (layout_.bands > pixelElements) {
    picks_ = false;
    elementRows_ = true;
    rows_ = Elements();
    return;
  }
  pixelsPerRow_ = static_cast<unsigned>(
      std::min<std::uint64_t>(width_, std::max<std::uint64_t>(rowElements / layout_.bands, 1)));
  rowsPerLine_ = (width_ - 1) / pixelsPerRow_ + 1;
  rows_ = std::uint64_t{height_} * rowsPerLine_;
}

bool FlatBlock::TakesAllBands() const {
  std::vector<bool> taken(layout_.bands);
  for (const unsigned band : bands_) taken[band] = true;
  return std::find(taken.begin(), taken.end(), false) == taken.end();
}

std::uint64_t FlatBlock::Elements() const {
  return std::uint64_t{width_} * height_ * bands_.size();
}

std::uint64_t FlatBlock::RowPixels(std::uint64_t row) const {
  const std::uint64_t before = row % rowsPerLine_ * pixelsPerRow_;
  return std::min<std::uint64_t>(pixelsPerRow_, width_ - before);
}

std::uint64_t FlatBlock::RowBegin(std::uint64_t row) const {
  const std::size_t count = bands_.size();
  if (elementRows_) {
    const std::uint64_t pixel = row / count;
    return layout_.At(left_ + pixel % width_, top_ + pixel / width_, bands_[row % count]);
  }
  switch (layout_.interleave) {
    case Interleave::BIP:
      return layout_.At(left_ + row % rowsPerLine_ * pixelsPerRow_, top_ + row / rowsPerLine_,
                        lowBand_);
    case Interleave::BIL:
      return layout_.At(left_, top_ + row / count, bands_[row % count]);
    default:
      return layout_.At(left_, top_ + row % height_, bands_[row / height_]);
  }
}

std::uint64_t FlatBlock::RowSpan(std::uint64_t row) const {
  if (!picks_) return RowElements(row);
  return (RowPixels(row) - 1) * layout_.bands + (highBand_ - lowBand_ + 1);
}

std::uint64_t FlatBlock::RowElements(std::uint64_t row) const {
  if (elementRows_) return 1;
  if (layout_.interleave != Interleave::BIP) return width_;
  return RowPixels(row) * bands_.size();
}

std::uint64_t FlatBlock::BlockBegin(std::uint64_t row) const {
  if (elementRows_) return row;
  if (layout_.interleave != Interleave::BIP) return row * width_;
  return (row / rowsPerLine_ * width_ + row % rowsPerLine_ * pixelsPerRow_) * bands_.size();
}

void FlatBlock::PickBands(std::uint64_t row, const void* span, void* elements,
                          unsigned elementBytes) const {
  ForElementBytes(elementBytes, [&]<std::size_t kBytes>() {
    const auto* const __restrict from = static_cast<const Element<kBytes>*>(span);
    auto* const __restrict to = static_cast<Element<kBytes>*>(elements);
    ForEachElement(RowPixels(row), layout_.bands, bands_, lowBand_,
                   [=](std::size_t inSpan, std::size_t inBlock) { to[inBlock] = from[inSpan]; });
  });
}

void FlatBlock::PlaceBands(std::uint64_t row, const void* elements, void* span,
                           unsigned elementBytes) const {
  ForElementBytes(elementBytes, [&]<std::size_t kBytes>() {
    const auto* const __restrict from = static_cast<const Element<kBytes>*>(elements);
    auto* const __restrict to = static_cast<Element<kBytes>*>(span);
    ForEachElement(RowPixels(row), layout_.bands, bands_, lowBand_,
                   [=](std::size_t inSpan, std::size_t inBlock) { to[inSpan] = from[inBlock]; });
  });
}

}  // namespace lumo
