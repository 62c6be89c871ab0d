#include "tiff_writer/cog_file.h"

#include <cstring>

#include <fmt/format.h>

#include "foundation/fault.h"
#include "tiff_writer/tiff_tags.h"

namespace lumo::tiff {
namespace {

constexpr std::uint64_t kEdge = 4;  // bytes in front of a block, and behind it
constexpr std::uint32_t kReduced = 1, kMask = 4;
constexpr std::uint64_t kFourGigabytes = std::uint64_t{1} << 32;

/// The tags of the raster that its levels have too.
bool IsOfLevels(std::uint16_t tag) {
  static constexpr std::uint16_t kTags[] = {kBitsPerSample,       kPhotometric, kSamplesPerPixel,
                                            kPlanarConfiguration, kColorMap,    kExtraSamples,
                                            kSampleFormat,        kNoData};
  return std::find(std::begin(kTags), std::end(kTags), tag) != std::end(kTags);
}

/// Of the text in front of the directories. A reader that doesn't know it passes over it.
std::string StructureText() {
  const std::string text =
      "LAYOUT=IFDS_BEFORE_DATA\n"
      "BLOCK_ORDER=ROW_MAJOR\n"
      "BLOCK_LEADER=SIZE_AS_UINT4\n"
      "BLOCK_TRAILER=LAST_4_BYTES_REPEATED\n"
      "KNOWN_INCOMPATIBLE_EDITION=NO\n ";  // the blank is for who edits the file and writes YES
  return fmt::format("GDAL_STRUCTURAL_METADATA_SIZE={:06} bytes\n{}", text.size(), text);
}

/// One image of the file: a level, or the mask of one.
struct Image {
  const PackedLevel* level;
  bool isMask;
  std::uint32_t kind;  ///< of tag 254
  std::vector<std::uint64_t> offsets;
  std::vector<std::uint32_t> counts;
};

class CogWriter {
 public:
  explicit CogWriter(const CogParts& parts) : parts_(parts) {
    for (std::size_t i = 0; i < parts.levels.size(); ++i) {
      const std::uint32_t kind = i == 0 ? 0 : kReduced;
      images_.push_back({&parts.levels[i], false, kind, {}, {}});
      if (parts.hasMasks) images_.push_back({&parts.levels[i], true, kind | kMask, {}, {}});
    }
  }

  bool Write(const std::string& path) {
    std::string why;
    isBig_ = parts_.bigTiff == BigTiffChoice::kYes;
    if (Place() >= kFourGigabytes && !isBig_) {
      if (parts_.bigTiff == BigTiffChoice::kNo) {
        SetFault(path + ": takes 4 GiB or more, which is too much for a file that is no BigTIFF");
        return false;
      }
      isBig_ = true;
      Place();
    }
    file_ = platform::RandomAccessFile::CreateOrEmpty(path, &why);
    if (file_ != nullptr && WriteHead(&why) && WriteBlocks(&why) && file_->Close(&why)) return true;
    SetFault(why);
    return false;
  }

 private:
  /// The bytes of a block: those of the store, or ones that several blocks share.
  const std::vector<unsigned char>* SharedBytes(const Image& image, std::size_t block) const {
    const bool isFill = image.level->blocks[block].offset <= PackedBlock::kFill;
    if (!image.isMask) return isFill ? &parts_.fill : nullptr;
    if (isFill) return parts_.isFillNoData ? &parts_.noneValid : &parts_.allValid;
    return image.level->masks[block].offset == 0 ? &parts_.allValid : nullptr;
  }

  const PackedBlock& Stored(const Image& image, std::size_t block) const {
    return image.isMask ? image.level->masks[block] : image.level->blocks[block];
  }

  DirectoryWriter DirectoryOf(const Image& image) const {
    DirectoryWriter directory(isBig_);
    const BlockLayout& layout = image.level->layout;
    if (!image.isMask) {
      for (const TagValue& tag : parts_.tags) {
        if (image.kind == 0 || IsOfLevels(tag.tag)) directory.Set(tag);
      }
    } else {
      directory.SetShorts(kBitsPerSample, {1});
      directory.SetShorts(kPhotometric, {4});
      directory.SetShorts(kSamplesPerPixel, {1});
      directory.SetShorts(kPlanarConfiguration, {1});
      directory.SetShorts(kSampleFormat, {1});
    }
    if (image.kind != 0) directory.SetLongs(kSubfileType, {image.kind});
    directory.SetLongs(kImageWidth, {layout.samples});
    directory.SetLongs(kImageLength, {layout.lines});
    SetBlockTags(directory, layout, image.isMask ? MaskPacking() : parts_.packing, image.offsets,
                 image.counts);
    return directory;
  }

  /// Gives all blocks their places. @return the end of the file.
  std::uint64_t Place() {
    for (Image& image : images_) {
      image.offsets.assign(image.level->blocks.size(), 0);
      image.counts.assign(image.level->blocks.size(), 0);
    }
    std::uint64_t at = FirstDirectory();
    for (const Image& image : images_) at += DirectoryOf(image).Bytes();
    for (auto image = images_.rbegin(); image != images_.rend(); ++image) {
      for (std::size_t block = 0; block < image->offsets.size(); ++block) {
        const auto* const shared = SharedBytes(*image, block);
        image->counts[block] = shared != nullptr ? static_cast<std::uint32_t>(shared->size())
                                                 : Stored(*image, block).bytes;
        image->offsets[block] = at + kEdge;
        at += kEdge + image->counts[block] + kEdge;
      }
    }
    return at;
  }

  std::uint64_t FirstDirectory() const {
    const std::uint64_t end = (isBig_ ? 16 : 8) + StructureText().size();
    return end + end % 2;
  }

  bool WriteHead(std::string* why) {
    std::vector<unsigned char> head = FileHeader(isBig_, FirstDirectory());
    const std::string text = StructureText();
    head.insert(head.end(), text.begin(), text.end());
    head.resize(FirstDirectory());
    for (std::size_t i = 0; i < images_.size(); ++i) {
      const DirectoryWriter directory = DirectoryOf(images_[i]);
      const std::uint64_t start = head.size();
      const bool isLast = i + 1 == images_.size();
      directory.AppendTo(head, start, isLast ? 0 : start + directory.Bytes());
    }
    end_ = head.size();
    return file_->Write(0, head.data(), head.size(), why);
  }

  bool WriteBlocks(std::string* why) {
    constexpr std::size_t kPiece = 4 << 20;
    std::vector<unsigned char> piece, packed;
    for (auto image = images_.rbegin(); image != images_.rend(); ++image) {
      for (std::size_t block = 0; block < image->offsets.size(); ++block) {
        const auto* bytes = SharedBytes(*image, block);
        if (bytes == nullptr) {
          const PackedBlock& stored = Stored(*image, block);
          packed.resize(stored.bytes);
          if (!parts_.store.Read(stored.offset, packed.data(), packed.size(), why)) return false;
          bytes = &packed;
        }
        AppendBlock(piece, *bytes);
        if (piece.size() >= kPiece && !WritePiece(piece, why)) return false;
      }
    }
    return WritePiece(piece, why);
  }

  static void AppendBlock(std::vector<unsigned char>& piece,
                          const std::vector<unsigned char>& bytes) {
    const auto count = static_cast<std::uint32_t>(bytes.size());
    unsigned char edge[kEdge] = {};
    std::memcpy(edge, &count, sizeof edge);
    piece.insert(piece.end(), edge, edge + kEdge);
    piece.insert(piece.end(), bytes.begin(), bytes.end());
    std::memset(edge, 0, sizeof edge);
    const std::size_t last = std::min<std::size_t>(kEdge, bytes.size());
    std::memcpy(edge, bytes.data() + bytes.size() - last, last);
    piece.insert(piece.end(), edge, edge + kEdge);
  }

  bool WritePiece(std::vector<unsigned char>& piece, std::string* why) {
    if (!file_->Write(end_, piece.data(), piece.size(), why)) return false;
    end_ += piece.size();
    piece.clear();
    return true;
  }

  const CogParts& parts_;
  std::vector<Image> images_;  // in the order of their directories
  std::unique_ptr<platform::RandomAccessFile> file_;
  std::uint64_t end_ = 0;
  bool isBig_ = false;
};

}  // namespace

Packing MaskPacking() {
  Packing packing;
  packing.compression = BlockCompression::kDeflate;
  packing.bits = 1;
  return packing;
}

std::vector<unsigned char> MaskBits(const BlockLayout& layout, unsigned width, unsigned height,
                                    const std::vector<unsigned char>& excluded) {
  const std::size_t row = MaskPacking().RowBytes(layout.blockWidth);
  std::vector<unsigned char> bits(row * layout.blockHeight);
  for (unsigned y = 0; y < height; ++y) {
    for (unsigned x = 0; x < width; ++x) {
      if (!excluded.empty() && excluded[std::size_t{y} * width + x] != 0) continue;
      unsigned char& byte = bits[y * row + x / 8];
      byte = static_cast<unsigned char>(byte | (0x80U >> (x % 8)));
    }
  }
  return bits;
}

void SetBlockTags(DirectoryWriter& directory, const BlockLayout& layout, const Packing& packing,
                  const std::vector<std::uint64_t>& offsets,
                  const std::vector<std::uint32_t>& counts) {
  directory.SetShorts(kCompression, {packing.CompressionTag()});
  directory.Drop(kPredictor);
  if (packing.PredictorTag() != 1) directory.SetShorts(kPredictor, {packing.PredictorTag()});
  for (const Tag tag : {kStripOffsets, kRowsPerStrip, kStripByteCounts, kTileWidth, kTileLength,
                        kTileOffsets, kTileByteCounts}) {
    directory.Drop(tag);
  }
  if (packing.isYcc) {
    constexpr std::uint16_t kRational = 5;
    std::vector<unsigned char> range;
    for (const std::uint32_t number : {0, 1, 255, 1, 128, 1, 255, 1, 128, 1, 255, 1}) {
      for (unsigned i = 0; i < 4; ++i) range.push_back(static_cast<unsigned char>(number >> 8 * i));
    }
    directory.SetShorts(kPhotometric, {6});
    directory.SetShorts(kYCbCrSubsampling, {2, 2});
    directory.Set({kReferenceBlackWhite, kRational, 6, range});
  }
  if (layout.isTiled) {
    directory.SetLongs(kTileWidth, {layout.blockWidth});
    directory.SetLongs(kTileLength, {layout.blockHeight});
    directory.SetOffsets(kTileOffsets, offsets);
    directory.SetLongs(kTileByteCounts, counts);
  } else {
    directory.SetLongs(kRowsPerStrip, {layout.blockHeight});
    directory.SetOffsets(kStripOffsets, offsets);
    directory.SetLongs(kStripByteCounts, counts);
  }
}

bool WriteCog(const std::string& path, const CogParts& parts) {
  return CogWriter(parts).Write(path);
}

}  // namespace lumo::tiff
