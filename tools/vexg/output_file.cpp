#include "output_file.h"

#include <algorithm>
#include <cerrno>
#include <iterator>
#include <system_error>

#include <fmt/format.h>

#include "platform/process.h"
#include "verb.h"

namespace lumo::host {
namespace {

namespace fs = std::filesystem;

/// What the names of files that describe another one have at the end.
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

}  // namespace

OutputFile::OutputFile(const std::string& file, bool overwrite,
                       const std::vector<std::string>& inputs)
    : shown_(file), target_(fs::absolute(file)), overwrite_(overwrite) {
  std::error_code fault;
  if (!target_.has_filename()) Refuse("is no name of a file");
  if (!fs::is_directory(target_.parent_path(), fault)) {
    Refuse("there is no folder " + target_.parent_path().string());
  }
  for (const std::string& input : inputs) RefuseInput(input);
  const fs::file_status status = fs::status(target_, fault);
  if (fs::is_directory(status)) Refuse("is a folder");
  if (fs::exists(status) && !fs::is_regular_file(status)) Refuse("is no file that can be replaced");
  if (fs::exists(fs::symlink_status(target_, fault)) && !overwrite_) {
    Refuse("is there already; give --overwrite to replace it");
  }
}

void OutputFile::RefuseInput(const std::string& input) {
  std::error_code fault;
  // "FILE|NAME=VALUE" is a raster in a file.
  const fs::path source = InResolvedFolder(input.substr(0, input.find('|')));
  const fs::path target = InResolvedFolder(target_);
  const bool goesWithIt =
      std::any_of(std::begin(kSideEndings), std::end(kSideEndings),
                  [&](const char* ending) { return target.string() == source.string() + ending; });
  if (target == source || goesWithIt || fs::equivalent(target, source, fault)) {
    Refuse("is a file of the input, or another output; nothing was run");
  }
  inputs_.push_back(source.string());
}

OutputFile::~OutputFile() {
  std::error_code ignored;
  if (!folder_.empty()) fs::remove_all(folder_, ignored);
}

void OutputFile::Refuse(const std::string& why) const {
  throw HostError(kExitUsage, shown_ + ": " + why);
}

void OutputFile::Begin(std::uint64_t bytes) {
  std::error_code fault;
  const fs::path parent = target_.parent_path();
  const fs::space_info space = fs::space(parent, fault);
  if (!fault && space.available < bytes) {
    throw HostError(kExitFailed, fmt::format("{}: takes {} bytes, and the disk has {} free", shown_,
                                             bytes, space.available));
  }
  const fs::path folder =
      parent / fmt::format(".{}.{}.part", target_.filename().string(), platform::ProcessNumber());
  fs::create_directory(folder, fault);
  if (fault) throw HostError(kExitFailed, shown_ + ": can't be written: " + fault.message());
  folder_ = folder;
}

std::string OutputFile::InUsersWords(std::string message) const {
  const std::string work = GetWorkName();
  for (std::size_t at = 0; (at = message.find(work, at)) != std::string::npos;) {
    message.replace(at, work.size(), shown_);
    at += shown_.size();
  }
  return message;
}

/// Throws when `place` holds a file that is not this output's to replace.
void OutputFile::CheckSideFile(const fs::path& place) const {
  std::error_code fault;
  if (!fs::exists(fs::symlink_status(place, fault))) return;
  for (const std::string& input : inputs_) {
    const fs::path source(input);
    const bool isBeside = fs::equivalent(source.parent_path(), place.parent_path(), fault);
    if (isBeside && place.stem() == source.stem()) {
      Refuse(place.string() +
             ", which goes with it, would replace a file of the input; choose "
             "another name");
    }
  }
  if (!overwrite_) {
    Refuse(place.string() +
           ", which goes with it, is there already; give --overwrite to "
           "replace it");
  }
}

/// Removes what described the file that is being replaced.
void OutputFile::RemoveLeftovers() const {
  std::error_code ignored;
  for (const char* ending : kSideEndings) {
    // "scene.hdr" may be of "scene.img" as well.
    if (!target_.has_extension() && ending == std::string(".hdr")) continue;
    fs::path leftover = target_;
    leftover += ending;
    fs::remove(leftover, ignored);
  }
}

void OutputFile::Move(const fs::path& name) const {
  std::error_code fault;
  fs::rename(folder_ / name, target_.parent_path() / name, fault);
  if (fault) throw HostError(kExitFailed, shown_ + ": can't be written: " + fault.message());
}

void OutputFile::Commit() {
  std::error_code fault;
  const fs::path main = target_.filename();
  std::vector<fs::path> beside;
  bool found = false;
  for (const fs::directory_entry& entry : fs::directory_iterator(folder_, fault)) {
    const fs::path name = entry.path().filename();
    if (name == main) {
      found = true;
    } else {
      beside.push_back(name);
    }
  }
  if (!found) throw HostError(kExitFailed, shown_ + ": was not written whole");
  for (const fs::path& name : beside) CheckSideFile(target_.parent_path() / name);
  RemoveLeftovers();
  for (const fs::path& name : beside) Move(name);
  Move(main);
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
