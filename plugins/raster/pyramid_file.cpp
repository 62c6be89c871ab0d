#include "pyramid_file.h"

#include "foundation/fault.h"
#include "foundation/file_faults.h"
#include "platform/folder_lock.h"
#include "raster/pixel_types.h"

namespace lumo::pyramid {

using platform::RandomAccessFile;

bool ReadHeader(const RandomAccessFile& file, Header& header, std::string& fault) {
  std::uint64_t fileBytes = 0;
  if (!file.GetSize(fileBytes, &fault)) return false;
  bool isFound = false;
  std::string firstFault;
  for (const std::uint64_t place : kHeaderPlaces) {
    StoredHeader stored{};
    Header found;
    std::string why = "isn't a whole pyramid";
    const bool hasRoom = place + sizeof stored <= fileBytes;
    // The other one may be older: what can't be read is not passed over.
    if (hasRoom && !file.Read(place, &stored, sizeof stored, &fault)) return false;
    const bool isThere = hasRoom && Load(stored, fileBytes, found, why);
    if (isThere && (!isFound || found.sequence > header.sequence)) header = found;
    isFound = isFound || isThere;
    if (firstFault.empty()) firstFault = why;
  }
  if (!isFound) fault = file.Path() + ": " + firstFault;
  return isFound;
}

std::unique_ptr<PyramidFile> PyramidFile::Open(const std::string& path) {
  std::string fault;
  auto opened = RandomAccessFile::Open(path, RandomAccessFile::Access::kRead, &fault);
  if (opened == nullptr) {
    SetFault(fault);
    return nullptr;
  }
  std::unique_ptr<PyramidFile> file(new PyramidFile(std::move(opened)));
  return file->LoadHeader() ? std::move(file) : nullptr;
}

bool PyramidFile::LoadHeader() {
  std::string fault;
  if (!ReadHeader(*file_, header_, fault)) {
    SetFault(fault);
    return false;
  }
  values_.resize(header_.values.bytes);
  return ReadExtent(header_.values, values_.data(), "the values of its bands are damaged");
}

bool PyramidFile::IsCurrent() const {
  if (!file_->HasName()) return false;
  Header now;
  std::string fault;
  return ReadHeader(*file_, now, fault) && now.sequence == header_.sequence;
}

bool PyramidFile::Fail(const std::string& fault) const {
  SetFault(file_->Path() + ": " + fault);
  return false;
}

/// Reads what an extent has, and checks it.
bool PyramidFile::ReadExtent(const Extent& extent, void* bytes, const char* what) const {
  std::string fault;
  if (!file_->Read(extent.offset, bytes, extent.bytes, &fault)) {
    SetFault(fault);
    return false;
  }
  return Checksum(bytes, extent.bytes) == extent.checksum || Fail(what);
}

bool PyramidFile::LoadIndex(unsigned level) {
  if (!header_.HasLevel(level)) {
    return Fail("level " + std::to_string(level) + " isn't stored, only " +
                std::to_string(header_.levelMin) + " to " + std::to_string(header_.levelMax));
  }
  std::vector<TileEntry>& index = indices_[level];
  const std::uint64_t count = header_.TileCount(level);
  if (index.size() == count) return true;
  index.resize(count);
  if (ReadExtent(header_.levels[level], index.data(), "the index of a level is damaged")) {
    return true;
  }
  index.clear();
  return false;
}

bool PyramidFile::ReadTile(const TilePlace& place, Tile& tile, std::string& fault) const {
  const auto fail = [&](const char* why) {
    fault = file_->Path() + ": level " + std::to_string(place.level) + ", tile " +
            std::to_string(place.column) + " " + std::to_string(place.row) + ": " + why;
    return false;
  };
  const LevelShape shape = header_.Shape(place.level);
  tile.width = shape.ColumnWidth(place.column);
  tile.height = shape.RowHeight(place.row);
  tile.bands = header_.Tiling().bands;
  const std::uint64_t values = std::uint64_t{tile.width} * tile.height * tile.bands;
  const std::uint64_t pixelBytes = values * DataTypeBytes(header_.dataType);
  const TileEntry& entry =
      indices_[place.level][header_.TileNumber(place.level, place.column, place.row, place.band)];
  const std::uint64_t stored = std::uint64_t{entry.pixelBytes} + entry.stateBytes;
  if (entry.offset < kDataBegin || entry.offset > header_.fileBytes ||
      stored > header_.fileBytes - entry.offset) {
    return fail("lies outside of the file");
  }
  if (!MayUnpackTo(header_.compression, entry.pixelBytes, pixelBytes) ||
      (entry.stateBytes != 0 && !MayUnpackTo(header_.compression, entry.stateBytes, values))) {
    return fail("has another size than it should");
  }
  tile.pixels.Resize(pixelBytes);
  tile.states.Resize(entry.stateBytes != 0 ? values : 0);

  const bool isPlain = entry.pixelBytes == pixelBytes && entry.stateBytes == 0;
  RawBytes packed;
  if (!isPlain) packed.Resize(stored);
  unsigned char* const into = isPlain ? tile.pixels.Get() : packed.Get();
  if (!file_->Read(entry.offset, into, stored, &fault)) return false;
  if (Checksum(into, stored) != entry.checksum) return fail("is damaged");
  if (isPlain) return true;
  const bool isWhole =
      UnpackBytes({into, entry.pixelBytes}, tile.pixels.All()) &&
      (entry.stateBytes == 0 ||
       UnpackBytes({into + entry.pixelBytes, entry.stateBytes}, tile.states.All()));
  return isWhole || fail("can't be unpacked");
}

namespace {

/// Writes the text of the values, and a header that names it, into an open file. What stands there
/// counts until the header does.
bool WriteValues(RandomAccessFile& file, const Header& before, const std::string& text,
                 std::string& fault) {
  Header header = before;
  header.sequence = before.sequence + 1;
  header.values = {before.fileBytes, text.size(), Checksum(text.data(), text.size())};
  header.fileBytes = header.values.offset + text.size();
  const StoredHeader stored = Store(header);
  const std::uint64_t place = kHeaderPlaces[header.sequence % std::size(kHeaderPlaces)];
  return file.Write(header.values.offset, text.data(), text.size(), &fault) &&
         file.Write(place, &stored, sizeof stored, &fault);
}

}  // namespace

bool ChangeValues(
    const std::string& path,
    const std::function<bool(const std::string& before, std::string& after)>& change) {
  std::string fault;
  const platform::FolderLock lock(path);
  if (!lock.IsHeld(&fault)) {
    SetFault(fault);
    return false;
  }
  const auto file = RandomAccessFile::Open(path, RandomAccessFile::Access::kUpdate, &fault);
  Header header;
  if (file == nullptr || !ReadHeader(*file, header, fault)) {
    SetFault(fault);
    return false;
  }
  std::string before(header.values.bytes, '\0'), after;
  if (!file->Read(header.values.offset, before.data(), before.size(), &fault)) {
    SetFault(fault);
    return false;
  }
  if (Checksum(before.data(), before.size()) != header.values.checksum) before.clear();
  if (!change(before, after)) return false;
  std::uint64_t bytes = 0;
  if (after == before) return true;
  if (file->GetSize(bytes, &fault) && WriteValues(*file, header, after, fault)) return true;
  if (bytes != 0) file->SetSize(bytes);  // what stands there has not changed
  SetFault(fault);
  return false;
}

bool IsPyramidFile(const std::string& path) {
  const auto file = RandomAccessFile::Open(path, RandomAccessFile::Access::kRead);
  StoredHeader stored{};
  std::size_t bytes = 0;
  if (file == nullptr || !file->ReadUpTo(0, stored.magic, sizeof stored.magic, bytes)) {
    FileFaults::NoteUnread(path);
    return false;
  }
  return bytes == sizeof stored.magic && HasMagic(stored);
}

}  // namespace lumo::pyramid
