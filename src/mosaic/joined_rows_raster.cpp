#include "mosaic/joined_rows_raster.h"

#include <algorithm>

#include <fmt/format.h>

#include "data/data_manager.h"
#include "foundation/fault.h"
#include "raster/block_strides.h"
#include "raster/interleave.h"
#include "raster/valid_pixels.h"
#include "views/publish_raster.h"
#include "views/sources/catalog_raster_ref.h"
#include "views/view_command.h"

namespace lumo {
namespace {

/// A block reaches from one into the next; each keeps a row of its tiles.
constexpr std::size_t kMostOpenFiles = 2;

/// Places a block of whole lines in a larger one of the same width and bands.
/// @param line  of `to` that the first of `from` becomes.
template <typename E>
void PlaceLines(const Array<E>& from, Array<E>& to, const SubRect& size, unsigned line,
                unsigned lines, Interleave interleave, unsigned bands) {
  const BlockStrides own(interleave, size.Width(), lines, bands);
  const BlockStrides whole(interleave, size.Width(), size.Height(), bands);
  // Without bands apart, the lines of a block lie together.
  const std::size_t planes = interleave == Interleave::BSQ ? bands : 1;
  const std::size_t count = std::size_t{size.Width()} * lines * (bands / planes);
  for (std::size_t plane = 0; plane < planes; ++plane) {
    std::copy_n(from.GetData() + plane * own.band, count,
                to.GetData() + plane * whole.band + line * whole.line);
  }
}

}  // namespace

template <typename T>
JoinedRowsRaster<T>::JoinedRowsRaster(const RasterPtr<T>& parent,
                                      const std::vector<RowsFile>& files, CopyBlocks walk)
    : ComputedRaster<T>(parent), firsts_{0}, open_(kMostOpenFiles) {
  for (const RowsFile& file : files) firsts_.push_back(firsts_.back() + file.lines);
  isWhole_ = parent && firsts_.back() == parent->Lines();
  RowsFiles rows{files};
  rows.watch = std::make_shared<RowsWatch>();
  rows.walksAsTarget = walk == CopyBlocks::kTarget;
  if (isWhole_ && !rows.walksAsTarget) {
    const auto blocks = MakeCopyIterator<T>(parent, AllBands(*parent), walk, *parent)->Dimensions();
    rows.walkWidth = blocks.width;
    rows.walkHeight = blocks.height;
  }
  rows_ = std::make_shared<const RowsFiles>(std::move(rows));
}

template <typename T>
std::size_t JoinedRowsRaster<T>::FileOf(unsigned line) const {
  const auto behind = std::upper_bound(firsts_.begin(), firsts_.end(), line);
  return static_cast<std::size_t>(behind - firsts_.begin()) - 1;
}

template <typename T>
RasterPtr<T> JoinedRowsRaster<T>::Open(std::size_t file) {
  const auto open = [&]() -> BasicRasterPtr {
    TakeFault();
    const DataConnectionPtr source = GetGlobalDataManager().Connect(
        ConnStrings({rows_->files[file].file}), GeoRefPtr(), MetadataPtr());
    return source ? MakeReaderRaster(source) : BasicRasterPtr();
  };
  const RasterPtr<T> raster(open_.Get(file, open));
  const bool fits = raster && raster->Samples() == this->Samples() &&
                    raster->Lines() == rows_->files[file].lines && raster->Bands() == this->Bands();
  if (fits) return raster;
  const std::string otherwise = fmt::format(
      "{}: doesn't hold {} lines of {} samples and {} bands", rows_->files[file].file.ToUTF8(),
      rows_->files[file].lines, this->Samples(), this->Bands());
  SetFault(TakeFaultOr(otherwise.c_str()));
  return {};
}

template <typename T>
bool JoinedRowsRaster<T>::GetSubRect(const SubRect& rect, const Array<unsigned>& bands,
                                     Interleave interleave, Array<T>& pixels,
                                     Array<unsigned char>& state) {
  const SubRect block(rect.left, rect.top, rect.right, rect.bottom);
  if (!IsValid() || block.bottom >= this->Lines()) return false;
  std::size_t file = FileOf(block.top);
  const auto read = [&](unsigned top, unsigned bottom, Array<T>& into,
                        Array<unsigned char>& states) {
    const RasterPtr<T> raster = Open(file);
    return raster && raster->GetSubRect(
                         {block.left, top - firsts_[file], block.right, bottom - firsts_[file]},
                         bands, interleave, into, states);
  };
  if (block.bottom < firsts_[file + 1]) return read(block.top, block.bottom, pixels, state);
  const unsigned count = BandsOfBlock(bands, interleave).GetCount();
  const ArrayDims dims = BlockDims(interleave, block.Width(), block.Height(), count);
  if (!pixels.Resize(dims) || !state.Resize(dims)) return false;
  Array<T> lines;
  Array<unsigned char> states;
  for (unsigned top = block.top; top <= block.bottom; top = firsts_[++file]) {
    const unsigned bottom = std::min(block.bottom, firsts_[file + 1] - 1);
    if (top > bottom) continue;  // a file without lines
    if (!read(top, bottom, lines, states)) return false;
    const unsigned to = top - block.top, height = bottom - top + 1;
    PlaceLines(lines, pixels, block, to, height, interleave, count);
    PlaceLines(states, state, block, to, height, interleave, count);
  }
  return true;
}

VEXG_INSTANCES(EIGHT, JoinedRowsRaster);

namespace {

const CommandDeclaration kJoinRows{
    "CreateJoinedRowsRasterCommand",
    "Views",
    "Shows a raster with its pixels out of files that hold its lines already. A command of this "
    "library's own.",
    {SourceInput(),
     {"Files", Presence::kRequired, ValueKind::kTextList,
      "rasters of the source's samples, bands and pixel type, from the first line to the last"},
     {"Lines", Presence::kRequired, ValueKind::kIntegerArray,
      "how many lines each of them has, together those of the source"},
     {"Names", Presence::kOptional, ValueKind::kTextList,
      "the files as a VRT file names them, relative to its place; as in Files when absent"},
     {"Blocks", Presence::kOptional, ValueKind::kWord,
      "those of the CopyRasterCommand that will read it: a file that takes packed blocks as they "
      "are, by RowsURI of CreateRasterCommand, has them in the order of that copy",
      "", &WordsIn<CopyBlocks>}},
    PublishedOutputs()};

class CreateJoinedRowsRasterCommand final : public ViewCommand {
  CommandResult Execute() override {
    const auto names = Read<Array<String>>("Files");
    const auto lines = Read<Array<unsigned>>("Lines");
    const auto shown = HasInput("Names") ? Read<Array<String>>("Names") : names;
    std::vector<RowsFile> files;
    std::uint64_t all = 0;
    if (shown.GetCount() != names.GetCount()) return Fail("Names has to be as long as Files");
    for (unsigned i = 0; i < names.GetCount() && i < lines.GetCount(); ++i) {
      files.push_back({names[i], lines[i], shown[i]});
      all += lines[i];
    }
    const BasicRasterPtr source = FindRaster("SrcURI");
    if (source && (names.GetCount() != lines.GetCount() || all != source->Lines())) {
      return Fail("Files and Lines don't make up the lines of the raster");
    }
    TakeFault();
    return PublishView<JoinedRowsRaster>(files, Read<CopyBlocks>("Blocks"));
  }
};

const CommandFactoryT<CreateJoinedRowsRasterCommand> createJoinedRowsRasterFactory(kJoinRows);

}  // namespace

}  // namespace lumo
