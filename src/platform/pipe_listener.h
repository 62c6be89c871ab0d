#pragma once

#include "platform/message_pipe.h"

namespace lumo::platform {

/// The server's end of a pipe. It takes the messages of any number of clients, one exchange after
/// the other: Wait gives the next message that is whole, Reply answers it. A client that is silent,
/// slow, or does not read its answer keeps none of the others waiting; one that breaks the rules of
/// the frame, or belongs to another user, is closed.
///
/// The name is free again when the object goes, and after the death of the process that had it.
/// Threads: one thread uses it; only Stop may come from another.
class VEXG_EXPORT PipeListener {
 public:
  /// Takes the name.
  /// @param fault  [out] why not, when null is returned.
  static std::unique_ptr<PipeListener> Open(const std::string& name, PipeFault& fault);

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

 private:
  struct Impl;
  explicit PipeListener(std::unique_ptr<Impl> impl);
  std::unique_ptr<Impl> impl_;
};

/// Frees the names of all pipes that this process still has, at its end.
VEXG_EXPORT void RemoveOwnPipes();

}  // namespace lumo::platform
