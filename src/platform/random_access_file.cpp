#include "platform/random_access_file.h"

#include <algorithm>
#include <atomic>
#include <cerrno>
#include <climits>
#include <cstdio>
#include <cstdlib>
#include <fcntl.h>
#include <sys/stat.h>
#include <sys/uio.h>
#include <unistd.h>
#include <utility>

#include "platform/file_descriptor.h"
#include "platform/file_gate.h"
#include "platform/file_moves.h"
#include "platform/memory_shortage.h"
#include "platform/temporary_file.h"

namespace lumo::platform {
namespace {

constexpr mode_t kReadableByAll = 0666;  // less what the process masks

bool Fail(std::string* fault, const std::string& path, const std::string& what) {
  if (fault != nullptr) *fault = path + ": " + what;
  return false;
}

bool FailBySystem(std::string* fault, const std::string& path, int error) {
  Fail(fault, path, SystemErrorText(error));
  errno = error;
  return false;
}

template <typename Call>
auto RetryInterrupted(Call&& call) {
  auto result = call();
  while (result < 0 && errno == EINTR) result = call();
  return result;
}

/// Only files whose bytes stand at places are opened. 0, or the system's number: EISDIR for others.
int FindUnfit(int descriptor) {
  struct stat status {};
  if (fstat(descriptor, &status) != 0) return errno;
  return S_ISREG(status.st_mode) ? 0 : EISDIR;
}

iovec Vector(const FilePiece& piece) {
  return {piece.data, piece.bytes};
}
iovec Vector(const ConstFilePiece& piece) {
  return {const_cast<void*>(piece.data), piece.bytes};
}

/// Takes `moved` bytes off the front of the vectors; gives the first that has some left.
iovec* Advance(iovec* at, const iovec* end, std::size_t moved) {
  for (; at != end && moved >= at->iov_len; ++at) moved -= at->iov_len;
  if (at != end) {
    at->iov_base = static_cast<char*>(at->iov_base) + moved;
    at->iov_len -= moved;
  }
  return at;
}

/// Moves all pieces by as many calls of preadv or pwritev as it takes.
/// @param call  (vectors, count, place), as the system's.
/// @return 0, the system's number for what went wrong, or kEnded.
constexpr int kEnded = -1;
template <typename Piece, typename Call>
int Transfer(std::uint64_t offset, std::span<const Piece> pieces, Call&& call) {
  iovec vectors[IOV_MAX];
  while (!pieces.empty()) {
    const std::size_t count = std::min<std::size_t>(pieces.size(), IOV_MAX);
    std::transform(pieces.begin(), pieces.begin() + static_cast<std::ptrdiff_t>(count), vectors,
                   [](const Piece& piece) { return Vector(piece); });
    pieces = pieces.subspan(count);
    const iovec* const end = vectors + count;
    for (iovec* at = Advance(vectors, end, 0); at != end;) {
      if (offset > static_cast<std::uint64_t>(INT64_MAX)) return EFBIG;
      const ssize_t moved = RetryInterrupted(
          [&] { return call(at, static_cast<int>(end - at), static_cast<off_t>(offset)); });
      if (moved < 0) return errno;
      if (moved == 0) return kEnded;
      offset += static_cast<std::uint64_t>(moved);
      at = Advance(at, end, static_cast<std::size_t>(moved));
    }
  }
  return 0;
}

/// False, with errno and the fault set, when the file gate refuses the file.
bool IsLetThrough(const std::string& path, bool writing, std::string* fault) {
  if (PassesFileGate(path, writing, fault)) return true;
  errno = EACCES;
  return false;
}

/// Opens a regular file; none, with errno and the fault set, when that fails.
FileDescriptor OpenRegular(const std::string& path, int mode, std::string* fault) {
  FileDescriptor file(RetryInterrupted(
      [&] { return open(path.c_str(), mode | O_CLOEXEC | O_NONBLOCK, kReadableByAll); }));
  if (!file.IsOpen()) {
    FailBySystem(fault, path, errno);
  } else if (const int unfit = FindUnfit(file.Get()); unfit != 0) {
    file.Close();
    if ((mode & O_EXCL) != 0) std::remove(path.c_str());  // made just now
    FailBySystem(fault, path, unfit);
    if (unfit == EISDIR) Fail(fault, path, "not a file");
    errno = unfit;
  }
  return file;
}

}  // namespace

std::unique_ptr<RandomAccessFile> RandomAccessFile::Open(const std::string& path, Access access,
                                                         std::string* fault, Gate gate) {
  const bool writing = access == Access::kUpdate;
  if (gate == Gate::kAsk && !IsLetThrough(path, writing, fault)) return nullptr;
  FileDescriptor file = OpenRegular(path, writing ? O_RDWR : O_RDONLY, fault);
  if (!file.IsOpen()) return nullptr;
  return std::unique_ptr<RandomAccessFile>(new RandomAccessFile(path, file.Release()));
}

std::unique_ptr<RandomAccessFile> RandomAccessFile::CreateOrEmpty(const std::string& path,
                                                                  std::string* fault) {
  if (!IsLetThrough(path, true, fault)) return nullptr;
  FileDescriptor file = OpenRegular(path, O_RDWR | O_CREAT, fault);
  if (!file.IsOpen()) return nullptr;
  std::unique_ptr<RandomAccessFile> opened(new RandomAccessFile(path, file.Release()));
  return opened->SetSize(0, fault) ? std::move(opened) : nullptr;
}

std::unique_ptr<RandomAccessFile> RandomAccessFile::Create(const std::string& path,
                                                           std::string* fault) {
  if (!IsLetThrough(path, true, fault)) return nullptr;
  FileDescriptor file = OpenRegular(path, O_RDWR | O_CREAT | O_EXCL, fault);
  if (!file.IsOpen()) return nullptr;
  return std::unique_ptr<RandomAccessFile>(new RandomAccessFile(path, file.Release()));
}

std::unique_ptr<RandomAccessFile> RandomAccessFile::CreateUnnamed(std::string folder,
                                                                  std::string* fault) {
  const char* const wanted = std::getenv("TMPDIR");
  if (folder.empty()) folder = wanted != nullptr && *wanted != '\0' ? wanted : "/var/tmp";
  constexpr mode_t kOwnersAlone = 0600;
  FileDescriptor file(RetryInterrupted(
      [&] { return open(folder.c_str(), O_RDWR | O_TMPFILE | O_CLOEXEC, kOwnersAlone); }));
  if (!file.IsOpen() && (errno == EOPNOTSUPP || errno == EISDIR || errno == EINVAL)) {
    // The file system knows no files without names: one gets a name for a moment.
    const std::string path = TemporaryPathBeside(folder + "/vexg");
    file = FileDescriptor(RetryInterrupted(
        [&] { return open(path.c_str(), O_RDWR | O_CREAT | O_EXCL | O_CLOEXEC, kOwnersAlone); }));
    if (file.IsOpen()) unlink(path.c_str());
  }
  if (!file.IsOpen()) {
    FailBySystem(fault, folder, errno);
    return nullptr;
  }
  return std::unique_ptr<RandomAccessFile>(new RandomAccessFile(folder, file.Release()));
}

RandomAccessFile::~RandomAccessFile() {
  Close();
}

bool RandomAccessFile::Close(std::string* fault) {
  const int descriptor = std::exchange(descriptor_, -1);
  // An interrupted close has closed all the same.
  if (descriptor < 0 || close(descriptor) == 0 || errno == EINTR) return true;
  return FailBySystem(fault, path_, errno);
}

bool RandomAccessFile::Read(std::uint64_t offset, std::span<const FilePiece> pieces,
                            std::string* fault) const {
  const int error = Transfer(offset, pieces, [this](const iovec* at, int count, off_t place) {
    return preadv(descriptor_, at, count, place);
  });
  if (error == kEnded) return Fail(fault, path_, "the file is too short");
  return error == 0 || FailBySystem(fault, path_, error);
}

bool RandomAccessFile::ReadUpTo(std::uint64_t offset, void* data, std::size_t bytes,
                                std::size_t& got, std::string* fault) const {
  got = 0;
  const FilePiece piece{data, bytes};
  const int error =
      Transfer(offset, std::span(&piece, 1), [&](const iovec* at, int count, off_t place) {
        const ssize_t moved = preadv(descriptor_, at, count, place);
        if (moved > 0) got += static_cast<std::size_t>(moved);
        return moved;
      });
  return error == 0 || error == kEnded || FailBySystem(fault, path_, error);
}

bool RandomAccessFile::Write(std::uint64_t offset, std::span<const ConstFilePiece> pieces,
                             std::string* fault) {
  const int error = Transfer(offset, pieces, [this](const iovec* at, int count, off_t place) {
    return pwritev(descriptor_, at, count, place);
  });
  if (error != 0) return FailBySystem(fault, path_, error == kEnded ? ENOSPC : error);
  std::uint64_t bytes = 0;
  for (const ConstFilePiece& piece : pieces) bytes += piece.bytes;
  writeBack_.Count(descriptor_, bytes);
  return true;
}

bool RandomAccessFile::GetSize(std::uint64_t& bytes, std::string* fault) const {
  struct stat status {};
  if (fstat(descriptor_, &status) != 0) return FailBySystem(fault, path_, errno);
  bytes = static_cast<std::uint64_t>(status.st_size);
  return true;
}

bool RandomAccessFile::SetSize(std::uint64_t bytes, std::string* fault) {
  if (bytes > static_cast<std::uint64_t>(INT64_MAX)) return FailBySystem(fault, path_, EFBIG);
  const auto cut = [&] { return ftruncate(descriptor_, static_cast<off_t>(bytes)); };
  return RetryInterrupted(cut) == 0 || FailBySystem(fault, path_, errno);
}

bool RandomAccessFile::Flush(std::string* fault) {
  return RetryInterrupted([this] { return fsync(descriptor_); }) == 0 ||
         FailBySystem(fault, path_, errno);
}

bool RandomAccessFile::HasName() const {
  struct stat mine {
  }, named{};
  return fstat(descriptor_, &mine) == 0 && stat(path_.c_str(), &named) == 0 &&
         mine.st_dev == named.st_dev && mine.st_ino == named.st_ino;
}

bool WriteNewFile(const std::string& path, std::string_view content, std::string* fault) {
  const auto file = RandomAccessFile::Create(path, fault);
  if (file == nullptr) return false;
  if (file->Write(0, content.data(), content.size(), fault) && file->Flush(fault)) return true;
  std::remove(path.c_str());
  return false;
}

bool ReplaceFile(const std::string& path, std::string_view content, std::string* fault) {
  RemoveAbandonedFiles(path);
  const std::string temporary = TemporaryPathBeside(path);
  std::string why;
  const bool written = WriteNewFile(temporary, content, &why);
  if (written && RenameFile(temporary, path, &why)) return true;
  if (written) std::remove(temporary.c_str());
  if (fault != nullptr) {  // the temporary path would mean nothing to anybody
    *fault = why.starts_with(temporary) ? path + why.substr(temporary.size()) : why;
  }
  return false;
}

}  // namespace lumo::platform
