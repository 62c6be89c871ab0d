#pragma once

#include <string>
#include <vector>

#include "platform/export.h"

namespace lumo::platform {

/// Puts several new files in the places of older ones, so that either all of them are there in the
/// end or all of the older ones. Until Keep is called, whatever ends the swap takes it back.
///
/// Failure: false, and one line in `fault`, where that isn't null: "path: what"; errno holds the
/// system's number. The next thing to do is to let the swap go.
///
///     FileSwap swap;
///     if (!swap.MoveIn(newPixels, pixels, &fault)) return false;
///     if (!swap.MoveIn(newHeader, header, &fault)) return false;  // the old pixels are back
///     swap.Keep();
class VEXG_EXPORT FileSwap {
 public:
  FileSwap() = default;
  ~FileSwap() { TakeBack(); }
  FileSwap(const FileSwap&) = delete;
  FileSwap& operator=(const FileSwap&) = delete;

  /// Moves the file at `path` out of the way; true as well where there is none.
  bool MoveAside(const std::string& path, std::string* fault = nullptr);

  /// Gives the file `from` the path `to`. A file that stands there is there up to that moment, on
  /// file systems that can let two files change places.
  bool MoveIn(const std::string& from, const std::string& to, std::string* fault = nullptr);

  /// Ends the swap: removes the older files.
  void Keep();

 private:
  enum class Kind { kMoved, kExchanged };
  struct Step {
    Kind kind;
    std::string from, to;
    bool isOlder;  // what now lies at `to`, or for an exchange at `from`, is to go in the end
  };

  void TakeBack();

  std::vector<Step> steps_;
};

}  // namespace lumo::platform
