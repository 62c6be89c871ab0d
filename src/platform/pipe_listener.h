#pragma once

#include "platform/message_pipe.h"

namespace lumo::platform {

/// Bounds for the clients of a listener.
struct ListenerLimits {
  double idleSeconds = 30.0;  ///< without a byte, before the first message is whole
  unsigned clients = 1024;    ///< connected at a time
  double drainSeconds = 2.0;  ///< without a byte read, for what answers are left after Stop
  /// Bytes of incoming messages, over all listeners of the process; small messages always get in.
  std::size_t incomingBytes = 2 * kMaxMessageBytes;
};

/// The server's end of a pipe. It takes the messages of any number of clients, one exchange after
/// the other: Wait gives the next message that is whole, Reply answers it. A client that is silent,
/// slow, or does not read its answer keeps none of the others waiting; one that breaks the rules of
/// the frame, or belongs to another user, is closed.
///
/// Clients can hold no more than ListenerLimits says: while Wait runs, a client that has not sent a
/// whole message and stays silent is closed after a while, and, where there are too many clients,
/// the one that has been silent for longest. The messages that all listeners of the process are
/// taking in are bounded together; the client with whose message they would be too many is closed.
///
/// The name is free again when the object goes, and after the death of the process that had it.
/// Threads: one thread uses it; only Stop may come from another.
class VEXG_EXPORT PipeListener {
 public:
  /// Takes the name. A socket of that name which a service manager has opened for this process is
  /// taken over (LISTEN_FDS); it stays the manager's when the listener goes.
  /// @param fault  [out] why not, when null is returned.
  static std::unique_ptr<PipeListener> Open(const std::string& name, PipeFault& fault,
                                            const ListenerLimits& limits = {});

  ~PipeListener();

  /// Ends the exchange before, and blocks until the next message is whole.
  /// @return false after Stop, or once the process of EndWithProcess has ended.
  bool Wait(std::string& message);

  /// Answers the message that Wait gave. What the client does not read at once is kept and sent
  /// while the next message is waited for.
  /// @return false when the client is gone or the answer too long.
  bool Reply(std::string_view message);

  /// The process that sent the message of Wait.
  int GetClientProcess() const;

  /// Has Wait end with the life of another process; nothing for this one.
  /// @return false when that process has ended already or can't be watched.
  bool EndWithProcess(int process);

  /// Has this and every later Wait give false.
  void Stop();

  /// Ends the exchange before, and gives clients that go on reading what is left of their answers;
  /// for the end of the listener.
  void Finish();

 private:
  struct Impl;
  explicit PipeListener(std::unique_ptr<Impl> impl);
  std::unique_ptr<Impl> impl_;
};

/// Frees the names of all pipes that this process still has, at its end.
VEXG_EXPORT void RemoveOwnPipes();

}  // namespace lumo::platform
