#pragma once

#include <cstdint>
#include <cstring>
#include <memory>
#include <string>
#include <type_traits>
#include <vector>

#include "commands/division.h"

namespace lumo {

namespace platform {
class RandomAccessFile;
}

// Files of shares: what one share of the work of a command has come to, for the command that joins
// all of them. A header (magic, checksum, key, share) stands in front of numbers in the byte order
// of the machine. They may be in several sections, each of which is read on its own.

/// The numbers of a section of a file of a share.
struct ShareSection {
  std::uint64_t bytes = 0;
  std::uint64_t checksum = 0;
};

/// Gathers the numbers of a share and writes them to a file.
///
///     ShareWriter out;
///     out.Put(count);
///     out.Put(sum);
///     if (!out.Write(path, key, share)) return Fail();
///
/// Memory: all that was put; after StreamTo 1 MiB.
class VEXG_EXPORT ShareWriter {
 public:
  ShareWriter();
  ~ShareWriter();
  ShareWriter(const ShareWriter&) = delete;
  ShareWriter& operator=(const ShareWriter&) = delete;

  /// Begins the file at once, so that what is put goes there as it comes: for shares that come to
  /// much. Comes before anything is put; Write, of the same path, ends the file.
  /// @return false, with the fault set, when it can't be made.
  bool StreamTo(const std::string& path);
  /// Adds a number.
  template <typename T>
  void Put(const T& number) {
    static_assert(std::has_unique_object_representations_v<T> || std::is_floating_point_v<T>);
    PutBytes(&number, sizeof number);
  }
  /// Adds numbers that lie side by side.
  template <typename T>
  void PutAll(const T* numbers, std::size_t count) {
    static_assert(std::has_unique_object_representations_v<T> || std::is_floating_point_v<T>);
    PutBytes(numbers, count * sizeof(T));
  }
  /// Ends the section; what comes is in the next one.
  void EndSection();

  /// Makes the file, in place of an older one. Comes last.
  /// @param key  says of what command, raster and inputs the share is.
  /// @return false, with the fault set, when it can't be written.
  bool Write(const std::string& path, const std::string& key, const Share& share);

 private:
  void PutBytes(const void* data, std::size_t bytes);
  void WritePiece(const unsigned char* piece, std::size_t bytes);
  void WriteSection(const std::vector<unsigned char>& rest);

  std::unique_ptr<platform::RandomAccessFile> file_;                   // once it is begun
  std::string fault_;                                                  // of its first failed write
  std::vector<ShareSection> sections_ = std::vector<ShareSection>(1);  // as far as they are written
  std::uint64_t written_ = 0;                                          // bytes of all of them
  /// Of each section what isn't written yet.
  std::vector<std::vector<unsigned char>> held_ = std::vector<std::vector<unsigned char>>(1);
};

/// Reads the numbers of a share again, or of one of its sections, in the order in which they were
/// put.
///
/// The file is open while some of it is read, and not in between, so that those of many shares may
/// be read at the same time. Memory: 1 MiB from Open to the end.
class VEXG_EXPORT ShareReader {
 public:
  /// Reads a section of a file to its end and goes back. @return false, with the fault set, when it
  /// can't be read, is damaged, isn't of this key and share, or has no such section.
  bool Open(const std::string& path, const std::string& key, const Share& share,
            std::uint64_t section = 0);

  /// The next number. False behind the end.
  template <typename T>
  bool Get(T& number) {
    return GetBytes(&number, sizeof number);
  }
  template <typename T>
  bool GetAll(T* numbers, std::size_t count) {
    return GetBytes(numbers, count * sizeof(T));
  }
  /// Bytes that are left.
  std::uint64_t Left() const { return size_ - at_; }
  /// True when nothing is left.
  bool IsAtEnd() const { return at_ == size_; }
  /// Gives up the memory until more is asked for.
  void Rest() { window_ = {}; }

 private:
  bool GetBytes(void* data, std::size_t bytes);
  bool ReadWindow();

  std::string path_;
  std::uint64_t place_ = 0;  // of the first number, in the file
  std::uint64_t size_ = 0;   // of the numbers
  std::uint64_t at_ = 0;     // of the next one
  std::uint64_t windowAt_ = 0;
  std::vector<unsigned char> window_;  // of the numbers, from there
};

/// Sets the fault for a file of a share that doesn't hold what it should.
VEXG_EXPORT void SetShareFault(const std::string& path);

}  // namespace lumo
