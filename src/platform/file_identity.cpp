#include "platform/file_identity.h"

#include <sys/stat.h>

namespace lumo::platform {

FileIdentity IdentifyFile(const std::string& path) {
  struct stat status {};
  FileIdentity identity;
  if (stat(path.c_str(), &status) != 0) return identity;
  constexpr std::int64_t kNanoseconds = 1'000'000'000;
  identity.exists = true;
  identity.device = status.st_dev;
  identity.number = status.st_ino;
  identity.size = static_cast<std::uint64_t>(status.st_size);
  identity.time = status.st_mtim.tv_sec * kNanoseconds + status.st_mtim.tv_nsec;
  return identity;
}

}  // namespace lumo::platform
