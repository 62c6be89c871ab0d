#pragma once

#include <memory>
#include <vector>

#include "platform/shared_memory.h"
#include "raster_source.h"

namespace lumo::host {

/// The bytes of pixels, or of states, that a block has at most.
inline constexpr std::uint64_t kBlockBudget = 8U << 20;

/// Cuts a rectangle into blocks along those of the source, each within the budget where a single
/// line is.
/// @param bands       how many are read.
/// @param wholeLines  a block is never narrower than the rectangle.
std::vector<SubRect> CutIntoBlocks(const RasterInfo& info, const SubRect& rect, unsigned bands,
                                   bool wholeLines);

/// A block to move between a raster and named memory.
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

  /// Adds a command that moves a block: GetRasterSubRectCommand or PutRasterSubRectCommand. The
  /// memory needs not be there yet.
  /// @param raster  a variable or URI.
  void AddStep(JobDraft& draft, const std::string& step, const char* id, const String& raster,
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

  const unsigned char* GetPixels() const { return memory_.GetPixels(); }
  const unsigned char* GetStates() const { return memory_.GetStates(); }
  BlockMemory& GetMemory() { return memory_; }

 private:
  JobSession& session_;
  const String raster_;
  const std::string shown_;
  BlockMemory memory_;
};

/// Name of the memory of this program's blocks.
std::string BlockMemoryName();

/// Throws HostError when a step of AddStep says that its block was not moved.
void CheckBlock(const JobResults& results, const std::string& step, const std::string& shown);

}  // namespace lumo::host
