#include "platform/file_gate.h"

#include <atomic>

namespace lumo::platform {
namespace {

std::atomic<FileGate> gGate{nullptr};

}  // namespace

void SetFileGate(FileGate gate) {
  gGate = gate;
}

bool PassesFileGate(const std::string& path, bool writing, std::string* fault) {
  const FileGate gate = gGate;
  return gate == nullptr || gate(path, writing, fault);
}

}  // namespace lumo::platform
