#pragma once

#include <cstddef>
#include <cstdint>
#include <memory>
#include <span>
#include <string>
#include <string_view>

#include "platform/durability.h"
#include "platform/export.h"

namespace lumo::platform {

/// A run of memory that takes part in a transfer.
struct FilePiece {
  void* data;
  std::size_t bytes;
};
/// A run of memory that is written.
struct ConstFilePiece {
  const void* data;
  std::size_t bytes;
};

/// An open file that is read and written at any place. Nothing is buffered here.
///
///     std::string fault;
///     const auto file = RandomAccessFile::Open(path, RandomAccessFile::Access::kRead, &fault);
///     if (!file || !file->Read(offset, data, bytes, &fault)) return false;
///
/// Threads: any number of threads may transfer at once; what they do to one place is theirs to
///          order.
/// Failure: false or null, and one line in `fault`, where that isn't null: "path: what". errno
///          holds the system's number. A transfer that fails half way may have moved some of its
///          bytes.
class VEXG_EXPORT RandomAccessFile {
 public:
  enum class Access {
    kRead,
    kUpdate,  ///< reading and writing
  };

  /// Says whether the file gate (file_gate.h) judges a file, or the caller has had it judged.
  enum class Gate { kAsk, kPassed };

  /// Opens a regular file that exists.
  /// @param path  UTF-8.
  static std::unique_ptr<RandomAccessFile> Open(const std::string& path, Access access,
                                                std::string* fault = nullptr,
                                                Gate gate = Gate::kAsk);

  /// Makes an empty file and opens it for kUpdate. Fails where there is one already.
  static std::unique_ptr<RandomAccessFile> Create(const std::string& path,
                                                  std::string* fault = nullptr);

  /// Opens a regular file for kUpdate, empty: a new one, or the one that is there.
  static std::unique_ptr<RandomAccessFile> CreateOrEmpty(const std::string& path,
                                                         std::string* fault = nullptr);

  /// Makes an empty file without a name, and opens it for kUpdate. It goes with its last user,
  /// whatever ends him. Path() names the folder.
  /// @param folder  empty for $TMPDIR, or where that isn't set /var/tmp.
  static std::unique_ptr<RandomAccessFile> CreateUnnamed(std::string folder,
                                                         std::string* fault = nullptr);

  ~RandomAccessFile();
  RandomAccessFile(const RandomAccessFile&) = delete;
  RandomAccessFile& operator=(const RandomAccessFile&) = delete;

  const std::string& Path() const { return path_; }

  /// Reads from `offset` into one piece after the other. A file that ends before is a failure.
  bool Read(std::uint64_t offset, std::span<const FilePiece> pieces,
            std::string* fault = nullptr) const;
  bool Read(std::uint64_t offset, void* data, std::size_t bytes,
            std::string* fault = nullptr) const {
    const FilePiece piece{data, bytes};
    return Read(offset, std::span(&piece, 1), fault);
  }

  /// Reads from `offset` as much as the file has, up to `bytes`. @param got  bytes read.
  bool ReadUpTo(std::uint64_t offset, void* data, std::size_t bytes, std::size_t& got,
                std::string* fault = nullptr) const;

  /// Writes one piece after the other from `offset` on. The file grows where it must.
  bool Write(std::uint64_t offset, std::span<const ConstFilePiece> pieces,
             std::string* fault = nullptr);
  bool Write(std::uint64_t offset, const void* data, std::size_t bytes,
             std::string* fault = nullptr) {
    const ConstFilePiece piece{data, bytes};
    return Write(offset, std::span(&piece, 1), fault);
  }

  /// Gets the size of the file now. @param bytes  [out] its size.
  bool GetSize(std::uint64_t& bytes, std::string* fault = nullptr) const;

  /// Cuts the file, or lets it grow by zeros that take no room on the disk.
  bool SetSize(std::uint64_t bytes, std::string* fault = nullptr);

  /// Returns when all bytes that were written are on the disk.
  bool Flush(std::string* fault = nullptr);

  /// Gives the file back to the system, which may report a failed write only now. Nothing works any
  /// more after it.
  bool Close(std::string* fault = nullptr);

  /// False when the file was deleted, or replaced by another, since it was opened.
  bool HasName() const;

 private:
  RandomAccessFile(std::string path, int descriptor)
      : path_(std::move(path)), descriptor_(descriptor) {}

  const std::string path_;
  int descriptor_;  // below 0: closed
  WriteBack writeBack_;
};

/// Makes a file that holds `content`, on the disk when this returns; none when it fails.
VEXG_EXPORT bool WriteNewFile(const std::string& path, std::string_view content,
                              std::string* fault = nullptr);

/// Puts a file with `content` at `path`, in one step that other programs see whole or not at all,
/// and that a crash of the machine doesn't tear. What stood there stays when it fails.
VEXG_EXPORT bool ReplaceFile(const std::string& path, std::string_view content,
                             std::string* fault = nullptr);

}  // namespace lumo::platform
