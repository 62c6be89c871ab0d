#pragma once

#include <cstdint>
#include <map>
#include <memory>
#include <string>
#include <vector>

#include "platform/random_access_file.h"
#include "tiff_writer/block_layout.h"

namespace lumo::tiff {

/// A block that is being filled: in memory, or where that is full in a file.
struct OpenBlock {
  static constexpr std::uint64_t kNoSlot = ~std::uint64_t{0};

  std::vector<unsigned char> pixels;    ///< empty for one in the file
  std::uint64_t slot = kNoSlot;         ///< of one in the file
  std::vector<unsigned char> excluded;  ///< a byte for each pixel inside the raster; or empty
  std::uint64_t written = 0;            ///< values, each as often as it was written
  bool isChanged = false;
  bool isQueued = false;
  bool wasPlaced = false;  ///< packed before, and taken up again
};

/// The blocks of all levels of a file that are being filled. They take up to a quarter of a GiB of
/// memory; further ones lie in a file without a name, where each row goes straight to its place.
///
/// Failure: false or null, with the fault set.
class OpenBlocks {
 public:
  /// @param path       of the raster, beside which the file lies.
  /// @param fill       bytes of one value.
  /// @param mostBytes  of a block.
  OpenBlocks(std::string path, std::vector<unsigned char> fill, std::uint64_t mostBytes);

  OpenBlock* Find(unsigned level, std::uint64_t block);
  /// Opens a block that isn't open, full of the fill value.
  OpenBlock* Open(unsigned level, std::uint64_t block, std::uint64_t bytes);
  /// Opens one with these pixels.
  OpenBlock* OpenWith(unsigned level, std::uint64_t block, std::vector<unsigned char> pixels);
  void Close(unsigned level, std::uint64_t block);
  /// Closes those that nobody has changed.
  void CloseUnchanged();

  bool Write(OpenBlock& block, std::uint64_t at, const void* data, std::size_t bytes);
  bool Read(const OpenBlock& block, std::uint64_t at, void* data, std::size_t bytes) const;
  /// Takes all pixels of a block into memory, for good.
  bool Load(OpenBlock& block, std::uint64_t bytes);

  /// The numbers of the changed blocks of a level that are not queued, in order.
  std::vector<std::uint64_t> Changed(unsigned level) const;

 private:
  bool Spill(OpenBlock& block, std::uint64_t bytes, const unsigned char* pixels);

  const std::string path_;
  const std::uint64_t slotBytes_;
  const std::vector<unsigned char> fill_;
  const bool fillsZero_;
  std::map<std::pair<unsigned, std::uint64_t>, OpenBlock> open_;
  std::uint64_t held_ = 0;  // bytes in memory
  std::unique_ptr<platform::RandomAccessFile> file_;
  std::uint64_t slots_ = 0;
  std::vector<std::uint64_t> freeSlots_;
};

/// Words what happened to a file without a name, which tells of itself by its folder, as a fault of
/// the raster that it is for.
std::string FaultOfUnnamed(const std::string& path, const std::string& why);

/// A run of bytes that repeats one value.
std::vector<unsigned char> Repeated(const std::vector<unsigned char>& value, std::uint64_t bytes);

}  // namespace lumo::tiff
