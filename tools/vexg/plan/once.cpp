#include "plan/once.h"

#include <algorithm>
#include <chrono>
#include <filesystem>
#include <fstream>
#include <iterator>
#include <memory>
#include <set>

#include "commands/catalog_session.h"
#include "commands/job_parser.h"
#include "commands/job_result.h"
#include "foundation/abandonment.h"
#include "jobs/result_output.h"
#include "output/output_file.h"
#include "plan/file_checksum.h"
#include "plan/job_commands.h"
#include "plan/manifest.h"
#include "platform/durability.h"
#include "platform/file_identity.h"
#include "platform/folder_lock.h"
#include "platform/random_access_file.h"
#include "verb.h"

namespace lumo::host {
namespace {

namespace fs = std::filesystem;

Json AsJson(const std::vector<PlannedInput>& files) {
  Json list = Json::array();
  for (const PlannedInput& file : files) {
    list.push_back({{"file", file.file}, {"size", file.size}, {"time", file.time}});
  }
  return list;
}

bool Holds(const Json& list, const PlannedInput& file) {
  return std::any_of(list.begin(), list.end(), [&](const Json& entry) {
    return entry.value("file", "") == file.file &&
           entry.value("size", std::uint64_t{0}) == file.size &&
           entry.value("time", std::int64_t{0}) == file.time;
  });
}

bool IsAsTold(const Json& entry) {
  const platform::FileIdentity found = platform::IdentifyFile(entry.value("file", ""));
  return found.exists && found.size == entry.value("size", std::uint64_t{0}) &&
         found.time == entry.value("time", std::int64_t{0});
}

/// The result that a run has left; null for none that can be read.
Json ReadResult(const std::string& path) {
  std::ifstream in(path, std::ios::binary);
  if (!in) return {};
  const Json result =
      Json::parse(std::string{std::istreambuf_iterator<char>(in), {}}, nullptr, false);
  return result.is_object() ? result : Json();
}

/// True when the result is of this hash, and the outputs are as it tells.
bool IsDone(const Json& result, const std::string& hash) {
  if (!result.is_object() || result.value("hash", "") != hash) return false;
  const Json outputs = result.value("outputs", Json::array());
  return std::all_of(outputs.begin(), outputs.end(), IsAsTold);
}

/// One document of a plan, or one alone.
class OnceRun {
 public:
  explicit OnceRun(const OnceRequest& request)
      : request_(request),
        path_(fs::absolute(request.document)),
        folder_(path_.parent_path().string()),
        text_(ReadFile(request.document)) {}

  int Run() {
    Find();
    resultPath_ = (fs::path(folder_) / planned_.GetResultName()).string();
    const Json before = ReadResult(resultPath_);
    CheckInputs(before);
    if (IsDone(before, planned_.hash)) return SayDone();
    for (const std::string& other : planned_.dependsOn) CheckDone(other);
    return RunAnew();
  }

 private:
  /// Finds the document in the manifest; one without any is taken as it is.
  void Find() {
    const std::string name = path_.filename().string();
    std::error_code ignored;
    if (!fs::exists(fs::path(folder_) / kManifestName, ignored)) {
      planned_.document = name;
      commands_ = JobCommands(Document(String(text_), request_.document));
      const JobFiles files = FindFiles(commands_.commands);
      for (const std::string& file : files.read) planned_.inputs.push_back(LookAt(file));
      planned_.outputs = files.made;
      planned_.hash = HashOf(text_, planned_.inputs, {});
      return;
    }
    manifest_ = ReadManifest(folder_);
    const PlannedDocument* const found = manifest_.Find(name);
    if (found == nullptr) Refuse("is no document of the plan in this folder");
    planned_ = *found;
    std::vector<std::string> before;
    for (const std::string& other : planned_.dependsOn) {
      const PlannedDocument* const document = manifest_.Find(other);
      if (document != nullptr) before.push_back(document->hash);
    }
    if (HashOf(text_, planned_.inputs, before) != planned_.hash) {
      Refuse("is not as it was planned");
    }
    std::error_code fault;
    fs::current_path(manifest_.folder, fault);
    if (fault) Refuse("the folder " + manifest_.folder + " is not there: " + fault.message());
    commands_ = JobCommands(Document(String(text_), request_.document));
  }

  [[noreturn]] void Refuse(const std::string& why) const {
    throw HostError(kExitUsage, request_.document + ": " + why + "; plan again; nothing was run");
  }

  /// Refuses inputs that are others than planned. Those that the document itself has changed, as
  /// statistics that are saved with a raster, are as its result tells.
  void CheckInputs(const Json& before) const {
    const bool isOfHash = before.is_object() && before.value("hash", "") == planned_.hash;
    const Json kept = isOfHash ? before.value("inputs", Json::array()) : Json::array();
    for (const PlannedInput& input : planned_.inputs) {
      const PlannedInput now = LookAt(input.file);
      if ((now.size == input.size && now.time == input.time) || Holds(kept, now)) continue;
      throw HostError(kExitUsage, input.file + ": has changed since " + request_.document +
                                      " was planned; plan again; nothing was run");
    }
  }

  /// Refuses to go before a document that comes first. One that has been done, but whose outputs
  /// are others by now, is done again: a run of this document that was killed has changed them.
  void CheckDone(const std::string& other) const {
    const PlannedDocument* const document = manifest_.Find(other);
    if (document == nullptr) Refuse("the plan has no " + other);
    const fs::path path = fs::path(folder_) / document->GetResultName();
    const Json result = ReadResult(path.string());
    if (IsDone(result, document->hash)) return;
    if (result.is_object() && result.value("hash", "") == document->hash) {
      OnceRequest first = request_;
      first.document = (fs::path(folder_) / other).string();
      first.quiet = true;
      std::error_code fault;
      const auto time = fs::last_write_time(path, fault);
      if (OnceRun(first).Run() == kExitSuccess) {
        if (!fault) fs::last_write_time(path, time, fault);  // nobody has to come after it anew
        return;
      }
    }
    throw HostError(kExitUsage, request_.document + ": " + other +
                                    " isn't done, which comes first; nothing was run");
  }

  /// Refuses files of documents before this one whose bytes are no longer those that were made: a
  /// disk may have changed them, and packed pixels are taken as they are.
  void CheckBytes(const std::vector<std::string>& read, const AbortFlag& abort) const {
    const std::set<std::string> wanted(read.begin(), read.end());
    for (const std::string& other : planned_.dependsOn) {
      const PlannedDocument* const document = manifest_.Find(other);
      if (document == nullptr) continue;
      const std::string path = (fs::path(folder_) / document->GetResultName()).string();
      for (const Json& output : ReadResult(path).value("outputs", Json::array())) {
        const std::string file = output.value("file", ""), sum = output.value("checksum", "");
        if (sum.empty() || !wanted.contains(file)) continue;
        const std::string now = ChecksumOf(file, abort);
        if (now.empty() || now == sum) continue;
        throw HostError(kExitFailed, file + ": is damaged: its bytes are not those that " + other +
                                         " has made; remove it, and have that document run again");
      }
    }
  }

  /// The files that were made, with their checksums where a document takes them.
  Json MadeAsJson(const AbortFlag& abort) const {
    const bool isTaken = std::any_of(
        manifest_.documents.begin(), manifest_.documents.end(), [&](const PlannedDocument& other) {
          return std::find(other.dependsOn.begin(), other.dependsOn.end(), planned_.document) !=
                 other.dependsOn.end();
        });
    std::vector<PlannedInput> made;
    for (const std::string& file : planned_.outputs) made.push_back(LookAt(file));
    Json list = AsJson(made);
    for (Json& entry : list) {
      if (isTaken) entry["checksum"] = ChecksumOf(entry.value("file", ""), abort);
    }
    return list;
  }

  /// A result counts as new from now on for programs that go by the times of files. The remains of
  /// a run that was killed at its very end go away.
  int SayDone() const {
    for (const std::string& file : FindFiles(commands_.commands).made) {
      const OutputFile cleaned(file, {.overwrite = true});
    }
    std::error_code ignored;
    fs::last_write_time(resultPath_, fs::file_time_type::clock::now(), ignored);
    if (!request_.quiet) Say(request_.document + ": done already");
    return kExitSuccess;
  }

  int RunAnew() {
    Job job;
    const AbortFlagPtr abort = job.GetIPC().abort;
    Interruption interruption([&] { abort->Set(true); });
    interruption.SetLast();
    platform::SetDurable(request_.isDurable);
    const JobFiles files = FindFiles(commands_.commands);
    CheckBytes(files.read, *abort);
    const OutputRules rules{.overwrite = true, .isDurable = request_.isDurable};
    auto outputs = std::make_unique<Outputs>(interruption, rules, files.read);
    for (const std::string& file : files.made) outputs->Add(file);
    outputs->Begin(std::vector<std::uint64_t>(files.made.size(), 0));
    std::map<std::string, std::string> names;
    for (std::size_t i = 0; i < files.made.size(); ++i) {
      names[files.made[i]] = outputs->Get(i).GetWorkName();
    }
    JobCommands renamed = commands_;
    for (JobCommand& command : renamed.commands) RenameFiles(names, command);
    const std::string text = renamed.Write();

    const Document document(String(text), request_.document);
    JobParser(job).Parse(String(text));
    job.tellsReasons = true;
    const String result = Execute(job, abort);
    const Outcome outcome = OutcomeOf(result, abort->IsSet());
    const int code = ExitCodeAfter(outcome, ExitCodeOf(document, result));
    if (outcome != Outcome::kDone || code != kExitSuccess || hasFault_) {
      return code == kExitSuccess ? kExitFailed : code;
    }
    Place(std::move(outputs), document, result, *abort);
    interruption.SetDone();
    return kExitSuccess;
  }

  String Execute(Job& job, const AbortFlagPtr& abort) {
    ProgressView view(job.GetIPC().progress, request_.progress);
    RunJob(job);
    const String result = JobResultWriter(job).Write();
    const Outcome outcome = OutcomeOf(result, abort->IsSet());
    const AbandonScope abandonment(outcome != Outcome::kDone);  // of files that aren't whole
    for (const String& fault : catalog::Empty()) {
      Say(fault.ToUTF8());
      hasFault_ = true;
    }
    view.SetOutcome(outcome);
    return result;
  }

  /// Gives the outputs their places, and writes the result. Who comes later finds it, and throws
  /// his own away.
  void Place(std::unique_ptr<Outputs> outputs, const Document& document, const String& result,
             const AbortFlag& abort) {
    const platform::FolderLock lock(resultPath_);
    lock.IsHeld();  // where there is no lock, the last one wins, with the same
    if (IsDone(ReadResult(resultPath_), planned_.hash)) return;
    outputs->Commit([] {});
    outputs.reset();  // their folders go before there is a result: nobody comes here after that
    Json all{{"document", planned_.document}, {"hash", planned_.hash}};
    std::vector<PlannedInput> read;
    for (const PlannedInput& input : planned_.inputs) read.push_back(LookAt(input.file));
    all["outputs"] = MadeAsJson(abort);
    all["inputs"] = AsJson(read);
    all.update(ResultAsJson(document, result));
    const std::string text = all.dump(1) + "\n";
    std::string fault;  // a kill leaves the whole result or none, and nothing beside the whole one
    if (platform::ReplaceFile(resultPath_, text, &fault)) return;
    throw HostError(kExitFailed, "the result can't be written: " + fault);
  }

  const OnceRequest& request_;
  const fs::path path_;
  const std::string folder_;
  const std::string text_;
  Manifest manifest_;
  PlannedDocument planned_;
  JobCommands commands_;
  std::string resultPath_;
  bool hasFault_ = false;
};

}  // namespace

int RunOnce(const OnceRequest& request) {
  if (request.document == "-") {
    throw HostError(kExitUsage,
                    "--once: the result lies beside the document, which has to be a file");
  }
  return OnceRun(request).Run();
}

}  // namespace lumo::host
