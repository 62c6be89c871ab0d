#pragma once

#include <cstdint>
#include <cstring>
#include <string>
#include <type_traits>
#include <vector>

#include "commands/division.h"

namespace lumo {

// Files of shares: what one share of the work of a command has come to, for the command that joins
// all of them. A header (magic, checksum, key, share) stands in front of numbers in the byte order
// of the machine. They may be in several sections, each of which is read on its own.

/// Gathers the numbers of a share and writes them to a file.
///
///     ShareWriter out;
///     out.Put(count);
///     out.Put(sum);
///     if (!out.Write(path, key, share)) return Fail();
///
/// Memory: all that was put.
class VEXG_EXPORT ShareWriter {
 public:
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
  void EndSection() { sections_.emplace_back(); }

  /// Makes the file, in place of an older one.
  /// @param key  says of what command, raster and inputs the share is.
  /// @return false, with the fault set, when it can't be written.
  bool Write(const std::string& path, const std::string& key, const Share& share) const;

 private:
  void PutBytes(const void* data, std::size_t bytes);

  std::vector<std::vector<unsigned char>> sections_ = std::vector<std::vector<unsigned char>>(1);
};

/// Reads the numbers of a share again, or of one of its sections, in the order in which they were
/// put.
class VEXG_EXPORT ShareReader {
 public:
  /// Reads a section of a file. @return false, with the fault set, when it can't be read, is
  /// damaged, isn't of this key and share, or has no such section.
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
  std::size_t Left() const { return bytes_.size() - at_; }
  /// True when nothing is left.
  bool IsAtEnd() const { return at_ == bytes_.size(); }

 private:
  bool GetBytes(void* data, std::size_t bytes);

  std::vector<unsigned char> bytes_;
  std::size_t at_ = 0;
};

/// Sets the fault for a file of a share that doesn't hold what it should.
VEXG_EXPORT void SetShareFault(const std::string& path);

}  // namespace lumo
