#pragma once

#include <functional>
#include <memory>

#include "orva/orva_header.h"
#include "platform/file_identity.h"
#include "platform/random_access_file.h"

namespace lumo::orva {

/// An ORVA raster on the disk: the file with the pixels, and its header.
///
/// A new raster has no header until Close: what breaks before leaves no raster. Where it takes the
/// place of an older one, that stays as it is until then, and when the change fails. Of two that
/// are made at one place, the second to be closed fails.
/// Failure: false or null, with SetFault.
class File {
 public:
  /// Opens a raster, for writing too where the system allows it.
  /// @param path  of the file with the pixels.
  static std::unique_ptr<File> Open(const std::string& path);

  /// Makes a raster of zeros.
  static std::unique_ptr<File> Create(const std::string& path, const RasterDef& def);

  ~File() { Close(); }
  File(const File&) = delete;
  File& operator=(const File&) = delete;

  /// Flushes a new raster and gives it its header, unless an operation on it has failed, or
  /// somebody has deleted its file. True as well when there is nothing to do.
  bool Close();

  /// Absolute, with links resolved.
  const std::string& Path() const { return path_; }
  const Header& GetHeader() const { return header_; }
  bool CanWrite() const { return whyReadOnly_.empty(); }

  bool Read(std::uint64_t offset, std::span<const platform::FilePiece> pieces) const;
  /// A failure to write dooms a new raster.
  bool Write(std::uint64_t offset, std::span<const platform::ConstFilePiece> pieces);

  /// Lets `change` change the text of a header, unless it gives false, with SetFault. The header of
  /// a raster which has one is read again before, since another connection may have written it, and
  /// is written when it has changed; nobody else changes it meanwhile.
  bool ChangeHeader(const std::function<bool(Header&)>& change);

 private:
  explicit File(std::string path) : path_(std::move(path)) {}
  bool Fail(const std::string& fault) const;
  bool LoadHeader(Header& header) const;
  bool ChangeText(Header& header, const std::function<bool(Header&)>& change,
                  std::string& text) const;
  bool Publish();
  bool TakePlace(const std::string& newHeader, std::string& fault);
  void Discard();

  const std::string path_;
  Header header_;
  std::unique_ptr<platform::RandomAccessFile> pixels_;
  std::string whyReadOnly_;       // "path: what"; empty where the pixels can be written
  platform::FileIdentity older_;  // that a new raster takes the place of
  bool hadHeader_ = false;        // when the new raster was begun
  bool isNew_ = false;            // has no header yet
  bool replaces_ = false;         // lies beside `path_` until it is whole
  bool failed_ = false;           // gets no header any more
};

/// The file that connection strings name: the one piece that is no format's key, without ".hdr" at
/// its end, absolute and with links resolved. Empty, with SetFault, when they don't name one.
std::string FindPath(const Array<String>& connStrings);

/// True when the file has a header that begins as one.
bool HasHeader(const std::string& path);

}  // namespace lumo::orva
