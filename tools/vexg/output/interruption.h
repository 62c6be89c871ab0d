#pragma once

#include <condition_variable>
#include <functional>
#include <mutex>
#include <set>
#include <string>
#include <vector>

#include "platform/file_identity.h"
#include "platform/interrupt.h"

namespace lumo::host {

/// Ends a verb soon, and truthfully, when the user or the system asks for it (SIGINT, SIGTERM).
///
/// The request raises the abort flags of what runs. Work that looks at them ends by itself, the
/// usual way. Where a library is busy with something that looks at no flag, as the packing of a
/// picture, the process ends around it after 60 ms, and everything that it has begun is removed
/// before. The line that the user reads depends on which of the watched files have changed.
///
/// Threads: any thread may call.
class Interruption {
 public:
  /// @param abort  raises the flags; called on a thread of its own.
  explicit Interruption(std::function<void()> abort);
  /// From here on the process does not end by an interrupt of this one.
  ~Interruption();
  Interruption(const Interruption&) = delete;
  Interruption& operator=(const Interruption&) = delete;

  /// Adds a file that the verb may make or change.
  /// @param shown  what the user calls it.
  void Watch(const std::string& path, const std::string& shown);

  /// Adds a folder that goes away with the process, until DropRemains.
  void AddRemains(const std::string& folder);
  void DropRemains(const std::string& folder);
  /// Adds a file whose temporary files (temporary_file.h) go away with the process.
  void AddTemporariesOf(const std::string& path);

  /// Says that all is done, so that an interrupt comes too late to fail the verb.
  void SetDone();
  bool IsDone() const;

  /// Says that the program ends with this object, so that an interrupt after it finds nothing to
  /// do.
  void SetLast();

  /// The line that says how the verb ended.
  /// @param how  it was ended.
  std::string Describe(const char* how = "interrupted") const;

  /// Keeps the process from being ended while one lives: in the moves of files, and in changes in
  /// place, which are short and are not to be cut in the middle.
  class Hold {
   public:
    explicit Hold(Interruption& interruption) : lock_(interruption.held_) {}

   private:
    const std::lock_guard<std::recursive_mutex> lock_;
  };

 private:
  struct Place {
    std::string path;
    std::string shown;
    platform::FileIdentity before;
  };

  void OnInterrupt();
  [[noreturn]] void EndNow();

  const std::function<void()> abort_;
  mutable std::mutex mutex_;  // of what follows
  std::vector<Place> places_;
  std::set<std::string> remains_;
  std::vector<std::string> temporaries_;
  bool isDone_ = false;
  bool isLast_ = false;
  bool isOver_ = false;
  std::condition_variable wake_;
  std::recursive_mutex held_;  // taken before mutex_
  platform::InterruptWatch watch_;
};

}  // namespace lumo::host
