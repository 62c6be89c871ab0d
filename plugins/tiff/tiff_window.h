#pragma once

#include "foundation/array.h"
#include "raster/raster_enums.h"
#include "tiff/tiff_block_cache.h"
#include "tiff/tiff_image.h"

namespace lumo::tiff {

/// A rectangle of pixels.
struct Rect {
  unsigned left, top, width, height;
};

/// Reads rectangles of an image, decoding blocks on as many threads as there are. Blocks of which a
/// rectangle needs a part are kept for the next ones (BlockCache); of a rectangle that lies
/// anywhere in the image all blocks are, since others will overlap with it; who passes over whole
/// blocks takes them. Blocks without compression are kept when they are needed again in short rows.
///
/// Threads: one at a time.
/// Failure: false, without a word, for data that are damaged or left out.
class Window {
 public:
  /// @param file  outlives the window, as does the directory of `image`.
  Window(const File& file, const Image& image) : file_(file), image_(image) {}
  ~Window();
  Window(const Window&) = delete;
  Window& operator=(const Window&) = delete;

  /// Reads a rectangle inside the image.
  /// @param order  of the axes: any where the image has its bands pixel by pixel, else band after
  ///               band.
  bool Read(const Rect& rect, const Array<unsigned>& bands, Interleave order,
            unsigned char* pixels);

 private:
  struct Piece;
  using Bytes = BlockCache::Bytes;

  bool FindBlocks();
  bool ReadPiece(const Piece& piece);
  bool ReadPlain(const Piece& piece);
  bool ReadPlainOrKept(const Piece& piece);
  bool Carry(const Piece& piece, const unsigned char* block) const;
  bool DecodeBlock(std::uint64_t block, unsigned lines, unsigned char* out) const;

  const File& file_;
  const Image image_;
  bool areBlocksFound_ = false;
  std::vector<std::uint64_t> offsets_, sizes_;
  std::vector<unsigned char> wasAsked_;  // by a window anywhere, for each plain block
  const std::uint64_t group_ = BlockCache::Get().NewGroup();
  std::atomic<bool> hasKept_{false};  // some block, now or before
};

}  // namespace lumo::tiff
