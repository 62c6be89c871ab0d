#pragma once

#include <functional>
#include <memory>
#include <vector>

#include "platform/shared_memory.h"
#include "rasters/raster_source.h"

namespace lumo::host {

/// The bytes of pixels, or of states, that a block has at most.
inline constexpr std::uint64_t kBlockBudget = 8U << 20;

/// Cuts a rectangle into blocks along those of the source, each within the budget where a single
/// line is.
/// @param bands       how many are read.
/// @param wholeLines  a block is never narrower than the rectangle.
std::vector<SubRect> CutIntoBlocks(const RasterInfo& info, const SubRect& rect, unsigned bands,
                                   bool wholeLines);

/// A block to read.
struct BlockRequest {
  SubRect rect;
  Array<unsigned> bands;
  Interleave interleave = Interleave::BIP;

  std::uint64_t GetCount() const {
    return std::uint64_t{rect.Width()} * rect.Height() * bands.GetCount();
  }
};

/// Named memory for one block of pixels and their states.
class BlockMemory {
 public:
  /// @param elementBytes  of a pixel's value.
  BlockMemory(const std::string& name, unsigned elementBytes)
      : name_(name), elementBytes_(elementBytes) {}

  /// Makes room for a block. Throws HostError when the system has none.
  void Make(std::uint64_t count);

  /// Adds a command that reads a block. The memory needs not be there yet.
  /// @param raster  a variable or URI.
  void AddStep(JobDraft& draft, const std::string& step, const String& raster,
               const BlockRequest& block) const;

  unsigned char* GetPixels() const { return pixels_->GetData(); }
  unsigned char* GetStates() const { return states_->GetData(); }

 private:
  std::string name_;
  unsigned elementBytes_;
  std::unique_ptr<platform::SharedMemoryBlock> pixels_;
  std::unique_ptr<platform::SharedMemoryBlock> states_;
};

/// Reads blocks of an open raster, one after the other.
class BlockReader {
 public:
  /// @param raster  URI of the open raster.
  /// @param shown   what the user calls it.
  BlockReader(JobSession& session, const String& raster, const RasterInfo& info,
              const std::string& shown);

  /// Reads a block; what was read before is gone. Throws HostError.
  void Read(const BlockRequest& block);

  /// Reads blocks and calls `take` after each, with the progress of it all on show.
  void ReadAll(const std::vector<SubRect>& blocks, const Array<unsigned>& bands,
               Interleave interleave, ProgressStyle style,
               const std::function<void(const SubRect&)>& take);

  const unsigned char* GetPixels() const { return memory_.GetPixels(); }
  const unsigned char* GetStates() const { return memory_.GetStates(); }

 private:
  JobSession& session_;
  const String raster_;
  const std::string shown_;
  BlockMemory memory_;
};

/// Adds commands that read blocks, each into memory of its own, "vexg-block0-pixels" and so on; for
/// a document that somebody else runs, who makes the memory.
/// @param raster  a variable or URI.
void AddBlockSteps(JobDraft& draft, const String& raster, const RasterInfo& info,
                   const Array<unsigned>& bands, Interleave interleave,
                   const std::vector<SubRect>& blocks);

}  // namespace lumo::host
