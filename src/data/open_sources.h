#pragma once

#include <vector>

#include "foundation/array.h"
#include "foundation/string.h"
#include "platform/file_identity.h"

namespace lumo {

/// The files that the name of a source stands for, as they were at one moment. A name that stands
/// for no file has none.
///
///     const SourceStamp before(connStrings);
///     …
///     if (!before.IsCurrent()) …  // somebody has changed or replaced a file since
class VEXG_EXPORT SourceStamp {
 public:
  SourceStamp() = default;
  /// Looks at the files now.
  explicit SourceStamp(const Array<String>& connStrings);

  /// True while every file is the same one and has neither changed its size nor its time. A file
  /// that was not there does not count.
  bool IsCurrent() const;
  /// True while every file is the same one, whatever was written to it.
  bool HasSameFiles() const;

  /// A file as it was.
  struct File {
    std::string path;                 ///< as the name has it
    URI uri;                          ///< with links resolved, see FileURI
    platform::FileIdentity identity;  ///< which file it is, its size and time
  };
  const std::vector<File>& GetFiles() const { return files_; }

 private:
  std::vector<File> files_;
};

/// Counts a source among the open ones while it lives. Held by the proxy of the source.
class VEXG_EXPORT OpenSource {
 public:
  /// @param stamp  of the files just before they were opened.
  explicit OpenSource(const SourceStamp& stamp);
  ~OpenSource();
  OpenSource(const OpenSource&) = delete;
  OpenSource& operator=(const OpenSource&) = delete;

  const SourceStamp& GetStamp() const { return stamp_; }

 private:
  const SourceStamp stamp_;
};

/// Keeps a source that is about to be made for one maker while it lives: it is not granted for a
/// source that is open, by whatever name, or claimed by somebody else.
class VEXG_EXPORT SourceClaim {
 public:
  explicit SourceClaim(const Array<String>& connStrings);
  ~SourceClaim();
  SourceClaim(const SourceClaim&) = delete;
  SourceClaim& operator=(const SourceClaim&) = delete;

  /// True when the source may be made.
  bool IsGranted() const { return granted_; }

 private:
  const SourceStamp stamp_;
  bool granted_ = false;
};

}  // namespace lumo
