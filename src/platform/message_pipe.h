#pragma once

#include <cstddef>
#include <memory>
#include <string>
#include <string_view>

#include "platform/export.h"

// Named pipes that carry whole messages between processes of one user of this machine.
//
// A pipe stands as a socket of its name in a directory that only the user can enter:
// $XDG_RUNTIME_DIR/vexg where that variable names a directory, else /tmp/vexg-<uid>. A name has 1
// or more bytes, without "/", NUL and "..", not beginning with ".", and short enough for the
// system's limit on the path. Both ends check that the other belongs to the same user.

namespace lumo::platform {

/// The longest message, in bytes.
inline constexpr std::size_t kMaxMessageBytes = std::size_t{256} << 20;

/// Why a pipe could not be opened.
enum class PipeFault {
  kNone,
  kBadName,       ///< the name is not allowed, or too long
  kBadDirectory,  ///< the directory can't be made, isn't ours or lets others in
  kTaken,         ///< a living server has the name
  kSystem,        ///< the system refuses, for want of descriptors for example
};

/// Path of the socket of the pipe `name`; empty when the name is not allowed.
VEXG_EXPORT std::string PipePath(const std::string& name);

/// The client's end of a pipe. Used by one thread at a time.
class VEXG_EXPORT PipeConnection {
 public:
  /// Connects to a server, waiting for one at most `seconds`; with 0 one try is made.
  /// @return null when there is none by then, or when it belongs to another user.
  static std::unique_ptr<PipeConnection> Connect(const std::string& name, double seconds);

  ~PipeConnection();

  /// Sends a message; blocks until the system has taken all of it.
  /// @return false when the server is gone or the message is too long.
  bool Write(std::string_view message);

  /// Blocks for the next message.
  /// @return false when the server closed without one.
  bool Read(std::string& message);

  /// Bytes of the message that wait to be read; 0 until it is whole.
  std::size_t BytesAvailable();

 private:
  struct Impl;
  explicit PipeConnection(std::unique_ptr<Impl> impl);
  std::unique_ptr<Impl> impl_;
};

}  // namespace lumo::platform
