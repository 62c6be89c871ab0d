#pragma once

#include <cstddef>
#include <set>
#include <string>
#include <vector>

#include "commands/division.h"
#include "plan/job_commands.h"

namespace lumo::host {

/// True for a command that changes nothing that another one sees.
/// @param id  its class name.
bool OnlyTells(const std::string& id);

/// Finds which commands of a job others need, by the variables that they give and take.
class JobSlices {
 public:
  /// @param job  outlives the object.
  explicit JobSlices(const JobCommands& job);

  /// The division that a command declares; null for one without.
  const DivisionDeclaration* DivisionAt(std::size_t at) const;
  /// True for a command that has to be done before others begin.
  bool IsFirst(std::size_t at) const;
  /// True for one of these that does its work in shares, which may run at the same time.
  bool IsFirstInShares(std::size_t at) const;
  /// The place behind the last command that has to be done before others begin; 0 without one.
  std::size_t GetFirstEnd() const { return firstEnd_; }

  /// True when a command reads a file that one before it makes, and that isn't done before, nor by
  /// every part for itself.
  bool ReadsWhatIsMade(std::size_t at) const;
  /// The commands before a place that give the variables of `command`, and those that change what
  /// these have opened; in their order. The target of a divided command is left out.
  std::vector<std::size_t> SliceOf(const JobCommand& command, std::size_t end) const;
  /// The same for variables, and for files that every part makes for itself.
  std::vector<std::size_t> SliceFor(std::set<std::string> wanted, std::set<std::string> files,
                                    std::size_t end) const;

 private:
  const JobCommand& At(std::size_t at) const { return job_.commands[at]; }
  bool ChangesGiven(std::size_t at, const std::set<std::string>& given) const;

  const JobCommands& job_;
  std::size_t firstEnd_ = 0;
};

}  // namespace lumo::host
