#pragma once

#include <string>
#include <vector>

#include "commands/share_file.h"
#include "commands/share_scope.h"

namespace lumo {

/// Does the work on the scenes of a mosaic, one after the other, in shares of them where that is
/// asked for. The results for a scene are put behind its number.
///
///     SceneShares shares;
///     if (!shares.Begin(inputs, key, scenes)) return Fail();
///     for (unsigned i = 0; i < scenes; ++i) {
///       if (!shares.IsWanted(i)) continue;
///       ShareReader* in = nullptr;
///       if (!shares.Find(i, in)) return Fail();
///       if (in != nullptr) Take(*in); else Work(i);  // and put it to shares.Out(i), of a share
///     }
///     if (!shares.End()) return Fail();
///
/// Failure: false, with the fault set, for inputs that don't fit and files that can't be read.
class VEXG_EXPORT SceneShares {
 public:
  /// @param key  says of what command, mosaic and inputs the shares are.
  bool Begin(const ShareInputs& inputs, const std::string& key, unsigned scenes);

  /// True where a share is done, and nothing else.
  bool IsShare() const { return isShare_; }
  /// True where the work of shares is taken.
  bool Joins() const { return !files_.empty(); }
  /// False for a scene of other shares.
  bool IsWanted(unsigned scene) const {
    return !isShare_ || (share_.Begin(scenes_) <= scene && scene < share_.End(scenes_));
  }
  /// The file of the share, beside which it may lay others for a while.
  const std::string& GetFile() const { return file_; }
  /// Takes the work on a scene; scenes come in their order.
  ShareWriter& Out(unsigned scene) {
    out_.Put(scene);
    return out_;
  }
  /// Finds the work on a scene that was done in a share.
  /// @param in  [out] null where there is none.
  bool Find(unsigned scene, ShareReader*& in);
  /// Writes the file of a share.
  bool End() { return !isShare_ || out_.Write(file_, key_, share_); }

 private:
  bool isShare_ = false;
  unsigned scenes_ = 0;
  Share share_{};
  std::string key_, file_;
  std::vector<std::string> files_;
  ShareWriter out_;
  std::size_t opened_ = 0;  // files
  ShareReader in_;          // of the last one that was opened
  bool hasNumber_ = false;
  unsigned number_ = 0;  // of the scene that comes next in it
};

}  // namespace lumo
