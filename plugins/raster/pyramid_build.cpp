#include "pyramid_build.h"

#include <algorithm>
#include <cstdio>
#include <filesystem>
#include <map>

#include "foundation/fault.h"
#include "foundation/file_faults.h"
#include "platform/file_moves.h"
#include "platform/folder_lock.h"
#include "platform/temporary_file.h"
#include "raster/pixel_types.h"

namespace lumo::pyramid {

using platform::RandomAccessFile;

namespace {

/// The builds under way, by path.
class Registry {
 public:
  static Registry& Get() {
    static auto* const registry = new Registry;
    return *registry;
  }

  std::shared_ptr<Build> Find(const std::string& path) {
    const std::lock_guard lock(lock_);
    const auto at = builds_.find(path);
    const std::shared_ptr<Build> build = at != builds_.end() ? at->second.lock() : nullptr;
    return build != nullptr && !build->IsOver() ? build : nullptr;
  }

  void Enter(const std::string& path, const std::shared_ptr<Build>& build) {
    const std::lock_guard lock(lock_);
    std::erase_if(builds_, [](const auto& entry) { return entry.second.expired(); });
    builds_[path] = build;
  }

 private:
  std::mutex lock_;
  std::map<std::string, std::weak_ptr<Build>> builds_;
};

}  // namespace

std::shared_ptr<Build> Build::Find(const std::string& path) {
  return Registry::Get().Find(path);
}

std::shared_ptr<Build> Build::Begin(const std::string& path, const Header& header,
                                    const void* beginner) {
  std::shared_ptr<Build> build(new Build(path, header));
  build->beginner_ = beginner;
  const char* const impossible = FindFault(header);
  if (impossible != nullptr) {
    build->Fail(impossible);
    return nullptr;
  }
  std::error_code ignored;
  const FileFaults faults;
  if (std::filesystem::exists(path, ignored) && !IsPyramidFile(path)) {
    const FileFault* const unread = faults.FirstOf(path);
    build->Fail(unread != nullptr ? unread->Text() : "is there, and no pyramid: it stays");
    return nullptr;
  }
  if (Find(path) != nullptr) {
    build->Fail("is being built");
    return nullptr;
  }
  if (!build->Open()) return nullptr;
  Registry::Get().Enter(path, build);
  return build;
}

Build::Build(const std::string& path, const Header& header)
    : path_(path),
      temporary_(platform::TemporaryPathBeside(path)),
      older_(platform::IdentifyFile(path)),
      header_(header) {}

bool Build::Open() {
  platform::RemoveAbandonedFiles(path_);
  order_.emplace(header_);
  std::string fault;
  file_ = RandomAccessFile::Create(temporary_, &fault);
  if (file_ == nullptr) return FailBy(fault);
  for (unsigned level = header_.levelMin; level <= header_.levelMax; ++level) {
    indices_[level].resize(header_.TileCount(level));
    missing_ += indices_[level].size();
  }
  return true;
}

Build::~Build() {
  if (!hasPlace_ && (file_ != nullptr || isComplete_)) std::remove(temporary_.c_str());
}

bool Build::Fail(const std::string& fault) const {
  SetFault(path_ + ": " + fault);
  return false;
}

/// Ends the build: sets a fault of the file, by the path that its user knows, now and later.
bool Build::FailBy(const std::string& fault) {
  isOver_ = true;
  fault_ = fault.starts_with(temporary_) ? path_ + fault.substr(temporary_.size()) : fault;
  SetFault(fault_);
  return false;
}

void Build::GiveUp(const std::string& fault) {
  const std::lock_guard lock(lock_);
  isOver_ = true;
  if (fault_.empty()) fault_ = fault;
}

bool Build::HasFailed() const {
  if (!isOver_ || hasPlace_) return false;
  const std::lock_guard lock(lock_);
  if (!fault_.empty()) SetFault(fault_);
  return true;
}

bool Build::Write(unsigned band, const PlainTiles& tiles, const void* writer) {
  const std::vector<TileToStore> packed = PackTiles(tiles, header_.compression);
  Run run{{tiles.shape.level, tiles.column, tiles.row, band}, {}, {}};
  for (const TileToStore& tile : packed) {
    run.tiles.push_back(tile.entry);
    for (const std::span<const unsigned char> part : {tile.pixels, tile.states}) {
      if (!part.empty()) run.pieces.push_back({part.data(), part.size()});
      run.bytes += part.size();
    }
  }
  return Take(run, writer);
}

/// True, with the fault set, when tiles can't be some of the file.
bool Build::FindMisfit(const PackedTileRow& row) const {
  const LevelShape shape = header_.Shape(row.level);
  const unsigned elementBytes = DataTypeBytes(header_.dataType);
  const bool isInside = header_.HasLevel(row.level) && row.row < shape.Rows() &&
                        row.band < header_.BandGroups() && row.column < shape.Columns() &&
                        !row.tiles.empty() && row.tiles.size() <= shape.Columns() - row.column;
  const PlainTiles plain{shape, row.row, row.column, 0, header_.Tiling().bands,
                         0,     nullptr, nullptr};
  std::uint64_t at = 0;
  bool fits = isInside;
  for (unsigned i = 0; fits && i < row.tiles.size(); ++i) {
    const StoredTile& tile = row.tiles[i];
    const std::uint64_t values = plain.ValuesOf(i);
    const std::uint64_t bytes = std::uint64_t{tile.pixelBytes} + tile.stateBytes;
    fits = bytes <= row.bytes.Count() - at &&
           MayUnpackTo(header_.compression, tile.pixelBytes, values * elementBytes) &&
           (tile.stateBytes == 0 || MayUnpackTo(header_.compression, tile.stateBytes, values)) &&
           Checksum(row.bytes.Get() + at, bytes) == tile.checksum;
    at += bytes;
  }
  if (!fits || at != row.bytes.Count()) Fail("packed tiles that can't be its own");
  return !fits || at != row.bytes.Count();
}

bool Build::Write(const PackedTileRow& row, const void* writer) {
  if (FindMisfit(row)) return false;
  return Take({{row.level, row.column, row.row, row.band},
               row.tiles,
               {{row.bytes.Get(), row.bytes.Count()}},
               row.bytes.Count()},
              writer);
}

TileEntry& Build::EntryOf(const TilePlace& first, unsigned index) {
  return indices_[first.level]
                 [header_.TileNumber(first.level, first.column + index, first.row, first.band)];
}

/// Writes tiles whose turn it is, and those that have waited for them; holds others.
bool Build::Take(const Run& run, const void* writer) {
  const std::lock_guard lock(lock_);
  writers_.insert(writer);
  if (isComplete_ || isOver_) return Fail("the pyramid is whole: it isn't written any more");
  for (unsigned i = 0; i < run.tiles.size(); ++i) {
    TileEntry& entry = EntryOf(run.first, i);
    if (entry.pixelBytes == 0) --missing_;
    entry = {entry.offset, run.tiles[i].pixelBytes, run.tiles[i].stateBytes, run.tiles[i].checksum};
  }
  const bool hasTurn =
      order_->IsAtEnd() || order_->Next() == run.first || EntryOf(run.first, 0).offset != 0;
  if (!hasTurn && heldBytes_ + run.bytes <= MostHeldBytes()) {
    Hold(run);
    return true;
  }
  if (!Append(run)) return false;
  while (!order_->IsAtEnd()) {
    if (EntryOf(order_->Next(), 0).offset != 0) {
      order_->Advance();
    } else if (!held_.contains(order_->Next())) {
      return true;
    } else if (!AppendHeld(order_->Next())) {
      return false;
    }
  }
  return true;
}

/// The bytes of tiles that may wait: some rows of each level, as far as one may run ahead of
/// another. Who writes in an order of his own gets that order.
std::uint64_t Build::MostHeldBytes() const {
  constexpr std::uint64_t kRows = 3, kLeast = 32 << 20;
  std::uint64_t bytes = kLeast;
  for (unsigned level = header_.levelMin; level <= header_.levelMax; ++level) {
    const LevelShape shape = header_.Shape(level);
    bytes += kRows * shape.width * shape.tileSide * header_.Tiling().bands *
             DataTypeBytes(header_.dataType);
  }
  return bytes;
}

void Build::Hold(const Run& run) {
  PackedTileRow& held = held_[run.first];
  heldBytes_ += run.bytes;
  heldBytes_ -= held.bytes.Count();
  held = {run.first.level, run.first.row, run.first.column, run.first.band, run.tiles, {}};
  held.bytes.Resize(run.bytes);
  unsigned char* to = held.bytes.Get();
  for (const platform::ConstFilePiece& piece : run.pieces) {
    to = std::copy_n(static_cast<const unsigned char*>(piece.data), piece.bytes, to);
  }
}

bool Build::AppendHeld(const TilePlace& first) {
  const auto at = held_.find(first);
  const PackedTileRow held = std::move(at->second);
  held_.erase(at);
  heldBytes_ -= held.bytes.Count();
  return Append({first, held.tiles, {{held.bytes.Get(), held.bytes.Count()}}, held.bytes.Count()});
}

/// Writes tiles at the end of the file.
bool Build::Append(const Run& run) {
  std::string fault;
  if (!file_->Write(end_, run.pieces, &fault)) return FailBy(fault);
  for (unsigned i = 0; i < run.tiles.size(); ++i) {
    const StoredTile& tile = run.tiles[i];
    EntryOf(run.first, i) = {end_, tile.pixelBytes, tile.stateBytes, tile.checksum};
    end_ += std::uint64_t{tile.pixelBytes} + tile.stateBytes;
  }
  return true;
}

bool Build::IsWhole() const {
  return missing_ == 0;
}

void Build::Leave(const void* self) {
  const std::lock_guard lock(lock_);
  if (self == beginner_) beginner_ = nullptr;
  if (writers_.erase(self) != 0) pastWriters_.insert(self);
}

bool Build::MayTakePlace(const void* self) const {
  const std::lock_guard lock(lock_);
  return (beginner_ == nullptr || beginner_ == self) &&
         std::ranges::all_of(writers_, [&](const void* writer) { return writer == self; });
}

bool Build::IsOfAnother(const void* self) const {
  const std::lock_guard lock(lock_);
  const auto isOther = [&](const void* writer) { return writer != self; };
  return std::ranges::any_of(writers_, isOther) || std::ranges::any_of(pastWriters_, isOther);
}

bool Build::Complete(const std::string& values) {
  const std::lock_guard lock(lock_);
  if (isComplete_) return true;
  if (!IsWhole()) return Fail("the levels are not whole yet");
  while (!held_.empty()) {
    if (!AppendHeld(held_.begin()->first)) return false;
  }
  Header header = header_;
  header.sequence = 0;
  std::string fault;
  const auto append = [&](const void* bytes, std::size_t count, Extent& extent) {
    extent = {end_, count, Checksum(bytes, count)};
    end_ += count;
    return file_->Write(extent.offset, bytes, count, &fault);
  };
  bool isWritten = true;
  for (unsigned level = header.levelMin; isWritten && level <= header.levelMax; ++level) {
    const std::vector<TileEntry>& index = indices_[level];
    isWritten = append(index.data(), index.size() * sizeof(TileEntry), header.levels[level]);
  }
  isWritten = isWritten && append(values.data(), values.size(), header.values) &&
              file_->SetSize(end_, &fault);  // without pixels nothing was written yet
  header.fileBytes = end_;
  const StoredHeader stored = Store(header);
  isWritten = isWritten && file_->Write(kHeaderPlaces[0], &stored, sizeof stored, &fault) &&
              file_->Close(&fault);
  if (!isWritten) return FailBy(fault);
  isComplete_ = true;
  file_.reset();
  for (std::vector<TileEntry>& index : indices_) index = {};
  return true;
}

bool Build::TakePlace() {
  const std::lock_guard guard(lock_);
  isOver_ = true;
  // The command fails then, whatever comes of it, and a failed one leaves the file that is there.
  if (memory_.WasShort()) return FailBy(path_ + ": " + platform::kOutOfMemory);
  std::string fault;
  const platform::FolderLock lock(path_);
  if (!lock.IsHeld(&fault)) return FailBy(fault);
  const platform::FileIdentity now = platform::IdentifyFile(path_);
  if (now.exists && !now.IsSameFile(older_)) {
    return FailBy(path_ + ": another program has built it meanwhile");
  }
  hasPlace_ = now.exists ? platform::RenameFile(temporary_, path_, &fault)
                         : platform::RenameToNew(temporary_, path_, &fault);
  return hasPlace_ || FailBy(fault);
}

}  // namespace lumo::pyramid
