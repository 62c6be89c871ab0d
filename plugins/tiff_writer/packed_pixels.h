#pragma once

#include <deque>
#include <functional>
#include <memory>
#include <string>
#include <vector>

#include "platform/random_access_file.h"
#include "raster/raster_def.h"
#include "tiff_writer/block_packer.h"
#include "tiff_writer/block_reducer.h"
#include "tiff_writer/block_work.h"
#include "tiff_writer/new_pixels.h"
#include "tiff_writer/open_blocks.h"
#include "tiff_writer/packed_rows.h"
#include "tiff_writer/tiff_directory.h"

namespace lumo::tiff {

/// All that PackedPixels has to know of a raster.
struct PackedRaster {
  RasterDef def;
  BlockLayout layout;
  std::vector<unsigned char> fill;  ///< bytes of a value that nobody writes
  bool isFillNoData = false;        ///< of every band
  bool hasAlpha = false;            ///< the last band says which pixels count
  std::string path;                 ///< of the file to make; absolute
  std::string description;          ///< a TIFF file without pixels, whose tags the file gets
  /// Gets the pixels of a place that are excluded, as bytes that are not 0; none where it gives
  /// none. Asked of files with levels only.
  std::function<bool(const BlockPlace& place, std::vector<unsigned char>& excluded)> getExcluded;
};

/// A block that has been packed.
struct PackedBlock {
  static constexpr std::uint64_t kFill = 1;  ///< the offset of one that nobody has written

  std::uint64_t offset = 0;  ///< in the file that holds it; 0 while there is none
  std::uint32_t bytes = 0;
};

/// The blocks of a level, or of its mask.
struct PackedLevel {
  BlockLayout layout;
  std::vector<PackedBlock> blocks;
  std::vector<PackedBlock> masks;       ///< of files with levels
  std::vector<unsigned char> quarters;  ///< a bit for each block of the level below that is packed
};

/// Pixels that are packed, of files of any layout.
///
/// Blocks are gathered until all their pixels are written, then packed by all threads, and written
/// in their order. Levels are made at the same time: each packed block gives a quarter of one of
/// the level above. Pixels may be written in any order and more than once; a block that was packed
/// before is taken up again then, and packed once more. A cloud-optimised file is put together at
/// the end, out of packed blocks that have waited in a file without a name.
class PackedPixels final : public NewPixels {
 public:
  /// Null when it can't be begun.
  static std::unique_ptr<PackedPixels> Begin(PackedRaster raster);

  bool Write(const BlockPlace& place, const void* pixels) override;
  bool Read(const BlockPlace& place, void* pixels) override;
  bool Finish() override;

  /// Takes all blocks out of files that hold the lines of the raster, as they are packed there, in
  /// the order in which they would be complete if the pixels were written in the blocks of
  /// `rows.walkWidth` by `rows.walkHeight`. Comes before anything is written, and tells the watch
  /// of `rows` how far it is.
  /// @param taken  [out] false when the files are packed otherwise; nothing has changed then.
  bool TakeRows(const RowsFiles& rows, bool& taken);

 private:
  explicit PackedPixels(PackedRaster raster);
  bool MakeFile();
  void MakeLevels();

  OpenBlock* TakeUp(unsigned level, std::uint64_t block, bool toChange);
  bool Unpacked(unsigned level, std::uint64_t block, std::vector<unsigned char>& pixels);
  bool WriteRun(const BlockRun& run, const BlockPlace& place, const unsigned char* pixels);
  bool ReadRun(const BlockRun& run, const BlockPlace& place, unsigned char* pixels);

  void Queue(unsigned level, std::uint64_t block, OpenBlock& open);
  bool PackQueued(bool all);
  bool Prepare(BlockWork& work);
  bool PackBatch(std::vector<BlockWork>& batch);
  bool Store(BlockWork& work);
  bool FailOfFile(const std::string& why) const;
  bool FailOfSize() const;
  bool Append(const std::vector<unsigned char>& packed, PackedBlock& block);
  bool GiveToLevelAbove(const BlockWork& work);
  void NoteQuarter(unsigned level, std::uint64_t block);
  bool TakeBlocks(PackedRows& rows, std::vector<std::uint64_t>& blocks);
  bool PackRest();
  bool GetFill(unsigned lines, std::vector<unsigned char>& packed);
  bool WriteUntouched();
  bool WriteDirectory();

  PackedRaster raster_;
  Packing packing_;
  BlockReducer reducer_;
  bool isCog_;
  std::vector<TagValue> tags_;
  std::vector<PackedLevel> levels_;
  OpenBlocks open_;
  std::deque<std::pair<unsigned, std::uint64_t>> queue_;
  std::size_t batch_ = 1;
  std::unique_ptr<platform::RandomAccessFile> file_;
  std::uint64_t end_ = 16;  // behind the header of a BigTIFF
  bool hasExcluded_ = false;
  std::map<unsigned, std::vector<unsigned char>> fills_;  // packed, by their lines
  std::vector<unsigned char> scratch_;
};

}  // namespace lumo::tiff
