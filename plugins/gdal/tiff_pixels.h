#pragma once

#include <algorithm>
#include <cstdint>
#include <memory>
#include <string>
#include <vector>

#include "gdal_raster.h"
#include "platform/random_access_file.h"

namespace lumo::gdal {

/// Where the blocks, tiles or strips, of a TIFF file without compression lie: one after the other,
/// each in a place of its own size. In bytes, where nothing else is said.
struct TiffLayout {
  unsigned samples = 0;
  unsigned lines = 0;
  unsigned bands = 0;
  unsigned blockWidth = 0;   ///< pixels
  unsigned blockHeight = 0;  ///< lines; the last strip of a raster may have fewer
  unsigned element = 0;      ///< one value
  bool byPixel = false;      ///< the bands of a pixel lie together, else those of a block's band
  bool isTiled = false;
  std::uint64_t start = 0;  ///< of the first block

  unsigned Columns() const { return (samples + blockWidth - 1) / blockWidth; }
  unsigned Rows() const { return (lines + blockHeight - 1) / blockHeight; }
  /// Bands in a block.
  unsigned Depth() const { return byPixel ? bands : 1; }
  std::uint64_t PixelBytes() const { return std::uint64_t{Depth()} * element; }
  std::uint64_t RowBytes() const { return blockWidth * PixelBytes(); }
  std::uint64_t PlaneBlocks() const { return std::uint64_t{Columns()} * Rows(); }
  std::uint64_t Planes() const { return bands / Depth(); }
  std::uint64_t Blocks() const { return PlaneBlocks() * Planes(); }
  std::uint64_t PlaneBytes() const {
    return isTiled ? PlaneBlocks() * blockHeight * RowBytes() : lines * RowBytes();
  }
  std::uint64_t OffsetOf(std::uint64_t block) const {
    return start + block / PlaneBlocks() * PlaneBytes() +
           block % PlaneBlocks() * blockHeight * RowBytes();
  }
  /// Lines that a block has in the file.
  unsigned LinesOf(std::uint64_t block) const {
    const auto row = static_cast<unsigned>(block % PlaneBlocks() / Columns());
    return isTiled ? blockHeight : std::min(blockHeight, lines - row * blockHeight);
  }
  std::uint64_t End() const { return start + Planes() * PlaneBytes(); }
};

/// The pixels of a TIFF file that is being made, written straight to their places, past GDAL's
/// cache of blocks: that would hold the raster twice, and copy each value twice more.
///
/// The file has been made by GDAL, with all but its pixels; it is whole from Begin on. Values that
/// nobody writes are the fill value. Failure: false, with the fault set.
class TiffPixels {
 public:
  /// False when the file can't be read or written.
  /// @param path  a closed TIFF file without any block.
  /// @param fill  bytes of one value.
  /// @param pixels  [out] null for a file that can't be filled like this.
  static bool Begin(const std::string& path, const RasterDef& def, bool byPixel,
                    const std::vector<unsigned char>& fill, std::unique_ptr<TiffPixels>& pixels);

  /// Carries a block, inside the raster, in the interleave of the file.
  bool Write(const BlockPlace& place, const void* pixels);
  bool Read(const BlockPlace& place, void* pixels);

  /// Fills what was not written, and closes the file.
  bool Finish();

 private:
  struct Run;
  TiffPixels(std::unique_ptr<platform::RandomAccessFile> file, const TiffLayout& layout,
             const std::vector<unsigned char>& fill);
  template <typename Visit>
  bool ForRuns(const BlockPlace& place, const Visit& visit) const;
  bool WriteRun(const Run& run, const BlockPlace& place, const unsigned char* pixels);
  bool ReadRun(const Run& run, const BlockPlace& place, unsigned char* pixels);
  bool FillRows(const Run& run);
  void NoteWritten(const Run& run);
  std::size_t RowNumber(std::uint64_t block, unsigned row) const {
    return static_cast<std::size_t>(block * layout_.blockHeight + row);
  }

  std::unique_ptr<platform::RandomAccessFile> file_;
  const TiffLayout layout_;
  std::vector<unsigned char> fillRow_;  // a block's row of the fill value; empty where that is 0
  std::vector<bool> isWritten_;         // each row of each block, where there is a fill value
  std::vector<unsigned char> scratch_;
};

}  // namespace lumo::gdal
