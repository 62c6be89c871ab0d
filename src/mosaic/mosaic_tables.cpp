#include "mosaic/mosaic_tables.h"

#include <algorithm>
#include <cstring>

#include "foundation/fault.h"

namespace lumo {
namespace {

constexpr std::string_view kItemMark = "MOSAICLUTBASE51";
constexpr std::string_view kEntryMark = "MOSAICLUT51";

// A header with more of them is damaged: no file could hold their entries.
constexpr std::uint64_t kMostTables = std::uint64_t{1} << 40;

String ItemPath(const String& base) {
  return String(base.ToUTF8() + ".mlh");
}
String EntryPath(const String& base) {
  return String(base.ToUTF8() + ".mlt");
}

/// A buffer on a file that is there: opening one that isn't would make it.
template <typename E>
Buffer<E> OpenToRead(const String& path) {
  std::string fault;
  const auto access = platform::RandomAccessFile::Access::kRead;
  if (platform::RandomAccessFile::Open(path.ToUTF8(), access, &fault)) {
    return Buffer<E>(path, kMosaicTableBins, BasicBuffer::kReadOnly);
  }
  SetFault(String(fault));
  return Buffer<E>();
}

}  // namespace

namespace detail {

template <typename E>
LUTFile<E>::LUTFile(const String& path, unsigned scenes, unsigned bands, std::vector<unsigned> more,
                    std::string_view mark)
    : mark_(mark),
      counts_{scenes, bands},
      buffer_(path, ArrayDims(scenes, bands), kMosaicTableBins),
      isKnown_(true),
      isNew_(true) {
  counts_.insert(counts_.end(), more.begin(), more.end());
}

template <typename E>
LUTFile<E>::LUTFile(const String& path, unsigned moreCounts, std::string_view mark)
    : mark_(mark), counts_(2 + moreCounts), buffer_(OpenToRead<E>(path)) {
  const std::span<const unsigned char> header = buffer_.Header();
  const std::size_t bytes = counts_.size() * sizeof(unsigned);
  if (header.size() < mark.size() + bytes) return;
  isKnown_ = buffer_.GetErrorState().severity == kSeverityNone &&
             std::equal(mark.begin(), mark.end(), header.begin());
  if (isKnown_) {
    std::memcpy(counts_.data(), &header[mark.size()], bytes);
  } else {
    SetFault(path.ToUTF8() + ": is no whole file of tables");
  }
}

template <typename E>
bool LUTFile<E>::Close() {
  if (isNew_ && buffer_.IsValid()) {
    const std::span<unsigned char> header = buffer_.Header();
    std::copy(mark_.begin(), mark_.end(), header.begin());
    std::memcpy(&header[mark_.size()], counts_.data(), counts_.size() * sizeof(unsigned));
  }
  return buffer_.Close();
}

template class LUTFile<MosaicLUTItemBase>;
template class LUTFile<double>;

}  // namespace detail

using ItemFile = MosaicHistMatchingLUTBaseFile<MosaicLUTItemBase>;
using EntryFile = MosaicHistMatchingLUTFile<double>;

ItemFile::MosaicHistMatchingLUTBaseFile(const String& path, unsigned scenes, unsigned bands)
    : file_(path, scenes, bands, {}, kItemMark) {
  if (scenes != 0 && bands != 0) Ref(scenes - 1, bands - 1) = {};  // the file has its full length
}

ItemFile::MosaicHistMatchingLUTBaseFile(const String& path) : file_(path, 0, kItemMark) {}

const MosaicLUTItemBase& ItemFile::At(unsigned scene, unsigned band) {
  return file_.Elements().At(std::uint64_t{scene} * Bands() + band);
}

MosaicLUTItemBase& ItemFile::Ref(unsigned scene, unsigned band) {
  return file_.Elements().Ref(std::uint64_t{scene} * Bands() + band);
}

EntryFile::MosaicHistMatchingLUTFile(const String& path, unsigned scenes, unsigned bands)
    : file_(path, scenes, bands, {kMosaicTableBins}, kEntryMark) {
  if (scenes != 0 && bands != 0) Ref(scenes - 1, bands - 1, kMosaicTableBins - 1) = 0;
}

EntryFile::MosaicHistMatchingLUTFile(const String& path) : file_(path, 1, kEntryMark) {}

std::uint64_t EntryFile::PlaceOf(unsigned scene, unsigned band, unsigned bin) const {
  return (std::uint64_t{scene} * Bands() + band) * Bins() + bin;
}

const double& EntryFile::At(unsigned scene, unsigned band, unsigned bin) {
  return file_.Elements().At(PlaceOf(scene, band, bin));
}

double& EntryFile::Ref(unsigned scene, unsigned band, unsigned bin) {
  return file_.Elements().Ref(PlaceOf(scene, band, bin));
}

MosaicTableReader::MosaicTableReader(const String& base)
    : items_(ItemPath(base)), entries_(EntryPath(base)) {
  const bool isWhole = items_.IsValid() && entries_.IsValid();
  const bool fits = items_.Scenes() == entries_.Scenes() && items_.Bands() == entries_.Bands() &&
                    entries_.Bins() == kMosaicTableBins &&
                    std::uint64_t{items_.Scenes()} * items_.Bands() <= kMostTables;
  if (isWhole && !fits) SetFault(base.ToUTF8() + ".mlt: doesn't belong to the .mlh file beside it");
  if (!isWhole || !fits) SetErrorState(ObjectErrorIO());
}

bool MosaicTableReader::Read(unsigned scene, unsigned band, MosaicTable& table) {
  if (!IsValid() || scene >= Scenes() || band >= Bands()) return false;
  const MosaicLUTItemBase item = items_.At(scene, band);
  if (item.bins > kMosaicTableBins) {
    SetFault("a table of the mosaic has more entries than there may be");
    SetErrorState(ObjectErrorIO());
    return false;
  }
  table = {item.minimum, item.maximum, {}};
  table.entries.reserve(item.bins);
  for (unsigned bin = 0; bin < item.bins; ++bin) {
    table.entries.push_back(entries_.At(scene, band, bin));
  }
  if (items_.IsValid() && entries_.IsValid()) return true;
  SetErrorState(ObjectErrorIO());
  return false;
}

}  // namespace lumo
