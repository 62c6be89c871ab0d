#pragma once

#include "commands/catalog_session.h"
#include "commands/named_pipe.h"
#include "foundation/thread.h"

namespace lumo {

// The reserved words of the pipes; everything else that a private server gets is a job document.

inline constexpr const char* kNewServerWord = "@NEW";  ///< to the dispatcher: a private server
inline constexpr const char* kQuitWord = "@QUIT";      ///< ends the thread that serves the pipe
inline constexpr const char* kErrorWord = "@ERROR";    ///< the answer when there is no other

/// A thread that serves one client.
class VEXG_EXPORT Server : public SimpleThread {};

/// Serves one client over a private pipe: each message is a job document, which is run to its end
/// and answered by its result document. It ends with "@QUIT", or with the client's process. The end
/// of the process that sent a job raises the job's abort flag.
///
/// Failure: a message that memory is too short for is answered by "@ERROR", and the server goes on.
///          A result document that is longer than a message may be is answered by a short one that
///          says so.
class VEXG_EXPORT PipeServer : public Server {
 public:
  /// @param name    of the private pipe.
  /// @param client  number of the process whose end ends the server.
  PipeServer(const String& name, int client);

  /// Takes the pipe's name, so that the client can connect before Run has begun.
  /// @return false when the name can't be had, or the client's process has gone.
  bool Open();
  platform::PipeFault GetFault() const { return pipe_.GetFault(); }

  /// Closes at the end what the client's jobs have opened and not closed.
  void ReleaseOnQuit() { releaseOnQuit_ = true; }

  void Run() override;

  /// Ends the server from another thread: it takes no further message, and ends after the one that
  /// it is at.
  void EndNow();

  /// Changes the length of the longest answer, for tests.
  void SetMaxAnswer(std::size_t bytes) { maxAnswer_ = bytes; }

 private:
  bool Serve();
  bool Answer(const String& request);
  void RunAndReply(const String& document);

  NamedPipe pipe_;
  catalog::Session session_;
  bool releaseOnQuit_ = false;
  std::size_t maxAnswer_;
};

using PipeServerPtr = Pointer<PipeServer>;

/// The thread to which clients come first.
class VEXG_EXPORT ServerDispatch : public SimpleThread {
 public:
  /// Ends the thread, by a message to it; waits for it to be there as a client would.
  virtual void Stop() = 0;
};

/// Hands each client that sends "@NEW" the name of a private pipe with a PipeServer of its own, and
/// ends with "@QUIT". The private names are the dispatcher's with "_SERVER_" and eight hexadecimal
/// digits behind it, which count up from 0.
class VEXG_EXPORT PipeServerDispatch : public ServerDispatch {
 public:
  /// @param name  of the well-known pipe; without "%".
  explicit PipeServerDispatch(const String& name) : name_(name), pipe_(name) {}

  const String& GetName() const { return name_; }

  /// Takes the pipe's name; Run does so by itself.
  /// @return false when the name can't be had; GetFault() says why.
  bool Open();
  platform::PipeFault GetFault() const { return pipe_.GetFault(); }

  /// Has the private servers that are made from now on close at their end what their clients have
  /// opened and not closed; else it stays open, for any client to use and to close.
  void SetReleaseOnQuit(bool release) { releaseOnQuit_ = release; }

  void Run() override;
  void Stop() override;

  /// Ends the thread from within the process, where Stop would go through the pipe.
  void EndNow();

 private:
  bool Serve();
  bool StartServer(int clientProcess, String& serverName);

  String name_;
  NamedPipe pipe_;
  unsigned nextServer_ = 0;
  bool releaseOnQuit_ = false;
};

/// The one dispatcher of the process. The first call makes it, under that name; later calls give
/// the same, whatever name they pass. The host starts it with StartThread.
VEXG_EXPORT ServerDispatch& GetServerDispatch(const String& name);

/// Raises the abort flag of every job that the private servers of this process are running.
VEXG_EXPORT void AbortServedJobs();

/// Ends all private servers of this process: they take no further message. Blocks until the jobs
/// that are running have ended and the servers are gone. For a host whose dispatcher has ended.
VEXG_EXPORT void EndServers();

/// Blocks until no private server of this process is in the middle of a job.
VEXG_EXPORT void WaitServedJobs();

}  // namespace lumo
