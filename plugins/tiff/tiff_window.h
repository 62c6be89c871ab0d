#pragma once

#include <list>
#include <mutex>

#include "foundation/array.h"
#include "tiff/tiff_image.h"

namespace lumo::tiff {

/// A rectangle of pixels.
struct Rect {
  unsigned left, top, width, height;
};

/// Reads rectangles of an image, decoding blocks on as many threads as there are. Blocks of which a
/// rectangle needs a part are kept for the next one, up to kMostKept bytes.
///
/// Threads: one at a time.
/// Failure: false, without a word, for data that are damaged or left out.
class Window {
 public:
  static constexpr std::size_t kMostKept = 32 << 20;

  /// @param file  outlives the window, as does the directory of `image`.
  Window(const File& file, const Image& image) : file_(file), image_(image) {}

  /// Reads a rectangle inside the image, in the image's order of axes: pixel by pixel, or band
  /// after band.
  bool Read(const Rect& rect, const Array<unsigned>& bands, unsigned char* pixels);

 private:
  struct Piece;
  using Bytes = std::shared_ptr<const std::vector<unsigned char>>;

  bool FindBlocks();
  bool ReadPiece(const Piece& piece);
  bool ReadPlain(const Piece& piece);
  bool DecodeBlock(std::uint64_t block, unsigned lines, unsigned char* out) const;
  Bytes Kept(std::uint64_t block);
  void Keep(std::uint64_t block, Bytes bytes);

  const File& file_;
  const Image image_;
  bool areBlocksFound_ = false;
  std::vector<std::uint64_t> offsets_, sizes_;
  std::mutex mutex_;                                 // of what is kept
  std::list<std::pair<std::uint64_t, Bytes>> kept_;  // the latest first
  std::size_t keptBytes_ = 0;
};

}  // namespace lumo::tiff
