#include "gdal_twins.h"

#include <algorithm>
#include <atomic>

#include "foundation/fault.h"
#include "gdal_types.h"
#include "tasks/crew.h"

namespace lumo::gdal {
namespace {

/// Each handle holds a file open, and the state of a codec.
constexpr unsigned kMostHandles = 16;

unsigned Handles() {
  return std::min(CrewSize(), kMostHandles);
}

bool IsJpeg2000(const Format& format) {
  return format.drivers.front().starts_with("JP2") || format.drivers.front() == "JPEG2000";
}

/// Whether blocks take longer to decode than to hand over to another thread, and stand alone.
bool IsCostly(const Format& format, const Source& source, GDALDatasetH dataset) {
  if (!source.isFile || Handles() < 2) return false;
  if (IsJpeg2000(format)) return true;
  return format.drivers.front() == "GTiff" &&
         GDALGetMetadataItem(dataset, "COMPRESSION", "IMAGE_STRUCTURE") != nullptr;
}

}  // namespace

/// A rectangle inside one block of the file, of all the bands that are wanted or of one.
struct Twins::Part {
  unsigned left, top, width, height;  // in pixels of the level
  unsigned band;                      // which of the wanted ones, or kAll
  bool isAhead = false;               // only to be decoded

  static constexpr unsigned kAll = ~0U;
};

Twins::Twins(const Format& format, const Source& source, GDALDatasetH dataset)
    : format_(format), source_(source), isUsed_(IsCostly(format, source, dataset)) {
  if (isUsed_) file_ = platform::IdentifyFile(source.name);
}

Twins::~Twins() = default;

/// Opens the handles. False when one of them doesn't open, or shows another raster.
bool Twins::Open(const OpenRaster& raster) {
  while (isUsed_ && others_.size() + 1 < Handles()) {
    auto other = OpenRaster::OpenTwin(format_, source_);
    isUsed_ =
        other != nullptr && other->IsAlike(raster) && platform::IdentifyFile(source_.name) == file_;
    if (isUsed_) others_.push_back(std::move(other));
  }
  if (isUsed_) return true;
  others_.clear();
  TakeFault();
  return false;
}

/// Cuts a block by the blocks of the file, and gives each handle its parts; nothing where there are
/// not two for two handles.
std::vector<std::vector<Twins::Part>> Twins::Cut(const OpenRaster& raster,
                                                 const BlockPlace& place) {
  std::vector<std::vector<Part>> parts(Handles());
  const RasterLevel& level = *raster.FindLevel(place.level);
  int blockWidth = 0, blockHeight = 0;
  GDALGetBlockSize(level.bands.front(), &blockWidth, &blockHeight);
  if (blockWidth < 1 || blockHeight < 1) return {};
  const auto width = static_cast<unsigned>(blockWidth), height = static_cast<unsigned>(blockHeight);
  const bool byBand =
      raster.Interleave() != Interleave::BIP && place.bands.GetCount() > 1 && !IsJpeg2000(format_);
  const std::uint64_t across = (level.samples + width - 1) / width;
  const unsigned right = place.left + place.width, bottom = place.top + place.height;
  std::uint64_t block = 0;
  unsigned count = 0;
  for (unsigned row = place.top / height; row <= (bottom - 1) / height; ++row) {
    const std::uint64_t top = std::uint64_t{row} * height;
    for (unsigned column = place.left / width; column <= (right - 1) / width; ++column, ++count) {
      const std::uint64_t left = std::uint64_t{column} * width;
      Part part{};
      part.left = static_cast<unsigned>(std::max<std::uint64_t>(left, place.left));
      part.top = static_cast<unsigned>(std::max<std::uint64_t>(top, place.top));
      part.width = static_cast<unsigned>(std::min<std::uint64_t>(left + width, right)) - part.left;
      part.height = static_cast<unsigned>(std::min<std::uint64_t>(top + height, bottom)) - part.top;
      part.band = Part::kAll;
      block = row * across + column;
      if (!byBand) {
        parts[block % parts.size()].push_back(part);
        continue;
      }
      for (part.band = 0; part.band < place.bands.GetCount(); ++part.band) {
        parts[(block + place.bands[part.band]) % parts.size()].push_back(part);
      }
    }
  }
  const bool looksAhead = count == 1 && IsJpeg2000(format_) && place.level == 0;
  if (looksAhead) {
    LookAhead(block, {width, height}, level, parts);
    if (aheadBlock_ > block) return parts;
  }
  const auto busy =
      std::count_if(parts.begin(), parts.end(), [](const auto& own) { return !own.empty(); });
  return busy > 1 ? std::move(parts) : std::vector<std::vector<Part>>();
}

/// Adds the blocks that follow one, where it follows one that was asked for.
void Twins::LookAhead(std::uint64_t block, const Size& size, const RasterLevel& level,
                      std::vector<std::vector<Part>>& parts) {
  const bool isNext = block == nextBlock_ || block + 1 == nextBlock_;
  nextBlock_ = block + 1;
  if (!isNext) aheadBlock_ = 0;
  if (!isNext || block < aheadBlock_) return;
  const std::uint64_t across = (level.samples + size.width - 1) / size.width;
  const std::uint64_t all = across * ((level.lines + size.height - 1) / size.height);
  aheadBlock_ = std::min(block + parts.size(), all);
  for (std::uint64_t next = block + 1; next < aheadBlock_; ++next) {
    const auto left = static_cast<unsigned>(next % across * size.width);
    const auto top = static_cast<unsigned>(next / across * size.height);
    parts[next % parts.size()].push_back({left, top, 1, 1, 0, true});
  }
}

/// Reads a part by a handle: to its place in the caller's memory, or only into GDAL's cache.
bool Twins::ReadPart(const OpenRaster& own, const BlockPlace& place, const Part& part,
                     void* pixels) {
  const bool isAll = part.band == Part::kAll;
  Array<unsigned> bands;
  if (isAll) {
    bands = place.bands;
  } else {
    bands = Array<unsigned>{ArrayDims(1)};
    bands[0] = place.bands[part.band];
  }
  const BlockPlace inner{part.left, part.top, part.width, part.height, bands, place.level};
  unsigned char pixel[16];  // of the largest type
  return part.isAhead ? own.ReadInto(inner, inner, 0, pixel)
                      : own.ReadInto(inner, place, isAll ? 0 : part.band, pixels);
}

bool Twins::Read(OpenRaster& raster, const BlockPlace& place, void* pixels) {
  constexpr std::uint64_t kLeastPixels = 16384;  // that are worth it
  if (!isUsed_ || std::uint64_t{place.width} * place.height < kLeastPixels) return false;
  const std::vector<std::vector<Part>> parts = Cut(raster, place);
  if (parts.empty() || !Open(raster)) return false;
  std::atomic<bool> isRead{true};
  RunByCrew(static_cast<unsigned>(parts.size()), [&](unsigned handle) {
    OpenRaster& own = handle == 0 ? raster : *others_[handle - 1];
    for (const Part& part : parts[handle]) {
      if (!isRead) return;
      if (!ReadPart(own, place, part, pixels)) isRead = false;
    }
    if (!isRead) TakeFault();
  });
  isUsed_ = isRead;
  return isRead;
}

}  // namespace lumo::gdal
