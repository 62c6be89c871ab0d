#include <filesystem>
#include <fstream>
#include <iostream>
#include <map>
#include <memory>
#include <set>
#include <sstream>

#include <fmt/format.h>

#include "foundation/near_name.h"
#include "options/command_line.h"
#include "options/option_values.h"
#include "output/capture.h"
#include "plan/job_cut.h"
#include "plan/manifest.h"
#include "plan/runner_text.h"
#include "platform/random_access_file.h"
#include "rasters/raster_target.h"
#include "verb.h"

namespace lumo::host {
namespace {

namespace fs = std::filesystem;

struct PlanOptions {
  std::string work;  ///< a verb, a document, or the folder of a plan
  std::vector<std::string> words;
  std::string folder;
  std::string runner;
  std::string join = "file";
  std::uint64_t parts = 0;
  std::uint64_t partMemory = 0;
  unsigned threads = 1;
  bool replaces = false;
  bool isQuiet = false;
};

class Planner {
 public:
  explicit Planner(const PlanOptions& options) : options_(options) {}

  int Run() {
    std::error_code ignored;
    if (!options_.runner.empty() && options_.folder.empty()) return PrintRunner(options_.work);
    if (FindVerb(options_.work) == nullptr && fs::is_directory(options_.work, ignored)) {
      throw HostError(kExitUsage, options_.work + ": a folder; --runner prints what runs a plan");
    }
    if (options_.folder.empty()) throw HostError(kExitUsage, "-o is required: the folder to make");
    if ((options_.parts == 0) == (options_.partMemory == 0)) {
      throw HostError(kExitUsage, "give one of --parts and --part-memory");
    }
    MakeFolder();
    const JobCommands job(Document(String(ReadWork()), options_.work));
    if (job.commands.empty()) throw HostError(kExitUsage, options_.work + ": holds no Command");
    const CutJobs cut =
        CutIntoJobs(job, {options_.parts, options_.partMemory, options_.threads, folder_.string(),
                          options_.join == "vrt" ? Join::kVrt : Join::kFile});
    const Manifest manifest = Write(cut);
    if (!options_.runner.empty()) {
      std::cout << RunnerText(options_.runner, manifest, folder_.string());
    }
    return kExitSuccess;
  }

 private:
  int PrintRunner(const std::string& folder) const {
    if (!options_.words.empty()) throw HostError(kExitUsage, "--runner takes the folder of a plan");
    std::cout << RunnerText(options_.runner, ReadManifest(folder), fs::canonical(folder).string());
    return kExitSuccess;
  }

  /// The document that is asked for.
  std::string ReadWork() const {
    const bool isVerb = FindVerb(options_.work) != nullptr;
    if (!isVerb && !options_.words.empty()) {
      std::vector<std::string> names;
      for (const Verb& known : GetVerbs()) names.push_back(known.name);
      throw HostError(kExitUsage,
                      "there is no verb " + options_.work + DidYouMean(options_.work, names));
    }
    if (!isVerb) return ReadFile(options_.work);
    const Verb verb = MakeVerb(options_.work);
    if (verb.options.Find("--print-job") == nullptr || verb.name == "plan") {
      throw HostError(kExitUsage, "plan: " + verb.name + " is no verb that works by a job");
    }
    std::vector<std::string> words = options_.words;
    words.emplace_back("--print-job");
    if (options_.join == "vrt") TakeVrtNames();
    ReadVerbArguments(verb, words);
    const Capture capture;
    verb.work();
    return capture.Text();
  }

  /// Makes the folder of the plan, and looks whether it may be used.
  void MakeFolder() {
    std::error_code fault;
    fs::create_directories(options_.folder, fault);
    if (fault) throw HostError(kExitFailed, options_.folder + ": " + fault.message());
    folder_ = fs::canonical(options_.folder);
    if (folder_.string().find_first_of("|[]$") != std::string::npos) {
      throw HostError(kExitUsage, options_.folder + ": no document can name files there");
    }
    if (fs::exists(folder_ / kManifestName) && !options_.replaces) {
      throw HostError(kExitUsage,
                      options_.folder + ": holds a plan already; give --replace to make it anew");
    }
  }

  Manifest Write(const CutJobs& cut) const {
    Manifest manifest;
    manifest.folder = fs::current_path().string();
    manifest.notes = cut.notes;
    std::vector<JobFiles> files;
    std::set<std::string> made;
    for (const CutJob& job : cut.jobs) {
      files.push_back(FindFiles(job.job.commands));
      made.insert(files.back().made.begin(), files.back().made.end());
      made.insert(files.back().inPlace.begin(), files.back().inPlace.end());
    }
    std::map<std::string, PlannedInput> inputs;  // each is looked at once
    for (std::size_t i = 0; i < cut.jobs.size(); ++i) {
      const CutJob& job = cut.jobs[i];
      PlannedDocument planned;
      planned.document = job.name + ".xml";
      std::vector<std::string> before;
      for (const std::size_t other : job.dependsOn) {
        planned.dependsOn.push_back(manifest.documents[other].document);
        before.push_back(manifest.documents[other].hash);
      }
      for (const std::string& file : files[i].read) {
        if (made.contains(file)) continue;
        if (!inputs.contains(file)) inputs[file] = LookAt(file);
        planned.inputs.push_back(inputs[file]);
      }
      planned.outputs = files[i].made;
      planned.outputs.insert(planned.outputs.end(), files[i].inPlace.begin(),
                             files[i].inPlace.end());
      planned.threads = job.threads;
      planned.memory = job.memory;
      const std::string text = job.job.Write() + "\n";
      planned.hash = HashOf(text, planned.inputs, before);
      Put(planned.document, text);
      manifest.documents.push_back(std::move(planned));
    }
    Put(kManifestName, manifest.Write());
    for (const std::string& note : cut.notes) {
      if (!options_.isQuiet) Say("note: " + note);
    }
    return manifest;
  }

  void Put(const std::string& name, const std::string& text) const {
    std::ofstream out(folder_ / name, std::ios::binary | std::ios::trunc);
    out << text;
    out.close();
    if (out) return;
    throw HostError(kExitFailed, (folder_ / name).string() + ": can't be written");
  }

  const PlanOptions& options_;
  fs::path folder_;
};

const VerbRegistration planRegistration(
    "plan", "Cuts a job into documents that run on many processors or machines",
    [](OptionSet& line) {
      const auto options = std::make_shared<PlanOptions>();
      line.AddNote(
          "Makes part-0000.xml and so on, merge.xml and manifest.json in a folder that all workers "
          "see under the same name. vexg run --once runs one of them; results are those of the "
          "single run, to the byte. What stands behind the verb goes to it; an option that both "
          "have is the verb's there, and plan's in front of it.");
      line.AddNote(
          "What commands make in place, as seams of a mosaic, comes first, in prepare.xml. A "
          "command that can't be divided is done by one document, and a line says so.");
      line.AddExample("vexg plan -o plan --parts 8 warp scene.tif out.tif --to EPSG:4326");
      line.AddExample("vexg plan job.xml --part-memory 1000000000 -o plan --runner slurm");
      line.AddExample("vexg plan plan --runner make | make -f - -C plan -j 4");
      line.Add("work", options->work,
               "A verb, a job document, or with --runner the folder of a plan")
          .Shows("VERB|JOB.xml|DIR")
          .Required();
      line.Add("words", options->words, "Arguments of the verb").Shows("WORD");
      line.Add("--into,-o", options->folder, "The folder of the plan").IsFile("DIR");
      line.Add("--parts", options->parts, "How many parts").Within(1, 10000);
      line.Add("--part-memory", options->partMemory,
               "As many parts as leave each at most so many bytes of pixels")
          .Shows("BYTES")
          .Within(1, 1ULL << 62U);
      line.Add("--threads", options->threads, "Threads of each worker; the merge has twice as many")
          .Within(1, 1024)
          .ShowsDefault();
      line.Add("--join", options->join,
               "What the parts of a raster become: a file as the single run makes it, or a VRT "
               "file on those of the parts, whose name ends with .vrt")
          .Takes(OneOf({"file", "vrt"}))
          .ShowsDefault();
      line.Add("--runner", options->runner, "Print what runs the plan").Takes(OneOf(RunnerNames()));
      line.Add("--replace", options->replaces, "Make the plan of a folder anew");
      line.Add("--quiet,-q", options->isQuiet, "Say nothing of what isn't divided");
      return VerbRegistration::Work([options] { return Planner(*options).Run(); });
    });

}  // namespace
}  // namespace lumo::host
