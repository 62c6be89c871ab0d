#include "orva/orva_file.h"

#include <filesystem>

#include "data/format_table.h"
#include "foundation/abandonment.h"
#include "foundation/fault.h"
#include "foundation/file_faults.h"
#include "platform/file_moves.h"
#include "platform/file_swap.h"
#include "platform/folder_lock.h"
#include "platform/temporary_file.h"

namespace lumo::orva {
namespace {

using platform::RandomAccessFile;

/// Beyond this no header is read or written: 200 bands with histograms of 65536 bins fit.
constexpr std::uint64_t kMaxHeaderBytes = 256 << 20;

/// Reads a header file.
bool LoadText(const std::string& path, std::string& text, std::string& fault) {
  const auto file = RandomAccessFile::Open(path, RandomAccessFile::Access::kRead, &fault);
  std::uint64_t bytes = 0;
  if (file == nullptr || !file->GetSize(bytes, &fault)) return false;
  if (bytes > kMaxHeaderBytes) {
    fault = path + ": line 1: too large for a header";
    return false;
  }
  text.resize(bytes);
  return file->Read(0, text.data(), text.size(), &fault);
}

void RemoveFile(const std::string& path) {
  std::error_code ignored;
  std::filesystem::remove(path, ignored);
}

}  // namespace

bool File::Fail(const std::string& fault) const {
  // A new raster lies beside its place at first; its user knows only the place.
  const std::string shown = pixels_ != nullptr ? pixels_->Path() : path_;
  SetFault(fault.starts_with(shown + ": ") ? path_ + fault.substr(shown.size()) : fault);
  return false;
}

bool File::LoadHeader(Header& header) const {
  const std::string headerPath = HeaderPath(path_);
  std::string text, fault;
  if (!LoadText(headerPath, text, fault)) return Fail(fault);
  return ParseHeader(text, header, fault) || Fail(headerPath + ": " + fault);
}

std::unique_ptr<File> File::Open(const std::string& path) {
  std::unique_ptr<File> file(new File(path));
  if (!file->LoadHeader(file->header_)) return nullptr;
  std::string fault;
  file->pixels_ =
      RandomAccessFile::Open(path, RandomAccessFile::Access::kUpdate, &file->whyReadOnly_);
  if (!file->CanWrite()) {
    file->pixels_ = RandomAccessFile::Open(path, RandomAccessFile::Access::kRead, &fault);
  }
  std::uint64_t bytes = 0;
  if (file->pixels_ == nullptr || !file->pixels_->GetSize(bytes, &fault)) {
    file->Fail(fault);
    return nullptr;
  }
  const std::uint64_t needed = file->header_.FileBytes();
  if (bytes < needed) {
    const HeaderText::Entry* const lines = file->header_.text.Find("lines");
    file->Fail(HeaderPath(path) + ": line " + std::to_string(lines->line) + ": the pixels take " +
               std::to_string(needed) + " bytes, the file has " + std::to_string(bytes));
    return nullptr;
  }
  return file;
}

std::unique_ptr<File> File::Create(const std::string& path, const RasterDef& def) {
  std::unique_ptr<File> file(new File(path));
  file->failed_ = true;
  std::string fault;
  if (!MakeHeader(def, file->header_, fault)) {
    file->Fail(path + ": " + fault);
    return nullptr;
  }
  std::error_code missing;
  if (std::filesystem::exists(path, missing) && !std::filesystem::is_regular_file(path, missing)) {
    file->Fail(path + ": not a file");
    return nullptr;
  }
  platform::RemoveAbandonedFiles(path);
  platform::RemoveAbandonedFiles(HeaderPath(path));
  file->older_ = platform::IdentifyFile(path);
  file->hadHeader_ = platform::IdentifyFile(HeaderPath(path)).exists;
  file->replaces_ = file->older_.exists || file->hadHeader_;
  file->pixels_ = RandomAccessFile::Create(
      file->replaces_ ? platform::TemporaryPathBeside(path) : path, &fault);
  file->isNew_ = file->pixels_ != nullptr;
  if (!file->isNew_ || !file->pixels_->SetSize(file->header_.FileBytes(), &fault)) {
    file->Fail(fault);
    return nullptr;
  }
  file->failed_ = false;
  return file;
}

bool File::Close() {
  if (!isNew_) return true;
  isNew_ = false;
  if (failed_ || IsAbandoning()) {
    Discard();
    return false;
  }
  if (!pixels_->HasName() && !platform::IdentifyFile(path_).exists) return true;  // deleted
  if (Publish()) return true;
  Discard();
  return false;
}

/// The new header is on the disk, under another name, before anything old goes; and at no moment
/// does a header stand over pixels that are not its own.
bool File::Publish() {
  std::string fault;
  const std::string headerPath = HeaderPath(path_);
  const std::string newHeader = platform::TemporaryPathBeside(headerPath);
  const bool isWritten =
      pixels_->Flush(&fault) && platform::WriteNewFile(newHeader, header_.text.Format(), &fault);
  if (isWritten && TakePlace(newHeader, fault)) return true;
  RemoveFile(newHeader);
  return Fail(fault.starts_with(newHeader) ? headerPath + fault.substr(newHeader.size()) : fault);
}

/// Puts both files to their places, unless another raster was made there meanwhile.
bool File::TakePlace(const std::string& newHeader, std::string& fault) {
  const platform::FolderLock lock(path_);
  if (!lock.IsHeld(&fault)) return false;
  const platform::FileIdentity now = platform::IdentifyFile(path_);
  const bool hasHeader = platform::IdentifyFile(HeaderPath(path_)).exists;
  if ((replaces_ ? now.exists && !now.IsSameFile(older_) : !pixels_->HasName()) ||
      (hasHeader && !hadHeader_)) {
    fault = path_ + ": was replaced by another program meanwhile";
    return false;
  }
  platform::FileSwap swap;
  if (!swap.MoveAside(HeaderPath(path_), &fault) ||
      (replaces_ && !swap.MoveIn(pixels_->Path(), path_, &fault)) ||
      !swap.MoveIn(newHeader, HeaderPath(path_), &fault)) {
    return false;
  }
  swap.Keep();
  return true;
}

void File::Discard() {
  if (pixels_->HasName()) RemoveFile(pixels_->Path());
}

bool File::Read(std::uint64_t offset, std::span<const platform::FilePiece> pieces) const {
  std::string fault;
  return pixels_->Read(offset, pieces, &fault) || Fail(fault);
}

bool File::Write(std::uint64_t offset, std::span<const platform::ConstFilePiece> pieces) {
  std::string fault;
  if (pixels_->Write(offset, pieces, &fault)) return true;
  failed_ = true;
  return Fail(fault);
}

bool File::ChangeHeader(const std::function<bool(Header&)>& change) {
  if (!CanWrite()) return Fail(whyReadOnly_);
  Header header = header_;
  std::string text, fault;
  if (isNew_) {
    if (!ChangeText(header, change, text)) return false;
  } else {
    const platform::FolderLock lock(path_);
    if (!lock.IsHeld(&fault)) return Fail(fault);
    if (!pixels_->HasName()) return Fail(path_ + ": replaced since it was opened");
    if (!LoadHeader(header)) return false;
    const std::string before = header.text.Format();
    if (!ChangeText(header, change, text)) return false;
    if (text != before && !platform::ReplaceFile(HeaderPath(path_), text, &fault)) {
      return Fail(fault);
    }
  }
  header_.text = std::move(header.text);
  return true;
}

/// @param text  [out] of the changed header.
bool File::ChangeText(Header& header, const std::function<bool(Header&)>& change,
                      std::string& text) const {
  if (!change(header)) return false;
  text = header.text.Format();
  return text.size() <= kMaxHeaderBytes || Fail(HeaderPath(path_) + ": too much for a header");
}

std::string FindPath(const Array<String>& connStrings) {
  Array<String> rest;
  RemoveFormatNames(connStrings, rest);
  std::string path = rest.GetCount() == 1 ? rest[0].ToUTF8() : std::string();
  constexpr std::string_view kSuffix = ".hdr";
  if (path.size() > kSuffix.size() && path.ends_with(kSuffix)) {
    path.resize(path.size() - kSuffix.size());
  }
  if (path.empty()) {
    SetFault("ORVA: the connection strings don't name one file");
    return {};
  }
  std::error_code fault;
  const std::string absolute = std::filesystem::weakly_canonical(path, fault).string();
  if (fault) SetFault(path + ": " + fault.message());
  return fault ? std::string() : absolute;
}

bool HasHeader(const std::string& path) {
  const std::string header = HeaderPath(path);
  const auto file = RandomAccessFile::Open(header, RandomAccessFile::Access::kRead);
  char start[5] = {};
  std::size_t bytes = 0;
  if (file == nullptr || !file->ReadUpTo(0, start, sizeof start, bytes)) {
    FileFaults::NoteUnread(header);
    return false;
  }
  if (bytes < sizeof start) return false;
  return std::string_view(start, 4) == "ORVA" && (start[4] == '\n' || start[4] == '\r');
}

}  // namespace lumo::orva
