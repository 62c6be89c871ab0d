#include "gdal_common/file_system.h"

#include <algorithm>
#include <cerrno>
#include <cpl_conv.h>
#include <cpl_string.h>
#include <cpl_vsi_error.h>
#include <cpl_vsi_virtual.h>
#include <cstring>
#include <filesystem>
#include <memory>
#include <string>
#include <string_view>
#include <system_error>
#include <utility>
#include <vector>

#include "foundation/file_faults.h"
#include "foundation/staged_files.h"
#include "platform/file_moves.h"
#include "platform/random_access_file.h"
#include "platform/temporary_file.h"

namespace lumo::gdal {
namespace {

using platform::RandomAccessFile;

/// Notes the system's number of the call that just failed. False, to be returned.
bool NoteFault(const std::string& path) {
  FileFaults::Note(path, errno != 0 ? errno : EIO);
  return false;
}

/// One open file of GDAL's. Small reads and writes go through one window of the file, which holds
/// either what was read ahead or what is not yet written.
///
/// A file to which a write has failed is given up: from then on every read and write of it fails,
/// so that a library that looks for its way in what it has half written comes to an end, and its
/// last failure is reported once more when it is closed.
class File final : public VSIVirtualHandle {
 public:
  /// @param shown  the path that faults are noted under.
  /// @param target  the place that the file takes when it is closed; empty when it is there.
  File(std::unique_ptr<RandomAccessFile> file, std::string shown, std::string target)
      : file_(std::move(file)), shown_(std::move(shown)), target_(std::move(target)) {}
  ~File() override { Close(); }

  int Seek(vsi_l_offset offset, int whence) override {
    isAtEnd_ = false;
    if (whence == SEEK_SET) {
      place_ = offset;
      return 0;
    }
    // Offsets are unsigned; those before the place come as large ones and wrap.
    std::uint64_t base = place_;
    if (whence == SEEK_END && !SizeOf(base)) return -1;
    place_ = base + offset;
    return 0;
  }

  vsi_l_offset Tell() override { return place_; }

  std::size_t Read(void* to, std::size_t size, std::size_t count) override {
    if (size == 0 || count == 0) return 0;
    const std::size_t wanted = size * count;
    const std::size_t got = ReadBytes(static_cast<char*>(to), wanted);
    if (got < wanted) isAtEnd_ = true;
    return got / size;
  }

  std::size_t Write(const void* from, std::size_t size, std::size_t count) override {
    if (size == 0 || count == 0) return 0;
    return WriteBytes(static_cast<const char*>(from), size * count) ? count : 0;
  }

  int Eof() override { return isAtEnd_ ? TRUE : FALSE; }

  int Flush() override { return WriteWindow() ? 0 : -1; }

  int Truncate(vsi_l_offset size) override {
    if (!WriteWindow()) return -1;
    window_.clear();
    errno = 0;
    writtenEnd_ = std::min<std::uint64_t>(writtenEnd_, size);
    return file_->SetSize(size) || FailToWrite() ? 0 : -1;
  }

  bool HasPRead() const override { return true; }

  std::size_t PRead(void* to, std::size_t size, vsi_l_offset offset) const override {
    std::size_t got = 0;
    errno = 0;
    if (failure_ == 0 && !file_->ReadUpTo(offset, to, size, got)) NoteFault(shown_);
    return got;
  }

  int Close() override {
    if (file_ == nullptr) return 0;
    const bool isWhole = WriteWindow() && HasAllThatWasWritten();
    const std::string made = file_->Path();
    errno = 0;
    if (!file_->Close()) FailToWrite();
    file_.reset();
    if (failure_ != 0) FileFaults::Note(shown_, failure_);  // its listener may be another one
    if (target_.empty()) return isWhole && failure_ == 0 ? 0 : -1;
    errno = 0;
    const bool canTakePlace = isWhole && failure_ == 0;
    if (canTakePlace && (platform::RenameFile(made, target_) || NoteFault(shown_))) return 0;
    VSIUnlink(made.c_str());
    return -1;
  }

 private:
  static constexpr std::size_t kWindowBytes = 16 << 10;

  bool SizeOf(std::uint64_t& bytes) {
    if (!WriteWindow()) return false;
    errno = 0;
    return file_->GetSize(bytes) || NoteFault(shown_);
  }

  /// False for a file that is shorter than what was written to it without a failure.
  bool HasAllThatWasWritten() {
    std::uint64_t bytes = 0;
    if (failure_ != 0 || writtenEnd_ == 0) return failure_ == 0;
    errno = 0;
    return file_->GetSize(bytes) && bytes >= writtenEnd_ ? true : FailToWrite();
  }

  /// Takes what the window holds of the next bytes.
  std::size_t TakeFromWindow(char* to, std::size_t bytes) {
    if (place_ < windowPlace_ || place_ >= windowPlace_ + window_.size()) return 0;
    const auto skipped = static_cast<std::size_t>(place_ - windowPlace_);
    const std::size_t taken = std::min(bytes, window_.size() - skipped);
    std::memcpy(to, window_.data() + skipped, taken);
    place_ += taken;
    return taken;
  }

  /// @return the bytes that there are, up to `bytes`; fewer also when the read failed.
  std::size_t ReadBytes(char* to, std::size_t bytes) {
    if (failure_ != 0 || !WriteWindow()) return 0;
    std::size_t got = TakeFromWindow(to, bytes);
    if (got == bytes) return got;
    const std::size_t rest = bytes - got;
    std::size_t more = 0;
    errno = 0;
    if (rest >= kWindowBytes) {
      if (!file_->ReadUpTo(place_, to + got, rest, more)) NoteFault(shown_);
      place_ += more;
      return got + more;
    }
    window_.resize(kWindowBytes);
    windowPlace_ = place_;
    const bool isRead = file_->ReadUpTo(place_, window_.data(), kWindowBytes, more);
    window_.resize(isRead ? more : 0);
    if (!isRead) NoteFault(shown_);
    return got + TakeFromWindow(to + got, rest);
  }

  bool WriteBytes(const char* from, std::size_t bytes) {
    if (failure_ != 0) return false;
    if (!isUnwritten_ || place_ != windowPlace_ + window_.size() ||
        window_.size() + bytes > kWindowBytes) {
      if (!WriteWindow()) return false;
      window_.clear();
      windowPlace_ = place_;
    }
    if (bytes > kWindowBytes) {
      errno = 0;
      if (!file_->Write(place_, from, bytes)) return FailToWrite();
      writtenEnd_ = std::max<std::uint64_t>(writtenEnd_, place_ + bytes);
    } else {
      window_.insert(window_.end(), from, from + bytes);
      isUnwritten_ = true;
    }
    place_ += bytes;
    return true;
  }

  bool WriteWindow() {
    if (!isUnwritten_) return failure_ == 0;
    isUnwritten_ = false;
    errno = 0;
    const bool isWritten = file_->Write(windowPlace_, window_.data(), window_.size());
    writtenEnd_ = std::max<std::uint64_t>(writtenEnd_, windowPlace_ + window_.size());
    window_.clear();
    return isWritten || FailToWrite();
  }

  bool FailToWrite() {
    if (errno == 0) errno = EIO;
    failure_ = errno;
    return NoteFault(shown_);
  }

  std::unique_ptr<RandomAccessFile> file_;
  const std::string shown_;
  const std::string target_;
  std::uint64_t place_ = 0;
  std::vector<char> window_;
  std::uint64_t windowPlace_ = 0;
  std::uint64_t writtenEnd_ = 0;  // of what was written; 0 for nothing
  bool isUnwritten_ = false;
  int failure_ = 0;  // the system's number of the first write that failed
  bool isAtEnd_ = false;
};

/// Codes that only say that there is nothing of the name, or nothing that can be changed: drivers
/// ask for files that need not be there, and try to open for writing what may be read only.
bool IsAnswer(int code, bool isForWriting) {
  switch (code) {
    case ENOENT:
    case ENOTDIR:
    case EISDIR:
    case ENAMETOOLONG:
      return true;
    case EACCES:
    case EPERM:
    case EROFS:
    case ETXTBSY:
      return isForWriting;
    default:
      return false;
  }
}

/// Marks this library's handler beside GDAL's own, which has no options.
constexpr const char* kMark = "<Options handler='vexg'/>";

/// Plain files by File; all else as GDAL's own handler does it.
class FileSystem final : public VSIFilesystemHandler {
 public:
  explicit FileSystem(VSIFilesystemHandler& plain) : plain_(plain) {}

  VSIVirtualHandle* Open(const char* path, const char* access, bool setError,
                         CSLConstList options) override {
    const std::string_view mode = access;
    if (mode.starts_with('a')) return plain_.Open(path, access, setError, options);
    const bool isNew = mode.starts_with('w');
    const bool isForWriting = isNew || mode.find('+') != mode.npos;
    errno = 0;
    VSIVirtualHandle* const file = Open(path, isNew, isForWriting);
    if (file != nullptr) return file;
    if (errno == EISDIR) return plain_.Open(path, access, setError, options);  // devices, pipes
    const int code = errno != 0 ? errno : EIO;
    if (!IsAnswer(code, isForWriting && !isNew)) FileFaults::Note(path, code);
    if (setError) {
      VSIError(VSIE_FileError, "%s: %s", path, std::generic_category().message(code).c_str());
    }
    errno = code;
    return nullptr;
  }

  int Stat(const char* path, VSIStatBufL* status, int flags) override {
    errno = 0;
    return Noted(path, plain_.Stat(PlaceOf(path).c_str(), status, flags));
  }
  int Unlink(const char* path) override {
    StagedFiles* const staged = StagedFiles::OfThread();
    if (staged == nullptr || !staged->Covers(path)) return Noted(path, plain_.Unlink(path));
    return staged->Remove(path) ? 0 : -1;
  }
  int Rename(const char* from, const char* to) override {
    return Noted(from, plain_.Rename(from, to));
  }
  int* UnlinkBatch(CSLConstList files) override { return plain_.UnlinkBatch(files); }
  int Mkdir(const char* path, long mode) override { return plain_.Mkdir(path, mode); }
  int Rmdir(const char* path) override { return plain_.Rmdir(path); }
  int RmdirRecursive(const char* path) override { return plain_.RmdirRecursive(path); }
  char** ReadDirEx(const char* path, int most) override {
    return WithStaged(path, plain_.ReadDirEx(path, most));
  }
  char** SiblingFiles(const char* path) override { return plain_.SiblingFiles(path); }
  int IsCaseSensitive(const char* path) override { return plain_.IsCaseSensitive(path); }
  const char* GetOptions() override { return kMark; }
  GIntBig GetDiskFreeSpace(const char* path) override { return plain_.GetDiskFreeSpace(path); }
  int SupportsSparseFiles(const char* path) override { return plain_.SupportsSparseFiles(path); }
  VSIDIR* OpenDir(const char* path, int depth, const char* const* options) override {
    return plain_.OpenDir(path, depth, options);
  }

 private:
  /// The names in a folder, and those of the files that are new there.
  static char** WithStaged(const char* folder, char** names) {
    const StagedFiles* const staged = StagedFiles::OfThread();
    if (staged == nullptr || names == nullptr) return names;
    for (const std::string& name : staged->NamesIn(folder))
      names = CSLAddString(names, name.c_str());
    return names;
  }

  /// Where a file that GDAL names lies for now.
  static std::string PlaceOf(const char* path) {
    const StagedFiles* const staged = StagedFiles::OfThread();
    return staged != nullptr ? staged->PlaceOf(path) : path;
  }

  static VSIVirtualHandle* Open(const char* path, bool isNew, bool isForWriting) {
    StagedFiles* const staged = StagedFiles::OfThread();
    if (staged != nullptr && isForWriting && staged->Covers(path)) {
      const std::string place = staged->Stage(path, isNew);
      return place.empty() ? nullptr : OpenAt(place, path, isNew, true);
    }
    if (isNew && std::string_view(path).ends_with(".aux.xml")) return OpenBeside(path);
    return OpenAt(PlaceOf(path), path, isNew, isForWriting);
  }

  static VSIVirtualHandle* OpenAt(const std::string& place, const char* path, bool isNew,
                                  bool isForWriting) {
    using Access = RandomAccessFile::Access;
    // The guard in front of this one has judged the file.
    auto file = isNew
                    ? RandomAccessFile::CreateOrEmpty(place)
                    : RandomAccessFile::Open(place, isForWriting ? Access::kUpdate : Access::kRead,
                                             nullptr, RandomAccessFile::Gate::kPassed);
    return file != nullptr ? new File(std::move(file), path, "") : nullptr;
  }

  /// Makes a file that takes the place of an older one when it is closed.
  static VSIVirtualHandle* OpenBeside(const char* path) {
    std::error_code fault;
    const std::filesystem::path resolved = std::filesystem::weakly_canonical(path, fault);
    const std::string target = fault ? path : resolved.string();
    platform::RemoveAbandonedFiles(target);
    auto file = RandomAccessFile::Create(platform::TemporaryPathBeside(target));
    if (file == nullptr) return nullptr;
    const auto status = std::filesystem::status(target, fault);
    if (std::filesystem::is_regular_file(status)) {
      std::filesystem::permissions(file->Path(), status.permissions(), fault);
    }
    return new File(std::move(file), path, target);
  }

  static int Noted(const char* path, int result) {
    const int code = errno;
    if (result != 0 && code != 0 && !IsAnswer(code, false)) FileFaults::Note(path, code);
    errno = code;
    return result;
  }

  VSIFilesystemHandler& plain_;
};

}  // namespace

void InstallFileSystem() {
  VSIFilesystemHandler* const plain = VSIFileManager::GetHandler("");
  // Several plug-ins share one GDAL, and the first of them has done it for all.
  const char* const mark = plain->GetOptions();
  if (mark != nullptr && std::string_view(mark) == kMark) return;
  // GDAL deletes the handler at its end, and never the one that it replaces.
  VSIFileManager::InstallHandler("", new FileSystem(*plain));
}

}  // namespace lumo::gdal
