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
#include "raster/raster_enums.h"
#include "tasks/parallel.h"

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

constexpr unsigned char kMasks = PixelValueState::NotValid & ~PixelValueState::NoData;

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

std::uint64_t Build::TileValues(const TilePlace& place) const {
  const LevelShape shape = header_.Shape(place.level);
  return std::uint64_t{shape.ColumnWidth(place.column)} * shape.RowHeight(place.row) *
         header_.Tiling().bands;
}

/// A tile as it is to be stored: what was packed, else what was given.
struct Build::Packed {
  RawBytes pixels;
  RawBytes states;
  RawBytes maskStates;  // as they were given, less the bit of no data
  std::vector<platform::ConstFilePiece> pieces;
  TileEntry entry;
};

void Build::Pack(const TileRow& tiles, unsigned index, Packed& packed) const {
  TilePlace place = tiles.first;
  // The tiles in front are as wide as they come.
  const std::uint64_t before = index * TileValues(place);
  place.column += index;
  const std::uint64_t values = TileValues(place);
  const unsigned elementBytes = DataTypeBytes(header_.dataType);
  const auto add = [&](std::span<const unsigned char> plain, RawBytes& part) -> std::uint32_t {
    PackBytes(header_.compression, plain, part);
    const std::span<const unsigned char> stored = part.Count() != 0 ? part.All() : plain;
    packed.pieces.push_back({stored.data(), stored.size()});
    return static_cast<std::uint32_t>(stored.size());
  };
  packed.pieces.clear();
  packed.entry.pixelBytes =
      add({tiles.pixels + before * elementBytes, values * elementBytes}, packed.pixels);
  packed.entry.stateBytes = 0;
  const std::span<const unsigned char> states(tiles.states + before, values);
  if (std::ranges::any_of(states, [](unsigned char state) { return (state & kMasks) != 0; })) {
    packed.maskStates.Resize(values);
    std::ranges::transform(states, packed.maskStates.Get(),
                           [](unsigned char s) -> unsigned char { return s & kMasks; });
    packed.entry.stateBytes = add(packed.maskStates.All(), packed.states);
  }
  const platform::ConstFilePiece& first = packed.pieces.front();
  const platform::ConstFilePiece& last = packed.pieces.back();
  packed.entry.checksum = packed.pieces.size() == 1
                              ? Checksum(first.data, first.bytes)
                              : Checksum(first.data, first.bytes, last.data, last.bytes);
}

bool Build::Write(const TileRow& tiles, const void* writer) {
  const std::lock_guard lock(lock_);
  writers_.insert(writer);
  if (isComplete_ || isOver_) return Fail("the pyramid is whole: it isn't written any more");
  const TilePlace& first = tiles.first;
  std::vector<Packed> packed(tiles.columns);
  ParallelFor(tiles.columns, nullptr, [&](unsigned i) { Pack(tiles, i, packed[i]); });

  std::vector<platform::ConstFilePiece> pieces;
  std::uint64_t end = end_;
  for (Packed& tile : packed) {
    tile.entry.offset = end;
    for (const platform::ConstFilePiece& piece : tile.pieces) {
      pieces.push_back(piece);
      end += piece.bytes;
    }
  }
  std::string fault;
  if (!file_->Write(end_, pieces, &fault)) return FailBy(fault);
  end_ = end;
  for (unsigned i = 0; i < tiles.columns; ++i) {
    TileEntry& entry = indices_[first.level][header_.TileNumber(first.level, first.column + i,
                                                                first.row, first.band)];
    if (entry.offset == 0) --missing_;
    entry = packed[i].entry;
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
