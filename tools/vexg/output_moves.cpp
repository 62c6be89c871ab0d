#include "output_moves.h"

#include <algorithm>
#include <cerrno>
#include <filesystem>
#include <fstream>
#include <string_view>

#include "platform/file_moves.h"
#include "platform/random_access_file.h"

namespace lumo::host {
namespace {

namespace fs = std::filesystem;

constexpr std::string_view kAside = ".old";
constexpr std::string_view kNote = ".moves";  // the names of the new files, one a line

/// The order in which new files take their places: what describes the output, the output, and last
/// a header, without which its pixels mean nothing.
int Rank(const std::string& name, const std::string& main) {
  return name.ends_with(".hdr") ? 2 : name == main ? 1 : 0;
}

std::vector<std::string> InOrder(std::vector<std::string> names, const std::string& main) {
  std::stable_sort(names.begin(), names.end(), [&](const std::string& a, const std::string& b) {
    return Rank(a, main) < Rank(b, main);
  });
  return names;
}

std::string NoteOf(const std::string& folder) {
  return (fs::path(folder) / kNote).string();
}

std::vector<std::string> ReadNote(const std::string& folder) {
  std::vector<std::string> names;
  std::ifstream note(NoteOf(folder));
  for (std::string name; std::getline(note, name);) names.push_back(name);
  return names;
}

}  // namespace

OutputMoves::OutputMoves(std::string folder, std::string place)
    : folder_(std::move(folder)), place_(std::move(place)) {}

std::string OutputMoves::Aside(const std::string& name) const {
  return (fs::path(folder_) / kAside / name).string();
}

bool OutputMoves::MoveAside(const std::vector<std::string>& old, std::string* fault) {
  std::error_code code;
  fs::create_directory(fs::path(folder_) / kAside, code);
  if (code) {
    *fault = code.message();
    errno = code.value();
    return false;
  }
  for (const std::string& name : old) {
    if (!platform::RenameToNew(Place(name), Aside(name), fault)) return false;
    aside_.push_back(name);
  }
  return true;
}

bool OutputMoves::MoveIn(const std::vector<std::string>& made, std::string* fault) {
  for (const std::string& name : made) {
    if (!platform::RenameToNew(Made(name), Place(name), fault)) return false;
    in_.push_back(name);
  }
  return true;
}

void OutputMoves::TakeBack() {
  const int code = errno;
  for (auto name = in_.rbegin(); name != in_.rend(); ++name) {
    platform::RenameToNew(Place(*name), Made(*name));
  }
  for (auto name = aside_.rbegin(); name != aside_.rend(); ++name) {
    platform::RenameToNew(Aside(*name), Place(*name));
  }
  errno = code;
}

bool OutputMoves::Run(const std::string& main, const std::vector<std::string>& made,
                      const std::vector<std::string>& old, std::string* fault) {
  std::string note;
  for (const std::string& name : made) note.append(name).append("\n");
  const std::vector<std::string> forward = InOrder(made, main);
  std::vector<std::string> backward = InOrder(old, main);
  std::reverse(backward.begin(), backward.end());
  if (!platform::WriteNewFile(NoteOf(folder_), note, fault)) return false;
  if (MoveAside(backward, fault) && MoveIn(forward, fault)) return true;
  TakeBack();
  return false;
}

bool OutputMoves::IsPutBack() const {
  std::error_code fault;
  return std::none_of(aside_.begin(), aside_.end(),
                      [&](const std::string& name) { return fs::exists(Aside(name), fault); });
}

bool OutputMoves::Recover(const std::string& folder, const std::string& place) {
  OutputMoves moves(folder, place);
  std::error_code fault;
  const std::vector<std::string> made = ReadNote(folder);
  const auto waits = [&](const std::string& name) { return fs::exists(moves.Made(name), fault); };
  const bool isDone = std::none_of(made.begin(), made.end(), waits);
  for (fs::directory_iterator at(fs::path(folder) / kAside, fault), end;
       !isDone && !fault && at != end; at.increment(fault)) {
    moves.aside_.push_back(at->path().filename().string());
  }
  if (!isDone) {
    for (const std::string& name : made) {
      // The new ones come in only when all older ones are away.
      if (!waits(name)) moves.in_.push_back(name);
    }
    moves.TakeBack();
  }
  const bool isPutBack = moves.IsPutBack();
  if (isPutBack) fs::remove_all(folder, fault);
  return isPutBack;
}

}  // namespace lumo::host
