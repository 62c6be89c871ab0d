#pragma once

#include "commands/command.h"
#include "commands/strict_checks.h"

namespace lumo {

/// One command of a job with its place in it.
struct CommandDescriptor {
  using PointerRoot = CommandDescriptor;
  virtual ~CommandDescriptor() = default;

  String name;                  ///< as the document gives it, possibly empty
  String id;                    ///< class name
  CommandPtr command;           ///< made by the parser
  Set<CommandPtr> dependsOn;    ///< must be retired first
  unsigned dependsOnFirst = 0;  ///< as many from the first of the job too; @ALL in a long job
  Map<String, String> inputs;   ///< input name to a literal or, with a leading $, a variable
  Map<String, String> outputs;  ///< output name to variable
  Set<String> expanded;         ///< names of inputs whose texts hold variables
  IPC ipc;                      ///< abort flag and progress report of this command
  unsigned position = 0;        ///< in the job, while it runs
  String complaint;             ///< what the document gets wrong about the command; see JobChecks
  String explanation;           ///< a better reason than the command's own for its failure

  /// Why the command failed, in one line; empty when it did not, or did not say.
  const String& GetReason() const {
    return explanation.GetLength() != 0 ? explanation : command->GetReason();
  }
};

using CommandDescriptorPtr = Pointer<CommandDescriptor>;

/// The most times that a job looks for the nearest name in its own: each look goes over all of
/// them, and a document may be wrong in a hundred thousand places.
inline constexpr unsigned kMostHints = 100;

/// A command of a document that names no command known here. It is no part of the job; a host may
/// want to say so.
struct UnknownCommand {
  String name;
  String id;
  unsigned position = 0;  ///< commands of the job that stand before it

  /// The complaint about it, in one line.
  /// @param withHint  with the nearest command that is known.
  String GetReason(bool withHint) const;
};

/// Commands with their inputs, outputs and order, and the channel through which a host watches.
///
///     Job job;
///     JobParser(job).Parse(document);
///     RunJob(job);
///     const String results = JobResultWriter(job).Write();
///
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
  List<String> faults;                   ///< what is wrong with the document, a line each
  JobChecks checks = JobChecks::kTold;   ///< how the commands' inputs are looked at
  bool tellsReasons = false;             ///< the result document says why commands failed
  IPCPtr ipc;                            ///< empty when the document named none that can be used
  IPC defaultIpc;                        ///< stands in where `ipc` is empty
};

/// Runs all commands of `job` and returns when the last has retired. A command starts once all that
/// it depends on have retired, whether they succeeded or not; of those that may start the first in
/// the document goes first. A job of one command runs on the calling thread; in a job of more, all
/// that may run at once do so on threads of their own, and one whose command has ended goes on with
/// the next that may start. A command for which the system gives no thread ends as failed.
/// @return true.
VEXG_EXPORT bool RunJob(Job& job);

}  // namespace lumo
