#pragma once

#include <string>
#include <vector>

#include "platform/random_access_file.h"
#include "tiff_writer/plain_pixels.h"

namespace lumo::tiff {

/// The outcome of PlaceBlocks.
enum class Placing {
  kDone,
  kUnsuited,  ///< the file isn't of the layout, or has blocks already; it is as it was
  kFailed,    ///< the file can't be read or written; nobody may go by its directory any more
};

/// Gives each block of a TIFF file its place, behind all that the file holds: the file is made long
/// enough, and its directory read. The layout's `start` is set. A file of another machine's byte
/// order is unsuited.
///
/// Source: TIFF 6.0, sections 2, 8 and 15; the BigTIFF extension for files beyond 4 GiB.
/// @param fault  [out] of one that failed: "path: what".
Placing PlaceBlocks(platform::RandomAccessFile& file, PlainLayout& layout, std::string& fault);

/// A tag of a directory, with its values as they lie in a file of this machine's byte order.
struct TagValue {
  std::uint16_t tag;
  std::uint16_t type;
  std::uint64_t count;
  std::vector<unsigned char> bytes;
};

/// Reads all tags of the first directory of a TIFF file.
/// @param tags   [out] by their numbers.
/// @param fault  [out] of a file that can't be read.
bool ReadTags(platform::RandomAccessFile& file, std::vector<TagValue>& tags, std::string& fault);

}  // namespace lumo::tiff
