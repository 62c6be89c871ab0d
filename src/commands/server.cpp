#include "commands/server.h"

#include <algorithm>
#include <chrono>
#include <mutex>
#include <thread>
#include <vector>

#include "commands/client.h"
#include "commands/job_parser.h"
#include "commands/job_result.h"
#include "commands/served_jobs.h"
#include "platform/message_pipe.h"
#include "platform/process_watch.h"

namespace lumo {
namespace {

/// The private servers of the process whose threads are running.
class PrivateServers {
 public:
  static PrivateServers& Get() {
    static auto& servers = *new PrivateServers;
    return servers;
  }

  void Add(const PipeServerPtr& server) {
    const std::lock_guard lock(mutex_);
    servers_.push_back(server);
  }

  void Remove(const PipeServer* server) {
    PipeServerPtr last;  // goes after the lock
    const std::lock_guard lock(mutex_);
    const auto at = std::find_if(servers_.begin(), servers_.end(),
                                 [&](const auto& one) { return one.Get() == server; });
    if (at == servers_.end()) return;
    last = *at;
    servers_.erase(at);
  }

  std::vector<PipeServerPtr> All() {
    const std::lock_guard lock(mutex_);
    return servers_;
  }

 private:
  std::mutex mutex_;
  std::vector<PipeServerPtr> servers_;
};

/// Serves message after message until `serve` gives false. What a message throws, memory being
/// short for example, ends with that message.
template <typename Serve>
void ServeAll(NamedPipe& pipe, const SimpleThread& thread, const Serve& serve) {
  constexpr auto kBreather = std::chrono::milliseconds(10);  // for memory to come back
  bool goesOn = true;
  while (goesOn && !thread.StopRequested()) {
    try {
      goesOn = serve();
    } catch (...) {
      std::this_thread::sleep_for(kBreather);
      try {
        pipe.Write(kErrorWord);
      } catch (...) {
        // Then the client sees its connection end without an answer.
      }
    }
  }
  pipe.FinishAnswers();
}

/// True when a text is longer in UTF-8, with a zero byte, than `bytes`.
bool IsLonger(const String& text, std::size_t bytes) {
  constexpr std::size_t kMostForUnit = 3;  // bytes in UTF-8
  return text.GetLength() >= bytes / kMostForUnit && text.ToUTF8().size() + 1 > bytes;
}

/// A result document without the return values, which are too many for a message. A command that
/// had some counts as failed, since its client does without them.
String DescribeWithoutReturns(Job& job, const String& why) {
  XMLDocumentRoot root;
  root.name = "JobResult";
  for (const CommandDescriptorPtr& descriptor : job.commands) {
    auto* const element = new JobResultWriterValue;
    root.children.PushBack(XMLElementPtr(element));
    Map<String, String> returns;
    descriptor->command->GetReturns(returns);
    const bool complete = returns.GetCount() == 0;
    const CommandResult result = descriptor->command->GetResult();
    element->attributes["Name"] = descriptor->name;
    element->attributes["Result"] = GetResultWord(complete ? result : CommandResult::kFailed);
    if (!complete) element->attributes["Reason"] = why;
  }
  return XMLSimpleWriter().Write(root);
}

/// The result document of a job, in as many words as a message can hold.
String DescribeResult(Job& job, std::size_t maxBytes) {
  const String whole = JobResultWriter(job).Write();
  if (!IsLonger(whole, maxBytes)) return whole;
  const String why("the result document has " + std::to_string(whole.ToUTF8().size()) +
                   " bytes, a message " + std::to_string(maxBytes) +
                   " at most: return values are left out");
  const String shorter = DescribeWithoutReturns(job, why);
  if (!IsLonger(shorter, maxBytes)) return shorter;
  return "<JobResult><Command Name=\"\" Result=\"Failed\" Reason=\"" + why +
         ", and so are the commands\"/></JobResult>";
}

}  // namespace

PipeServer::PipeServer(const String& name, int client)
    : pipe_(name), session_(client), maxAnswer_(platform::kMaxMessageBytes) {}

bool PipeServer::Open() {
  return pipe_.Create() && pipe_.EndWithProcess(session_.GetClient());
}

void PipeServer::Run() {
  SetRunning();
  {
    const catalog::SessionScope scope(&session_);
    ServeAll(pipe_, *this, [this] { return Serve(); });
  }
  if (releaseOnQuit_) session_.ReleaseAll();
  PrivateServers::Get().Remove(this);
}

void PipeServer::EndNow() {
  RequestStop();
  pipe_.StopListening();
}

/// Serves one message; false at the end of the server.
bool PipeServer::Serve() {
  String request;
  return pipe_.Listen() && (pipe_.Read(request) == 0 || Answer(request));
}

/// Answers one message; false for the word that ends the server.
bool PipeServer::Answer(const String& request) {
  if (request == kQuitWord) return false;
  if (request.GetLength() == 0) {
    pipe_.Write(kErrorWord);
  } else {
    RunAndReply(request);
  }
  return true;
}

void PipeServer::RunAndReply(const String& document) {
  Job job;
  JobParser(job).Parse(document);
  const int client = pipe_.GetClientProcess();
  const ServedJob served(job, client);
  const platform::ProcessWatch watch(client, [&job] { job.GetIPC().abort->Set(true); });
  session_.BeginJob();
  RunJob(job);
  session_.EndJob(job.GetIPC().abort->IsSet());
  pipe_.Write(DescribeResult(job, maxAnswer_));
}

bool PipeServerDispatch::Open() {
  return name_.Find("%") == String::kNotFound && pipe_.Create();
}

void PipeServerDispatch::Run() {
  SetRunning();
  ServeAll(pipe_, *this, [this] { return Serve(); });
}

/// Serves one message; false at the end of the dispatcher.
bool PipeServerDispatch::Serve() {
  if (!Open() || !pipe_.Listen()) return false;
  String request;
  if (pipe_.Read(request) == 0) return true;
  if (request == kNewServerWord) {
    String serverName(kErrorWord);
    StartServer(pipe_.GetClientProcess(), serverName);
    pipe_.Write(serverName);
  } else if (request == kQuitWord) {
    RequestStop();
  }
  return true;
}

/// Starts a private server; its name is changed only when that worked.
bool PipeServerDispatch::StartServer(int clientProcess, String& serverName) {
  // A name may still be in use, by a private server that has outlived an earlier dispatcher.
  constexpr unsigned kTries = 1000;
  for (unsigned i = 0; i < kTries; ++i) {
    const String name = String::Format((name_ + "_SERVER_%08x").GetUTF8(), nextServer_++);
    const PipeServerPtr server(new PipeServer(name, clientProcess));
    if (releaseOnQuit_) server->ReleaseOnQuit();
    if (!server->Open()) {
      if (server->GetFault() == platform::PipeFault::kTaken) continue;
      return false;
    }
    PrivateServers::Get().Add(server);
    if (!StartThread(server)) {
      PrivateServers::Get().Remove(server.Get());
      return false;
    }
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

void EndServers() {
  const std::vector<PipeServerPtr> servers = PrivateServers::Get().All();
  for (const PipeServerPtr& server : servers) server->EndNow();
  for (const PipeServerPtr& server : servers) server->WaitEnded();
}

void WaitServedJobs() {
  ServedJobs::Get().WaitNone();
}

}  // namespace lumo
