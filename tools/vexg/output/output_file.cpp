#include "output/output_file.h"

#include <algorithm>
#include <cerrno>
#include <iterator>
#include <map>
#include <system_error>

#include <fmt/format.h>

#include "platform/file_identity.h"
#include "platform/file_moves.h"
#include "platform/temporary_file.h"
#include "verb.h"

namespace lumo::host {
namespace {

namespace fs = std::filesystem;

/// The ends of the names of files that describe another one.
constexpr const char* kSideEndings[] = {".hdr", ".aux.xml", ".ovr", ".msk"};
/// The same of a shapefile, in the place of its own ending.
constexpr const char* kShapeEndings[] = {".shx", ".dbf", ".prj", ".cpg",
                                         ".qpj", ".qix", ".sbn", ".sbx"};

std::string LastFault() {
  const int code = errno;
  return code != 0 ? std::generic_category().message(code) : "the system does not say why";
}

/// The absolute path, with the links of all but its last part resolved. Only the system knows where
/// ".." behind a link leads.
fs::path InResolvedFolder(const fs::path& path) {
  std::error_code fault;
  const fs::path absolute = fs::absolute(path);
  return fs::weakly_canonical(absolute.parent_path(), fault) / absolute.filename();
}

bool IsThere(const fs::path& path) {
  std::error_code fault;
  return fs::exists(fs::symlink_status(path, fault));
}

/// The paths of an input and of the files that may go with it, whether there are such or not.
std::vector<fs::path> FilesOfInput(const fs::path& input) {
  std::vector<fs::path> files{input};
  const auto add = [&](const fs::path& base, std::initializer_list<const char*> endings) {
    for (const char* const ending : endings) files.push_back(fs::path(base).concat(ending));
  };
  add(input, {".hdr", ".aux.xml", ".ovr", ".msk", ".msk.ovr", ".pyr"});
  fs::path plain = input;
  plain.replace_extension();
  add(plain, {".hdr", ".aux", ".rrd", ".ige", ".prj", ".rpb", ".RPB", ".imd", ".IMD", ".tfw"});
  return files;
}

/// True when two paths name one file, or would if it were there.
bool IsSame(const fs::path& a, const fs::path& b) {
  return a == b ||
         platform::IdentifyFile(a.string()).IsSameFile(platform::IdentifyFile(b.string()));
}

}  // namespace

OutputFile::OutputFile(const std::string& file, const OutputRules& rules)
    : shown_(file), target_(fs::absolute(file)), rules_(rules) {
  std::error_code fault;
  if (!target_.has_filename()) Refuse("is no name of a file");
  if (!fs::is_directory(target_.parent_path(), fault)) {
    if (fault && fault != std::errc::no_such_file_or_directory) Refuse(fault.message());
    Refuse("there is no folder " + target_.parent_path().string());
  }
  const fs::file_status status = fs::status(target_, fault);
  if (fs::is_directory(status)) Refuse("is a folder");
  if (fs::exists(status) && !fs::is_regular_file(status)) Refuse("is no file that can be replaced");
  for (const std::string& left : platform::FindAbandonedFolders(target_.string())) {
    OutputMoves::Recover(left, target_.parent_path().string());
  }
}

void OutputFile::RefuseInput(const std::string& input) {
  // "FILE|NAME=VALUE" is a raster in a file.
  const fs::path source = InResolvedFolder(input.substr(0, input.find('|')));
  const fs::path target = InResolvedFolder(target_);
  std::vector<fs::path> own{target};
  for (const std::string& name : SideNames()) own.push_back(target.parent_path() / name);
  for (const fs::path& file : FilesOfInput(source)) {
    for (const fs::path& made : own) {
      // Two files that go with others, and are not there, are none of each other's.
      const bool isSide = made != target && file != source && !IsThere(file);
      if (isSide || !IsSame(made, file)) continue;
      Refuse("is a file of the input, or another output; nothing was run");
    }
  }
  inputs_.push_back(source.string());
}

OutputFile::~OutputFile() {
  std::error_code ignored;
  // An empty one goes by its name, which takes nothing that a process can run out of.
  if (!folder_.empty() && !fs::remove(folder_, ignored)) fs::remove_all(folder_, ignored);
}

void OutputFile::Refuse(const std::string& why) const {
  throw HostError(kExitUsage, shown_ + ": " + why);
}

void OutputFile::FailMove(const std::string& why) const {
  if (errno == EEXIST) {
    throw HostError(kExitUsage, InUsersWords(why.substr(0, why.rfind(": "))) +
                                    ": has been made by somebody else meanwhile; give --overwrite "
                                    "to replace it");
  }
  // The system's paths, also of files in the making, say less to the user than his own name.
  const std::string place = target_.parent_path().string();
  const std::size_t end = why.starts_with(place) ? why.find(": ", place.size()) : why.npos;
  throw HostError(kExitFailed,
                  shown_ + ": can't be written: " + (end == why.npos ? why : why.substr(end + 2)));
}

void OutputFile::CheckPlaces() const {
  for (const std::string& name : NamesInPlace({})) CheckPlace(name);
}

void OutputFile::Begin(std::uint64_t bytes) {
  std::error_code fault;
  const fs::space_info space = fs::space(target_.parent_path(), fault);
  if (!fault && space.available < bytes) {
    throw HostError(kExitFailed, fmt::format("{}: takes {} bytes, and the disk has {} free", shown_,
                                             bytes, space.available));
  }
  const fs::path folder = platform::TemporaryFolderBeside(target_.string());
  fs::create_directory(folder, fault);
  if (fault) throw HostError(kExitFailed, shown_ + ": can't be written: " + fault.message());
  folder_ = folder;
}

std::string OutputFile::InUsersWords(std::string message) const {
  for (const std::string& name : {GetWorkName(), GetName()}) {
    if (name == shown_) continue;
    for (std::size_t at = 0; (at = message.find(name, at)) != std::string::npos;) {
      message.replace(at, name.size(), shown_);
      at += shown_.size();
    }
  }
  return message;
}

/// Throws when a file in the output's place, or beside it, is not this output's to replace.
void OutputFile::CheckPlace(const std::string& name) const {
  const fs::path place = target_.parent_path() / name;
  if (!IsThere(place)) return;
  const bool isMain = place == target_;
  std::error_code fault;
  for (const std::string& input : inputs_) {
    const fs::path source(input);
    const bool isBeside = fs::equivalent(source.parent_path(), place.parent_path(), fault);
    if (!isMain && isBeside && place.stem() == source.stem()) {
      Refuse(place.string() +
             ", which goes with it, would replace a file of the input; choose "
             "another name");
    }
  }
  if (rules_.overwrite) return;
  Refuse(isMain ? "is there already; give --overwrite to replace it"
                : place.string() +
                      ", which goes with it, is there already; give --overwrite to "
                      "replace it");
}

/// The names of files that may go with the output.
std::vector<std::string> OutputFile::SideNames() const {
  std::vector<std::string> names;
  for (const std::string ending : kSideEndings) {
    // "scene.hdr" may be of "scene.img" as well.
    const bool isOwn = target_.has_extension() || ending != ".hdr";
    if (rules_.hasSides && isOwn) names.push_back(target_.filename().string() + ending);
  }
  if (rules_.hasSides && target_.extension() == ".shp") {
    for (const char* const ending : kShapeEndings)
      names.push_back(target_.stem().string() + ending);
  }
  return names;
}

/// The names of the files that were made, the main one among them.
std::vector<std::string> OutputFile::NamesMade() const {
  std::vector<std::string> names;
  std::error_code fault;
  for (fs::directory_iterator at(folder_, fault), end; !fault && at != end; at.increment(fault)) {
    names.push_back(at->path().filename().string());
  }
  if (fault) FailMove(fault.message());
  std::sort(names.begin(), names.end());
  return names;
}

/// The names, in the output's place and beside it, that are taken: those of `made`, the output's
/// own and those of files that describe it.
std::vector<std::string> OutputFile::NamesInPlace(const std::vector<std::string>& made) const {
  std::vector<std::string> names = SideNames();
  names.push_back(target_.filename().string());
  names.insert(names.end(), made.begin(), made.end());
  std::sort(names.begin(), names.end());
  names.erase(std::unique(names.begin(), names.end()), names.end());
  std::erase_if(names,
                [&](const std::string& name) { return !IsThere(target_.parent_path() / name); });
  return names;
}

MovedFiles OutputFile::Collect() const {
  MovedFiles files{folder_.string(),
                   target_.parent_path().string(),
                   target_.filename().string(),
                   NamesMade(),
                   {}};
  if (std::find(files.made.begin(), files.made.end(), files.main) == files.made.end()) {
    throw HostError(kExitFailed, shown_ + ": was not written whole");
  }
  files.old = NamesInPlace(files.made);
  for (const std::string& name : files.old) CheckPlace(name);
  return files;
}

bool OutputFile::MoveAtOnce(const MovedFiles& files) const {
  const bool isFree = files.old.empty();
  if (files.made.size() != 1 || !(isFree || files.old == files.made)) return false;
  std::string why;
  const bool isMoved = rules_.overwrite ? platform::RenameFile(GetWorkName(), GetName(), &why)
                                        : platform::RenameToNew(GetWorkName(), GetName(), &why);
  if (!isMoved) FailMove(why);
  return true;
}

Outputs::Outputs(Interruption& interruption, const OutputRules& rules,
                 std::vector<std::string> inputs)
    : interruption_(interruption), rules_(rules), inputs_(std::move(inputs)) {}

void Outputs::Add(const std::string& file) {
  files_.push_back(std::make_unique<OutputFile>(file, rules_));
  OutputFile& added = *files_.back();
  for (const std::string& input : inputs_) added.RefuseInput(input);
  for (const auto& other : files_) {
    if (other.get() != &added) added.RefuseInput(other->GetName());
  }
  added.CheckPlaces();
  interruption_.Watch(added.GetName(), added.GetShownName());
}

void Outputs::RefuseInput(const std::string& input) {
  for (const auto& file : files_) file->RefuseInput(input);
}

void Outputs::Begin(const std::vector<std::uint64_t>& bytes) {
  std::map<std::uint64_t, std::uint64_t> taken;  // of each disk, by the outputs so far
  for (std::size_t i = 0; i < files_.size(); ++i) {
    const fs::path folder = fs::path(files_[i]->GetName()).parent_path();
    std::uint64_t& sum = taken[platform::IdentifyFile(folder.string()).device];
    sum += bytes[i];
    files_[i]->Begin(sum);
    interruption_.AddRemains(files_[i]->GetFolder());
  }
}

std::string Outputs::InUsersWords(std::string message) const {
  for (const auto& file : files_) message = file->InUsersWords(message);
  return message;
}

void Outputs::Commit(const std::function<void()>& onTheWay) {
  std::vector<MovedFiles> moved;
  for (const auto& file : files_) {
    moved.push_back(file->Collect());
    std::string why;
    for (const std::string& name : moved.back().made) {
      if (!rules_.isDurable || platform::SyncPath(file->GetFolder() + "/" + name, &why)) continue;
      file->FailMove(why);
    }
  }
  const Interruption::Hold hold(interruption_);
  onTheWay();
  MoveAll(moved);
  if (!moved.empty()) interruption_.SetDone();
}

void Outputs::MoveAll(const std::vector<MovedFiles>& moved) {
  if (moved.empty() || (moved.size() == 1 && files_[0]->MoveAtOnce(moved[0]))) return;
  OutputMoves moves(moved, rules_.isDurable);
  std::string why;
  if (moves.Run(&why)) return;
  const int code = errno;
  const OutputFile* failed = files_.front().get();
  for (const auto& file : files_) {
    if (why.starts_with(file->GetFolder()) || why.starts_with(file->GetName())) failed = file.get();
  }
  for (const std::string& folder : moves.GetStuckFolders()) {
    why += "; the older file is in " + folder;
    interruption_.DropRemains(folder);
    for (const auto& file : files_) {
      if (file->GetFolder() == folder) file->KeepFolder();
    }
  }
  errno = code;
  failed->FailMove(why);
}

FileWriter::FileWriter(const OutputFile& output) : shown_(output.GetShownName()) {
  errno = 0;
  file_ = platform::RandomAccessFile::CreateOrEmpty(output.GetWorkName());
  Check(file_ != nullptr);
}

void FileWriter::Check(bool isDone) const {
  if (!isDone) throw HostError(kExitFailed, shown_ + ": can't be written: " + LastFault());
}

void FileWriter::Write(const void* data, std::size_t bytes) {
  WriteAt(end_, data, bytes);
}

void FileWriter::WriteAt(std::uint64_t offset, const void* data, std::size_t bytes) {
  errno = 0;
  Check(file_->Write(offset, data, bytes));
  end_ = offset + bytes;
}

void FileWriter::Close() {
  errno = 0;
  Check(file_->Close());
}

}  // namespace lumo::host
