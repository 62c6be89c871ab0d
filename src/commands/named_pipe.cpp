#include "commands/named_pipe.h"

#include "platform/message_pipe.h"
#include "platform/pipe_listener.h"

namespace lumo {
namespace {

/// The text of a message: what stands before its first zero byte.
String TextOf(const std::string& message) {
  return String(message.c_str());
}

}  // namespace

NamedPipe::NamedPipe(const String& name)
    : name_(name), fullName_(platform::PipePath(name.ToUTF8())) {}

NamedPipe::~NamedPipe() = default;

bool NamedPipe::Create() {
  const MutexLock lock = Lock();
  if (stopped_) return false;
  if (listener_ != nullptr) return true;
  listener_ = platform::PipeListener::Open(name_.ToUTF8(), fault_);
  return listener_ != nullptr;
}

bool NamedPipe::Listen() {
  connected_ = Create() && listener_->Wait(received_);
  return connected_;
}

void NamedPipe::StopListening() {
  const MutexLock lock = Lock();
  stopped_ = true;
  if (listener_ != nullptr) listener_->Stop();
}

void NamedPipe::FinishAnswers() {
  connected_ = false;
  if (listener_ != nullptr) listener_->Finish();
}

int NamedPipe::GetClientProcess() const {
  return connected_ ? listener_->GetClientProcess() : 0;
}

bool NamedPipe::EndWithProcess(int process) {
  return Create() && listener_->EndWithProcess(process);
}

bool NamedPipe::ConnectWithin(double seconds) {
  connection_.reset();
  if (IsValid()) connection_ = platform::PipeConnection::Connect(name_.ToUTF8(), seconds);
  return connection_ != nullptr;
}

unsigned NamedPipe::Write(const String& text) {
  std::string message = text.ToUTF8();
  message.push_back('\0');
  bool written = false;
  if (connection_ != nullptr) {
    written = connection_->Write(message);
  } else if (connected_) {
    written = listener_->Reply(message);
  }
  return written ? static_cast<unsigned>(message.size()) : 0;
}

unsigned NamedPipe::Read(String& text) {
  text = "";
  std::string message;
  if (connection_ != nullptr) {
    if (!connection_->Read(message)) return 0;
  } else {
    message.swap(received_);
  }
  if (!message.empty()) text = TextOf(message);
  return static_cast<unsigned>(message.size());
}

unsigned NamedPipe::BytesAvailable() {
  const std::size_t bytes =
      connection_ != nullptr ? connection_->BytesAvailable() : received_.size();
  return static_cast<unsigned>(bytes);
}

}  // namespace lumo
