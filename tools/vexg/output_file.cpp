#include "output_file.h"

#include <algorithm>
#include <cerrno>
#include <iterator>
#include <system_error>

#include <fmt/format.h>

#include "output_moves.h"
#include "platform/file_moves.h"
#include "platform/temporary_file.h"
#include "verb.h"

namespace lumo::host {
namespace {

namespace fs = std::filesystem;

/// The ends of the names of files that describe another one.
constexpr const char* kSideEndings[] = {".hdr", ".aux.xml", ".ovr", ".msk"};

std::string LastFault() {
  const int code = errno;
  return code != 0 ? std::generic_category().message(code) : "the system does not say why";
}

/// The absolute path, with the links of all but its last part resolved.
fs::path InResolvedFolder(const fs::path& path) {
  std::error_code fault;
  const fs::path absolute = fs::absolute(path).lexically_normal();
  return fs::weakly_canonical(absolute.parent_path(), fault) / absolute.filename();
}

bool IsThere(const fs::path& path) {
  std::error_code fault;
  return fs::exists(fs::symlink_status(path, fault));
}

/// The names of files that may go with one of this name.
std::vector<std::string> SideNames(const fs::path& target) {
  std::vector<std::string> names;
  for (const std::string ending : kSideEndings) {
    // "scene.hdr" may be of "scene.img" as well.
    if (target.has_extension() || ending != ".hdr")
      names.push_back(target.filename().string() + ending);
  }
  return names;
}

}  // namespace

OutputFile::OutputFile(const std::string& file, bool overwrite,
                       const std::vector<std::string>& inputs)
    : shown_(file), target_(fs::absolute(file)), overwrite_(overwrite) {
  std::error_code fault;
  if (!target_.has_filename()) Refuse("is no name of a file");
  if (!fs::is_directory(target_.parent_path(), fault)) {
    if (fault && fault != std::errc::no_such_file_or_directory) Refuse(fault.message());
    Refuse("there is no folder " + target_.parent_path().string());
  }
  for (const std::string& input : inputs) RefuseInput(input);
  const fs::file_status status = fs::status(target_, fault);
  if (fs::is_directory(status)) Refuse("is a folder");
  if (fs::exists(status) && !fs::is_regular_file(status)) Refuse("is no file that can be replaced");
  for (const std::string& left : platform::FindAbandonedFolders(target_.string())) {
    OutputMoves::Recover(left, target_.parent_path().string());
  }
  for (const std::string& name : NamesInPlace({})) CheckPlace(name);
}

void OutputFile::RefuseInput(const std::string& input) {
  std::error_code fault;
  // "FILE|NAME=VALUE" is a raster in a file.
  const fs::path source = InResolvedFolder(input.substr(0, input.find('|')));
  const fs::path target = InResolvedFolder(target_);
  const auto isSame = [&](const fs::path& a, const fs::path& b) {
    return a == b || fs::equivalent(a, b, fault);
  };
  // Neither the input nor what goes with it may be replaced, whatever names lead there.
  bool collides = isSame(target, source);
  for (const std::string& name : SideNames(source)) {
    collides = collides || isSame(target, source.parent_path() / name);
    for (const std::string& own : SideNames(target)) {
      collides = collides ||
                 fs::equivalent(target.parent_path() / own, source.parent_path() / name, fault);
    }
  }
  for (const std::string& own : SideNames(target)) {
    collides = collides || isSame(target.parent_path() / own, source);
  }
  if (collides) Refuse("is a file of the input, or another output; nothing was run");
  inputs_.push_back(source.string());
}

OutputFile::~OutputFile() {
  std::error_code ignored;
  if (!folder_.empty()) fs::remove_all(folder_, ignored);
}

void OutputFile::Refuse(const std::string& why) const {
  throw HostError(kExitUsage, shown_ + ": " + why);
}

void OutputFile::FailMove(const std::string& why) const {
  throw HostError(kExitFailed, shown_ + ": can't be written: " + InUsersWords(why));
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
  if (overwrite_) return;
  Refuse(isMain ? "is there already; give --overwrite to replace it"
                : place.string() +
                      ", which goes with it, is there already; give --overwrite to "
                      "replace it");
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
  std::vector<std::string> names = SideNames(target_);
  names.push_back(target_.filename().string());
  names.insert(names.end(), made.begin(), made.end());
  std::sort(names.begin(), names.end());
  names.erase(std::unique(names.begin(), names.end()), names.end());
  std::erase_if(names,
                [&](const std::string& name) { return !IsThere(target_.parent_path() / name); });
  return names;
}

void OutputFile::SyncMade(const std::vector<std::string>& made) const {
  std::string why;
  for (const std::string& name : made) {
    if (!platform::SyncPath((folder_ / name).string(), &why)) FailMove(why);
  }
}

void OutputFile::MoveAll(const std::vector<std::string>& made,
                         const std::vector<std::string>& old) {
  std::string why;
  const std::string main = target_.filename().string();
  if (made.size() == 1 && (old.empty() || (old.size() == 1 && old.front() == main))) {
    const bool isMoved = overwrite_ ? platform::RenameFile(GetWorkName(), GetName(), &why)
                                    : platform::RenameToNew(GetWorkName(), GetName(), &why);
    if (isMoved) return;
    if (errno == EEXIST) Refuse("has been made by somebody else meanwhile; give --overwrite");
    FailMove(why);
  }
  OutputMoves moves(folder_.string(), target_.parent_path().string());
  if (moves.Run(main, made, old, &why)) return;
  if (!moves.IsPutBack()) {
    why += "; the older file is in " + folder_.string();
    folder_.clear();
  }
  if (errno == EEXIST) Refuse(why + "; somebody else has made it meanwhile");
  FailMove(why);
}

void OutputFile::Commit() {
  const std::vector<std::string> made = NamesMade();
  if (std::find(made.begin(), made.end(), target_.filename().string()) == made.end()) {
    throw HostError(kExitFailed, shown_ + ": was not written whole");
  }
  const std::vector<std::string> old = NamesInPlace(made);
  for (const std::string& name : old) CheckPlace(name);
  if (isDurable_) SyncMade(made);
  MoveAll(made, old);
  std::string why;
  if (isDurable_ && !platform::SyncPath(target_.parent_path().string(), &why)) FailMove(why);
}

FileWriter::FileWriter(const OutputFile& output) : shown_(output.GetShownName()) {
  errno = 0;
  stream_.open(output.GetWorkName(), std::ios::binary | std::ios::trunc);
  Check();
}

void FileWriter::Check() const {
  if (!stream_) throw HostError(kExitFailed, shown_ + ": can't be written: " + LastFault());
}

void FileWriter::Write(const void* data, std::size_t bytes) {
  stream_.write(static_cast<const char*>(data), static_cast<std::streamsize>(bytes));
  Check();
}

void FileWriter::WriteAt(std::uint64_t offset, const void* data, std::size_t bytes) {
  stream_.seekp(static_cast<std::streamoff>(offset));
  Write(data, bytes);
}

void FileWriter::Close() {
  stream_.close();
  Check();
}

}  // namespace lumo::host
