#pragma once

#include <map>
#include <string>
#include <vector>

#include "platform/export.h"
#include "platform/file_identity.h"

namespace lumo {

/// Has a library make, change and remove files beside a raster under temporary names, on this
/// thread and while it lives. The library names them as ever and sees its own changes; everybody
/// else sees what was there before, until MoveIn puts all of them to their places. Whoever does the
/// file operations for the library asks here for the names.
///
/// Covers the files whose names begin with that of the raster and go on (".ovr"), not the raster
/// itself. One at a time on a thread. Failure: false or no text, with errno set.
///
///     StagedFiles staged(path);         // path + ".ovr" and the like, on this thread
///     BuildOverviews(dataset);          // the library believes that it writes them in place
///     std::string fault;
///     if (!staged.MoveIn(fault)) …      // what was there before is there still
class VEXG_EXPORT StagedFiles {
 public:
  explicit StagedFiles(std::string raster);
  /// Removes the files that were not moved in.
  ~StagedFiles();
  StagedFiles(const StagedFiles&) = delete;
  StagedFiles& operator=(const StagedFiles&) = delete;

  /// Puts the files to their places, all or none, unless one was changed by somebody else since it
  /// was staged.
  /// @param fault  [out] "path: what".
  bool MoveIn(std::string& fault);

  // For whoever does the file operations.

  /// The one of this thread; null when there is none.
  static StagedFiles* OfThread();
  /// True for a file whose name begins with that of the raster and goes on.
  bool Covers(const std::string& path) const;
  /// Where a file lies for now; a name of nothing for one that was removed.
  std::string PlaceOf(const std::string& path) const;
  /// The names of the files of a folder that are there for the library alone.
  std::vector<std::string> NamesIn(const std::string& folder) const;
  /// Where a file is to be written: a copy of it, or for a new one a name. No text on failure.
  std::string Stage(const std::string& path, bool isNew);
  /// Makes a file look removed to the library; it goes when all is moved in.
  bool Remove(const std::string& path);

 private:
  /// A file that was changed.
  struct Entry {
    std::string place;             // where it lies until it is moved in
    platform::FileIdentity older;  // that stands there until then
    bool isRemoved = false;
  };

  Entry& EntryOf(const std::string& path);

  const std::string raster_;
  std::map<std::string, Entry> entries_;  // by the path that the library knows
};

}  // namespace lumo
