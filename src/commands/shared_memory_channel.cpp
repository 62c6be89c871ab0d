#include "commands/shared_memory_channel.h"

#include "platform/shared_memory.h"

namespace lumo {

SharedMemory::SharedMemory(const String& name, unsigned size) : name_(name), size_(size) {}

SharedMemory::~SharedMemory() = default;

bool SharedMemory::Open() {
  block_.reset();
  block_ = platform::SharedMemoryBlock::Open(name_.ToUTF8(), size_);
  return block_ != nullptr;
}

unsigned char* SharedMemory::GetData() const {
  return block_ != nullptr ? block_->GetData() : nullptr;
}

}  // namespace lumo
