#include "fx/work_file.h"

#include <vector>

#include "data/access_policy.h"
#include "foundation/fault.h"

namespace lumo {

std::unique_ptr<platform::RandomAccessFile> MakeWorkFile() {
  std::string fault;
  const std::vector<std::string> roots = GetAccessPolicy().roots;
  auto file = platform::RandomAccessFile::CreateUnnamed(roots.empty() ? "" : roots.front(), &fault);
  if (!file) FailByWorkFile(fault);
  return file;
}

bool FailByWorkFile(const std::string& fault) {
  SetFault(String("working file: ") + fault);
  return false;
}

}  // namespace lumo
