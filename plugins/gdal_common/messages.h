#pragma once

#include <string>

#include "foundation/file_faults.h"
#include "platform/memory_shortage.h"

namespace lumo::gdal {

/// Gathers what GDAL has to say on this thread while it lives, in place of the standard error
/// stream, and which file operations failed (FileFaults). They nest; each hears what is said while
/// it is the innermost.
class Messages {
 public:
  /// How warnings count by which codecs report that pixels are damaged.
  enum class Damage { kIsWarned, kIsError };

  explicit Messages(Damage damage = Damage::kIsWarned);
  ~Messages();
  Messages(const Messages&) = delete;
  Messages& operator=(const Messages&) = delete;

  /// True when GDAL reported an error, memory was short, or a file operation failed that it did not
  /// report or, as when a file beside the raster could not be saved, only warned of.
  bool HasError() const {
    return !error_.empty() || faults_.First() != nullptr || memory_.WasShort();
  }
  bool HasWarning() const { return !warning_.empty(); }

  /// "out of memory" where it was, else the file operation that failed first, else the last error,
  /// else the last warning, in one line; empty when there was none.
  std::string Text() const;

  /// The file operations that failed.
  const FileFaults& Files() const { return faults_; }

  /// Sets the fault "name: what GDAL said", or why the system refused a file operation. False, to
  /// be returned.
  /// @param otherwise  the fault when GDAL said nothing.
  bool Fail(const std::string& name, const char* otherwise = "GDAL gave no reason") const;

  /// Forgets what was said so far.
  void Clear();

 private:
  struct Handler;

  FileFaults faults_;
  platform::MemoryWatch memory_;
  const Damage damage_;
  std::string error_;
  std::string warning_;
};

/// Sets the fault "name: what". False, to be returned.
bool FailWith(const std::string& name, const std::string& what);

}  // namespace lumo::gdal
