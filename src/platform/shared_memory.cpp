#include "platform/shared_memory.h"

#include <cerrno>
#include <fcntl.h>
#include <sys/mman.h>
#include <sys/stat.h>
#include <unistd.h>

#include "platform/file_descriptor.h"

namespace lumo::platform {
namespace {

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
  return view != MAP_FAILED ? static_cast<unsigned char*>(view) : nullptr;
}

bool HoldsAtLeast(int file, std::size_t size) {
  struct stat status {};
  return fstat(file, &status) == 0 && status.st_size >= 0 &&
         static_cast<std::size_t>(status.st_size) >= size;
}

}  // namespace

std::unique_ptr<SharedMemoryBlock> SharedMemoryBlock::Open(const std::string& name,
                                                           std::size_t size) {
  const std::string path = SystemName(name);
  if (path.empty() || size == 0) return nullptr;
  const FileDescriptor file(shm_open(path.c_str(), O_RDWR, 0));
  if (!file.IsOpen() || !HoldsAtLeast(file.Get(), size)) return nullptr;
  unsigned char* const data = Map(file.Get(), size);
  if (data == nullptr) return nullptr;
  return std::unique_ptr<SharedMemoryBlock>(new SharedMemoryBlock(data, size, {}));
}

std::unique_ptr<SharedMemoryBlock> SharedMemoryBlock::Create(const std::string& name,
                                                             std::size_t size) {
  const std::string path = SystemName(name);
  if (path.empty() || size == 0) return nullptr;
  const FileDescriptor file(shm_open(path.c_str(), O_RDWR | O_CREAT | O_EXCL, S_IRUSR | S_IWUSR));
  if (!file.IsOpen()) return nullptr;
  // Backed at once: a block that only promises its memory would end in a bus error later.
  const bool backed = posix_fallocate(file.Get(), 0, static_cast<off_t>(size)) == 0;
  unsigned char* const data = backed ? Map(file.Get(), size) : nullptr;
  if (data == nullptr) {
    shm_unlink(path.c_str());
    return nullptr;
  }
  return std::unique_ptr<SharedMemoryBlock>(new SharedMemoryBlock(data, size, path));
}

SharedMemoryBlock::~SharedMemoryBlock() {
  munmap(data_, size_);
  if (!ownedPath_.empty()) shm_unlink(ownedPath_.c_str());
}

}  // namespace lumo::platform
