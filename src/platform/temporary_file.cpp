#include "platform/temporary_file.h"

#include <atomic>
#include <cerrno>
#include <charconv>
#include <csignal>
#include <cstdint>
#include <filesystem>
#include <fstream>
#include <iterator>
#include <optional>
#include <string_view>
#include <unistd.h>

namespace lumo::platform {
namespace {

namespace fs = std::filesystem;

constexpr std::string_view kFileEnding = ".tmp";
constexpr std::string_view kFolderEnding = ".part";
constexpr std::size_t kMaxNameBytes = 255;

std::string FirstLine(const char* file) {
  std::ifstream stream(file);
  std::string line;
  std::getline(stream, line);
  return line;
}

/// A short text in place of a long one (FNV-1a, 32 bits).
std::string Digest(std::string_view text) {
  std::uint32_t hash = 2166136261U;
  for (const char letter : text) {
    hash ^= static_cast<unsigned char>(letter);
    hash *= 16777619U;
  }
  char digits[8];
  const auto end = std::to_chars(std::begin(digits), std::end(digits), hash, 16).ptr;
  return std::string(std::begin(digits), end);
}

/// When a process began, in the system's ticks since it was started; none when there is no such.
std::optional<std::string> StartOf(const std::string& process) {
  const std::string line = FirstLine(("/proc/" + process + "/stat").c_str());
  // The name of the program, in parentheses, may hold blanks; the start is 20 fields behind it.
  std::size_t at = line.rfind(')');
  if (at == std::string::npos) return std::nullopt;
  constexpr int kFields = 20;
  for (int field = 0; field < kFields && at != std::string::npos; ++field) {
    at = line.find(' ', at + 1);
  }
  if (at == std::string::npos) return std::nullopt;
  return line.substr(at + 1, line.find(' ', at + 1) - at - 1);
}

/// One process of one run of one machine, as names hold it: "machine-run-process-start".
struct Owner {
  std::string machine, run, process, start;

  static Owner Self() {
    const std::string process = std::to_string(getpid());
    return {Digest(FirstLine("/etc/machine-id")),
            Digest(FirstLine("/proc/sys/kernel/random/boot_id")), process,
            StartOf(process).value_or("0")};
  }

  static std::optional<Owner> Parse(std::string_view text) {
    Owner owner;
    for (std::string* const part : {&owner.machine, &owner.run, &owner.process, &owner.start}) {
      const std::size_t dash = text.find('-');
      *part = text.substr(0, dash);
      if (part->empty() || part->find_first_not_of("0123456789abcdef") != part->npos) return {};
      text.remove_prefix(dash == text.npos ? text.size() : dash + 1);
    }
    return owner;
  }

  std::string Text() const { return machine + "-" + run + "-" + process + "-" + start; }

  bool IsSelf() const { return Text() == Self().Text(); }

  /// True when the process ran on this machine and runs no more.
  bool HasEnded() const {
    const Owner self = Self();
    if (machine != self.machine) return false;
    return run != self.run || StartOf(process) != start;
  }
};

/// "beginning.owner-number.ending", no longer than names may be.
std::string TemporaryName(const std::string& beginning, std::string_view ending) {
  static std::atomic<unsigned> count{0};
  std::string rest(".");
  rest += Owner::Self().Text() + "-" + std::to_string(count++);
  rest += ending;
  return beginning.substr(0, kMaxNameBytes - rest.size()) + rest;
}

/// The entries beside `path` that TemporaryName named in processes that `isMeant`; they may have a
/// further ending.
std::vector<std::string> FindNamed(const std::string& path, const std::string& beginning,
                                   std::string_view ending, bool (Owner::*isMeant)() const) {
  std::vector<std::string> found;
  const fs::path folder = fs::path(path).parent_path();
  std::error_code fault;
  for (fs::directory_iterator at(folder.empty() ? "." : folder, fault), end; !fault && at != end;
       at.increment(fault)) {
    const std::string name = at->path().filename().string();
    const std::size_t start = beginning.size() + 1;
    if (!name.starts_with(beginning + ".") || name.find(ending, start) == name.npos) continue;
    const std::string_view middle =
        std::string_view(name).substr(start, name.find(ending, start) - start);
    const auto owner = Owner::Parse(middle);
    if (owner && ((*owner).*isMeant)()) found.push_back(at->path().string());
  }
  return found;
}

std::string NameOf(const std::string& path) {
  return fs::path(path).filename().string();
}

void RemoveNamed(const std::string& path, bool (Owner::*isMeant)() const) {
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
  return (fs::path(path).parent_path() / TemporaryName(HiddenNameOf(path), kFolderEnding)).string();
}

bool IsTemporaryFolderIn(const std::string& folder, const std::string& place) {
  const std::string name = NameOf(folder);
  return fs::path(folder).parent_path() == fs::path(place) && name.starts_with('.') &&
         name.ends_with(kFolderEnding);
}

void RemoveAbandonedFiles(const std::string& path) {
  RemoveNamed(path, &Owner::HasEnded);
}

void RemoveOwnFiles(const std::string& path) {
  RemoveNamed(path, &Owner::IsSelf);
}

std::vector<std::string> FindAbandonedFolders(const std::string& path) {
  return FindNamed(path, HiddenNameOf(path), kFolderEnding, &Owner::HasEnded);
}

}  // namespace lumo::platform
