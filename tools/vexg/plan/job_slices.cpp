#include "plan/job_slices.h"

#include <algorithm>
#include <initializer_list>

namespace lumo::host {

namespace {

/// True for a command that every part does for itself.
bool IsForEach(const JobCommand& command) {
  const DivisionDeclaration* const division = FindDivision(String(command.id));
  return division != nullptr && division->kind == DivisionKind::kEach;
}

/// Adds what may be names of files in the inputs of a command.
void AddPieces(const JobCommand& command, std::set<std::string>& pieces) {
  for (const JobInput& input : command.inputs) {
    for (const std::string& piece : PiecesOf(input.value)) pieces.insert(piece);
  }
}

}  // namespace

bool OnlyTells(const std::string& id) {
  const std::initializer_list<const char*> kBeginnings{"Get",   "Query", "ExtendedQuery",
                                                       "Check", "Fit",   "Compare"};
  return id == "CloseRasterCommand" ||
         std::any_of(kBeginnings.begin(), kBeginnings.end(),
                     [&](const char* beginning) { return id.starts_with(beginning); });
}

JobSlices::JobSlices(const JobCommands& job) : job_(job) {
  for (std::size_t at = 0; at < job_.commands.size(); ++at) {
    if (IsFirst(at)) firstEnd_ = at + 1;
  }
}

const DivisionDeclaration* JobSlices::DivisionAt(std::size_t at) const {
  return FindDivision(String(At(at).id));
}

bool JobSlices::IsFirst(std::size_t at) const {
  const DivisionDeclaration* const division = DivisionAt(at);
  return division != nullptr && division->kind == DivisionKind::kFirst;
}

bool JobSlices::IsFirstInShares(std::size_t at) const {
  return IsFirst(at) && *DivisionAt(at)->source != '\0';
}

bool JobSlices::ReadsWhatIsMade(std::size_t at) const {
  if (at < firstEnd_) return false;  // that is done before
  std::vector<JobCommand> before(job_.commands.begin() + static_cast<std::ptrdiff_t>(firstEnd_),
                                 job_.commands.begin() + static_cast<std::ptrdiff_t>(at));
  std::erase_if(before, [](const JobCommand& command) { return IsForEach(command); });
  const JobFiles files = FindFiles(before);
  const std::set<std::string> made(files.made.begin(), files.made.end());
  for (const JobInput& input : At(at).inputs) {
    for (const std::string& piece : PiecesOf(input.value)) {
      if (made.contains(piece)) return true;
    }
  }
  return false;
}

std::vector<std::size_t> JobSlices::SliceOf(const JobCommand& command, std::size_t end) const {
  std::set<std::string> wanted;
  for (const JobInput& input : command.inputs) {
    for (const std::string& variable : VariablesOf(input)) wanted.insert(variable);
  }
  const DivisionDeclaration* const division = FindDivision(String(command.id));
  const bool isDivided = division != nullptr && (division->kind == DivisionKind::kRows ||
                                                 division->kind == DivisionKind::kShares);
  if (isDivided) {
    const std::string* const target = command.Find(division->target);
    if (target != nullptr) wanted.erase(*target);
  }
  std::set<std::string> files;
  AddPieces(command, files);
  return SliceFor(std::move(wanted), std::move(files), end);
}

std::vector<std::size_t> JobSlices::SliceFor(std::set<std::string> wanted,
                                             std::set<std::string> files, std::size_t end) const {
  std::set<std::size_t> taken;
  std::set<std::string> given;
  for (std::size_t at = end; at-- > 0;) {
    const bool gives =
        std::any_of(At(at).outputs.begin(), At(at).outputs.end(),
                    [&](const JobOutput& output) { return wanted.contains(output.variable); });
    const std::vector<std::string> made =
        IsForEach(At(at)) ? FindFiles({At(at)}).made : std::vector<std::string>();
    const bool makes = std::any_of(made.begin(), made.end(),
                                   [&](const std::string& file) { return files.contains(file); });
    if (!gives && !makes) continue;
    taken.insert(at);
    AddPieces(At(at), files);
    for (const JobOutput& output : At(at).outputs) given.insert(output.variable);
    for (const JobInput& input : At(at).inputs) {
      for (const std::string& variable : VariablesOf(input)) wanted.insert(variable);
    }
  }
  for (std::size_t at = 0; at < end; ++at) {
    if (ChangesGiven(at, given)) taken.insert(at);
  }
  return {taken.begin(), taken.end()};
}

bool JobSlices::ChangesGiven(std::size_t at, const std::set<std::string>& given) const {
  if (OnlyTells(At(at).id) || DivisionAt(at) != nullptr || !At(at).outputs.empty()) return false;
  bool uses = false;
  for (const JobInput& input : At(at).inputs) {
    for (const std::string& variable : VariablesOf(input)) {
      if (!given.contains(variable)) return false;
      uses = true;
    }
  }
  return uses;
}

}  // namespace lumo::host
