#include "plan/job_cut.h"

#include <algorithm>
#include <filesystem>
#include <map>
#include <optional>
#include <set>

#include <fmt/format.h>

#include "commands/division.h"
#include "plan/job_slices.h"
#include "platform/temporary_file.h"
#include "raster/creation_options.h"
#include "raster/pixel_types.h"
#include "rasters/raster_source.h"
#include "verb.h"

namespace lumo::host {
namespace {

constexpr const char* kCreate = "CreateRasterCommand";
constexpr const char* kClose = "CloseRasterCommand";

/// A command that is divided.
struct Cut {
  std::size_t at;  ///< in the job
  const DivisionDeclaration* division;
  unsigned level = 1;              ///< 1: it needs nothing of other divided commands
  std::size_t create = 0;          ///< of kRows: the command that makes the target
  RasterInfo source{};             ///< the raster that is read
  std::vector<unsigned> firsts{};  ///< of kRows: the first line of each part, and behind the last
};

std::string NumberArray(const std::vector<unsigned>& numbers) {
  std::string text = fmt::format("1:{} [", numbers.size());
  for (std::size_t i = 0; i < numbers.size(); ++i) {
    text += fmt::format("{}{}", i == 0 ? "" : " ", numbers[i]);
  }
  return text + "] ";
}

std::string JoinedByBars(const std::vector<std::string>& texts) {
  std::string joined;
  for (const std::string& text : texts) joined += (joined.empty() ? "" : "|") + text;
  return joined;
}

/// Files in a folder of their own in the place of those that a job makes, while it is measured.
class Scratch {
 public:
  explicit Scratch(const std::vector<std::string>& files) {
    namespace fs = std::filesystem;
    if (files.empty()) return;
    folder_ = platform::TemporaryFolderBeside((fs::temp_directory_path() / "vexg-plan").string());
    fs::create_directory(folder_);
    for (const std::string& file : files) {
      names_[file] = (fs::path(folder_) / fs::path(file).filename()).string();
    }
  }
  ~Scratch() {
    std::error_code ignored;
    if (!folder_.empty()) std::filesystem::remove_all(folder_, ignored);
  }
  Scratch(const Scratch&) = delete;
  Scratch& operator=(const Scratch&) = delete;

  void Rename(JobCommand& command) const { RenameFiles(names_, command); }

 private:
  std::string folder_;
  std::map<std::string, std::string> names_;
};

class Cutter {
 public:
  Cutter(const JobCommands& job, const CutRequest& request)
      : job_(job), request_(request), slices_(job), firstEnd_(slices_.GetFirstEnd()) {}

  CutJobs Run() {
    FindCuts();
    for (Cut& cut : cuts_) Measure(cut);
    DropOddTypes();
    ChoosePlaces();
    CutJobs made;
    AddFirst(made);
    if (cuts_.empty()) {
      AddWhole(made);
    } else {
      AddParts(made);
      AddMerge(made);
    }
    made.notes = notes_;
    return made;
  }

 private:
  const JobCommand& At(std::size_t at) const { return job_.commands[at]; }
  Cut* FindCut(std::size_t at) {
    const auto cut =
        std::find_if(cuts_.begin(), cuts_.end(), [&](const Cut& other) { return other.at == at; });
    return cut != cuts_.end() ? &*cut : nullptr;
  }

  // Choosing what is divided.

  void FindCuts() {
    for (std::size_t at = firstEnd_; at < job_.commands.size(); ++at) {
      const DivisionDeclaration* const division = slices_.DivisionAt(at);
      if (division == nullptr) continue;
      std::string why = "it can't be divided";
      if (division->kind == DivisionKind::kRows || division->kind == DivisionKind::kShares) {
        Cut cut{at, division};
        why = WhyNot(cut);
        if (why.empty()) cuts_.push_back(cut);
      }
      const bool isWork =
          division->kind != DivisionKind::kNone || !FindFiles({At(at)}).made.empty();
      if (!why.empty() && isWork && At(at).id != kCreate) {
        notes_.push_back(
            fmt::format("{} ({}): {}; one document does all of it", At(at).id, At(at).name, why));
      }
    }
  }

  /// Why a command can't be divided here; empty when it can. Sets the level and the target.
  std::string WhyNot(Cut& cut) {
    const JobCommand& command = At(cut.at);
    const std::string when = cut.division->dividesWhen;
    const std::string* const form = when.empty() ? nullptr : command.Find(when);
    if (!when.empty() && (form == nullptr || *form != "Exact")) return when + " is not Exact";
    const std::string* const source = command.Find(cut.division->source);
    if (source == nullptr || !source->starts_with('$')) return "its source is open before the job";
    for (const std::size_t at : slices_.SliceOf(command, cut.at)) {
      if (const Cut* const before = FindCut(at)) cut.level = std::max(cut.level, before->level + 1);
      if (slices_.ReadsWhatIsMade(at)) return "it works on files that the job makes";
    }
    if (slices_.ReadsWhatIsMade(cut.at)) return "it works on files that the job makes";
    if (cut.division->kind != DivisionKind::kRows) return {};
    const std::string* const target = command.Find(cut.division->target);
    if (command.Find("Bands") != nullptr) return "it chooses bands itself";
    for (std::size_t at = cut.at; target != nullptr && at-- > 0;) {
      const bool isMaking =
          std::any_of(At(at).outputs.begin(), At(at).outputs.end(),
                      [&](const JobOutput& output) { return output.variable == *target; });
      if (!isMaking) continue;
      cut.create = at;
      return At(at).id == kCreate ? "" : "its target is no new raster";
    }
    return "its target is open before the job";
  }

  // Measuring.

  /// Asks the source of a cut for its size.
  void Measure(Cut& cut) {
    RasterJobOptions options;
    JobSession session(options);
    JobDraft draft;
    const std::string variable = *At(cut.at).Find(cut.division->source);
    std::vector<std::string> opened;
    // The commands that come first have not run yet: those that make the files which are opened
    // run aside.
    const Scratch scratch(FirstFiles());
    std::set<std::size_t> steps;
    for (std::size_t at = 0; at < firstEnd_; ++at) {
      if (!FindFiles({At(at)}).inPlace.empty()) steps.insert(at);
    }
    for (const std::size_t at : slices_.SliceFor({variable}, cut.at)) {
      if (!slices_.IsFirst(at)) steps.insert(at);
    }
    for (const std::size_t at : steps) {
      JobCommand command = At(at);
      scratch.Rename(command);
      AddTo(draft, command);
      for (const JobOutput& output : command.outputs) {
        if (IsRaster(output)) opened.push_back(output.variable);
      }
    }
    AddQuery(draft, "measured", String(variable));
    for (auto raster = opened.rbegin(); raster != opened.rend(); ++raster) {
      draft.Close("close." + raster->substr(1), String(*raster));
    }
    cut.source = ReadInfo(session.Run(draft), "measured");
  }

  /// Leaves whole what there are no views on, and questions what the single run of a verb looks at
  /// and a document doesn't.
  void DropOddTypes() {
    const auto isOdd = [this](const Cut& cut) {
      const bool isEight =
          DispatchType(EightTypes{}, cut.source.dataType, []<typename T>() { return true; });
      if (isEight || cut.division->kind != DivisionKind::kRows) return false;
      notes_.push_back(
          fmt::format("{} ({}): lines of complex numbers can't be divided; one "
                      "document does all of it",
                      At(cut.at).id, At(cut.at).name));
      return true;
    };
    std::erase_if(cuts_, isOdd);
    for (const Cut& cut : cuts_) {
      if (cut.division->kind != DivisionKind::kRows) continue;
      const std::string* const format = At(cut.create).Find("Format");
      const bool hasNoData = At(cut.create).Find("NoDataValue") != nullptr ||
                             std::all_of(cut.source.hasNoData.begin(), cut.source.hasNoData.end(),
                                         [](bool has) { return has; });
      if (format == nullptr || *format != "ORVA" || hasNoData) continue;
      notes_.emplace_back(
          "the format ORVA keeps which pixels are valid by a no-data value alone; a verb chooses "
          "one "
          "where it has to, a document doesn't");
    }
  }

  static bool IsRaster(const JobOutput& output) { return output.name.ends_with("URI"); }

  static void AddTo(JobDraft& draft, const JobCommand& command) {
    JobWriterCommand& step = draft.Step(command.name, command.id.c_str());
    for (const JobInput& input : command.inputs) {
      if (input.isExpanded) {
        step.AddExpandedInput(String(input.name), String(input.value));
      } else {
        step.AddInput(String(input.name), String(input.value));
      }
    }
    for (const JobOutput& output : command.outputs) {
      step.AddOutput(String(output.name), String(output.variable));
    }
  }

  std::vector<std::string> FirstFiles() const {
    const std::vector<JobCommand> first(
        job_.commands.begin(), job_.commands.begin() + static_cast<std::ptrdiff_t>(firstEnd_));
    return FindFiles(first).inPlace;
  }

  // Choosing the places where it is cut.

  /// The bytes of the pixels that a cut reads.
  static std::uint64_t BytesOf(const Cut& cut) {
    return std::uint64_t{cut.source.samples} * cut.source.lines * cut.source.bands *
           DataTypeBytes(cut.source.dataType);
  }

  /// The lines at which cuts lie: those of the tiles of usual files, where there are enough.
  static unsigned UnitOf(const Cut& cut, std::uint64_t parts) {
    for (const unsigned unit : {512U, 64U, 16U}) {
      if (cut.source.lines / unit >= parts) return unit;
    }
    return 1;
  }

  void ChoosePlaces() {
    std::uint64_t bytes = 0;
    for (const Cut& cut : cuts_) bytes = std::max(bytes, BytesOf(cut));
    std::uint64_t parts = request_.parts;
    if (parts == 0) parts = (bytes + request_.partMemory - 1) / request_.partMemory;
    for (const Cut& cut : cuts_) {
      parts = std::min<std::uint64_t>(parts, std::max(cut.source.lines, 1U));
    }
    if (parts > kMostParts) {
      throw HostError(kExitUsage, fmt::format("{} parts are more than {}; make larger ones", parts,
                                              kMostParts));
    }
    parts_ = static_cast<unsigned>(std::max<std::uint64_t>(parts, 1));
    for (Cut& cut : cuts_) {
      if (cut.division->kind != DivisionKind::kRows) continue;
      const unsigned unit = UnitOf(cut, parts_);
      const unsigned units = (cut.source.lines + unit - 1) / unit;
      for (unsigned part = 0; part <= parts_; ++part) {
        const std::uint64_t line = Share{part, parts_}.Begin(units) * unit;
        cut.firsts.push_back(
            static_cast<unsigned>(std::min<std::uint64_t>(line, cut.source.lines)));
      }
    }
  }

  /// The bytes that a worker should have for a part: what the program takes with its libraries, the
  /// blocks in flight, and rows of tiles of the file that is written. docs/scale.md has measured
  /// figures.
  std::uint64_t MemoryFor(const std::vector<const Cut*>& cuts, bool isMerge) const {
    constexpr std::uint64_t kProgram = 128 << 20, kThread = 32 << 20, kTileLines = 512;
    std::uint64_t memory = kProgram + request_.threads * kThread;
    for (const Cut* const cut : cuts) {
      if (cut->division->kind != DivisionKind::kRows || cut->source.lines == 0) continue;
      const std::uint64_t line = BytesOf(*cut) / cut->source.lines;
      memory += 3 * line * kTileLines * (isMerge ? 3 : 1);
    }
    return memory;
  }

  // Making jobs.

  std::string FileOfPart(const std::string& part, std::size_t cut, const char* ending) const {
    const std::string name =
        cuts_.size() == 1 ? part : fmt::format("{}-{}", part, cut + 1);  // as part-0003-2.share
    return (std::filesystem::path(request_.folder) / (name + ending)).string();
  }

  /// Adds what has to be there before the parts begin.
  void AddFirst(CutJobs& made) {
    if (firstEnd_ == 0) return;
    CutJob first{"prepare", {}, job_.WithoutCommands()};
    std::vector<std::string> opened;
    for (std::size_t at = 0; at < firstEnd_; ++at) {
      if (At(at).id == kCreate) continue;
      first.job.commands.push_back(At(at));
      for (const JobOutput& output : At(at).outputs) {
        if (IsRaster(output)) opened.push_back(output.variable);
      }
    }
    AddCloses(opened, first.job);
    first.memory = MemoryFor({}, false);
    first.threads = request_.threads;
    made.jobs.push_back(std::move(first));
  }

  static void AddCloses(const std::vector<std::string>& opened, JobCommands& job) {
    for (auto raster = opened.rbegin(); raster != opened.rend(); ++raster) {
      job.commands.push_back({"close." + raster->substr(1), kClose, {{"URI", *raster}}});
    }
  }

  void AddWhole(CutJobs& made) {
    CutJob whole{"part-0000", {}, job_.WithoutCommands()};
    for (std::size_t at = 0; at < job_.commands.size(); ++at) {
      if (!slices_.IsFirst(at)) whole.job.commands.push_back(At(at));
    }
    if (firstEnd_ != 0) whole.dependsOn.push_back(0);
    whole.memory = MemoryFor({}, false);
    whole.threads = request_.threads;
    if (notes_.empty()) notes_.push_back("no command of the job can be divided: it is one part");
    const bool isDone = std::all_of(
        whole.job.commands.begin(), whole.job.commands.end(), [](const JobCommand& command) {
          return OnlyTells(command.id) || command.id == "OpenRasterCommand";
        });
    if (firstEnd_ == 0 || !isDone) made.jobs.push_back(std::move(whole));
  }

  void AddParts(CutJobs& made) {
    unsigned last = 0;
    for (const Cut& cut : cuts_) last = std::max(last, cut.level);
    unsigned number = 0;
    std::vector<std::size_t> before;
    if (firstEnd_ != 0) before.push_back(0);
    files_.resize(cuts_.size());
    for (unsigned level = 1; level <= last; ++level) {
      std::vector<std::size_t> ofLevel;
      for (unsigned part = 0; part < parts_; ++part) {
        ofLevel.push_back(made.jobs.size());
        made.jobs.push_back(MakePart(fmt::format("part-{:04}", number++), level, part));
        made.jobs.back().dependsOn = before;
      }
      before = ofLevel;
    }
  }

  CutJob MakePart(const std::string& name, unsigned level, unsigned part) {
    CutJob made{name, {}, job_.WithoutCommands()};
    std::set<std::size_t> steps;
    std::vector<const Cut*> ofLevel;
    for (const Cut& cut : cuts_) {
      if (cut.level != level) continue;
      ofLevel.push_back(&cut);
      for (const std::size_t at : slices_.SliceOf(At(cut.at), cut.at)) {
        if (!slices_.IsFirst(at)) steps.insert(at);
      }
    }
    std::vector<std::string> opened;
    for (const std::size_t at : steps) {
      made.job.commands.push_back(AsDone(at));
      for (const JobOutput& output : At(at).outputs) {
        if (IsRaster(output)) opened.push_back(output.variable);
      }
    }
    for (const Cut* const cut : ofLevel) {
      const auto number = static_cast<std::size_t>(cut - cuts_.data());
      if (cut->division->kind == DivisionKind::kRows) {
        files_[number].push_back(FileOfPart(name, number, ".tif"));
        AddRows(*cut, part, files_[number].back(), made.job);
      } else {
        files_[number].push_back(FileOfPart(name, number, ".share"));
        AddShare(*cut, part, files_[number].back(), made.job);
      }
    }
    AddCloses(opened, made.job);
    made.memory = MemoryFor(ofLevel, false);
    made.threads = request_.threads;
    return made;
  }

  /// A command, where it is divided with what its parts have done in the place of its work.
  JobCommand AsDone(std::size_t at) {
    JobCommand command = At(at);
    const Cut* const cut = FindCut(at);
    if (cut == nullptr || cut->division->kind != DivisionKind::kShares) return command;
    command.Set(kShareFilesInput,
                JoinedByBars(files_[static_cast<std::size_t>(cut - cuts_.data())]));
    return command;
  }

  /// Adds the making of some lines, in a file of their own that loses nothing.
  void AddRows(const Cut& cut, unsigned part, const std::string& file, JobCommands& job) const {
    const unsigned first = cut.firsts[part], end = cut.firsts[part + 1];
    const std::string tag = At(cut.at).name;
    const std::string rows = "$" + tag + ".rows", target = "$" + tag + ".part";
    JobCommand subset{tag + ".rows", "CreateSpatialSubsetRasterCommand"};
    subset.Set("SrcURI", *At(cut.at).Find(cut.division->source));
    subset.Set("SubRect", fmt::format("0 {} {} {}", first, cut.source.samples - 1, end - 1));
    subset.Set("Placing", "Exact");
    subset.outputs.push_back({"URI", rows});
    job.commands.push_back(subset);

    JobCommand create = At(cut.create);
    create.name = tag + ".part";
    create.outputs = {{"URI", target}};
    for (const CreationValue& value : CreationValues()) create.Remove(value.input);
    for (const char* const input : {"Interleave", "Categories", "Samples", "Lines", "GeoRef"}) {
      create.Remove(input);
    }
    create.Set("ConnStr", file);
    create.Set("SrcURI", rows);
    create.Set("Format", "TIFF");
    create.Set("Compress", "ZSTD");
    create.Set("Level", "1");
    create.Set("Predictor", "Auto");
    create.Set("Tile", "512");
    create.Set("BigTIFF", "Auto");
    job.commands.push_back(create);

    JobCommand copy = At(cut.at);
    copy.outputs.clear();
    copy.Set(cut.division->source, rows);
    copy.Set(cut.division->target, target);
    job.commands.push_back(copy);
    AddCloses({rows, target}, job);
  }

  void AddShare(const Cut& cut, unsigned part, const std::string& file, JobCommands& job) {
    JobCommand share = At(cut.at);
    share.outputs.clear();
    share.Set(kShareInput, NumberArray({part, parts_}));
    share.Set(kShareFileInput, file);
    job.commands.push_back(share);
  }

  /// Adds the job itself, whose divided commands take what the parts have made.
  void AddMerge(CutJobs& made) {
    CutJob merge{"merge", {}, job_.WithoutCommands()};
    std::vector<const Cut*> all;
    for (std::size_t at = 0; at < job_.commands.size(); ++at) {
      if (slices_.IsFirst(at)) continue;
      const Cut* const cut = FindCut(at);
      if (cut != nullptr && cut->division->kind == DivisionKind::kRows) {
        AddJoin(*cut, merge.job);
      } else {
        merge.job.commands.push_back(AsDone(at));
      }
    }
    for (const Cut& cut : cuts_) all.push_back(&cut);
    merge.memory = MemoryFor(all, true);
    merge.threads = 2 * request_.threads;  // it runs alone
    for (std::size_t part = firstEnd_ != 0 ? 1 : 0; part < made.jobs.size(); ++part) {
      merge.dependsOn.push_back(part);
    }
    made.jobs.push_back(std::move(merge));
  }

  void AddJoin(const Cut& cut, JobCommands& job) {
    const auto number = static_cast<std::size_t>(&cut - cuts_.data());
    const std::string joined = "$" + At(cut.at).name + ".joined";
    std::vector<unsigned> lines;
    for (unsigned part = 0; part < parts_; ++part) {
      lines.push_back(cut.firsts[part + 1] - cut.firsts[part]);
    }
    JobCommand join{At(cut.at).name + ".joined", "CreateJoinedRowsRasterCommand"};
    join.Set("SrcURI", *At(cut.at).Find(cut.division->source));
    join.Set("Files", JoinedByBars(files_[number]));
    join.Set("Lines", NumberArray(lines));
    join.outputs.push_back({"URI", joined});
    job.commands.push_back(join);
    JobCommand copy = At(cut.at);
    copy.Set(cut.division->source, joined);
    job.commands.push_back(copy);
    AddCloses({joined}, job);
  }

  static constexpr std::uint64_t kMostParts = 10000;  // of four digits

  const JobCommands& job_;
  const CutRequest& request_;
  const JobSlices slices_;
  const std::size_t firstEnd_;  // commands before it are done before all others
  std::vector<Cut> cuts_;
  unsigned parts_ = 1;
  std::vector<std::vector<std::string>> files_;  // by cut: those of its parts
  std::vector<std::string> notes_;
};

}  // namespace

CutJobs CutIntoJobs(const JobCommands& job, const CutRequest& request) {
  return Cutter(job, request).Run();
}

}  // namespace lumo::host
