#include "platform/temporary_file.h"

#include <filesystem>
#include <string_view>

#include "platform/owned_name.h"
#include "platform/unfinished_folders.h"

namespace lumo::platform {
namespace {

namespace fs = std::filesystem;

constexpr std::string_view kFileEnding = ".tmp";
constexpr std::string_view kFolderEnding = ".part";
constexpr std::size_t kMaxNameBytes = 255;

/// "beginning.owner-number.ending", no longer than names may be.
std::string TemporaryName(const std::string& beginning, std::string_view ending) {
  std::string rest = OwnedName("");
  rest += ending;
  return beginning.substr(0, kMaxNameBytes - rest.size()) + rest;
}

/// The entries beside `path` that TemporaryName named in processes whose mark `isMeant`; they may
/// have a further ending.
std::vector<std::string> FindNamed(const std::string& path, const std::string& beginning,
                                   std::string_view ending, bool (*isMeant)(std::string_view)) {
  std::vector<std::string> found;
  const fs::path folder = fs::path(path).parent_path();
  std::error_code fault;
  for (fs::directory_iterator at(folder.empty() ? "." : folder, fault), end; !fault && at != end;
       at.increment(fault)) {
    const std::string name = at->path().filename().string();
    const std::size_t start = beginning.size() + 1;
    if (!name.starts_with(beginning + ".") || name.find(ending, start) == name.npos) continue;
    if (isMeant(name.substr(beginning.size()))) found.push_back(at->path().string());
  }
  return found;
}

/// Takes the mark and ending of a file's name away, which stand at `at`, and what stands behind
/// them where it only repeats the ending of the name.
void RemoveFileMark(std::string& text, std::size_t at, std::size_t length) {
  text.erase(at, length);
  const std::size_t dot = text.find_last_of("./", at == 0 ? 0 : at - 1);
  if (at == 0 || dot == text.npos || text[dot] != '.') return;
  const std::string ending = text.substr(dot, at - dot);
  if (text.compare(at, ending.size(), ending) == 0) text.erase(at, ending.size());
}

/// Takes a hidden folder out of a path: its name ends at `end`.
std::size_t RemoveFolder(std::string& text, std::size_t at, std::size_t end) {
  const std::size_t slash = text.rfind('/', at);
  const std::size_t start = slash == text.npos ? 0 : slash;
  if (slash == text.npos && end < text.size() && text[end] == '/') ++end;
  text.erase(start, end - start);
  return start;
}

std::string NameOf(const std::string& path) {
  return fs::path(path).filename().string();
}

void RemoveNamed(const std::string& path, bool (*isMeant)(std::string_view)) {
  std::error_code ignored;
  for (const std::string& file : FindNamed(path, NameOf(path), kFileEnding, isMeant)) {
    fs::remove(file, ignored);
  }
}

std::string HiddenNameOf(const std::string& path) {
  return std::string(".").append(NameOf(path));
}

}  // namespace

std::string TemporaryPathBeside(const std::string& path) {
  return (fs::path(path).parent_path() / TemporaryName(NameOf(path), kFileEnding)).string();
}

std::string TemporaryFolderBeside(const std::string& path) {
  std::string made =
      (fs::path(path).parent_path() / TemporaryName(HiddenNameOf(path), kFolderEnding)).string();
  KeepUnfinishedFolder(made);
  return made;
}

std::string WithoutTemporaryNames(std::string text) {
  for (std::size_t at = text.find('.'); at < text.size(); at = text.find('.', at)) {
    const std::size_t mark = OwnerMarkLength(std::string_view(text).substr(at));
    const std::size_t end = at + mark;
    if (mark != 0 && text.compare(end, kFileEnding.size(), kFileEnding) == 0) {
      RemoveFileMark(text, at, mark + kFileEnding.size());
    } else if (mark != 0 && text.compare(end, kFolderEnding.size(), kFolderEnding) == 0) {
      at = RemoveFolder(text, at, end + kFolderEnding.size());
    } else {
      ++at;
    }
  }
  return text;
}

bool IsTemporaryFolderIn(const std::string& folder, const std::string& place) {
  const std::string name = NameOf(folder);
  return fs::path(folder).parent_path() == fs::path(place) && name.starts_with('.') &&
         name.ends_with(kFolderEnding);
}

void RemoveAbandonedFiles(const std::string& path) {
  RemoveNamed(path, IsAbandoned);
}

void RemoveOwnFiles(const std::string& path) {
  RemoveNamed(path, IsOwned);
}

std::vector<std::string> FindAbandonedFolders(const std::string& path) {
  return FindNamed(path, HiddenNameOf(path), kFolderEnding, IsAbandoned);
}

}  // namespace lumo::platform
