#include "platform/shared_memory.h"

#include <cerrno>
#include <fcntl.h>
#include <filesystem>
#include <mutex>
#include <set>
#include <sys/mman.h>
#include <sys/stat.h>
#include <unistd.h>

#include "platform/file_descriptor.h"
#include "platform/memory_guard.h"
#include "platform/memory_shortage.h"
#include "platform/owned_name.h"

namespace lumo::platform {
namespace {

/// The blocks that this process has made and not yet taken away.
struct OwnBlocks {
  std::mutex mutex;
  std::set<std::string> paths;

  static OwnBlocks& Get() {
    static auto* const blocks = new OwnBlocks;  // for threads that outlast static objects
    return *blocks;
  }
  void Add(const std::string& path) {
    const std::lock_guard lock(mutex);
    paths.insert(path);
  }
  void Remove(const std::string& path) {
    const std::lock_guard lock(mutex);
    paths.erase(path);
    shm_unlink(path.c_str());
  }
};

/// The system's form of a block's name; empty when the name is not allowed.
std::string SystemName(const std::string& name) {
  constexpr std::size_t kMaxName = 255;
  const bool allowed = !name.empty() && name.size() <= kMaxName && name != "." && name != ".." &&
                       name.find('/') == std::string::npos && name.find('\0') == std::string::npos;
  return allowed ? "/" + name : std::string();
}

/// All pages are mapped at once: a block of pixels is used from end to end, and a fault for each
/// page costs more than the copying.
unsigned char* Map(int file, std::size_t size) {
  void* const view =
      mmap(nullptr, size, PROT_READ | PROT_WRITE, MAP_SHARED | MAP_POPULATE, file, 0);
  if (view != MAP_FAILED) return static_cast<unsigned char*>(view);
  if (errno == ENOMEM || errno == EAGAIN) NoteMemoryShortage();
  return nullptr;
}

/// True for memory of this user's own that is as large as asked for.
bool IsUsable(int file, std::size_t size) {
  struct stat status {};
  return fstat(file, &status) == 0 && S_ISREG(status.st_mode) && status.st_uid == geteuid() &&
         status.st_size >= 0 && static_cast<std::size_t>(status.st_size) >= size;
}

/// Has the system give memory for all of a block now: one that only promises it would end in a bus
/// error where the memory is short. What is there already stays.
bool Reserve(int file, std::size_t size) {
  int code = EINTR;
  while (code == EINTR) code = posix_fallocate(file, 0, static_cast<off_t>(size));
  if (code == ENOMEM || code == ENOSPC) NoteMemoryShortage();  // its file system is memory
  errno = code;
  return code == 0;
}

/// Unlinks the blocks that killed processes of this user have left, which would keep their memory
/// until the machine is started again.
void RemoveAbandonedBlocks() {
  std::error_code fault;
  for (std::filesystem::directory_iterator at("/dev/shm", fault), end; !fault && at != end;
       at.increment(fault)) {
    const std::string name = at->path().filename().string();
    if (name.starts_with("vexg-") && IsAbandoned(name)) shm_unlink(("/" + name).c_str());
  }
}

}  // namespace

SharedMemoryBlock::SharedMemoryBlock(unsigned char* data, std::size_t size, std::string ownedPath)
    : data_(data),
      size_(size),
      ownedPath_(std::move(ownedPath)),
      guard_(std::make_unique<MemoryGuard>(data, size)) {
  if (!ownedPath_.empty()) OwnBlocks::Get().Add(ownedPath_);
}

bool SharedMemoryBlock::WasCut() const {
  return guard_->WasCut();
}

std::unique_ptr<SharedMemoryBlock> SharedMemoryBlock::Open(const std::string& name,
                                                           std::size_t size, std::size_t used) {
  const std::string path = SystemName(name);
  if (path.empty() || size == 0) return nullptr;
  const FileDescriptor file(shm_open(path.c_str(), O_RDWR, 0));
  if (!file.IsOpen() || used > size || !IsUsable(file.Get(), size)) return nullptr;
  const std::size_t mapped = used != 0 ? used : size;
  unsigned char* const data = Reserve(file.Get(), mapped) ? Map(file.Get(), mapped) : nullptr;
  if (data == nullptr) return nullptr;
  std::unique_ptr<SharedMemoryBlock> block(new SharedMemoryBlock(data, mapped, {}));
  return block->guard_->IsActive() ? std::move(block) : nullptr;
}

std::unique_ptr<SharedMemoryBlock> SharedMemoryBlock::Create(const std::string& name,
                                                             std::size_t size) {
  static std::once_flag cleared;
  std::call_once(cleared, RemoveAbandonedBlocks);
  const std::string path = SystemName(name);
  if (path.empty() || size == 0) return nullptr;
  const FileDescriptor file(shm_open(path.c_str(), O_RDWR | O_CREAT | O_EXCL, S_IRUSR | S_IWUSR));
  if (!file.IsOpen()) return nullptr;
  unsigned char* const data = Reserve(file.Get(), size) ? Map(file.Get(), size) : nullptr;
  if (data == nullptr) {
    const int code = errno;
    shm_unlink(path.c_str());
    errno = code;
    return nullptr;
  }
  std::unique_ptr<SharedMemoryBlock> block(new SharedMemoryBlock(data, size, path));
  return block->guard_->IsActive() ? std::move(block) : nullptr;
}

SharedMemoryBlock::~SharedMemoryBlock() {
  guard_.reset();
  munmap(data_, size_);
  if (!ownedPath_.empty()) OwnBlocks::Get().Remove(ownedPath_);
}

void RemoveOwnSharedMemory() {
  OwnBlocks& blocks = OwnBlocks::Get();
  const std::lock_guard lock(blocks.mutex);
  for (const std::string& path : blocks.paths) shm_unlink(path.c_str());
}

}  // namespace lumo::platform
