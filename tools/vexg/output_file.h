#pragma once

#include <cstdint>
#include <filesystem>
#include <fstream>
#include <string>
#include <vector>

namespace lumo::host {

/// A file that a verb makes, which appears under its name when it is whole or not at all.
///
/// It is made in a folder of its own beside the place where it shall be, under its own name, so
/// that a format may put further files beside it. Commit moves them all, and puts back what it had
/// moved when a move fails. Without Commit they go away. What a killed run left of an output of
/// this name is taken away, or put back, by the next one.
class OutputFile {
 public:
  /// Throws HostError when there is a file already, or one that would go with it, and `overwrite`
  /// is false, when the output would be one of the inputs, by whatever name or link, or where
  /// nothing can be made.
  OutputFile(const std::string& file, bool overwrite, const std::vector<std::string>& inputs);
  ~OutputFile();
  OutputFile(const OutputFile&) = delete;
  OutputFile& operator=(const OutputFile&) = delete;

  /// Has Commit return only when the files are on the disk, to outlast a power cut.
  void MakeDurable() { isDurable_ = true; }

  /// Throws HostError when the output would be `input`, or a file that goes with it. The
  /// constructor asks this of the inputs that it gets; what a raster's source turns out to be comes
  /// later.
  void RefuseInput(const std::string& input);

  /// Makes the folder. Throws HostError when the disk has less room than `bytes`.
  void Begin(std::uint64_t bytes);

  /// Where the file is to be made, from Begin on.
  std::string GetWorkName() const { return (folder_ / target_.filename()).string(); }
  /// Where it will be.
  std::string GetName() const { return target_.string(); }
  /// What the user calls it.
  const std::string& GetShownName() const { return shown_; }

  /// A message in which the working name stands, with the name of the user in its place.
  std::string InUsersWords(std::string message) const;

  /// Gives the file, and what was made beside it, their names, in place of the older file and of
  /// what lies beside that. Throws HostError when the file isn't there, when a file beside it would
  /// take the place of one that isn't its own, or when a move fails; nothing has changed then.
  void Commit();

 private:
  std::vector<std::string> NamesMade() const;
  std::vector<std::string> NamesInPlace(const std::vector<std::string>& made) const;
  void CheckPlace(const std::string& name) const;
  void MoveAll(const std::vector<std::string>& made, const std::vector<std::string>& old);
  void SyncMade(const std::vector<std::string>& made) const;
  [[noreturn]] void Refuse(const std::string& why) const;
  [[noreturn]] void FailMove(const std::string& why) const;

  const std::string shown_;
  const std::filesystem::path target_;  // absolute
  const bool overwrite_;
  bool isDurable_ = false;
  std::vector<std::string> inputs_;
  std::filesystem::path folder_;  // empty before Begin
};

/// Writes bytes to a file; a failure throws a HostError that names the file as the user knows it.
class FileWriter {
 public:
  explicit FileWriter(const OutputFile& output);

  void Write(const void* data, std::size_t bytes);
  void WriteAt(std::uint64_t offset, const void* data, std::size_t bytes);
  void Close();

 private:
  void Check() const;

  const std::string shown_;
  std::ofstream stream_;
};

}  // namespace lumo::host
