#pragma once

#include <string>
#include <vector>

namespace lumo::host {

/// The files of one output, on their way from the folder in which they were made.
struct MovedFiles {
  std::string folder;             ///< where the new files are
  std::string place;              ///< the folder that they go to
  std::string main;               ///< name of the output itself, among `made`
  std::vector<std::string> made;  ///< names of the new files
  std::vector<std::string> old;   ///< names that are taken in their place
};

/// Moves the files of the outputs of a verb from the folders in which they were made to their
/// places, in turn for older ones, so that either all of them are there in the end or all of the
/// older ones.
///
/// The older files go into a folder inside that of the new ones first, a header before the pixels
/// that it describes; then the new ones take their places, a header last. A failed move takes all
/// of that back. A note in each folder lets another process do the same for one that was killed.
class OutputMoves {
 public:
  /// @param isDurable  the moves are on the disk when Run returns. The content of the new files is
  ///                   the caller's.
  OutputMoves(const std::vector<MovedFiles>& outputs, bool isDurable);

  /// Removes the older files, and the folders, when all new ones are in place.
  /// @return false when a move failed; `fault` gets the reason, and all is as it was.
  bool Run(std::string* fault);

  /// The folders in which an older file stays that a failed Run could not put back.
  std::vector<std::string> GetStuckFolders() const;

  /// Ends what a killed process began in this folder, and in those of the same verb: puts back the
  /// older files unless all new ones were in place, then removes the folders. A folder with a file
  /// that could not be put back stays.
  static void Recover(const std::string& folder, const std::string& place);

 private:
  /// How far one output has come.
  struct Part {
    MovedFiles files;
    std::vector<std::string> aside{};  // older files that were moved away
    std::vector<std::string> in{};     // new files that are in place

    std::string Made(const std::string& name) const { return files.folder + "/" + name; }
    std::string Aside(const std::string& name) const;
    std::string Place(const std::string& name) const { return files.place + "/" + name; }
    std::string NotePath() const;
    bool Waits(const std::string& name) const;

    bool MoveAside(std::string* fault);
    bool MoveIn(std::string* fault);
    void TakeBack() const;
    bool IsPutBack() const;
    void FindProgress();
  };

  OutputMoves() = default;
  bool WriteNotes(std::string* fault) const;
  bool SyncPlaces(std::string* fault) const;
  std::vector<std::string> ListRemains() const;
  void TakeBack() const;
  static Part ReadPart(const std::string& folder, const std::string& place,
                       std::vector<Part>* others);

  std::vector<Part> parts_;
  bool isDurable_ = false;
};

}  // namespace lumo::host
