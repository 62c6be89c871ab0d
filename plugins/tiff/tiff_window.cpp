#include "tiff/tiff_window.h"

#include <algorithm>
#include <atomic>
#include <cstring>
#include <utility>

#include "raster/interleave_lines.h"
#include "tasks/crew.h"

namespace lumo::tiff {
namespace {

/// Decoded bytes that are worth a task of their own.
constexpr std::size_t kTaskBytes = 64 << 10;

/// Copies rows of pixels, all bands of them or some, as they are or band after band.
struct Carrier {
  std::size_t element;                      // bytes of a value
  std::size_t pixel;                        // bytes of a pixel in the block
  std::size_t bands;                        // that are wanted
  const Array<unsigned>* chosen = nullptr;  // null: all, in their order
  std::size_t plane = 0;                    // values from a band to the next; 0: bands by pixel

  /// True where rows are copied as they are.
  bool IsPlain() const { return chosen == nullptr && plane == 0; }

  void Row(const unsigned char* from, unsigned char* to, std::size_t width) const {
    if (IsPlain()) {
      std::memcpy(to, from, width * pixel);
      return;
    }
    if (chosen == nullptr) {
      SplitPixels(from, to, width, bands, plane, element);
      return;
    }
    switch (element) {
      case 1:
        return Pick<1>(from, to, width);
      case 2:
        return Pick<2>(from, to, width);
      case 4:
        return Pick<4>(from, to, width);
      default:
        return Pick<8>(from, to, width);
    }
  }

 private:
  template <std::size_t kBytes>
  void Pick(const unsigned char* from, unsigned char* to, std::size_t width) const {
    const std::size_t across = plane != 0 ? kBytes : bands * kBytes;
    const std::size_t down = plane != 0 ? plane * kBytes : kBytes;
    for (std::size_t x = 0; x < width; ++x, from += pixel, to += across) {
      for (std::size_t i = 0; i < bands; ++i) {
        std::memcpy(to + i * down, from + (*chosen)[static_cast<unsigned>(i)] * kBytes, kBytes);
      }
    }
  }
};

bool AreAll(const Array<unsigned>& bands, unsigned count) {
  if (bands.GetCount() != count) return false;
  for (unsigned i = 0; i < count; ++i) {
    if (bands[i] != i) return false;
  }
  return true;
}

}  // namespace

/// The part of a block that a rectangle needs, and where it goes.
struct Window::Piece {
  std::uint64_t block;
  unsigned lines;          // of the block
  unsigned left, top;      // in the block
  unsigned width, height;  // of the part
  unsigned char* to;       // its first pixel
  std::size_t stride;      // bytes from one of its rows to the next
  const Carrier* carrier;
  bool isKept;  // even where all of the block is needed
};

bool Window::FindBlocks() {
  if (areBlocksFound_) return true;
  const Tag offsets = image_.isTiled ? kTileOffsets : kStripOffsets;
  const Tag sizes = image_.isTiled ? kTileByteCounts : kStripByteCounts;
  const std::uint64_t count = image_.Blocks();
  areBlocksFound_ = file_.ReadNumbers(*image_.directory, offsets, count, offsets_) &&
                    file_.ReadNumbers(*image_.directory, sizes, count, sizes_) &&
                    offsets_.size() == count && sizes_.size() == count;
  return areBlocksFound_;
}

bool Window::DecodeBlock(std::uint64_t block, unsigned lines, unsigned char* out) const {
  constexpr std::uint64_t kMostPacked = 64 << 20;
  const std::uint64_t packedBytes = sizes_[block];
  if (offsets_[block] == 0 || packedBytes == 0 || packedBytes > kMostPacked) return false;
  const std::size_t rowBytes = image_.RowBytes(), bytes = lines * rowBytes;
  thread_local std::vector<unsigned char> packed;
  if (packed.size() < packedBytes) packed.resize(packedBytes);
  if (!file_.Handle().Read(offsets_[block], packed.data(), packedBytes)) return false;
  if (image_.jpeg != nullptr) {
    return DecodeJpeg(*image_.jpeg, image_.blockWidth, lines, packed.data(), packedBytes, out);
  }
  if (!Decode(image_.compression, packed.data(), packedBytes, out, bytes)) {
    return false;
  }
  if (image_.predictor == 1) return true;
  const Prediction prediction{image_.predictor, image_.elementBytes,
                              image_.byPixel ? image_.bands : 1};
  for (unsigned y = 0; y < lines; ++y) Undo(prediction, out + y * rowBytes, rowBytes);
  return true;
}

Window::~Window() {
  if (hasKept_) BlockCache::Get().Drop(group_);
}

/// Reads a part of a block without compression, straight to its place where rows are long.
bool Window::ReadPlain(const Piece& piece) {
  const std::size_t rowBytes = image_.RowBytes(), pixelBytes = image_.PixelBytes();
  if (offsets_[piece.block] == 0 || sizes_[piece.block] < piece.lines * rowBytes) return false;
  const std::uint64_t first =
      offsets_[piece.block] + piece.top * rowBytes + piece.left * pixelBytes;
  const std::size_t bytes = piece.width * pixelBytes;
  const bool isPlain = piece.carrier->IsPlain();
  if (isPlain && bytes == rowBytes && piece.stride == rowBytes) {
    return file_.Handle().Read(first, piece.to, piece.height * rowBytes);
  }
  constexpr std::size_t kLongRow = 16384;
  if (isPlain && bytes >= kLongRow) {
    for (unsigned y = 0; y < piece.height; ++y) {
      if (!file_.Handle().Read(first + y * rowBytes, piece.to + y * piece.stride, bytes)) {
        return false;
      }
    }
    return true;
  }
  thread_local std::vector<unsigned char> rows;
  const std::size_t span = (piece.height - 1) * rowBytes + bytes;
  if (rows.size() < span) rows.resize(span);
  if (!file_.Handle().Read(first, rows.data(), span)) return false;
  for (unsigned y = 0; y < piece.height; ++y) {
    piece.carrier->Row(rows.data() + y * rowBytes, piece.to + y * piece.stride, piece.width);
  }
  return true;
}

/// Reads a part of a block without compression. A block that is asked for again by windows that lie
/// anywhere is read whole and kept, where a call of the system for each window costs more than it
/// copies.
bool Window::ReadPlainOrKept(const Piece& piece) {
  constexpr std::size_t kMostBytes = 1 << 20, kLeastShare = 32, kMostRowBytes = 4096;
  const std::size_t bytes = piece.lines * image_.RowBytes();
  const std::size_t row = piece.width * image_.PixelBytes(), wanted = row * piece.height;
  if (!piece.isKept || row > kMostRowBytes || bytes > kMostBytes || wanted < bytes / kLeastShare) {
    return ReadPlain(piece);
  }
  BlockCache& cache = BlockCache::Get();
  if (const Bytes kept = cache.Find(group_, piece.block)) return Carry(piece, kept.get());
  // A band that is asked for twice has two pieces in a block, which two threads may have.
  if (std::atomic_ref(wasAsked_[piece.block]).exchange(1) == 0) return ReadPlain(piece);
  if (offsets_[piece.block] == 0 || sizes_[piece.block] < bytes) return false;
  std::shared_ptr<unsigned char[]> block(std::make_unique_for_overwrite<unsigned char[]>(bytes));
  if (!file_.Handle().Read(offsets_[piece.block], block.get(), bytes)) return false;
  Carry(piece, block.get());
  hasKept_ = true;
  cache.Keep(group_, piece.block, std::move(block), bytes);
  return true;
}

/// Copies the part of a block to its place.
bool Window::Carry(const Piece& piece, const unsigned char* block) const {
  const std::size_t rowBytes = image_.RowBytes();
  const unsigned char* const first =
      block + piece.top * rowBytes + piece.left * image_.PixelBytes();
  for (unsigned y = 0; y < piece.height; ++y) {
    piece.carrier->Row(first + y * rowBytes, piece.to + y * piece.stride, piece.width);
  }
  return true;
}

bool Window::ReadPiece(const Piece& piece) {
  if (image_.compression == Compression::kNone) return ReadPlainOrKept(piece);
  const std::size_t rowBytes = image_.RowBytes();
  const bool isWholeWidth = piece.width == image_.blockWidth;
  const bool isWhole =
      piece.height == piece.lines &&
      (isWholeWidth || piece.left + piece.width == image_.samples % image_.blockWidth);
  const bool isPassing = isWhole && !piece.isKept;
  if (isPassing && hasKept_) {
    const Bytes kept = BlockCache::Get().Take(group_, piece.block);
    if (kept) return Carry(piece, kept.get());
  }
  if (isPassing && isWholeWidth && piece.stride == rowBytes && piece.carrier->IsPlain()) {
    return DecodeBlock(piece.block, piece.lines, piece.to);
  }
  const std::size_t bytes = piece.lines * rowBytes;
  if (isPassing) {
    thread_local std::vector<unsigned char> decoded;
    if (decoded.size() < bytes) decoded.resize(bytes);
    return DecodeBlock(piece.block, piece.lines, decoded.data()) && Carry(piece, decoded.data());
  }
  BlockCache& cache = BlockCache::Get();
  if (const Bytes kept = cache.Find(group_, piece.block)) return Carry(piece, kept.get());
  std::shared_ptr<unsigned char[]> decoded(std::make_unique_for_overwrite<unsigned char[]>(bytes));
  if (!DecodeBlock(piece.block, piece.lines, decoded.get())) return false;
  Carry(piece, decoded.get());
  hasKept_ = true;
  cache.Keep(group_, piece.block, std::move(decoded), bytes);
  return true;
}

bool Window::Read(const Rect& rect, const Array<unsigned>& bands, Interleave order,
                  unsigned char* pixels) {
  if (!FindBlocks()) return false;
  const unsigned count = bands.GetCount();
  Carrier carrier{image_.elementBytes, image_.PixelBytes(), count};
  if (image_.byPixel && !AreAll(bands, image_.bands)) carrier.chosen = &bands;
  const bool splits = image_.byPixel && count > 1 && order != Interleave::BIP;
  const bool isByLine = splits && order == Interleave::BIL;
  if (splits) carrier.plane = std::size_t{rect.width} * (isByLine ? 1 : rect.height);
  const bool isByPixel = image_.byPixel && !splits;  // where the pixels go
  const std::size_t pixelBytes = std::size_t{image_.elementBytes} * (isByPixel ? count : 1);
  const std::size_t rowBytes = rect.width * pixelBytes * (isByLine ? count : 1);
  const unsigned planes = image_.byPixel ? 1 : count;
  const std::uint64_t perPlane = std::uint64_t{image_.BlocksAcross()} * image_.BlocksDown();
  const unsigned bottom = rect.top + rect.height, right = rect.left + rect.width;
  const unsigned width = image_.blockWidth, height = image_.blockHeight;
  // Who reads whole rows of an image reads it from top to bottom, as a rule.
  const bool isAnywhere =
      rect.width < image_.samples && (rect.left % width != 0 || rect.top % height != 0);
  if (isAnywhere && image_.compression == Compression::kNone && wasAsked_.empty()) {
    wasAsked_.resize(image_.Blocks());
  }
  std::vector<Piece> pieces;
  for (unsigned plane = 0; plane < planes; ++plane) {
    unsigned char* const start = pixels + plane * rowBytes * rect.height;
    for (unsigned row = rect.top / height; row <= (bottom - 1) / height; ++row) {
      const unsigned top = std::max(rect.top, row * height);
      const unsigned end =
          static_cast<unsigned>(std::min<std::uint64_t>(bottom, std::uint64_t{row + 1} * height));
      for (unsigned column = rect.left / width; column <= (right - 1) / width; ++column) {
        const unsigned left = std::max(rect.left, column * width);
        const unsigned stop = static_cast<unsigned>(
            std::min<std::uint64_t>(right, std::uint64_t{column + 1} * width));
        const std::uint64_t block = (image_.byPixel ? 0 : bands[plane] * perPlane) +
                                    std::uint64_t{row} * image_.BlocksAcross() + column;
        unsigned char* const to =
            start + (top - rect.top) * rowBytes + (left - rect.left) * pixelBytes;
        pieces.push_back({block, image_.LinesOf(row), left - column * width, top - row * height,
                          stop - left, end - top, to, rowBytes, &carrier, isAnywhere});
      }
    }
  }
  const std::size_t pieceBytes = std::max<std::size_t>(height * image_.RowBytes(), 1);
  const auto perTask = static_cast<unsigned>(std::max<std::size_t>(kTaskBytes / pieceBytes, 1));
  const auto all = static_cast<unsigned>(pieces.size());
  const unsigned tasks = (all + perTask - 1) / perTask;
  std::atomic<bool> isRead{true};
  const auto run = [&](unsigned task) {
    const unsigned end = std::min(all, (task + 1) * perTask);
    for (unsigned i = task * perTask; i < end && isRead; ++i) {
      if (!ReadPiece(pieces[i])) isRead = false;
    }
  };
  RunByCrew(tasks, run);
  return isRead;
}

}  // namespace lumo::tiff
