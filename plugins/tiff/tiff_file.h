#pragma once

#include <cstdint>
#include <map>
#include <memory>
#include <string>
#include <vector>

#include "platform/random_access_file.h"
#include "tiff_writer/tiff_tags.h"

namespace lumo::tiff {

/// The values of one tag of a directory: where they lie.
struct Entry {
  std::uint16_t type = 0;
  std::uint64_t count = 0;
  std::uint64_t offset = 0;
};

using Directory = std::map<std::uint16_t, Entry>;

/// A TIFF or BigTIFF file in this machine's byte order, and its directories.
///
/// Threads: once it is open, any number may read.
/// Failure: false, null or empty, without a word: whoever asks then goes another way, which says
/// why.
class File {
 public:
  /// True for the first bytes of a file that may be one of these.
  static bool HasMark(const unsigned char* bytes, std::size_t count);

  /// Opens a file and reads all its directories. Null for a file that isn't one, or is cut off in
  /// them.
  static std::unique_ptr<File> Open(const std::string& path);

  const std::vector<Directory>& Directories() const { return directories_; }
  const platform::RandomAccessFile& Handle() const { return *file_; }

  /// All values of a tag that are whole numbers. False for another type, or more than `most`.
  bool ReadNumbers(const Directory& directory, Tag tag, std::uint64_t most,
                   std::vector<std::uint64_t>& values) const;
  /// The one value of a tag, or `absent`; `absent` as well where there are several that differ.
  std::uint64_t Number(const Directory& directory, Tag tag, std::uint64_t absent) const;
  /// All values of a tag that are of the type DOUBLE.
  bool ReadDoubles(const Directory& directory, Tag tag, std::vector<double>& values) const;
  /// The bytes of a tag of the type UNDEFINED, or BYTE.
  bool ReadBytes(const Directory& directory, Tag tag, std::vector<unsigned char>& bytes) const;
  /// The characters of a tag up to the first null.
  bool ReadText(const Directory& directory, Tag tag, std::string& text) const;
  /// The text between the header and the first directory, as far as the first bytes of the file go.
  std::string Head() const;

 private:
  explicit File(std::unique_ptr<platform::RandomAccessFile> file) : file_(std::move(file)) {}
  bool Get(std::uint64_t offset, void* to, std::size_t bytes) const;
  bool ReadDirectories();
  bool ReadDirectory(std::uint64_t offset, std::uint64_t& next);

  std::unique_ptr<platform::RandomAccessFile> file_;
  std::vector<unsigned char> head_;  // the first bytes of the file
  bool isBig_ = false;
  std::vector<Directory> directories_;
};

}  // namespace lumo::tiff
