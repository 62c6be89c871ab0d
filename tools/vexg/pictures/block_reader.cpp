#include "pictures/block_reader.h"

#include <algorithm>
#include <cerrno>
#include <limits>

#include <fmt/format.h>

#include "platform/memory_shortage.h"
#include "platform/owned_name.h"
#include "raster/pixel_types.h"
#include "verb.h"

namespace lumo::host {
namespace {

/// How much of an axis one block takes.
struct Cut {
  unsigned width;
  unsigned height;
};

constexpr unsigned kUncut = std::numeric_limits<unsigned>::max();

/// `most` cut down to a multiple of `unit` where it holds one, else at least 1.
unsigned WholeUnits(std::uint64_t most, unsigned unit) {
  const std::uint64_t capped = std::min<std::uint64_t>(most, kUncut);
  if (capped < unit) return static_cast<unsigned>(std::max<std::uint64_t>(capped, 1));
  return static_cast<unsigned>(capped - capped % unit);
}

Cut ChooseCut(const RasterInfo& info, const SubRect& rect, unsigned bands, bool wholeLines) {
  const std::uint64_t pixelBytes = std::uint64_t{bands} * DataTypeBytes(info.dataType);
  const unsigned tileWidth = std::clamp(info.tiles.width, 1U, info.samples);
  const unsigned tileHeight = std::clamp(info.tiles.height, 1U, info.lines);
  const std::uint64_t lineBytes = pixelBytes * rect.Width();
  if (wholeLines || lineBytes * tileHeight <= kBlockBudget) {
    return {kUncut, WholeUnits(kBlockBudget / lineBytes, tileHeight)};
  }
  // Squares of tiles; parts of lines where the source has no tiles.
  const unsigned height = WholeUnits(kBlockBudget / (pixelBytes * tileWidth), tileHeight);
  const unsigned rows = std::min(height, tileHeight);
  return {WholeUnits(kBlockBudget / (pixelBytes * rows), tileWidth), rows};
}

struct Span {
  unsigned first;
  unsigned last;
};

/// Cuts first to last at the multiples of `size`.
std::vector<Span> CutAxis(unsigned first, unsigned last, unsigned size) {
  std::vector<Span> spans;
  for (std::uint64_t at = first; at <= last;) {
    const std::uint64_t next = (at / size + 1) * size;
    const auto end = static_cast<unsigned>(std::min<std::uint64_t>(last, next - 1));
    spans.push_back({static_cast<unsigned>(at), end});
    at = std::uint64_t{end} + 1;
  }
  return spans;
}

unsigned FittingSize(std::uint64_t bytes) {
  if (bytes > kUncut) throw HostError(kExitFailed, "a line of the raster is too long to be read");
  return static_cast<unsigned>(bytes);
}

}  // namespace

std::vector<SubRect> CutIntoBlocks(const RasterInfo& info, const SubRect& rect, unsigned bands,
                                   bool wholeLines) {
  const Cut cut = ChooseCut(info, rect, bands, wholeLines);
  std::vector<SubRect> blocks;
  for (const Span rows : CutAxis(rect.top, rect.bottom, cut.height)) {
    for (const Span columns : CutAxis(rect.left, rect.right, cut.width)) {
      blocks.emplace_back(columns.first, rows.first, columns.last, rows.last);
    }
  }
  return blocks;
}

void BlockMemory::Make(std::uint64_t count) {
  const unsigned pixelBytes = FittingSize(count * elementBytes_);
  const unsigned stateBytes = FittingSize(count);
  if (pixels_ && pixels_->GetSize() >= pixelBytes && states_->GetSize() >= stateBytes) return;
  pixels_.reset();
  states_.reset();
  pixels_ = platform::SharedMemoryBlock::Create(name_ + "-pixels", pixelBytes);
  states_ = platform::SharedMemoryBlock::Create(name_ + "-states", stateBytes);
  if (!pixels_ || !states_) {
    throw HostError(kExitFailed, fmt::format("the system gives no {} bytes of named memory: {}",
                                             std::uint64_t{pixelBytes} + stateBytes,
                                             platform::SystemErrorText(errno)));
  }
}

void BlockMemory::AddStep(JobDraft& draft, const std::string& step, const String& raster,
                          const BlockRequest& block) const {
  JobWriterCommand& command = draft.Step(step, "GetRasterSubRectCommand");
  command.AddInput("URI", raster);
  command.AddInput("SubRect", block.rect);
  command.AddInput("Bands", block.bands);
  command.AddInput("Interleave", block.interleave);
  command.AddInput("PixelDataBufName", String(name_ + "-pixels"));
  command.AddInput("PixelDataBufSize", FittingSize(block.GetCount() * elementBytes_));
  command.AddInput("PixelValueStateBufName", String(name_ + "-states"));
  command.AddInput("PixelValueStateBufSize", FittingSize(block.GetCount()));
}

BlockReader::BlockReader(JobSession& session, const String& raster, const RasterInfo& info,
                         const std::string& shown)
    : session_(session),
      raster_(raster),
      shown_(shown),
      memory_(platform::OwnedName("vexg-block"), DataTypeBytes(info.dataType)) {}

void BlockReader::Read(const BlockRequest& block) {
  session_.CheckInterrupt();
  memory_.Make(block.GetCount());
  JobDraft draft;
  memory_.AddStep(draft, "block", raster_, block);
  const JobResults results = session_.Run(draft);
  const Map<String, String>& returns = results.Find("block").returns;
  if (ParseValue<bool>(returns.Find("Return"))) return;
  const std::string fault = returns.Find("Fault").ToUTF8();
  throw HostError(kExitFailed, fault.empty() ? shown_ + ": the pixels can't be read" : fault);
}

void BlockReader::ReadAll(const std::vector<SubRect>& blocks, const Array<unsigned>& bands,
                          Interleave interleave, ProgressStyle style,
                          const std::function<void(const SubRect&)>& take) {
  const ProgressReportPtr progress(new StandardProgressReport);
  const ProgressView view(progress, style);
  for (std::size_t i = 0; i < blocks.size(); ++i) {
    Read({blocks[i], bands, interleave});
    take(blocks[i]);
    progress->Update(static_cast<double>(i + 1) / static_cast<double>(blocks.size()));
  }
}

void AddBlockSteps(JobDraft& draft, const String& raster, const RasterInfo& info,
                   const Array<unsigned>& bands, Interleave interleave,
                   const std::vector<SubRect>& blocks) {
  for (std::size_t i = 0; i < blocks.size(); ++i) {
    const std::string step = "block" + std::to_string(i);
    const BlockMemory memory("vexg-" + step, DataTypeBytes(info.dataType));
    memory.AddStep(draft, step, raster, {blocks[i], bands, interleave});
  }
}

}  // namespace lumo::host
