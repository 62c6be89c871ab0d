#pragma once

#include <cstddef>
#include <string>

#include "platform/export.h"

namespace lumo {

/// A file operation that the system refused.
struct FileFault {
  std::string path;  ///< as the operation had it
  int code = 0;      ///< the system's number, as errno has it

  /// The meaning of the code, in the system's words.
  VEXG_EXPORT std::string Text() const;
};

/// Hears of the file operations that fail on this thread while it lives.
///
/// Libraries that read and write files report many failures by a short result, a warning or not at
/// all. Whoever does the file operations for such a library notes each failure, and whoever called
/// the library asks here whether its success can be believed. A file that isn't there is no fault.
///
/// They nest: an outer one hears what the inner ones heard. Threads: each hears its own alone.
class VEXG_EXPORT FileFaults {
 public:
  FileFaults();
  ~FileFaults();
  FileFaults(const FileFaults&) = delete;
  FileFaults& operator=(const FileFaults&) = delete;

  /// The first fault since this object was made; null when there was none.
  const FileFault* First() const;

  /// The first fault of that file; null when there was none.
  const FileFault* FirstOf(const std::string& path) const;

  /// Forgets the faults heard so far.
  void Clear();

  /// Notes a fault. It is kept only while some FileFaults lives on this thread.
  static void Note(const std::string& path, int code);

  /// Notes what errno says of a call that was to read a file, unless it is that there is none.
  static void NoteUnread(const std::string& path);

 private:
  std::size_t begin_;
};

}  // namespace lumo
