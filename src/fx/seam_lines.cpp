#include "fx/seam_lines.h"

#include "fx/work_file.h"

namespace lumo {

bool SeamLines::ReadBytes(std::uint64_t place, void* bytes, std::size_t count) const {
  std::string fault;
  return file_->Read(place, bytes, count, &fault) || FailByWorkFile(fault);
}

bool SeamLines::WriteBytes(std::uint64_t place, const void* bytes, std::size_t count) {
  std::string fault;
  return file_->Write(place, bytes, count, &fault) || FailByWorkFile(fault);
}

}  // namespace lumo
