#pragma once

#include "commands/share_file.h"

namespace lumo {

/// The inputs of WithShareInputs, as a command has them.
struct ShareInputs {
  bool hasShare = false;
  Array<unsigned> share{};
  String file{};
  Array<String> files{};  ///< none: the work isn't taken out of files
};

/// Has the sums over a raster that this thread asks for be those of a share of the raster, or be
/// joined out of the files of all shares, as long as it lives. The operations of a raster have no
/// room for this wish, so it goes beside the call.
///
///     ShareScope shares;
///     if (!shares.Begin(inputs, key)) return Fail();
///     Compute(*raster);  // asks for shares, and gives its sums to them or takes them from there
///     if (!shares.End()) return Fail();
///
/// Sums are given, and taken, in the order in which they are computed.
class VEXG_EXPORT ShareScope {
 public:
  ShareScope() = default;
  ~ShareScope();
  ShareScope(const ShareScope&) = delete;
  ShareScope& operator=(const ShareScope&) = delete;

  /// Begins, where the inputs ask for it.
  /// @param key  says of what command, raster and inputs the shares are.
  /// @return false, with the fault set, for inputs that don't fit.
  bool Begin(const ShareInputs& inputs, const std::string& key);
  /// Writes the file of the share; of joined ones, looks whether all was taken.
  bool End();

  bool IsShare() const { return isShare_; }  ///< a share is done, and nothing else
  bool Joins() const { return !readers_.empty(); }
  const Share& GetShare() const { return share_; }
  ShareWriter& Out() { return out_; }
  /// Has the file of the share written as its numbers are put; comes before any is.
  /// @return false, with the fault set, when it can't be made.
  bool StreamOut() { return out_.StreamTo(file_.ToUTF8()); }
  /// How many files of shares there are, where Joins().
  unsigned Count() const { return static_cast<unsigned>(readers_.size()); }
  /// The file of a share, from where it was left; it is read when it is first asked for, and given
  /// up when it is at its end. Null, with the fault set, when it can't be read.
  ShareReader* In(unsigned share);

  /// The one that lives on this thread and has begun; null for none.
  static ShareScope* Current();

 private:
  void Enter();

  /// A file, before it is read, on the way, and behind.
  struct Input {
    bool isOpen = false;
    ShareReader reader{};
  };

  bool isShare_ = false;
  bool hasEntered_ = false;
  ShareScope* before_ = nullptr;
  Share share_;
  std::string key_;
  String file_;
  Array<String> files_;
  ShareWriter out_;
  std::vector<Input> readers_;
};

}  // namespace lumo
