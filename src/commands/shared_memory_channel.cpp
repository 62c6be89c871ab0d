#include "commands/shared_memory_channel.h"

#include "commands/value_text.h"
#include "platform/shared_memory.h"

namespace lumo {
namespace {

template <typename Channel>
IPCPtr KeepUsable(Channel* channel) {
  const IPCPtr owner(channel);
  return channel->IsUsable() ? owner : IPCPtr();
}

}  // namespace

SharedMemory::SharedMemory(const String& name, unsigned size, std::size_t used)
    : name_(name), size_(size), used_(used) {}

SharedMemory::~SharedMemory() = default;

bool SharedMemory::Open() {
  block_.reset();
  block_ = platform::SharedMemoryBlock::Open(name_.ToUTF8(), size_, used_);
  return block_ != nullptr;
}

unsigned char* SharedMemory::GetData() const {
  return block_ != nullptr ? block_->GetData() : nullptr;
}

bool SharedMemory::WasCut() const {
  return block_ != nullptr && block_->WasCut();
}

bool IsChannelElement(const String& element) {
  return element == "SHMIPC" || element == "ORVAIPC" || element == "TQFProcessIPC";
}

IPCPtr OpenChannel(const String& element, const Map<String, String>& attributes) {
  const auto number = [&](const char* name) { return ParseValue<unsigned>(attributes.Find(name)); };
  const String& name = attributes.Find("Name");
  if (element == "TQFProcessIPC") return KeepUsable(new TQFProcessIPC(name));
  if (element == "ORVAIPC") return KeepUsable(new ORVAIPC(name, number("Size")));
  return KeepUsable(new SHMIPC<bool, float>(name, number("Size"), number("AbortOffset"),
                                            number("ProgressOffset")));
}

}  // namespace lumo
