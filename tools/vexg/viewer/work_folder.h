#pragma once

#include <atomic>
#include <string>

namespace lumo::host {

/// A folder for files that go away with the viewer, which nobody but the user can look into.
class WorkFolder {
 public:
  /// Throws HostError where none can be made.
  WorkFolder();
  ~WorkFolder();
  WorkFolder(const WorkFolder&) = delete;
  WorkFolder& operator=(const WorkFolder&) = delete;

  /// Removes it, for a process that is about to end.
  void Remove();
  /// A path in there that was not given before. Any thread.
  /// @param ending  with its dot.
  std::string NewPath(const std::string& ending);

 private:
  std::string path_;
  std::atomic<unsigned> next_{0};
};

}  // namespace lumo::host
