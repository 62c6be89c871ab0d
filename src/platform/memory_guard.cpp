#include "platform/memory_guard.h"

#include <array>
#include <mutex>
#include <signal.h>
#include <sys/mman.h>
#include <sys/syscall.h>
#include <unistd.h>

namespace lumo::platform {
namespace {

constexpr std::size_t kMaxGuards = 4096;

// No destructor, and no constructor at run time: the handler may run at any moment.
constinit std::array<MemoryGuard::Slot, kMaxGuards> gSlots{};
struct sigaction gBefore {};

MemoryGuard::Slot* FindSlot(std::uintptr_t address) {
  for (MemoryGuard::Slot& slot : gSlots) {
    const std::size_t size = slot.size.load();
    const std::uintptr_t begin = slot.begin.load();
    if (size != 0 && address >= begin && address - begin < size) return &slot;
  }
  return nullptr;
}

/// Puts zeros in place of a mapping that has lost pages. Only the system is called, and directly,
/// since the signal may have come anywhere.
bool Replace(MemoryGuard::Slot& slot) {
  slot.cut.store(true);
  const long made = syscall(SYS_mmap, slot.begin.load(), slot.size.load(), PROT_READ | PROT_WRITE,
                            MAP_PRIVATE | MAP_ANONYMOUS | MAP_FIXED, -1, 0L);
  return made != -1;
}

void OnBusError(int signal, siginfo_t* info, void* context) {
  const bool isFault = info->si_code > 0;  // not sent by a process
  MemoryGuard::Slot* const slot =
      isFault ? FindSlot(reinterpret_cast<std::uintptr_t>(info->si_addr)) : nullptr;
  if (slot != nullptr && Replace(*slot)) return;
  if ((gBefore.sa_flags & SA_SIGINFO) != 0 && gBefore.sa_sigaction != nullptr) {
    gBefore.sa_sigaction(signal, info, context);
    return;
  }
  // A fault comes again as soon as this returns, and then ends as it would without this handler.
  sigaction(SIGBUS, &gBefore, nullptr);
  if (!isFault) raise(signal);
}

void InstallHandler() {
  struct sigaction action {};
  action.sa_sigaction = OnBusError;
  action.sa_flags = SA_SIGINFO | SA_NODEFER;
  sigemptyset(&action.sa_mask);
  sigaction(SIGBUS, &action, &gBefore);
}

MemoryGuard::Slot* TakeSlot() {
  for (MemoryGuard::Slot& slot : gSlots) {
    if (!slot.taken.exchange(true)) return &slot;
  }
  return nullptr;
}

}  // namespace

MemoryGuard::MemoryGuard(void* data, std::size_t size) : slot_(TakeSlot()) {
  static std::once_flag installed;
  std::call_once(installed, InstallHandler);
  if (slot_ == nullptr) return;
  slot_->cut = false;
  slot_->begin = reinterpret_cast<std::uintptr_t>(data);
  slot_->size = size;
}

MemoryGuard::~MemoryGuard() {
  if (slot_ == nullptr) return;
  slot_->size = 0;
  slot_->taken = false;
}

bool MemoryGuard::WasCut() const {
  return slot_ != nullptr && slot_->cut;
}

}  // namespace lumo::platform
