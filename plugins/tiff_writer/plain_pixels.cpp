#include "tiff_writer/plain_pixels.h"

#include <cstring>

#include "foundation/fault.h"
#include "tiff_writer/tiff_directory.h"

namespace lumo::tiff {

bool PlainPixels::Begin(const std::string& path, const RasterDef& def, bool byPixel,
                        const std::vector<unsigned char>& fill,
                        std::unique_ptr<PlainPixels>& pixels) {
  pixels.reset();
  std::string fault;
  auto file =
      platform::RandomAccessFile::Open(path, platform::RandomAccessFile::Access::kUpdate, &fault);
  PlainLayout layout;
  layout.samples = def.samples;
  layout.lines = def.lines;
  layout.bands = def.bands;
  layout.element = static_cast<unsigned>(fill.size());
  layout.byPixel = byPixel;
  const Placing placing = file != nullptr ? PlaceBlocks(*file, layout, fault) : Placing::kFailed;
  if (placing == Placing::kFailed) {
    SetFault(fault);
    return false;
  }
  if (placing == Placing::kUnsuited) return true;
  // Strips follow each other without a gap: as good as one.
  if (!layout.isTiled) layout.blockHeight = layout.lines;
  pixels.reset(new PlainPixels(std::move(file), layout, fill));
  return true;
}

PlainPixels::PlainPixels(std::unique_ptr<platform::RandomAccessFile> file,
                         const PlainLayout& layout, const std::vector<unsigned char>& fill)
    : file_(std::move(file)), layout_(layout) {
  // Bytes that nobody has written read as zeros.
  if (std::all_of(fill.begin(), fill.end(), [](unsigned char byte) { return byte == 0; })) return;
  while (fillRow_.size() < layout_.RowBytes()) {
    fillRow_.insert(fillRow_.end(), fill.begin(), fill.end());
  }
  isWritten_.resize(RowNumber(layout_.Blocks(), 0));
}

bool PlainPixels::Write(const BlockPlace& place, const void* pixels) {
  return ForRuns(layout_, place, [&](const BlockRun& run) {
    return WriteRun(run, place, static_cast<const unsigned char*>(pixels) + run.memory);
  });
}

bool PlainPixels::Read(const BlockPlace& place, void* pixels) {
  return ForRuns(layout_, place, [&](const BlockRun& run) {
    return ReadRun(run, place, static_cast<unsigned char*>(pixels) + run.memory);
  });
}

bool PlainPixels::WriteRun(const BlockRun& run, const BlockPlace& place,
                           const unsigned char* pixels) {
  const MemoryStrides strides(layout_, place);
  const std::uint64_t rowBytes = layout_.RowBytes(), pixelBytes = layout_.PixelBytes();
  const std::uint64_t offset =
      layout_.OffsetOf(run.block) + run.top * rowBytes + run.left * pixelBytes;
  const std::size_t bytes = run.width * pixelBytes;
  std::string why;
  bool done = true;
  if (!HasAllBands(layout_, place)) {
    scratch_.resize(bytes);
    done = FillRows(run);
    for (unsigned y = 0; done && y < run.height; ++y) {
      done = file_->Read(offset + y * rowBytes, scratch_.data(), bytes, &why);
      CarryBands<true>(layout_, place, run.width, scratch_.data(), pixels + y * strides.line);
      done = done && file_->Write(offset + y * rowBytes, scratch_.data(), bytes, &why);
    }
  } else if (run.IsWholeRows() && run.width == place.width && bytes == rowBytes) {
    done = file_->Write(offset, pixels, run.height * rowBytes, &why);
  } else if (run.IsWholeRows()) {
    // Columns beyond the raster get what lay there before; nobody looks at them.
    scratch_.resize(std::max<std::size_t>(scratch_.size(), run.height * rowBytes));
    for (unsigned y = 0; y < run.height; ++y) {
      std::memcpy(&scratch_[y * rowBytes], pixels + y * strides.line, bytes);
    }
    done = file_->Write(offset, scratch_.data(), (run.height - 1) * rowBytes + bytes, &why);
  } else {
    done = FillRows(run);
    for (unsigned y = 0; done && y < run.height; ++y) {
      done = file_->Write(offset + y * rowBytes, pixels + y * strides.line, bytes, &why);
    }
  }
  if (done) NoteWritten(run);
  if (!done && !why.empty()) SetFault(why);
  return done;
}

bool PlainPixels::ReadRun(const BlockRun& run, const BlockPlace& place, unsigned char* pixels) {
  if (!FillRows(run)) return false;
  const MemoryStrides strides(layout_, place);
  const std::uint64_t rowBytes = layout_.RowBytes(), pixelBytes = layout_.PixelBytes();
  const std::uint64_t offset =
      layout_.OffsetOf(run.block) + run.top * rowBytes + run.left * pixelBytes;
  const std::size_t bytes = run.width * pixelBytes;
  const bool isPlain = HasAllBands(layout_, place);
  if (!isPlain) scratch_.resize(std::max(scratch_.size(), bytes));
  std::string why;
  for (unsigned y = 0; y < run.height; ++y) {
    unsigned char* const row = pixels + y * strides.line;
    if (!file_->Read(offset + y * rowBytes, isPlain ? row : scratch_.data(), bytes, &why)) {
      SetFault(why);
      return false;
    }
    if (!isPlain) CarryBands<false>(layout_, place, run.width, scratch_.data(), row);
  }
  return true;
}

/// Writes the fill value to those rows of a run that nobody has written yet.
bool PlainPixels::FillRows(const BlockRun& run) {
  if (fillRow_.empty()) return true;
  std::string why;
  for (unsigned y = 0; y < run.height; ++y) {
    const std::size_t row = RowNumber(run.block, run.top + y);
    if (isWritten_[row]) continue;
    const std::uint64_t offset = layout_.OffsetOf(run.block) + (run.top + y) * layout_.RowBytes();
    if (!file_->Write(offset, fillRow_.data(), layout_.RowBytes(), &why)) {
      SetFault(why);
      return false;
    }
    isWritten_[row] = true;
  }
  return true;
}

void PlainPixels::NoteWritten(const BlockRun& run) {
  if (fillRow_.empty()) return;
  for (unsigned y = 0; y < run.height; ++y) isWritten_[RowNumber(run.block, run.top + y)] = true;
}

bool PlainPixels::Finish() {
  for (std::uint64_t block = 0; !fillRow_.empty() && block < layout_.Blocks(); ++block) {
    BlockRun run{};
    run.block = block;
    run.height = layout_.LinesOf(block);
    if (!FillRows(run)) return false;
  }
  std::string why;
  if (file_->Close(&why)) return true;
  SetFault(why);
  return false;
}

}  // namespace lumo::tiff
