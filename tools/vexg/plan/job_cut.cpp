#include "plan/job_cut.h"

#include <algorithm>
#include <filesystem>
#include <map>
#include <optional>
#include <set>

#include <fmt/format.h>

#include "commands/division.h"
#include "plan/first_jobs.h"
#include "plan/job_measure.h"
#include "plan/job_slices.h"
#include "raster/pixel_types.h"
#include "rasters/raster_source.h"
#include "verb.h"

namespace lumo::host {
namespace {

constexpr const char* kCreate = "CreateRasterCommand";

/// A command that is divided.
struct Cut {
  std::size_t at;  ///< in the job
  const DivisionDeclaration* division;
  unsigned level = 1;              ///< 1: it needs nothing of other divided commands
  unsigned rounds = 1;             ///< of shares
  std::size_t create = 0;          ///< of kRows: the command that makes the target
  RasterInfo source{};             ///< the raster that is read
  std::vector<unsigned> firsts{};  ///< of kRows: the first line of each part, and behind the last
};

class Cutter {
 public:
  Cutter(const JobCommands& job, const CutRequest& request)
      : job_(job), request_(request), slices_(job), firstEnd_(slices_.GetFirstEnd()) {}

  CutJobs Run() {
    FindCuts();
    for (Cut& cut : cuts_) Measure(cut);
    DropOddWork();
    DropOddTypes();
    CheckJoin();
    ChoosePlaces();
    CutJobs made;
    AddFirstJobs(job_, slices_, request_, parts_, MemoryFor({}, false), made);
    firstJobs_ = made.jobs.size();
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
          division->kind != DivisionKind::kEach &&
          (division->kind != DivisionKind::kNone || !FindFiles({At(at)}).made.empty());
      if (!why.empty() && isWork && At(at).id != kCreate) {
        notes_.push_back(NoteOf(at, why));
      }
    }
  }

  static DivisionInputs InputsOf(const JobCommand& command) {
    return [&command](const std::string& input) { return command.Find(input); };
  }

  std::string NoteOf(std::size_t at, const std::string& why) const {
    return fmt::format("{} ({}): {}; one document does all of it", At(at).id, At(at).name, why);
  }

  /// Why a command can't be divided here; empty when it can. Sets the level and the target.
  std::string WhyNot(Cut& cut) {
    const JobCommand& command = At(cut.at);
    const std::string when = cut.division->dividesWhen;
    const std::string* const form = when.empty() ? nullptr : command.Find(when);
    if (!when.empty() && (form == nullptr || *form != "Exact")) return when + " is not Exact";
    const std::string* const source = command.Find(cut.division->source);
    if (HasSource(cut) && (source == nullptr || !source->starts_with('$'))) {
      return "its source is open before the job";
    }
    for (const std::size_t at : slices_.SliceOf(command, cut.at)) {
      if (const Cut* const before = FindCut(at)) {
        const bool hasRounds = before->division->rounds != nullptr;
        const unsigned rounds = hasRounds ? DivisionDeclaration::kMostRounds : 1;
        cut.level = std::max(cut.level, before->level + rounds);
      }
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
  void Measure(Cut& cut) const {
    if (!HasSource(cut)) return;
    cut.source = MeasureRaster(job_, slices_, *At(cut.at).Find(cut.division->source), cut.at);
    if (cut.division->rounds == nullptr) return;
    cut.rounds = cut.division->rounds(cut.source.dataType, InputsOf(At(cut.at)));
  }

  /// False for work on files alone.
  static bool HasSource(const Cut& cut) { return *cut.division->source != '\0'; }

  /// Leaves whole what its command can't divide as it is asked for.
  void DropOddWork() {
    std::erase_if(cuts_, [this](const Cut& cut) {
      if (cut.division->whyNot == nullptr) return false;
      const std::string why = cut.division->whyNot(InputsOf(At(cut.at)), cut.source.bands);
      if (why.empty()) return false;
      notes_.push_back(NoteOf(cut.at, why));
      return true;
    });
  }

  /// Leaves whole what there are no views on, and questions what the single run of a verb looks at
  /// and a document doesn't.
  void DropOddTypes() {
    const auto isOdd = [this](const Cut& cut) {
      const bool isEight =
          DispatchType(EightTypes{}, cut.source.dataType, []<typename T>() { return true; });
      if (isEight || cut.division->kind != DivisionKind::kRows) return false;
      notes_.push_back(NoteOf(cut.at, "lines of complex numbers can't be divided"));
      return true;
    };
    std::erase_if(cuts_, isOdd);
    for (const Cut& cut : cuts_) {
      if (cut.division->kind != DivisionKind::kRows) continue;
      const std::string* const format = At(cut.create).Find("Format");
      const bool hasNoData = At(cut.create).Find("NoDataValue") != nullptr ||
                             std::all_of(cut.source.hasNoData.begin(), cut.source.hasNoData.end(),
                                         [](bool has) { return has; });
      if (format == nullptr || *format != "ORVA" || hasNoData || request_.join == Join::kVrt) {
        continue;
      }
      notes_.emplace_back(
          "the format ORVA keeps which pixels are valid by a no-data value alone; a verb chooses "
          "one "
          "where it has to, a document doesn't");
    }
  }

  /// Refuses a VRT file where there are no lines for one.
  void CheckJoin() const {
    if (request_.join == Join::kFile) return;
    const bool canJoin = std::any_of(cuts_.begin(), cuts_.end(), [this](const Cut& cut) {
      return cut.division->kind == DivisionKind::kRows && IsTaken(cut);
    });
    if (canJoin) return;
    throw HostError(kExitUsage, "--join vrt: no raster of the job is written by lines");
  }

  // Choosing the places where it is cut.

  /// The bytes of the pixels that a cut reads.
  static std::uint64_t BytesOf(const Cut& cut) {
    return std::uint64_t{cut.source.samples} * cut.source.lines * cut.source.bands *
           DataTypeBytes(cut.source.dataType);
  }

  RowParts RowsOf(const Cut& cut) const {
    return {At(cut.create),       At(cut.at), cut.division->source,
            cut.division->target, cut.source, request_.join};
  }

  /// The lines at which cuts lie: those of the blocks of the file that is written, and of the tiles
  /// of usual files, where there are enough.
  unsigned UnitOf(const Cut& cut, std::uint64_t parts) const {
    const unsigned block = BlockLinesOf(RowsOf(cut));
    for (const unsigned lines : {512U, 64U, 16U, 1U}) {
      const unsigned unit = block != 0 ? (lines + block - 1) / block * block : lines;
      if ((cut.source.lines + unit - 1) / unit >= parts) return unit;
    }
    for (const unsigned unit : {64U, 16U}) {
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
      if (HasSource(cut)) parts = std::min<std::uint64_t>(parts, std::max(cut.source.lines, 1U));
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
      if (cut->source.lines == 0) continue;
      const DivisionDeclaration& division = *cut->division;
      const std::uint64_t pixels = std::uint64_t{cut->source.samples} * cut->source.lines;
      const std::uint64_t rows = kTileLines * BytesOf(*cut) / cut->source.lines;
      if (division.shareBytes != 0) {
        memory +=
            isMerge ? pixels * division.joinBytes : (pixels / parts_ + 1) * division.shareBytes;
      } else {
        const bool isByLines = division.kind == DivisionKind::kRows;
        // Files of shares are read piece by piece; they themselves take what reading ahead takes.
        memory += rows * (isByLines ? (isMerge ? 9 : 3) : (isMerge ? 0 : 7));
      }
    }
    return memory;
  }

  // Making jobs.

  std::string FileOfPart(const std::string& part, std::size_t cut, const char* ending) const {
    const std::string name =
        cuts_.size() == 1 ? part : fmt::format("{}-{}", part, cut + 1);  // as part-0003-2.share
    return (std::filesystem::path(request_.folder) / (name + ending)).string();
  }

  void AddWhole(CutJobs& made) {
    CutJob whole{"part-0000", {}, job_.WithoutCommands()};
    for (std::size_t at = 0; at < job_.commands.size(); ++at) {
      if (!slices_.IsFirst(at)) whole.job.commands.push_back(At(at));
    }
    if (firstJobs_ != 0) whole.dependsOn.push_back(firstJobs_ - 1);
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
    for (const Cut& cut : cuts_) last = std::max(last, cut.level + cut.rounds - 1);
    unsigned number = 0;
    std::vector<std::size_t> before;
    if (firstJobs_ != 0) before.push_back(firstJobs_ - 1);
    files_.resize(cuts_.size());
    counts_.resize(cuts_.size());
    for (unsigned level = 1; level <= last; ++level) {
      const bool hasWork = std::any_of(cuts_.begin(), cuts_.end(),
                                       [&](const Cut& cut) { return IsOfLevel(cut, level); });
      if (!hasWork) continue;
      std::vector<std::size_t> ofLevel;
      for (unsigned part = 0; part < parts_; ++part) {
        ofLevel.push_back(made.jobs.size());
        made.jobs.push_back(MakePart(fmt::format("part-{:04}", number++), level, part));
        made.jobs.back().dependsOn = before;
      }
      before = ofLevel;
    }
  }

  static bool IsOfLevel(const Cut& cut, unsigned level) {
    return cut.level <= level && level < cut.level + cut.rounds;
  }

  CutJob MakePart(const std::string& name, unsigned level, unsigned part) {
    CutJob made{name, {}, job_.WithoutCommands()};
    std::set<std::size_t> steps;
    std::vector<const Cut*> ofLevel;
    for (const Cut& cut : cuts_) {
      if (!IsOfLevel(cut, level)) continue;
      ofLevel.push_back(&cut);
      for (const std::size_t at : slices_.SliceOf(At(cut.at), cut.at)) {
        if (!slices_.IsFirst(at)) steps.insert(at);
      }
    }
    std::vector<std::string> opened;
    std::map<std::string, std::string> names;  // of files that each part makes for itself
    for (const std::size_t at : steps) {
      made.job.commands.push_back(AsDone(at));
      for (const std::string& file : FindFiles({At(at)}).made) {
        const std::string own =
            fmt::format("{}.{}", name, std::filesystem::path(file).filename().string());
        names[file] = (std::filesystem::path(request_.folder) / own).string();
      }
      for (const JobOutput& output : At(at).outputs) {
        if (NamesRaster(output)) opened.push_back(output.variable);
      }
    }
    for (const Cut* const cut : ofLevel) {
      const auto number = static_cast<std::size_t>(cut - cuts_.data());
      if (cut->division->kind == DivisionKind::kRows) {
        files_[number].push_back(FileOfPart(name, number, ".tif"));
        counts_[number].push_back(IsTaken(*cut) ? FileOfPart(name, number, ".share") : "");
        AddRows(RowsOf(*cut), cut->firsts[part], cut->firsts[part + 1], files_[number].back(),
                counts_[number].back(), {part, parts_}, made.job);
      } else {
        const std::string file = FileOfPart(name, number, ".share");
        AddShare(*cut, level - cut->level, part, file, made.job);
        files_[number].push_back(file);
      }
    }
    made.job.AddCloses(opened);
    for (JobCommand& command : made.job.commands) RenameFiles(names, command);
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

  void AddShare(const Cut& cut, unsigned round, unsigned part, const std::string& file,
                JobCommands& job) const {
    JobCommand share = At(cut.at);
    share.outputs.clear();
    share.Remove(cut.division->target);
    const auto number = static_cast<std::size_t>(&cut - cuts_.data());
    const auto end = files_[number].begin() + static_cast<std::ptrdiff_t>(round * parts_);
    if (round != 0) share.Set(kShareFilesInput, JoinedByBars({files_[number].begin(), end}));
    share.Set(kShareInput, NumberArray({part, parts_}));
    share.Set(kShareFileInput, file);
    job.commands.push_back(share);
  }

  /// Adds the job itself, whose divided commands take what the parts have made.
  void AddMerge(CutJobs& made) {
    CutJob merge{"merge", {}, job_.WithoutCommands()};
    std::map<std::size_t, std::vector<JobCommand>> joins;  // in the place of commands
    std::map<std::string, std::string> names;              // of files that are made
    for (const Cut& cut : cuts_) {
      if (cut.division->kind != DivisionKind::kRows) continue;
      JoinedRows joined = JoinOf(cut);
      joins[cut.create] = std::move(joined.create);
      joins[cut.at] = std::move(joined.copy);
      for (const std::string& file : FindFiles({At(cut.create)}).made) {
        names[file] = FileOfJoin(file, request_.join);
      }
    }
    for (std::size_t at = 0; at < job_.commands.size(); ++at) {
      if (slices_.IsFirst(at)) continue;
      const auto join = joins.find(at);
      if (join == joins.end()) {
        merge.job.commands.push_back(AsDone(at));
        RenameFiles(names, merge.job.commands.back());
      } else {
        merge.job.commands.insert(merge.job.commands.end(), join->second.begin(),
                                  join->second.end());
      }
    }
    std::vector<const Cut*> all;
    for (const Cut& cut : cuts_) all.push_back(&cut);
    merge.memory = MemoryFor(all, true);
    merge.threads = 2 * request_.threads;  // it runs alone
    for (std::size_t part = firstJobs_; part < made.jobs.size(); ++part) {
      merge.dependsOn.push_back(part);
    }
    made.jobs.push_back(std::move(merge));
  }

  JoinedRows JoinOf(const Cut& cut) const {
    const auto number = static_cast<std::size_t>(&cut - cuts_.data());
    std::vector<unsigned> lines;
    for (unsigned part = 0; part < parts_; ++part) {
      lines.push_back(cut.firsts[part + 1] - cut.firsts[part]);
    }
    return JoinRows(RowsOf(cut), lines, files_[number],
                    IsTaken(cut) ? counts_[number] : std::vector<std::string>(), TakingOf(cut));
  }

  /// True when the file that is made takes the pixels out of those of the parts as they are.
  bool IsTaken(const Cut& cut) const { return TakingOf(cut) != Taking::kNone; }

  /// Where that is done: the raster that is read has to be open before.
  Taking TakingOf(const Cut& cut) const {
    const RowParts rows = RowsOf(cut);
    if (rows.join == Join::kFile && BlockLinesOf(rows) == 0) return Taking::kNone;
    const auto begin = job_.commands.begin();
    const auto create = begin + static_cast<std::ptrdiff_t>(cut.create);
    const auto copy = begin + static_cast<std::ptrdiff_t>(cut.at);
    const auto givesSource = [&](const JobCommand& command) {
      return std::any_of(
          command.outputs.begin(), command.outputs.end(),
          [&](const JobOutput& output) { return output.variable == *rows.copy.Find(rows.source); });
    };
    if (std::any_of(begin, create, givesSource)) return Taking::kAtCreate;
    const auto usesTarget = [&](const JobCommand& command) {
      return std::any_of(command.inputs.begin(), command.inputs.end(), [&](const JobInput& input) {
        const std::vector<std::string> used = VariablesOf(input);
        return std::find(used.begin(), used.end(), *rows.copy.Find(rows.target)) != used.end();
      });
    };
    return std::any_of(create + 1, copy, usesTarget) ? Taking::kNone : Taking::kAtCopy;
  }

  static constexpr std::uint64_t kMostParts = 10000;  // of four digits

  const JobCommands& job_;
  const CutRequest& request_;
  const JobSlices slices_;
  const std::size_t firstEnd_;  // commands before it are done before all others
  std::size_t firstJobs_ = 0;   // that do these
  std::vector<Cut> cuts_;
  unsigned parts_ = 1;
  std::vector<std::vector<std::string>> files_;   // by cut: those of its parts
  std::vector<std::vector<std::string>> counts_;  // of kRows: of valid pixels
  std::vector<std::string> notes_;
};

}  // namespace

CutJobs CutIntoJobs(const JobCommands& job, const CutRequest& request) {
  return Cutter(job, request).Run();
}

}  // namespace lumo::host
