#pragma once

#include <string>
#include <vector>

namespace lumo::host {

/// Moves the files of an output from the folder in which they were made to their places, in turn
/// for older ones, so that either all of them are there in the end or all of the older ones.
///
/// The older files go into a folder inside that one first, a header before the pixels that it
/// describes; then the new ones take their places, a header last. A failed move takes all of that
/// back. A note in the folder lets another process do the same for one that was killed.
class OutputMoves {
 public:
  /// @param folder  where the new files are; @param place  the folder that they go to.
  OutputMoves(std::string folder, std::string place);

  /// @param main  the output itself, among `made`.
  /// @param made  names of the new files; @param old  names that are taken in their place.
  /// @return false when a move failed; `fault` gets the reason, and all is as it was.
  bool Run(const std::string& main, const std::vector<std::string>& made,
           const std::vector<std::string>& old, std::string* fault);

  /// False when Run has failed and an older file could not be put back; it stays in the folder.
  bool IsPutBack() const;

  /// Ends what a killed process began: puts back the older files unless all new ones were in place,
  /// then removes the folder. False when something could not be put back; it stays in the folder.
  static bool Recover(const std::string& folder, const std::string& place);

 private:
  bool MoveAside(const std::vector<std::string>& old, std::string* fault);
  bool MoveIn(const std::vector<std::string>& made, std::string* fault);
  void TakeBack();
  std::string Made(const std::string& name) const { return folder_ + "/" + name; }
  std::string Aside(const std::string& name) const;
  std::string Place(const std::string& name) const { return place_ + "/" + name; }

  const std::string folder_;
  const std::string place_;
  std::vector<std::string> aside_;  // older files that were moved away
  std::vector<std::string> in_;     // new files that are in place
};

}  // namespace lumo::host
