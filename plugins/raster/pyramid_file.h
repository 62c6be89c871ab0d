#pragma once

#include <functional>
#include <memory>
#include <mutex>
#include <vector>

#include "foundation/packing.h"
#include "platform/random_access_file.h"
#include "tile_order.h"

namespace lumo::pyramid {

/// A tile of a level as pixels, pixel-interleaved.
struct Tile {
  unsigned width = 0;
  unsigned height = 0;
  unsigned bands = 0;
  RawBytes pixels;
  RawBytes states;  ///< one for each value; none when all are 0
};

/// A whole pyramid file, open for reading. docs/file-formats.md describes the format.
/// Threads: tiles may be read on many threads at once.
/// Failure: false or null, with SetFault. Sizes in the file are checked before anything is
///          allocated by them.
class PyramidFile {
 public:
  static std::unique_ptr<PyramidFile> Open(const std::string& path);

  const Header& GetHeader() const { return header_; }
  /// Text of the values of bands.
  const std::string& Values() const { return values_; }

  const std::string& Path() const { return file_->Path(); }

  /// False when another file has taken the place of this one, or other values were stored in it.
  bool IsCurrent() const;

  /// Reads the index of a level, once; before tiles of it can be read.
  bool LoadIndex(unsigned level);

  /// Reads a tile of a level whose index is loaded.
  bool ReadTile(const TilePlace& place, Tile& tile, std::string& fault) const;

 private:
  PyramidFile(std::unique_ptr<platform::RandomAccessFile> file) : file_(std::move(file)) {}
  bool LoadHeader();
  bool ReadExtent(const Extent& extent, void* bytes, const char* what) const;
  bool Fail(const std::string& fault) const;

  std::unique_ptr<platform::RandomAccessFile> file_;
  Header header_;
  std::string values_;
  std::array<std::vector<TileEntry>, kLevelCount> indices_;
};

/// Lets `change` change the values of a file on the disk: it gets the text that stands there.
/// Another one that is open shows the new values when it is opened again.
bool ChangeValues(const std::string& path,
                  const std::function<bool(const std::string& before, std::string& after)>& change);

/// True when the file begins as a pyramid, of whatever version.
bool IsPyramidFile(const std::string& path);

/// Reads the header of an open file that counts.
bool ReadHeader(const platform::RandomAccessFile& file, Header& header, std::string& fault);

}  // namespace lumo::pyramid
