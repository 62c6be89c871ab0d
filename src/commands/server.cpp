#include "commands/server.h"

#include <condition_variable>
#include <mutex>
#include <set>

#include "commands/client.h"
#include "commands/job_parser.h"
#include "commands/job_result.h"
#include "platform/message_pipe.h"

namespace lumo {
namespace {

/// The jobs that private servers are running, for a host that wants to end.
class ServedJobs {
 public:
  static ServedJobs& Get() {
    static auto& jobs = *new ServedJobs;
    return jobs;
  }

  void Add(const Job& job) {
    const std::lock_guard lock(mutex_);
    running_.insert(&job);
  }

  void Remove(const Job& job) {
    const std::lock_guard lock(mutex_);
    running_.erase(&job);
    ended_.notify_all();
  }

  void AbortAll() {
    const std::lock_guard lock(mutex_);
    for (const Job* job : running_) job->GetIPC().abort->Set(true);
  }

  void WaitNone() {
    std::unique_lock lock(mutex_);
    ended_.wait(lock, [this] { return running_.empty(); });
  }

 private:
  std::mutex mutex_;
  std::condition_variable ended_;
  std::set<const Job*> running_;
};

/// Counts a job among the served ones until its answer is out.
class ServedJob {
 public:
  explicit ServedJob(const Job& job) : job_(job) { ServedJobs::Get().Add(job_); }
  ~ServedJob() { ServedJobs::Get().Remove(job_); }
  ServedJob(const ServedJob&) = delete;
  ServedJob& operator=(const ServedJob&) = delete;

 private:
  const Job& job_;
};

}  // namespace

bool PipeServer::Open(int clientProcess) {
  return pipe_.Create() && pipe_.EndWithProcess(clientProcess);
}

void PipeServer::Run() {
  SetRunning();
  String request;
  while (!StopRequested() && pipe_.Listen()) {
    if (pipe_.Read(request) != 0 && !Answer(request)) return;
  }
}

/// Answers one message; false for the word that ends the server.
bool PipeServer::Answer(const String& request) {
  if (request == kQuitWord) return false;
  if (request.GetLength() == 0) {
    pipe_.Write(kErrorWord);
    return true;
  }
  Job job;
  JobParser(job).Parse(request);
  const ServedJob served(job);
  RunJob(job);
  pipe_.Write(JobResultWriter(job).Write());
  return true;
}

bool PipeServerDispatch::Open() {
  return name_.Find("%") == String::kNotFound && pipe_.Create();
}

void PipeServerDispatch::Run() {
  SetRunning();
  String request;
  while (!StopRequested() && Open() && pipe_.Listen()) {
    if (pipe_.Read(request) == 0) continue;
    if (request == kNewServerWord) {
      String serverName(kErrorWord);
      StartServer(pipe_.GetClientProcess(), serverName);
      pipe_.Write(serverName);
    } else if (request == kQuitWord) {
      RequestStop();
    }
  }
}

/// Starts a private server; its name is changed only when that worked.
bool PipeServerDispatch::StartServer(int clientProcess, String& serverName) {
  // A name may still be in use, by a private server that has outlived an earlier dispatcher.
  constexpr unsigned kTries = 1000;
  for (unsigned i = 0; i < kTries; ++i) {
    const String name = String::Format((name_ + "_SERVER_%08x").GetUTF8(), nextServer_++);
    const PipeServerPtr server(new PipeServer(name));
    if (!server->Open(clientProcess)) {
      if (server->GetFault() == platform::PipeFault::kTaken) continue;
      return false;
    }
    if (!StartThread(server)) return false;
    server->WaitRunning();
    serverName = name;
    return true;
  }
  return false;
}

void PipeServerDispatch::Stop() {
  PipeClient(name_).Shutdown();
}

void PipeServerDispatch::EndNow() {
  RequestStop();
  pipe_.StopListening();
}

ServerDispatch& GetServerDispatch(const String& name) {
  static auto& dispatch = *new PipeServerDispatch(name);
  return dispatch;
}

void AbortServedJobs() {
  ServedJobs::Get().AbortAll();
}

void WaitServedJobs() {
  ServedJobs::Get().WaitNone();
}

}  // namespace lumo
