#include "tiff_writer/packed_pixels.h"

#include <algorithm>
#include <cstring>
#include <filesystem>

#include "foundation/fault.h"
#include "foundation/library.h"
#include "tasks/crew.h"
#include "tiff_writer/cog_file.h"
#include "tiff_writer/directory_writer.h"
#include "tiff_writer/tiff_tags.h"

namespace lumo::tiff {
namespace {

constexpr std::uint64_t kMostBlockBytes = std::uint64_t{1} << 30;
constexpr std::uint64_t kFourGigabytes = std::uint64_t{1} << 32;

}  // namespace

PackedPixels::PackedPixels(PackedRaster raster)
    : raster_(std::move(raster)),
      packing_(PackingOf(raster_.def, raster_.layout)),
      reducer_(raster_.def, raster_.layout.Depth(), raster_.hasAlpha),
      isCog_(raster_.def.creation.layout == FileLayout::kCog),
      open_(raster_.path, raster_.fill, raster_.layout.BlockBytes(0)) {
  MakeLevels();
  constexpr std::uint64_t kBatchBytes = 64 << 20;
  const auto cores = static_cast<std::uint64_t>(std::max(GetProcessingCores(), 1));
  batch_ = static_cast<std::size_t>(
      std::clamp(kBatchBytes / raster_.layout.BlockBytes(0), cores, 4 * cores));
}

std::unique_ptr<PackedPixels> PackedPixels::Begin(PackedRaster raster) {
  if (raster.layout.BlockBytes(0) > kMostBlockBytes) {
    Refuse(raster.path +
           ": a block with all bands would take more than 1 GiB; give smaller tiles, "
           "or the order by band");
    return nullptr;
  }
  std::unique_ptr<PackedPixels> made(new PackedPixels(std::move(raster)));
  return made->MakeFile() ? std::move(made) : nullptr;
}

bool PackedPixels::MakeFile() {
  std::string why;
  const auto description = platform::RandomAccessFile::Open(
      raster_.description, platform::RandomAccessFile::Access::kRead, &why);
  if (description == nullptr || !ReadTags(*description, tags_, why)) return Refuse(why);
  for (const TagValue& tag : tags_) {
    const bool isColors = tag.tag == kPhotometric && !tag.bytes.empty() && tag.bytes[0] == 2;
    if (isColors && packing_.compression == BlockCompression::kJpeg && packing_.depth == 3) {
      packing_.isYcc = true;
    }
  }
  const std::string folder = std::filesystem::path(raster_.path).parent_path().string();
  file_ = isCog_ ? platform::RandomAccessFile::CreateUnnamed(folder, &why)
                 : platform::RandomAccessFile::CreateOrEmpty(raster_.path, &why);
  return file_ != nullptr || FailOfFile(why);
}

void PackedPixels::MakeLevels() {
  const auto add = [this](const BlockLayout& layout) {
    PackedLevel level{layout, std::vector<PackedBlock>(layout.Blocks()), {}, {}};
    if (isCog_) level.masks.resize(layout.Blocks());
    if (!levels_.empty()) level.quarters.resize(layout.Blocks());
    levels_.push_back(std::move(level));
  };
  BlockLayout layout = raster_.layout;
  add(layout);
  if (!isCog_ || raster_.def.creation.overviews == OverviewMethod::kNone) return;
  while (layout.samples > layout.blockWidth || layout.lines > layout.blockHeight) {
    layout.samples = (layout.samples - 1) / 2 + 1;
    layout.lines = (layout.lines - 1) / 2 + 1;
    add(layout);
  }
}

/// Gets the pixels of a block that was packed before.
bool PackedPixels::Unpacked(unsigned level, std::uint64_t block,
                            std::vector<unsigned char>& pixels) {
  const BlockLayout& layout = levels_[level].layout;
  const PackedBlock& placed = levels_[level].blocks[block];
  if (placed.offset == PackedBlock::kFill) {
    pixels = Repeated(raster_.fill, layout.BlockBytes(block));
    return true;
  }
  std::vector<unsigned char> packed(placed.bytes);
  pixels.resize(layout.BlockBytes(block));
  std::string why;
  return (file_->Read(placed.offset, packed.data(), packed.size(), &why) &&
          Unpack(packing_, layout.blockWidth, layout.LinesOf(block), packed, pixels.data(), why)) ||
         FailOfFile(why);
}

/// Gets a block that is being filled; one that was packed before is taken up again.
OpenBlock* PackedPixels::TakeUp(unsigned level, std::uint64_t block, bool toChange) {
  OpenBlock* open = open_.Find(level, block);
  if (open == nullptr) {
    PackedLevel& of = levels_[level];
    const bool wasPlaced = of.blocks[block].offset != 0;
    if (!wasPlaced) {
      open = open_.Open(level, block, of.layout.BlockBytes(block));
    } else {
      std::vector<unsigned char> pixels;
      if (!Unpacked(level, block, pixels)) return nullptr;
      open = open_.OpenWith(level, block, std::move(pixels));
    }
    if (open == nullptr) return nullptr;
    open->wasPlaced = wasPlaced;
    if (wasPlaced && level > 0 && of.masks[block].offset != 0) {
      std::vector<unsigned char> packed(of.masks[block].bytes);
      const std::size_t row = MaskPacking().RowBytes(of.layout.blockWidth);
      std::vector<unsigned char> bits(row * of.layout.blockHeight);
      std::string why;
      if (!file_->Read(of.masks[block].offset, packed.data(), packed.size(), &why) ||
          !Unpack(MaskPacking(), of.layout.blockWidth, of.layout.blockHeight, packed, bits.data(),
                  why)) {
        FailOfFile(why);
        return nullptr;
      }
      const unsigned width = of.layout.InnerWidth(block), height = of.layout.InnerHeight(block);
      open->excluded.resize(std::size_t{width} * height);
      for (unsigned y = 0; y < height; ++y) {
        for (unsigned x = 0; x < width; ++x) {
          const bool isValid = (bits[y * row + x / 8] & (0x80U >> (x % 8))) != 0;
          open->excluded[std::size_t{y} * width + x] = isValid ? 0 : 1;
        }
      }
    }
  }
  open->isChanged = open->isChanged || toChange;
  return open;
}

bool PackedPixels::Write(const BlockPlace& place, const void* pixels) {
  return ForRuns(raster_.layout, place, [&](const BlockRun& run) {
    return WriteRun(run, place, static_cast<const unsigned char*>(pixels) + run.memory);
  });
}

bool PackedPixels::Read(const BlockPlace& place, void* pixels) {
  return ForRuns(raster_.layout, place, [&](const BlockRun& run) {
    return ReadRun(run, place, static_cast<unsigned char*>(pixels) + run.memory);
  });
}

bool PackedPixels::WriteRun(const BlockRun& run, const BlockPlace& place,
                            const unsigned char* pixels) {
  const BlockLayout& layout = raster_.layout;
  OpenBlock* const open = TakeUp(0, run.block, true);
  if (open == nullptr) return false;
  const MemoryStrides strides(layout, place);
  const std::size_t bytes = run.width * layout.PixelBytes();
  const bool isWhole = HasAllBands(layout, place);
  for (unsigned y = 0; y < run.height; ++y) {
    const std::uint64_t at = (run.top + y) * layout.RowBytes() + run.left * layout.PixelBytes();
    const unsigned char* const row = pixels + y * strides.line;
    if (isWhole) {
      if (!open_.Write(*open, at, row, bytes)) return false;
      continue;
    }
    scratch_.resize(bytes);
    if (!open_.Read(*open, at, scratch_.data(), bytes)) return false;
    CarryBands<true>(layout, place, run.width, scratch_.data(), row);
    if (!open_.Write(*open, at, scratch_.data(), bytes)) return false;
  }
  const std::uint64_t depth = layout.byPixel ? place.bands.GetCount() : 1;
  open->written += std::uint64_t{run.width} * run.height * depth;
  const std::uint64_t all =
      std::uint64_t{layout.InnerWidth(run.block)} * layout.InnerHeight(run.block) * layout.Depth();
  if (open->written >= all) Queue(0, run.block, *open);
  return PackQueued(false);
}

bool PackedPixels::ReadRun(const BlockRun& run, const BlockPlace& place, unsigned char* pixels) {
  const BlockLayout& layout = raster_.layout;
  OpenBlock* const open = TakeUp(0, run.block, false);
  if (open == nullptr) return false;
  const MemoryStrides strides(layout, place);
  const std::size_t bytes = run.width * layout.PixelBytes();
  const bool isWhole = HasAllBands(layout, place);
  scratch_.resize(bytes);
  for (unsigned y = 0; y < run.height; ++y) {
    const std::uint64_t at = (run.top + y) * layout.RowBytes() + run.left * layout.PixelBytes();
    unsigned char* const row = pixels + y * strides.line;
    if (!open_.Read(*open, at, isWhole ? row : scratch_.data(), bytes)) return false;
    if (!isWhole) CarryBands<false>(layout, place, run.width, scratch_.data(), row);
  }
  return true;
}

void PackedPixels::Queue(unsigned level, std::uint64_t block, OpenBlock& open) {
  if (open.isQueued) return;
  open.isQueued = true;
  queue_.emplace_back(level, block);
}

/// Packs blocks that wait, as many at a time as keep all threads busy.
/// @param all  also the last ones, which are fewer.
bool PackedPixels::PackQueued(bool all) {
  while (!queue_.empty() && (all || queue_.size() >= batch_)) {
    std::vector<BlockWork> batch;
    for (; !queue_.empty() && batch.size() < batch_; queue_.pop_front()) {
      BlockWork work;
      std::tie(work.level, work.block) = queue_.front();
      work.open = open_.Find(work.level, work.block);
      if (!Prepare(work)) return false;
      batch.push_back(std::move(work));
    }
    if (!PackBatch(batch)) return false;
  }
  return true;
}

/// Packs prepared blocks by all threads, and stores them in their order.
bool PackedPixels::PackBatch(std::vector<BlockWork>& batch) {
  // The engine's threads wait for this one, or are at other stages.
  RunByCrew(static_cast<unsigned>(batch.size()), [&](unsigned i) {
    BlockWork& work = batch[i];
    const auto levels = !isCog_                            ? BlockWork::Levels::kNone
                        : work.level + 1 == levels_.size() ? BlockWork::Levels::kLast
                                                           : BlockWork::Levels::kMore;
    work.Run(packing_, reducer_, raster_.fill, levels_[work.level].layout, levels);
  });
  return std::all_of(batch.begin(), batch.end(), [this](BlockWork& work) { return Store(work); });
}

/// Does what has to be done by one thread before a block is packed.
bool PackedPixels::Prepare(BlockWork& work) {
  const BlockLayout& layout = levels_[work.level].layout;
  work.width = layout.InnerWidth(work.block);
  work.height = layout.InnerHeight(work.block);
  if (!open_.Load(*work.open, layout.BlockBytes(work.block))) return false;
  if (!isCog_ || work.level != 0) return true;
  const Array<unsigned> none;
  const BlockPlace place{layout.ColumnOf(work.block) * layout.blockWidth,
                         layout.RowOf(work.block) * layout.blockHeight,
                         work.width,
                         work.height,
                         none,
                         0};
  return raster_.getExcluded(place, work.open->excluded);
}

/// Writes a packed block, gives its quarter to the level above and lets it go.
bool PackedPixels::Store(BlockWork& work) {
  if (!work.why.empty()) return Refuse(raster_.path + ": " + work.why);
  PackedLevel& level = levels_[work.level];
  PackedBlock& placed = level.blocks[work.block];
  if (work.level == 0 && !work.open->excluded.empty()) hasExcluded_ = true;
  if (work.isFill && isCog_) {
    placed = {PackedBlock::kFill, 0};
  } else if (work.isFill) {
    if (!GetFill(level.layout.LinesOf(work.block), work.packed)) return false;
    if (!Append(work.packed, placed)) return false;
  } else if (!Append(work.packed, placed)) {
    return false;
  }
  if (isCog_) {
    level.masks[work.block] = {};
    if (!work.packedMask.empty() && !Append(work.packedMask, level.masks[work.block])) return false;
  }
  if (work.level + 1 < levels_.size() && !GiveToLevelAbove(work)) return false;
  open_.Close(work.level, work.block);
  return true;
}

/// Sets the fault of the file that takes the blocks.
bool PackedPixels::FailOfFile(const std::string& why) const {
  return Refuse(isCog_ ? FaultOfUnnamed(raster_.path, why) : why);
}

bool PackedPixels::FailOfSize() const {
  return Refuse(raster_.path +
                ": takes 4 GiB or more, which is too much for a file that is no BigTIFF");
}

bool PackedPixels::Append(const std::vector<unsigned char>& packed, PackedBlock& block) {
  std::string why;
  const bool isFull = !isCog_ && raster_.def.creation.bigTiff == BigTiffChoice::kNo &&
                      end_ + packed.size() >= kFourGigabytes;
  if (isFull) return FailOfSize();
  if (!file_->Write(end_, packed.data(), packed.size(), &why)) return FailOfFile(why);
  block = {end_, static_cast<std::uint32_t>(packed.size())};
  end_ += packed.size() + packed.size() % 2;
  return true;
}

bool PackedPixels::GiveToLevelAbove(const BlockWork& work) {
  const BlockLayout& below = levels_[work.level].layout;
  const unsigned level = work.level + 1;
  PackedLevel& above = levels_[level];
  const BlockLayout& layout = above.layout;
  const unsigned column = below.ColumnOf(work.block), row = below.RowOf(work.block);
  const std::uint64_t plane = work.block / below.PlaneBlocks();
  const std::uint64_t block =
      plane * layout.PlaneBlocks() + std::uint64_t{row / 2} * layout.Columns() + column / 2;
  // A block of nothing but the fill value is that before anything is given to it.
  const bool isNeeded =
      !work.isFill || open_.Find(level, block) != nullptr || above.blocks[block].offset != 0;
  if (isNeeded) {
    OpenBlock* const open = TakeUp(level, block, true);
    if (open == nullptr) return false;
    const unsigned left = column % 2 * (layout.blockWidth / 2);
    const unsigned top = row % 2 * (layout.blockHeight / 2);
    const unsigned width = (work.width + 1) / 2, height = (work.height + 1) / 2;
    const std::size_t bytes = width * layout.PixelBytes();
    for (unsigned y = 0; y < height; ++y) {
      const std::uint64_t at = (top + y) * layout.RowBytes() + left * layout.PixelBytes();
      if (!open_.Write(*open, at, &work.reduced[y * bytes], bytes)) return false;
    }
    const unsigned inner = layout.InnerWidth(block);
    if (!work.reducedExcluded.empty() && open->excluded.empty()) {
      open->excluded.resize(std::size_t{inner} * layout.InnerHeight(block));
    }
    for (unsigned y = 0; !open->excluded.empty() && y < height; ++y) {
      unsigned char* const to = &open->excluded[std::size_t{top + y} * inner + left];
      if (work.reducedExcluded.empty()) {
        std::memset(to, 0, width);
      } else {
        std::memcpy(to, &work.reducedExcluded[std::size_t{y} * width], width);
      }
    }
  }
  above.quarters[block] =
      static_cast<unsigned char>(above.quarters[block] | 1U << (row % 2 * 2 + column % 2));
  NoteQuarter(level, block);
  return true;
}

/// Queues a block all of whose quarters are there. One that was packed before waits for the end.
void PackedPixels::NoteQuarter(unsigned level, std::uint64_t block) {
  const BlockLayout& layout = levels_[level].layout;
  const BlockLayout& below = levels_[level - 1].layout;
  const unsigned column = 2 * layout.ColumnOf(block), row = 2 * layout.RowOf(block);
  unsigned all = 1;
  if (column + 1 < below.Columns()) all |= 2;
  if (row + 1 < below.Rows()) all |= 4;
  if (column + 1 < below.Columns() && row + 1 < below.Rows()) all |= 8;
  OpenBlock* const open = open_.Find(level, block);
  if (levels_[level].quarters[block] != all || open == nullptr || open->wasPlaced) return;
  Queue(level, block, *open);
}

bool PackedPixels::TakeRows(const RowsFiles& rows, bool& taken) {
  taken = false;
  const std::unique_ptr<PackedRows> files = rows.walkWidth != 0 && rows.walkHeight != 0
                                                ? PackedRows::Find(rows, raster_.layout, packing_)
                                                : nullptr;
  if (files == nullptr) return true;
  const BlockLayout& layout = raster_.layout;
  Array<unsigned> bands(ArrayDims(layout.bands));
  for (unsigned band = 0; band < layout.bands; ++band) bands[band] = band;
  std::vector<std::uint64_t> written(layout.Blocks());
  std::vector<std::uint64_t> blocks;
  std::uint64_t count = 0;
  const auto take = [&] {
    count += blocks.size();
    const double done = static_cast<double>(count) / static_cast<double>(layout.Blocks());
    return TakeBlocks(*files, blocks) && (rows.watch == nullptr || rows.watch->Report(done));
  };
  const auto note = [&](const BlockRun& run) {
    written[run.block] += std::uint64_t{run.width} * run.height;
    const std::uint64_t all =
        std::uint64_t{layout.InnerWidth(run.block)} * layout.InnerHeight(run.block);
    if (written[run.block] == all) blocks.push_back(run.block);
    return blocks.size() < batch_ || take();
  };
  for (unsigned top = 0; top < layout.lines; top += std::min(rows.walkHeight, layout.lines - top)) {
    const unsigned height = std::min(rows.walkHeight, layout.lines - top);
    for (unsigned left = 0; left < layout.samples;
         left += std::min(rows.walkWidth, layout.samples - left)) {
      const unsigned width = std::min(rows.walkWidth, layout.samples - left);
      if (!ForRuns(layout, {left, top, width, height, bands, 0}, note)) return false;
    }
  }
  taken = true;
  return take();
}

/// Places packed blocks, and forgets their numbers; of a file with levels these get what belongs to
/// them.
bool PackedPixels::TakeBlocks(PackedRows& rows, std::vector<std::uint64_t>& blocks) {
  std::vector<BlockWork> batch;
  for (const std::uint64_t block : blocks) {
    BlockWork work;
    work.level = 0;
    work.block = block;
    work.isTaken = true;
    if (!rows.Read(block, work.packed)) return false;
    if (isCog_) {
      batch.push_back(std::move(work));
    } else if (!Append(work.packed, levels_[0].blocks[block])) {
      return false;
    }
  }
  blocks.clear();
  std::vector<std::vector<unsigned char>> pixels(batch.size());
  RunByCrew(static_cast<unsigned>(batch.size()), [&](unsigned i) {
    const BlockLayout& layout = raster_.layout;
    pixels[i].resize(layout.BlockBytes(batch[i].block));
    if (!Unpack(packing_, layout.blockWidth, layout.LinesOf(batch[i].block), batch[i].packed,
                pixels[i].data(), batch[i].why) &&
        batch[i].why.empty()) {
      batch[i].why = "a block can't be unpacked";
    }
  });
  for (std::size_t i = 0; i < batch.size(); ++i) {
    batch[i].open = open_.OpenWith(0, batch[i].block, std::move(pixels[i]));
    if (batch[i].open == nullptr) return false;
    batch[i].open->isChanged = true;
  }
  for (BlockWork& work : batch) {
    if (!work.why.empty()) return Refuse(raster_.path + ": " + work.why);
    if (!Prepare(work)) return false;
  }
  return PackBatch(batch) && PackQueued(false);
}

/// Packs what is left, from the raster up, since each level gives to the one above.
bool PackedPixels::PackRest() {
  if (!PackQueued(true)) return false;
  for (unsigned level = 0; level < levels_.size(); ++level) {
    for (const std::uint64_t block : open_.Changed(level)) {
      Queue(level, block, *open_.Find(level, block));
      if (!PackQueued(false)) return false;
    }
    if (!PackQueued(true)) return false;
  }
  return true;
}

/// Gets the packed form of a block of nothing but the fill value.
bool PackedPixels::GetFill(unsigned lines, std::vector<unsigned char>& packed) {
  std::vector<unsigned char>& fill = fills_[lines];
  const BlockLayout& layout = raster_.layout;
  std::string why;
  if (fill.empty()) {
    const auto pixels = Repeated(raster_.fill, lines * layout.RowBytes());
    if (!Pack(packing_, layout.blockWidth, lines, pixels.data(), fill, why)) {
      return Refuse(raster_.path + ": " + why);
    }
  }
  packed = fill;
  return true;
}

/// Each block that nobody has written gets bytes of its own, since many readers know no files with
/// gaps, and one that changes a block in place would change all that share its bytes.
bool PackedPixels::WriteUntouched() {
  std::vector<unsigned char> packed;
  PackedLevel& level = levels_[0];
  for (std::uint64_t block = 0; block < level.blocks.size(); ++block) {
    if (level.blocks[block].offset != 0) continue;
    if (!GetFill(level.layout.LinesOf(block), packed)) return false;
    if (!Append(packed, level.blocks[block])) return false;
  }
  return true;
}

/// Puts the directory behind the blocks of a file without levels, and the header in front.
bool PackedPixels::WriteDirectory() {
  std::vector<std::uint64_t> offsets;
  std::vector<std::uint32_t> counts;
  for (const PackedBlock& block : levels_[0].blocks) {
    offsets.push_back(block.offset);
    counts.push_back(block.bytes);
  }
  const auto make = [&](bool isBig) {
    DirectoryWriter directory(isBig);
    for (const TagValue& tag : tags_) directory.Set(tag);
    SetBlockTags(directory, raster_.layout, packing_, offsets, counts);
    return directory;
  };
  const BigTiffChoice wanted = raster_.def.creation.bigTiff;
  const bool isLarge = end_ + make(false).Bytes() >= kFourGigabytes;
  if (isLarge && wanted == BigTiffChoice::kNo) return FailOfSize();
  const bool isBig = isLarge || wanted == BigTiffChoice::kYes;
  std::vector<unsigned char> bytes;
  make(isBig).AppendTo(bytes, end_, 0);
  const std::vector<unsigned char> header = FileHeader(isBig, end_);
  std::string why;
  return (file_->Write(end_, bytes.data(), bytes.size(), &why) &&
          file_->Write(0, header.data(), header.size(), &why) && file_->Close(&why)) ||
         Refuse(why);
}

bool PackedPixels::Finish() {
  std::string why;
  // The description holds whatever was told of the raster since it was begun.
  const auto description = platform::RandomAccessFile::Open(
      raster_.description, platform::RandomAccessFile::Access::kRead, &why);
  if (description == nullptr || !ReadTags(*description, tags_, why)) return Refuse(why);
  if (!PackRest()) return false;
  if (!isCog_) return WriteUntouched() && WriteDirectory();
  CogParts parts{*file_,
                 levels_,
                 tags_,
                 packing_,
                 {},
                 hasExcluded_,
                 {},
                 {},
                 raster_.isFillNoData,
                 raster_.def.creation.bigTiff};
  const BlockLayout& layout = raster_.layout;
  const auto all = MaskBits(layout, layout.blockWidth, layout.blockHeight, {});
  const std::vector<unsigned char> none(all.size());
  if (!GetFill(layout.blockHeight, parts.fill)) return false;
  if (!Pack(MaskPacking(), layout.blockWidth, layout.blockHeight, all.data(), parts.allValid,
            why) ||
      !Pack(MaskPacking(), layout.blockWidth, layout.blockHeight, none.data(), parts.noneValid,
            why)) {
    return Refuse(raster_.path + ": " + why);
  }
  return WriteCog(raster_.path, parts);
}

}  // namespace lumo::tiff
