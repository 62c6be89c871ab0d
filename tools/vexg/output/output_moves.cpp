#include "output/output_moves.h"

#include <algorithm>
#include <cerrno>
#include <cstdio>
#include <filesystem>
#include <fstream>
#include <string_view>

#include "platform/file_moves.h"
#include "platform/random_access_file.h"
#include "platform/temporary_file.h"

namespace lumo::host {
namespace {

namespace fs = std::filesystem;

constexpr std::string_view kAside = ".old";
// The names of the new files, an empty one, and the folders and places of the other outputs of the
// verb; a zero byte, which no name holds, ends each.
constexpr std::string_view kNote = ".moves";

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

bool Move(const std::string& from, const std::string& to, std::string* fault = nullptr) {
  return platform::RenameToNew(from, to, fault, platform::MoveSync::kByCaller);
}

}  // namespace

std::string OutputMoves::Part::Aside(const std::string& name) const {
  return (fs::path(files.folder) / kAside / name).string();
}

std::string OutputMoves::Part::NotePath() const {
  return (fs::path(files.folder) / kNote).string();
}

bool OutputMoves::Part::Waits(const std::string& name) const {
  std::error_code fault;
  return fs::exists(Made(name), fault);
}

bool OutputMoves::Part::MoveAside(std::string* fault) {
  std::error_code code;
  fs::create_directory(fs::path(files.folder) / kAside, code);
  if (code) {
    *fault = code.message();
    errno = code.value();
    return false;
  }
  std::vector<std::string> backward = InOrder(files.old, files.main);
  std::reverse(backward.begin(), backward.end());
  for (const std::string& name : backward) {
    if (!Move(Place(name), Aside(name), fault)) return false;
    aside.push_back(name);
  }
  return true;
}

bool OutputMoves::Part::MoveIn(std::string* fault) {
  for (const std::string& name : InOrder(files.made, files.main)) {
    if (!Move(Made(name), Place(name), fault)) return false;
    in.push_back(name);
  }
  return true;
}

void OutputMoves::Part::TakeBack() const {
  for (auto name = in.rbegin(); name != in.rend(); ++name) Move(Place(*name), Made(*name));
  for (auto name = aside.rbegin(); name != aside.rend(); ++name) Move(Aside(*name), Place(*name));
}

bool OutputMoves::Part::IsPutBack() const {
  std::error_code fault;
  return std::none_of(aside.begin(), aside.end(),
                      [&](const std::string& name) { return fs::exists(Aside(name), fault); });
}

/// Finds out how far a killed process came.
void OutputMoves::Part::FindProgress() {
  std::error_code fault;
  for (fs::directory_iterator at(fs::path(files.folder) / kAside, fault), end; !fault && at != end;
       at.increment(fault)) {
    aside.push_back(at->path().filename().string());
  }
  aside = InOrder(aside, files.main);
  std::reverse(aside.begin(), aside.end());
  // The new ones come in only when all older ones are away.
  for (const std::string& name : InOrder(files.made, files.main)) {
    if (!Waits(name)) in.push_back(name);
  }
}

OutputMoves::OutputMoves(const std::vector<MovedFiles>& outputs, bool isDurable)
    : isDurable_(isDurable) {
  for (const MovedFiles& files : outputs) parts_.push_back({files});
}

bool OutputMoves::WriteNotes(std::string* fault) const {
  for (const Part& part : parts_) {
    std::string note;
    const auto add = [&](const std::string& text) { note.append(text).push_back('\0'); };
    for (const std::string& name : part.files.made) add(name);
    add("");
    for (const Part& other : parts_) {
      if (&other == &part) continue;
      add(other.files.folder);
      add(other.files.place);
    }
    if (!platform::WriteNewFile(part.NotePath(), note, fault)) return false;
  }
  return true;
}

bool OutputMoves::SyncPlaces(std::string* fault) const {
  return std::all_of(parts_.begin(), parts_.end(),
                     [&](const Part& part) { return platform::SyncPath(part.files.place, fault); });
}

void OutputMoves::TakeBack() const {
  const int code = errno;
  for (auto part = parts_.rbegin(); part != parts_.rend(); ++part) part->TakeBack();
  errno = code;
}

/// Lists what is left of older files and notes when all moves are done, each folder behind its
/// content.
std::vector<std::string> OutputMoves::ListRemains() const {
  std::vector<std::string> remains;
  for (const Part& part : parts_) {
    for (const std::string& name : part.files.old) remains.push_back(part.Aside(name));
    remains.push_back((fs::path(part.files.folder) / kAside).string());
    remains.push_back(part.NotePath());
    remains.push_back(part.files.folder);
  }
  return remains;
}

bool OutputMoves::Run(std::string* fault) {
  const std::vector<std::string> remains = ListRemains();
  if (!WriteNotes(fault)) return false;
  const bool isDone =
      std::all_of(parts_.begin(), parts_.end(),
                  [&](Part& part) { return part.MoveAside(fault); }) &&
      std::all_of(parts_.begin(), parts_.end(), [&](Part& part) { return part.MoveIn(fault); }) &&
      (!isDurable_ || SyncPlaces(fault));
  if (!isDone) {
    TakeBack();
    return false;
  }
  // By name: where the process has too little of anything, a folder can't be read any more.
  for (const std::string& path : remains) std::remove(path.c_str());
  return true;
}

std::vector<std::string> OutputMoves::GetStuckFolders() const {
  std::vector<std::string> folders;
  for (const Part& part : parts_) {
    if (!part.IsPutBack()) folders.push_back(part.files.folder);
  }
  return folders;
}

/// The output that a killed process was moving, by its note.
/// @param others  gets those that it was moving with it; null where nobody asks.
OutputMoves::Part OutputMoves::ReadPart(const std::string& folder, const std::string& place,
                                        std::vector<Part>* others) {
  Part part{{folder, place, "", {}, {}}};
  std::ifstream note(part.NotePath(), std::ios::binary);
  for (std::string name; std::getline(note, name, '\0') && !name.empty();) {
    part.files.made.push_back(name);
  }
  std::string folderOfOther, placeOfOther;
  while (others != nullptr && std::getline(note, folderOfOther, '\0') &&
         std::getline(note, placeOfOther, '\0')) {
    std::error_code fault;
    // It is gone where the end was near: all was in place then, or put back.
    if (platform::IsTemporaryFolderIn(folderOfOther, placeOfOther) &&
        fs::exists(folderOfOther, fault)) {
      others->push_back(ReadPart(folderOfOther, placeOfOther, nullptr));
    }
  }
  return part;
}

void OutputMoves::Recover(const std::string& folder, const std::string& place) {
  OutputMoves moves;
  std::vector<Part> others;
  moves.parts_.push_back(ReadPart(folder, place, &others));
  moves.parts_.insert(moves.parts_.end(), others.begin(), others.end());
  const bool isDone = std::none_of(moves.parts_.begin(), moves.parts_.end(), [](const Part& part) {
    return std::any_of(part.files.made.begin(), part.files.made.end(),
                       [&](const std::string& name) { return part.Waits(name); });
  });
  if (!isDone) {
    for (Part& part : moves.parts_) part.FindProgress();
    moves.TakeBack();
  }
  for (const Part& part : moves.parts_) {
    std::error_code fault;
    if (part.IsPutBack()) fs::remove_all(part.files.folder, fault);
  }
}

}  // namespace lumo::host
