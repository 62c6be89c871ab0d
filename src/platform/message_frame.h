#pragma once

#include <cstddef>
#include <string>
#include <string_view>

// Messages keep their boundaries on a stream socket by 4 bytes with the length, lowest byte first,
// in front of each. For the sources of this folder only.

namespace lumo::platform {

/// Puts a message together from what arrives in pieces.
class FrameReader {
 public:
  enum class Status {
    kMore,    ///< the message isn't whole yet
    kWhole,   ///< Take() gives it
    kBroken,  ///< the other end has closed, or sends what is no message
  };

  /// Takes what the socket has, without going past the end of the message. Blocks for a first byte
  /// when the socket blocks. Memory grows with what has arrived, not with what is announced.
  Status Receive(int socket);

  /// The bytes of the message received so far; all of it once it is whole.
  std::size_t GetReceived() const { return bodyBytes_; }
  bool IsWhole() const { return headBytes_ == kHead && bodyBytes_ == length_; }

  /// Gives the message and begins anew.
  std::string Take();

 private:
  static constexpr std::size_t kHead = 4;

  Status ReceiveInto(int socket, char* target, std::size_t size, std::size_t& count);

  unsigned char head_[kHead] = {};
  std::size_t headBytes_ = 0;
  std::size_t length_ = 1;  // until the head is there, nothing is whole
  std::string body_;
  std::size_t bodyBytes_ = 0;
};

/// `message` with its length in front; empty when it is longer than a message may be.
std::string MakeFrame(std::string_view message);

/// Sends as much of `bytes` as the socket takes; never raises a signal.
/// @return false when the other end is gone.
bool SendSome(int socket, std::string_view bytes, std::size_t& sent);

}  // namespace lumo::platform
