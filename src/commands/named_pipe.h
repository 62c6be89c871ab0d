#pragma once

#include <memory>

#include "foundation/locks.h"
#include "foundation/pointer.h"

namespace lumo {

namespace platform {
class PipeConnection;
class PipeListener;
enum class PipeFault;
}  // namespace platform

/// One end of a named pipe between processes of one user. A message is a text; the pipe keeps its
/// boundaries. Each exchange is one connection: the client connects, writes one message and reads
/// the answer, if it has one.
///
/// Threads: used by one thread at a time; only StopListening may come from another.
class VEXG_EXPORT NamedPipe : public Lockable {
 public:
  using PointerRoot = NamedPipe;

  explicit NamedPipe(const String& name);
  virtual ~NamedPipe();
  NamedPipe(const NamedPipe&) = delete;
  NamedPipe& operator=(const NamedPipe&) = delete;

  const String& GetName() const { return name_; }
  /// Path of the socket on which the pipe stands; no text when the name is not allowed.
  const String& GetFullName() const { return fullName_; }

  /// True when the name is allowed.
  bool IsValid() const { return fullName_.GetLength() != 0; }
  /// True when Listen has a client, or Connect a server.
  bool IsConnected() const { return connected_; }

  /// Server side: takes the name, so that clients can come from now on. Listen does so by itself.
  /// @return false when a living server has it, or the system refuses; GetFault() says which.
  bool Create();
  /// Why the last Create or Listen could not have the name.
  platform::PipeFault GetFault() const { return fault_; }

  /// Server side: ends the exchange before and waits for the next client, which has come once its
  /// message is there as a whole. Clients that are silent or slow keep nobody else waiting.
  /// @return false when the name can't be had, after StopListening, and at the end of the process
  ///         that EndWithProcess watches.
  bool Listen();

  /// Server side: has Create and Listen give false from now on.
  void StopListening();

  /// Server side: ends the exchange before, and gives clients that go on reading what is left of
  /// their answers, at the end of the server.
  void FinishAnswers();

  /// Server side: the process of the client that Listen gave.
  int GetClientProcess() const;

  /// Server side: has Listen give false once `process` has ended.
  /// @return false when it has ended already.
  bool EndWithProcess(int process);

  /// Client side: connects anew, with one try.
  bool Connect() { return ConnectWithin(0.0); }
  /// Client side: connects anew, waiting for a server for up to `seconds`.
  bool ConnectWithin(double seconds);

  /// Writes `text` as one message, in UTF-8 with a zero byte at the end.
  /// @return bytes of the message; 0 when there is nobody, or it could not be sent.
  unsigned Write(const String& text);

  /// Reads one message, blocking for it on the client side.
  /// @param text  [out] the message up to its first zero byte; "" when there is none.
  /// @return bytes of the message, 0 for none.
  unsigned Read(String& text);

  /// Bytes of the message that waits to be read, without taking it; 0 for none.
  unsigned BytesAvailable();

 private:
  String name_;
  String fullName_;
  bool connected_ = false;
  bool stopped_ = false;  // with the making of listener_ under the lock
  platform::PipeFault fault_{};
  std::unique_ptr<platform::PipeListener> listener_;      // server side
  std::unique_ptr<platform::PipeConnection> connection_;  // client side
  std::string received_;                                  // server side, the message of Listen
};

using NamedPipePtr = Pointer<NamedPipe>;

}  // namespace lumo
