#include "tiff_writer/tiff_directory.h"

#include <bit>
#include <cstring>
#include <map>
#include <optional>

#include "tiff_writer/tiff_tags.h"

namespace lumo::tiff {
namespace {

/// Places of blocks begin at multiples of this.
constexpr std::uint64_t kAlignment = 4096;

/// Where the values of a tag lie.
struct Entry {
  std::uint16_t type = 0;
  unsigned valueBytes = 0;  ///< 2, 4 or 8; 0 for what is no whole number
  std::uint64_t count = 0;
  std::uint64_t offset = 0;
};

unsigned BytesOfType(std::uint16_t type) {
  return type == 3 ? 2 : type == 4 ? 4 : type == 16 ? 8 : 0;  // SHORT, LONG, LONG8
}

/// Bytes of a value of any type; 0 for an unknown one.
unsigned BytesOfAnyType(std::uint16_t type) {
  static constexpr unsigned kBytes[] = {0, 1, 1, 2, 4, 8, 1, 1, 2, 4, 8, 4, 8, 4, 0, 0, 8, 8, 8};
  return type < std::size(kBytes) ? kBytes[type] : 0;
}

/// The first directory of a file.
class Directory {
 public:
  explicit Directory(platform::RandomAccessFile& file) : file_(file) {}

  /// Why a read or write of the file has failed; no text while none has.
  const std::string& Fault() const { return fault_; }

  bool Read() {
    struct {
      char order[2];
      std::uint16_t version;
      std::uint32_t offset;
      std::uint64_t bigOffset;
    } header;
    static_assert(sizeof header == 16);
    const char* const native = std::endian::native == std::endian::little ? "II" : "MM";
    if (!Get(0, &header, sizeof header) || std::memcmp(header.order, native, 2) != 0) {
      return false;
    }
    isBig_ = header.version == 43;
    if (!isBig_ && header.version != 42) return false;
    return ReadEntries(isBig_ ? header.bigOffset : header.offset);
  }

  /// The first value of a tag, or `absent`.
  std::uint64_t Value(Tag tag, std::uint64_t absent) const {
    const auto at = entries_.find(tag);
    std::uint64_t value = 0;
    if (at == entries_.end() || at->second.valueBytes == 0) return absent;
    return Get(at->second.offset, &value, at->second.valueBytes) ? value : absent;
  }

  /// All tags with their values.
  bool ReadAll(std::vector<TagValue>& tags) const {
    for (const auto& [tag, entry] : entries_) {
      TagValue value{tag, entry.type, entry.count, {}};
      value.bytes.resize(entry.count * BytesOfAnyType(entry.type));
      if (!Get(entry.offset, value.bytes.data(), value.bytes.size())) return false;
      tags.push_back(std::move(value));
    }
    return true;
  }

  bool Has(Tag tag) const { return entries_.contains(tag); }

  bool AreAll(Tag tag, std::uint64_t value, std::uint64_t count) const {
    const auto at = entries_.find(tag);
    if (at == entries_.end() || at->second.valueBytes == 0 || at->second.count != count) {
      return false;
    }
    const Entry& entry = at->second;
    std::vector<unsigned char> bytes(entry.count * entry.valueBytes);
    if (!Get(entry.offset, bytes.data(), bytes.size())) return false;
    for (std::size_t i = 0; i < bytes.size(); i += entry.valueBytes) {
      std::uint64_t found = 0;
      std::memcpy(&found, &bytes[i], entry.valueBytes);  // of this machine's order, little endian
      if (found != value) return false;
    }
    return true;
  }

  /// Bytes of one value of a tag.
  unsigned ValueBytes(Tag tag) const { return entries_.at(tag).valueBytes; }

  /// Sets all values of a tag.
  template <typename ValueOf>
  bool Set(Tag tag, const ValueOf& valueOf) {
    const Entry& entry = entries_.at(tag);
    std::vector<unsigned char> bytes(entry.count * entry.valueBytes);
    for (std::uint64_t i = 0; i < entry.count; ++i) {
      const std::uint64_t value = valueOf(i);
      std::memcpy(&bytes[i * entry.valueBytes], &value, entry.valueBytes);
    }
    return file_.Write(entry.offset, bytes.data(), bytes.size(), &fault_);
  }

 private:
  bool Get(std::uint64_t offset, void* to, std::size_t bytes) const {
    return file_.Read(offset, to, bytes, &fault_);
  }

  bool ReadEntries(std::uint64_t offset) {
    std::uint64_t count = 0;
    const unsigned countBytes = isBig_ ? 8 : 2;
    const unsigned entryBytes = isBig_ ? 20 : 12;
    constexpr std::uint64_t kMostEntries = 4096;
    if (!Get(offset, &count, countBytes) || count > kMostEntries) return false;
    std::vector<unsigned char> bytes(count * entryBytes);
    offset += countBytes;
    if (!Get(offset, bytes.data(), bytes.size())) return false;
    for (std::uint64_t i = 0; i < count; ++i) {
      ReadEntry(&bytes[i * entryBytes], offset + i * entryBytes);
    }
    return true;
  }

  void ReadEntry(const unsigned char* bytes, std::uint64_t offset) {
    std::uint16_t tag = 0, type = 0;
    const unsigned countBytes = isBig_ ? 8 : 4;
    Entry entry;
    std::memcpy(&tag, bytes, 2);
    std::memcpy(&type, bytes + 2, 2);
    std::memcpy(&entry.count, bytes + 4, countBytes);
    entry.valueBytes = BytesOfType(type);
    const unsigned inside = 4 + countBytes;
    constexpr std::uint64_t kMostValues = std::uint64_t{1} << 32;
    if (entry.count > kMostValues) return;
    entry.type = type;
    if (entry.count * BytesOfAnyType(type) <= countBytes) {
      entry.offset = offset + inside;
    } else {
      std::memcpy(&entry.offset, bytes + inside, countBytes);
    }
    entries_[tag] = entry;
  }

  platform::RandomAccessFile& file_;
  mutable std::string fault_;
  bool isBig_ = false;
  std::map<std::uint16_t, Entry> entries_;
};

/// Reads the sides of the blocks, and says whether all else is as the layout has it.
bool IsOfLayout(const Directory& directory, PlainLayout& layout) {
  layout.isTiled = directory.Has(kTileOffsets);
  const auto side = [&](Tag tag, unsigned absent) {
    return static_cast<unsigned>(directory.Value(tag, absent));
  };
  layout.blockWidth = layout.isTiled ? side(kTileWidth, 0) : layout.samples;
  layout.blockHeight = layout.isTiled ? side(kTileLength, 0)
                                      : std::min(side(kRowsPerStrip, layout.lines), layout.lines);
  constexpr unsigned kNoCompression = 1, kContiguous = 1, kSeparate = 2;
  const unsigned planes = layout.byPixel || layout.bands == 1 ? kContiguous : kSeparate;
  return layout.blockWidth != 0 && layout.blockHeight != 0 &&
         directory.Value(kImageWidth, 0) == layout.samples &&
         directory.Value(kImageLength, 0) == layout.lines &&
         directory.Value(kSamplesPerPixel, 1) == layout.bands &&
         directory.Value(kBitsPerSample, 1) == layout.element * 8 &&
         directory.Value(kCompression, kNoCompression) == kNoCompression &&
         directory.Value(kPlanarConfiguration, kContiguous) == planes;
}

}  // namespace

Placing PlaceBlocks(platform::RandomAccessFile& file, PlainLayout& layout, std::string& fault) {
  if constexpr (std::endian::native != std::endian::little) return Placing::kUnsuited;
  Directory directory(file);
  const auto fail = [&] {
    if (fault.empty()) fault = directory.Fault();
    return fault.empty() ? Placing::kUnsuited : Placing::kFailed;
  };
  std::uint64_t bytes = 0;
  if (!directory.Read() || !IsOfLayout(directory, layout) || !file.GetSize(bytes, &fault)) {
    return fail();
  }
  const Tag offsets = layout.isTiled ? kTileOffsets : kStripOffsets;
  const Tag counts = layout.isTiled ? kTileByteCounts : kStripByteCounts;
  if (!directory.AreAll(offsets, 0, layout.Blocks()) ||
      !directory.AreAll(counts, 0, layout.Blocks()) || !directory.Fault().empty()) {
    return fail();
  }
  layout.start = (bytes + kAlignment - 1) / kAlignment * kAlignment;
  const auto fits = [&](Tag tag, std::uint64_t most) {
    return directory.ValueBytes(tag) == 8 || most >> (8 * directory.ValueBytes(tag)) == 0;
  };
  if (!fits(offsets, layout.End()) || !fits(counts, layout.blockHeight * layout.RowBytes())) {
    return Placing::kUnsuited;
  }
  const bool isDone =
      file.SetSize(layout.End(), &fault) &&
      directory.Set(offsets, [&](std::uint64_t block) { return layout.OffsetOf(block); }) &&
      directory.Set(counts,
                    [&](std::uint64_t block) { return layout.LinesOf(block) * layout.RowBytes(); });
  return isDone ? Placing::kDone : fail();
}

bool ReadTags(platform::RandomAccessFile& file, std::vector<TagValue>& tags, std::string& fault) {
  Directory directory(file);
  tags.clear();
  if (directory.Read() && directory.ReadAll(tags)) return true;
  fault =
      directory.Fault().empty() ? file.Path() + ": its directory can't be read" : directory.Fault();
  return false;
}

}  // namespace lumo::tiff
