#pragma once

#include <cstdint>
#include <filesystem>
#include <functional>
#include <memory>
#include <string>
#include <vector>

#include "output/interruption.h"
#include "output/output_moves.h"
#include "platform/random_access_file.h"

namespace lumo::host {

/// How the outputs of a verb come into their places.
struct OutputRules {
  bool overwrite = false;  ///< older files may be replaced
  bool isDurable = false;  ///< the new ones outlast a power cut from Commit on
  bool hasSides = true;    ///< files of certain endings belong to it, and go with an older one
};

/// A file that a verb makes, which appears under its name when it is whole or not at all.
///
/// It is made in a folder of its own beside the place where it shall be, under its own name, so
/// that a format may put further files beside it. Outputs moves them all. What a killed run left of
/// an output of this name is taken away, or put back, by the next one.
class OutputFile {
 public:
  /// Throws HostError where nothing can be made.
  OutputFile(const std::string& file, const OutputRules& rules);
  ~OutputFile();
  OutputFile(const OutputFile&) = delete;
  OutputFile& operator=(const OutputFile&) = delete;

  /// Throws HostError when the output, or a file that goes with it, would be `input`, or a file
  /// that goes with that, by whatever name or link.
  void RefuseInput(const std::string& input);

  /// Throws HostError when there is a file already, or one that would go with it, that is not this
  /// output's to replace.
  void CheckPlaces() const;

  /// Makes the folder. Throws HostError when the disk has less room than `bytes`; 0 for a size that
  /// is not known in advance.
  void Begin(std::uint64_t bytes);

  /// Where the file is to be made, from Begin on.
  std::string GetWorkName() const { return (folder_ / target_.filename()).string(); }
  /// The folder that Begin made.
  std::string GetFolder() const { return folder_.string(); }
  /// Where it will be.
  std::string GetName() const { return target_.string(); }
  /// The name that the user gave it.
  const std::string& GetShownName() const { return shown_; }

  /// A message in which the working name stands, with the name of the user in its place.
  std::string InUsersWords(std::string message) const;

  /// The files that were made, for their move. Throws HostError when the file isn't there, or when
  /// one of them would take the place of a file that is not the output's to replace.
  MovedFiles Collect() const;

  /// Gives a file that was made alone its place, in one step, where that is as good as all the
  /// moves of OutputMoves. False where it isn't. Throws HostError when it fails.
  bool MoveAtOnce(const MovedFiles& files) const;

  /// Leaves the folder behind, with older files that could not be put back.
  void KeepFolder() { folder_.clear(); }

  [[noreturn]] void FailMove(const std::string& why) const;

 private:
  std::vector<std::string> SideNames() const;
  std::vector<std::string> NamesMade() const;
  std::vector<std::string> NamesInPlace(const std::vector<std::string>& made) const;
  void CheckPlace(const std::string& name) const;
  [[noreturn]] void Refuse(const std::string& why) const;

  const std::string shown_;
  const std::filesystem::path target_;  // absolute
  const OutputRules rules_;
  std::vector<std::string> inputs_;
  std::filesystem::path folder_;  // empty before Begin
};

/// All outputs of a verb, which come into their places together or not at all.
class Outputs {
 public:
  /// @param inputs  files that no output may be, nor what goes with them.
  Outputs(Interruption& interruption, const OutputRules& rules, std::vector<std::string> inputs);

  /// Adds an output. Throws HostError where it can't be made, would be an input or another output,
  /// or would replace what may not be replaced.
  void Add(const std::string& file);
  OutputFile& Get(std::size_t output) const { return *files_[output]; }

  /// OutputFile::RefuseInput, of each.
  void RefuseInput(const std::string& input);

  /// Makes the folders. Throws HostError when a disk has less room than its outputs take.
  /// @param bytes  of each output.
  void Begin(const std::vector<std::uint64_t>& bytes);

  /// OutputFile::InUsersWords, of each.
  std::string InUsersWords(std::string message) const;

  /// Gives all files, and what was made beside them, their names, in place of the older files and
  /// of what lies beside those. Throws HostError when that fails; nothing has changed then.
  /// @param onTheWay  runs right before the moves, when nothing else can fail; may throw.
  void Commit(const std::function<void()>& onTheWay);

 private:
  void MoveAll(const std::vector<MovedFiles>& moved);

  Interruption& interruption_;
  const OutputRules rules_;
  const std::vector<std::string> inputs_;
  std::vector<std::unique_ptr<OutputFile>> files_;
};

/// Writes bytes to a file; a failure throws a HostError that names the file as the user knows it.
class FileWriter {
 public:
  explicit FileWriter(const OutputFile& output);

  /// Writes behind what was written last.
  void Write(const void* data, std::size_t bytes);
  void WriteAt(std::uint64_t offset, const void* data, std::size_t bytes);
  void Close();

 private:
  void Check(bool isDone) const;

  const std::string shown_;
  std::uint64_t end_ = 0;  // of what was written last
  std::unique_ptr<platform::RandomAccessFile> file_;
};

}  // namespace lumo::host
