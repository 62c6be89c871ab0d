#pragma once

#include <algorithm>
#include <cstdint>
#include <memory>
#include <string>
#include <vector>

#include "platform/random_access_file.h"
#include "raster/raster_def.h"
#include "tiff_writer/new_pixels.h"

namespace lumo::tiff {

/// Where the blocks of a TIFF file without compression lie: one after the other, each in a place of
/// its own size. In bytes.
struct PlainLayout : BlockLayout {
  std::uint64_t start = 0;  ///< of the first block

  std::uint64_t PlaneBytes() const {
    return isTiled ? PlaneBlocks() * blockHeight * RowBytes() : lines * RowBytes();
  }
  std::uint64_t OffsetOf(std::uint64_t block) const {
    return start + block / PlaneBlocks() * PlaneBytes() +
           block % PlaneBlocks() * blockHeight * RowBytes();
  }
  std::uint64_t End() const { return start + Planes() * PlaneBytes(); }
};

/// Pixels without compression, written straight to their places, past GDAL's cache of blocks: that
/// would hold the raster twice, and copy each value twice more.
///
/// The file has been made by GDAL, with all but its pixels; it is whole from Begin on. Values that
/// nobody writes are the fill value.
class PlainPixels final : public NewPixels {
 public:
  /// False when the file can't be read or written.
  /// @param path  a closed TIFF file without any block.
  /// @param fill  bytes of one value.
  /// @param pixels  [out] null for a file that can't be filled like this.
  static bool Begin(const std::string& path, const RasterDef& def, bool byPixel,
                    const std::vector<unsigned char>& fill, std::unique_ptr<PlainPixels>& pixels);

  bool Write(const BlockPlace& place, const void* pixels) override;
  bool Read(const BlockPlace& place, void* pixels) override;

  /// Fills what was not written, and closes the file.
  bool Finish() override;

 private:
  PlainPixels(std::unique_ptr<platform::RandomAccessFile> file, const PlainLayout& layout,
              const std::vector<unsigned char>& fill);
  bool WriteRun(const BlockRun& run, const BlockPlace& place, const unsigned char* pixels);
  bool ReadRun(const BlockRun& run, const BlockPlace& place, unsigned char* pixels);
  bool FillRows(const BlockRun& run);
  void NoteWritten(const BlockRun& run);
  std::size_t RowNumber(std::uint64_t block, unsigned row) const {
    return static_cast<std::size_t>(block * layout_.blockHeight + row);
  }

  std::unique_ptr<platform::RandomAccessFile> file_;
  const PlainLayout layout_;
  std::vector<unsigned char> fillRow_;  // a block's row of the fill value; empty where that is 0
  std::vector<bool> isWritten_;         // each row of each block, where there is a fill value
  std::vector<unsigned char> scratch_;
};

}  // namespace lumo::tiff
