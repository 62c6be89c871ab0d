#pragma once

#include <map>
#include <string>

namespace lumo::host {

/// The files of the page, read once at the start: no request ever reaches the file system.
///
/// Ownership: holds all of them, some 2 MB. Threads: any.
class PageFiles {
 public:
  struct File {
    std::string type;  ///< of the content, as HTTP names it
    std::string text;
  };

  /// Reads them from where the library's data lie, or from $VEXG_VIEW_PAGE. Throws HostError where
  /// they aren't.
  PageFiles();

  /// The file of a path of the address, as "/main.js", and "/" for the page itself; null for none.
  const File* Find(const std::string& path) const;

 private:
  std::map<std::string, File> files_;
};

}  // namespace lumo::host
