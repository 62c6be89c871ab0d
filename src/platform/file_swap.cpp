#include "platform/file_swap.h"

#include <cerrno>
#include <cstdio>

#include "platform/file_moves.h"
#include "platform/temporary_file.h"

namespace lumo::platform {

bool FileSwap::MoveAside(const std::string& path, std::string* fault) {
  const std::string aside = TemporaryPathBeside(path);
  std::string why;
  if (RenameFile(path, aside, &why)) {
    steps_.push_back({Kind::kMoved, path, aside, true});
    return true;
  }
  if (errno == ENOENT) return true;
  // The temporary path would mean nothing to anybody.
  if (fault != nullptr) *fault = path + why.substr(why.find(": "));
  return false;
}

bool FileSwap::MoveIn(const std::string& from, const std::string& to, std::string* fault) {
  if (RenameToNew(from, to, fault)) {
    steps_.push_back({Kind::kMoved, from, to, false});
    return true;
  }
  if (errno != EEXIST) return false;
  if (ExchangeFiles(from, to, fault)) {
    steps_.push_back({Kind::kExchanged, from, to, true});
    return true;
  }
  if (errno != EINVAL && errno != ENOSYS) return false;  // known, and failed
  if (!MoveAside(to, fault) || !RenameToNew(from, to, fault)) return false;
  steps_.push_back({Kind::kMoved, from, to, false});
  return true;
}

void FileSwap::TakeBack() {
  const int code = errno;
  for (auto step = steps_.rbegin(); step != steps_.rend(); ++step) {
    if (step->kind == Kind::kExchanged) {
      ExchangeFiles(step->from, step->to);
    } else {
      RenameToNew(step->to, step->from);
    }
  }
  steps_.clear();
  errno = code;
}

void FileSwap::Keep() {
  for (const Step& step : steps_) {
    if (step.isOlder) std::remove((step.kind == Kind::kExchanged ? step.from : step.to).c_str());
  }
  steps_.clear();
}

}  // namespace lumo::platform
