#pragma once

#include <memory>
#include <vector>

#include "platform/random_access_file.h"
#include "raster/rows_files.h"
#include "tiff_writer/block_layout.h"
#include "tiff_writer/block_packer.h"

namespace lumo::tiff {

/// The packed blocks of TIFF files, each of which holds some of the lines of a raster.
///
/// Few files are open at a time: they are to be asked for from the first line to the last. Failure:
/// false, with the fault set.
class PackedRows {
 public:
  /// Looks at all files. @return null when one isn't packed as the whole will be, or is cut where
  /// the whole has no border of blocks: its blocks are no blocks of the whole then.
  /// @param layout  of the whole.
  static std::unique_ptr<PackedRows> Find(const RowsFiles& rows, const BlockLayout& layout,
                                          const Packing& packing);

  /// Reads a block of the whole.
  bool Read(std::uint64_t block, std::vector<unsigned char>& packed);

 private:
  /// A file with the places of its blocks.
  struct Part {
    std::unique_ptr<platform::RandomAccessFile> file;
    std::vector<std::uint64_t> offsets;
    std::vector<std::uint64_t> counts;
  };

  PackedRows(const RowsFiles& rows, const BlockLayout& layout, const Packing& packing)
      : rows_(rows), layout_(layout), packing_(packing) {}
  bool Open(std::size_t number, Part& part) const;

  const RowsFiles& rows_;
  const BlockLayout layout_;
  const Packing packing_;
  std::vector<unsigned> firsts_;  // row of blocks of each file, and behind the last
  std::size_t number_ = 0;        // of the file that is open
  Part open_;
};

}  // namespace lumo::tiff
