#pragma once

#include <memory>
#include <set>
#include <string>
#include <vector>

#include "commands/job_result.h"
#include "commands/job_writer.h"
#include "jobs/job_channel.h"
#include "jobs/progress_view.h"
#include "jobs/server_link.h"
#include "options/option.h"
#include "output/interruption.h"

namespace lumo::host {

/// Adds the option by which what a verb writes outlasts a power cut.
void AddDurableTo(OptionSet& line, bool& isDurable);

/// The options of a verb that does its work by jobs of its own.
struct RasterJobOptions {
  ServerOptions server{.name = ""};  ///< no name: in this process
  bool printJob = false;
  std::string progress = "auto";
  bool quiet = false;

  void AddTo(OptionSet& line);
  /// For a verb that may take long.
  void AddProgressTo(OptionSet& line);
  ProgressStyle GetProgressStyle() const { return ChooseProgressStyle(progress, quiet); }
};

/// A job document in the making, whose commands run one after the other, each whatever became of
/// those before it.
class JobDraft {
 public:
  JobDraft();

  /// Puts a word in front of the names of the steps that follow, where several pieces of work with
  /// the same names of steps become one document.
  void SetStage(const std::string& stage) { stage_ = stage + "."; }

  /// Adds a command at the end. Further inputs and outputs are the caller's.
  JobWriterCommand& Step(const std::string& name, const char* id);

  /// Adds a command that opens or makes a raster; its URI goes into the variable "$" name.
  /// @param output  of the command, that gives the URI.
  JobWriterCommand& Open(const std::string& name, const char* id, const char* output = "URI");
  /// Adds the command that closes a raster: a variable of Open, or the URI of one that is open.
  void Close(const std::string& name, const String& raster);

  /// The document; `channel` is named in it unless null.
  String Write(const JobChannel* channel = nullptr) const;

  /// The name of a step, and its work.
  struct StepInfo {
    String name;
    String id;
    String opens;   ///< the variable that a raster's URI goes into
    String closes;  ///< a variable or URI
    String output;  ///< that gives the URI, of a step that opens one
  };
  const std::vector<StepInfo>& GetSteps() const { return steps_; }

 private:
  XMLElement root_;
  std::vector<StepInfo> steps_;
  std::string stage_;
};

using JobResults = Map<String, JobResult>;

/// How a job goes with an interrupt.
enum class Interrupts {
  kEnd,            ///< it is ended, and its results do not count
  kEndUnlessDone,  ///< it is ended, which its commands show; where they say success, it was too
                   ///< late
  kWait,           ///< it is short, changes something, and runs to its end
};

/// Runs the jobs of a verb, in this process or by a server. What they opened and did not close is
/// closed at the end, whatever happens; new files are given up then where an exception has ended
/// the session. The first Ctrl-C ends what runs: see Interruption.
class JobSession {
 public:
  /// The server is called with the first job.
  explicit JobSession(const RasterJobOptions& options);
  ~JobSession();
  JobSession(const JobSession&) = delete;
  JobSession& operator=(const JobSession&) = delete;

  /// Runs a job and gives the results of its commands by name. Throws HostError with the reason of
  /// the first command that failed, when the user interrupted it, or when no server answers.
  JobResults Run(const JobDraft& draft, Interrupts interrupts = Interrupts::kEnd);

  /// Progress of the job that runs, over all its commands.
  ProgressReportPtr GetProgress() const;

  /// Throws HostError once the user has interrupted.
  void CheckInterrupt() const;
  bool IsInterrupted() const;

  Interruption& GetInterruption() { return interruption_; }

 private:
  String Execute(const JobDraft& draft, bool watched);
  void NoteOpenRasters(const JobDraft& draft, const JobResults& results);
  static const JobDraft::StepInfo* FindFailed(const JobDraft& draft, const JobResults& results);
  static void CheckResults(const JobDraft& draft, const JobResults& results);
  void SayNotes(const JobDraft& draft, const JobResults& results);
  void CloseAll();

  IPC ipc_;  // of jobs in this process; its flag is that of all
  std::unique_ptr<JobChannel> channel_;
  std::unique_ptr<ServerLink> link_;  // null: in this process
  bool isConnected_ = false;
  const int exceptions_;
  std::vector<String> open_;  // URIs
  std::set<std::string> said_;
  Interruption interruption_;  // the last, since it uses the others
};

/// Throws HostError when a command's output "Return" is false: with its "Fault", else `otherwise`.
void CheckReturn(const JobResults& results, const char* step, const std::string& otherwise);

/// Has a server run a job of one verb. Throws HostError as a JobSession does.
JobResults RunOnServer(const ServerOptions& server, const JobDraft& draft);

/// How far some commands of a job have come, where the commands run one after the other.
class StepProgress final : public ProgressReport {
 public:
  /// @param first  position of the first of the commands.
  /// @param last   position of the last of them.
  /// @param steps  how many commands the job has.
  StepProgress(const ProgressReportPtr& job, std::size_t first, std::size_t last, std::size_t steps)
      : job_(job),
        first_(static_cast<double>(first)),
        count_(static_cast<double>(last - first + 1)),
        steps_(static_cast<double>(steps)) {
    job_->Update(0.0);  // what it shows is of the job before
  }
  double GetProgress() const override { return (job_->GetProgress() * steps_ - first_) / count_; }

 private:
  ProgressReportPtr job_;
  double first_;
  double count_;
  double steps_;
};

}  // namespace lumo::host
