#include "jobs/raster_job.h"

#include <algorithm>
#include <exception>
#include <utility>

#include "commands/job_parser.h"
#include "foundation/abandonment.h"
#include "options/option_values.h"
#include "verb.h"

namespace lumo::host {
namespace {

String RunHere(const String& document, const IPC& ipc) {
  Job job;
  JobParser(job).Parse(document);
  job.defaultIpc = ipc;
  RunJob(job);
  return JobResultWriter(job).Write();
}

}  // namespace

void AddDurableTo(OptionSet& line, bool& isDurable) {
  line.Add("--durable", isDurable,
           "End only when what was written outlasts a power cut, which nothing else promises; "
           "a server always does");
}

void RasterJobOptions::AddTo(OptionSet& line) {
  line.Add("--server", server.name, "Have the server of this name do the work").Shows("NAME");
  server.AddNoWait(line);
  line.Add("--print-job", printJob, "Print the job document instead of running it");
}

void RasterJobOptions::AddProgressTo(OptionSet& line) {
  line.Add("--progress", progress, "How progress shows on standard error")
      .Takes(OneOf({"auto", "bar", "json", "none"}))
      .ShowsDefault();
  line.Add("--quiet,-q", quiet, "Show neither progress nor where the area lies");
}

JobDraft::JobDraft() : root_("Job") {
  root_.AddChild("Reasons");
}

JobWriterCommand& JobDraft::Step(const std::string& name, const char* id) {
  auto* const command = new JobWriterCommand;
  root_.children.PushBack(XMLElementPtr(command));
  const String named(stage_ + name);
  command->attributes["Name"] = named;
  command->attributes["ID"] = id;
  if (!steps_.empty()) command->AddDependsOn(steps_.back().name);
  steps_.push_back({named, id, "", "", ""});
  return *command;
}

JobWriterCommand& JobDraft::Open(const std::string& name, const char* id, const char* output) {
  JobWriterCommand& command = Step(name, id);
  steps_.back().opens = String("$" + name);
  steps_.back().output = output;
  command.AddOutput(output, steps_.back().opens);
  return command;
}

void JobDraft::Close(const std::string& name, const String& raster) {
  Step(name, "CloseRasterCommand").AddInput("URI", raster);
  steps_.back().closes = raster;
}

String JobDraft::Write(const JobChannel* channel) const {
  XMLElement job("Job");
  if (channel != nullptr) channel->AddTo(job);
  XMLDocumentRoot document;
  document.name = root_.name;
  if (ChecksAreStrict()) document.attributes["Checks"] = FormatValue(JobChecks::kStrict);
  for (const XMLElementPtr& child : job.children) document.children.PushBack(child);
  for (const XMLElementPtr& child : root_.children) document.children.PushBack(child);
  return XMLSimpleWriter().Write(document);
}

JobSession::JobSession(const RasterJobOptions& options)
    : channel_(options.server.name.empty() ? nullptr : std::make_unique<JobChannel>()),
      link_(channel_ ? std::make_unique<ServerLink>(options.server) : nullptr),
      exceptions_(std::uncaught_exceptions()),
      interruption_([this] {
        ipc_.abort->Set(true);
        if (channel_) channel_->Abort();
      }) {}

JobSession::~JobSession() {
  try {
    const AbandonScope abandonment(std::uncaught_exceptions() > exceptions_);
    CloseAll();
  } catch (const std::exception&) {
    // The server has gone, and with it what was open.
  }
}

ProgressReportPtr JobSession::GetProgress() const {
  return channel_ ? channel_->GetProgress() : ipc_.progress;
}

bool JobSession::IsInterrupted() const {
  return ipc_.abort->IsSet() || (channel_ && channel_->IsAborted());
}

void JobSession::CheckInterrupt() const {
  if (!IsInterrupted() || interruption_.IsDone()) return;
  throw HostError(kExitFailed, interruption_.Describe(ipc_.abort->IsSet() ? "interrupted"
                                                                          : "the job was aborted"));
}

JobResults JobSession::Run(const JobDraft& draft, Interrupts interrupts) {
  CheckInterrupt();
  JobResults results;
  if (interrupts == Interrupts::kWait) {
    const Interruption::Hold hold(interruption_);
    JobResultParser(results).Parse(Execute(draft, false));
  } else {
    JobResultParser(results).Parse(Execute(draft, true));
  }
  NoteOpenRasters(draft, results);
  const bool isDone = interrupts != Interrupts::kEnd && FindFailed(draft, results) == nullptr;
  if (!isDone) CheckInterrupt();
  CheckResults(draft, results);
  SayNotes(draft, results);
  return results;
}

/// Says what the opening of a raster noted, once.
void JobSession::SayNotes(const JobDraft& draft, const JobResults& results) {
  for (const JobDraft::StepInfo& step : draft.GetSteps()) {
    const std::string note = results.Find(step.name).returns.Find("Note").ToUTF8();
    if (step.opens.GetLength() != 0 && !note.empty() && said_.insert(note).second) Say(note);
    const std::string warning = results.Find(step.name).returns.Find("Warning").ToUTF8();
    if (!warning.empty() && said_.insert(warning).second) Say("warning: " + warning);
  }
}

/// @param watched  with the progress and the abort flag of the session.
String JobSession::Execute(const JobDraft& draft, bool watched) {
  if (link_ && !std::exchange(isConnected_, true)) link_->Connect();
  if (link_) return link_->Run(draft.Write(watched ? channel_.get() : nullptr));
  return RunHere(draft.Write(), watched ? ipc_ : IPC());
}

void JobSession::NoteOpenRasters(const JobDraft& draft, const JobResults& results) {
  Map<String, String> variables;
  for (const JobDraft::StepInfo& step : draft.GetSteps()) {
    const JobResult& result = results.Find(step.name);
    if (step.opens.GetLength() != 0 && result.returns.HasKey(step.output)) {
      const String uri = result.returns.Find(step.output);
      if (uri.GetLength() == 0) continue;
      variables[step.opens] = uri;
      open_.push_back(uri);
    } else if (step.closes.GetLength() != 0 && result.result == "Success") {
      const bool isVariable = variables.HasKey(step.closes);
      const String uri = isVariable ? variables.Find(step.closes) : step.closes;
      const auto at = std::find(open_.begin(), open_.end(), uri);
      if (at != open_.end()) open_.erase(at);
    }
  }
}

/// The first step that did not succeed; null for none.
const JobDraft::StepInfo* JobSession::FindFailed(const JobDraft& draft, const JobResults& results) {
  for (const JobDraft::StepInfo& step : draft.GetSteps()) {
    if (results.Find(step.name).result != "Success") return &step;
  }
  return nullptr;
}

void JobSession::CheckResults(const JobDraft& draft, const JobResults& results) {
  const JobDraft::StepInfo* const failed = FindFailed(draft, results);
  if (failed == nullptr) return;
  const std::string id = failed->id.ToUTF8();
  if (!results.HasKey(failed->name)) {
    throw HostError(kExitFailed, "the server does not know the command " + id);
  }
  const std::string reason = results.Find(failed->name).reason.ToUTF8();
  throw HostError(kExitFailed, reason.empty() ? id + " failed without a reason" : reason);
}

void JobSession::CloseAll() {
  if (open_.empty()) return;
  JobDraft draft;
  for (std::size_t i = 0; i < open_.size(); ++i) {
    draft.Close("close" + std::to_string(i), open_[i]);
  }
  open_.clear();
  Execute(draft, false);
}

void CheckReturn(const JobResults& results, const char* step, const std::string& otherwise) {
  const Map<String, String>& returns = results.Find(step).returns;
  if (ParseValue<bool>(returns.Find("Return"))) return;
  const std::string fault = returns.Find("Fault").ToUTF8();
  throw HostError(kExitFailed, fault.empty() ? otherwise : fault);
}

JobResults RunOnServer(const ServerOptions& server, const JobDraft& draft) {
  RasterJobOptions options;
  options.server = server;
  return JobSession(options).Run(draft);
}

}  // namespace lumo::host
