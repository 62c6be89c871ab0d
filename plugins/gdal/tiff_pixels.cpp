#include "tiff_pixels.h"

#include <cstring>

#include "foundation/fault.h"
#include "gdal_common/messages.h"
#include "tiff_directory.h"

namespace lumo::gdal {

/// A rectangle inside one block of the file.
struct TiffPixels::Run {
  std::uint64_t block;
  unsigned left, top, width, height;  ///< inside the block
  unsigned columns;                   ///< of the block, that lie inside the raster
  std::uint64_t memory;               ///< where its first pixel lies in the caller's memory

  bool IsWholeRows() const { return left == 0 && width == columns; }
};

namespace {

/// Strides of the caller's memory, in bytes.
struct Strides {
  Strides(const TiffLayout& layout, const BlockPlace& place)
      : pixel((layout.byPixel ? place.bands.GetCount() : 1) * std::uint64_t{layout.element}),
        line(place.width * pixel),
        band(place.height * line) {}

  std::uint64_t pixel, line, band;
};

/// True when the block in memory has the bands of the file, in their order.
bool HasAllBands(const TiffLayout& layout, const BlockPlace& place) {
  if (!layout.byPixel) return true;
  if (place.bands.GetCount() != layout.bands) return false;
  for (unsigned i = 0; i < layout.bands; ++i) {
    if (place.bands[i] != i) return false;
  }
  return true;
}

/// Carries the chosen bands of pixels from the caller's memory to the file's order, or back.
template <bool kToFile>
void CarryBands(const TiffLayout& layout, const BlockPlace& place, unsigned width,
                unsigned char* file,
                std::conditional_t<kToFile, const unsigned char*, unsigned char*> memory) {
  const std::size_t element = layout.element;
  const unsigned bands = place.bands.GetCount();
  for (unsigned x = 0; x < width; ++x) {
    for (unsigned i = 0; i < bands; ++i) {
      unsigned char* const inFile = file + place.bands[i] * element;
      if constexpr (kToFile) {
        std::memcpy(inFile, memory, element);
      } else {
        std::memcpy(memory, inFile, element);
      }
      memory += element;
    }
    file += layout.PixelBytes();
  }
}

}  // namespace

bool TiffPixels::Begin(const std::string& path, const RasterDef& def, bool byPixel,
                       const std::vector<unsigned char>& fill,
                       std::unique_ptr<TiffPixels>& pixels) {
  pixels.reset();
  std::string fault;
  auto file =
      platform::RandomAccessFile::Open(path, platform::RandomAccessFile::Access::kUpdate, &fault);
  TiffLayout layout;
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
  pixels.reset(new TiffPixels(std::move(file), layout, fill));
  return true;
}

TiffPixels::TiffPixels(std::unique_ptr<platform::RandomAccessFile> file, const TiffLayout& layout,
                       const std::vector<unsigned char>& fill)
    : file_(std::move(file)), layout_(layout) {
  // Bytes that nobody has written read as zeros.
  if (std::all_of(fill.begin(), fill.end(), [](unsigned char byte) { return byte == 0; })) return;
  while (fillRow_.size() < layout_.RowBytes()) {
    fillRow_.insert(fillRow_.end(), fill.begin(), fill.end());
  }
  isWritten_.resize(RowNumber(layout_.Blocks(), 0));
}

/// Calls `visit(run)` for the part of a block in each block of the file, until one gives false.
template <typename Visit>
bool TiffPixels::ForRuns(const BlockPlace& place, const Visit& visit) const {
  const Strides strides(layout_, place);
  const unsigned planes = layout_.byPixel ? 1 : place.bands.GetCount();
  const unsigned right = place.left + place.width, bottom = place.top + place.height;
  for (unsigned plane = 0; plane < planes; ++plane) {
    const std::uint64_t first = layout_.byPixel ? 0 : layout_.PlaneBlocks() * place.bands[plane];
    for (unsigned y = place.top; y < bottom;) {
      const unsigned row = y / layout_.blockHeight;
      const auto below = static_cast<unsigned>(
          std::min(std::uint64_t{row + 1} * layout_.blockHeight, std::uint64_t{bottom}));
      for (unsigned x = place.left; x < right;) {
        const unsigned column = x / layout_.blockWidth;
        const std::uint64_t blockRight = std::uint64_t{column + 1} * layout_.blockWidth;
        const auto beyond = static_cast<unsigned>(std::min(blockRight, std::uint64_t{right}));
        Run run{};
        run.block = first + std::uint64_t{row} * layout_.Columns() + column;
        run.left = x - column * layout_.blockWidth;
        run.top = y - row * layout_.blockHeight;
        run.width = beyond - x;
        run.height = below - y;
        run.columns = std::min(layout_.blockWidth, layout_.samples - column * layout_.blockWidth);
        run.memory = plane * strides.band + (y - place.top) * strides.line +
                     (x - place.left) * strides.pixel;
        if (!visit(run)) return false;
        x = beyond;
      }
      y = below;
    }
  }
  return true;
}

bool TiffPixels::Write(const BlockPlace& place, const void* pixels) {
  return ForRuns(place, [&](const Run& run) {
    return WriteRun(run, place, static_cast<const unsigned char*>(pixels) + run.memory);
  });
}

bool TiffPixels::Read(const BlockPlace& place, void* pixels) {
  return ForRuns(place, [&](const Run& run) {
    return ReadRun(run, place, static_cast<unsigned char*>(pixels) + run.memory);
  });
}

bool TiffPixels::WriteRun(const Run& run, const BlockPlace& place, const unsigned char* pixels) {
  const Strides strides(layout_, place);
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

bool TiffPixels::ReadRun(const Run& run, const BlockPlace& place, unsigned char* pixels) {
  if (!FillRows(run)) return false;
  const Strides strides(layout_, place);
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
bool TiffPixels::FillRows(const Run& run) {
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

void TiffPixels::NoteWritten(const Run& run) {
  if (fillRow_.empty()) return;
  for (unsigned y = 0; y < run.height; ++y) isWritten_[RowNumber(run.block, run.top + y)] = true;
}

bool TiffPixels::Finish() {
  for (std::uint64_t block = 0; !fillRow_.empty() && block < layout_.Blocks(); ++block) {
    Run run{};
    run.block = block;
    run.height = layout_.LinesOf(block);
    if (!FillRows(run)) return false;
  }
  std::string why;
  if (file_->Close(&why)) return true;
  SetFault(why);
  return false;
}

}  // namespace lumo::gdal
