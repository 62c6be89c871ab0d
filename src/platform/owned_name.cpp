#include "platform/owned_name.h"

#include <algorithm>
#include <atomic>
#include <charconv>
#include <cstdint>
#include <fstream>
#include <iterator>
#include <optional>
#include <unistd.h>

namespace lumo::platform {
namespace {

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

/// When a process began, in the system's ticks since it was started; none when there is no such, or
/// when it has ended and only waits for its parent to notice.
std::optional<std::string> StartOf(const std::string& process) {
  const std::string line = FirstLine(("/proc/" + process + "/stat").c_str());
  // The name of the program, in parentheses, may hold blanks; the start is 20 fields behind it.
  std::size_t at = line.rfind(')');
  if (at == std::string::npos) return std::nullopt;
  const char state = at + 2 < line.size() ? line[at + 2] : ' ';
  if (state == 'Z' || state == 'X') return std::nullopt;
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
    // Containers may lack an identifier of their own, and see no processes of others.
    std::string machine = FirstLine("/etc/machine-id");
    machine += '\n';
    machine += FirstLine("/proc/sys/kernel/hostname");
    return {Digest(machine), Digest(FirstLine("/proc/sys/kernel/random/boot_id")), process,
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

  /// True when the process ran on this machine and runs no more.
  bool HasEnded() const {
    const Owner self = Self();
    if (machine != self.machine) return false;
    return run != self.run || StartOf(process) != start;
  }
};

/// The process whose mark a name has at its first dot.
std::optional<Owner> OwnerIn(std::string_view name) {
  const std::size_t dot = name.find('.');
  return dot == name.npos ? std::nullopt : Owner::Parse(name.substr(dot + 1));
}

}  // namespace

std::string OwnedName(const std::string& beginning) {
  static std::atomic<unsigned> count{0};
  return beginning + "." + Owner::Self().Text() + "-" + std::to_string(count++);
}

bool IsAbandoned(std::string_view name) {
  const auto owner = OwnerIn(name);
  return owner && owner->HasEnded();
}

bool IsOwned(std::string_view name) {
  const auto owner = OwnerIn(name);
  return owner && owner->Text() == Owner::Self().Text();
}

std::size_t OwnerMarkLength(std::string_view text) {
  constexpr int kGroups = 5;  // of the owner, and the number
  std::size_t at = 0;
  for (int group = 0; group < kGroups; ++group) {
    if (at == text.size() || text[at] != (group == 0 ? '.' : '-')) return 0;
    const std::size_t end =
        std::min(text.find_first_not_of("0123456789abcdef", at + 1), text.size());
    if (end == at + 1) return 0;
    at = end;
  }
  return at;
}

}  // namespace lumo::platform
