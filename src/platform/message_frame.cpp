#include "platform/message_frame.h"

#include <algorithm>
#include <cerrno>
#include <sys/socket.h>
#include <utility>

#include "platform/message_pipe.h"

namespace lumo::platform {

FrameReader::Status FrameReader::ReceiveInto(int socket, char* target, std::size_t size,
                                             std::size_t& count) {
  ssize_t received = 0;
  do {
    received = recv(socket, target, size, 0);
  } while (received < 0 && errno == EINTR);
  if (received < 0) return errno == EAGAIN ? Status::kMore : Status::kBroken;
  if (received == 0) return Status::kBroken;
  count += static_cast<std::size_t>(received);
  return Status::kWhole;
}

FrameReader::Status FrameReader::Receive(int socket) {
  constexpr std::size_t kMaxStep = std::size_t{1} << 20;
  while (headBytes_ < kHead) {
    char* const next = reinterpret_cast<char*>(head_) + headBytes_;
    const Status status = ReceiveInto(socket, next, kHead - headBytes_, headBytes_);
    if (status != Status::kWhole) return status;
    if (headBytes_ < kHead) continue;
    length_ = head_[0] | (std::size_t{head_[1]} << 8) | (std::size_t{head_[2]} << 16) |
              (std::size_t{head_[3]} << 24);
    if (length_ == 0 || length_ > kMaxMessageBytes) return Status::kBroken;
  }
  // At most one step a call, so that one busy sender does not hold up the others of a server.
  const std::size_t step = std::min(length_ - bodyBytes_, kMaxStep);
  if (body_.size() < bodyBytes_ + step) {
    body_.reserve(std::min(length_, std::max(body_.capacity() * 2, bodyBytes_ + step)));
    body_.resize(bodyBytes_ + step);
  }
  const Status status = ReceiveInto(socket, body_.data() + bodyBytes_, step, bodyBytes_);
  if (status != Status::kWhole) return status;
  return IsWhole() ? Status::kWhole : Status::kMore;
}

std::string FrameReader::Take() {
  std::string message = std::move(body_);
  message.resize(bodyBytes_);
  *this = FrameReader();
  return message;
}

std::string MakeFrame(std::string_view message) {
  std::string frame;
  if (message.empty() || message.size() > kMaxMessageBytes) return frame;
  frame.reserve(message.size() + 4);
  for (const int shift : {0, 8, 16, 24}) {
    frame.push_back(static_cast<char>((message.size() >> shift) & 0xFF));
  }
  frame.append(message);
  return frame;
}

bool SendSome(int socket, std::string_view bytes, std::size_t& sent) {
  while (sent < bytes.size()) {
    const ssize_t count = send(socket, bytes.data() + sent, bytes.size() - sent, MSG_NOSIGNAL);
    if (count < 0 && errno == EINTR) continue;
    if (count < 0) return errno == EAGAIN;
    sent += static_cast<std::size_t>(count);
  }
  return true;
}

}  // namespace lumo::platform
