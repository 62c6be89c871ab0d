#pragma once

#include "commands/command.h"

namespace lumo {

/// One command of a job with its place in it.
struct CommandDescriptor {
  using PointerRoot = CommandDescriptor;
  virtual ~CommandDescriptor() = default;

  String name;  ///< as the document gives it, possibly empty
  String id;    ///< class name
  CommandPtr command;
  Set<CommandPtr> dependsOn;    ///< must be retired first
  Map<String, String> inputs;   ///< input name to a literal or, with a leading $, a variable
  Map<String, String> outputs;  ///< output name to variable
  IPC ipc;                      ///< abort flag and progress report of this command
};

using CommandDescriptorPtr = Pointer<CommandDescriptor>;

/// A command of a document that names no command known here. It is no part of the job; a host may
/// want to say so.
struct UnknownCommand {
  String name;
  String id;
};

/// Commands with their inputs, outputs and order, and the channel through which a host watches.
/// Threads: built and asked by one thread; RunJob runs its commands on others.
class VEXG_EXPORT Job {
 public:
  Job() = default;
  /// Reports progress 1 on the channel, when there is one.
  ~Job();
  Job(const Job&) = delete;
  Job& operator=(const Job&) = delete;

  /// The channel that the document named, or the job's own flag and report.
  const IPC& GetIPC() const { return ipc.IsNull() ? defaultIpc : *ipc; }

  /// Drops the commands; the channel stays.
  void Clear();

  Deque<CommandDescriptorPtr> commands;  ///< in document order
  Map<String, unsigned> commandIndex;    ///< name to position in `commands`
  List<UnknownCommand> unknown;          ///< in document order
  bool tellsReasons = false;             ///< the result document says why commands failed
  IPCPtr ipc;                            ///< empty when the document named none that can be used
  IPC defaultIpc;
};

/// Runs all commands of `job` and returns when the last has retired. A command starts once all that
/// it depends on have retired, whether they succeeded or not; of those that may start the first in
/// the document goes first. A job of one command runs on the calling thread; in a job of more, all
/// that may run at once do so on threads of their own, and one whose command has ended goes on with
/// the next that may start. A command for which the system gives no thread ends as failed.
/// @return true.
VEXG_EXPORT bool RunJob(Job& job);

}  // namespace lumo
