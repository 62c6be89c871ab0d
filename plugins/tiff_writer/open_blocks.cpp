#include "tiff_writer/open_blocks.h"

#include <cstring>
#include <filesystem>

#include "foundation/fault.h"

namespace lumo::tiff {
namespace {

constexpr std::uint64_t kMostHeld = std::uint64_t{256} << 20;

}  // namespace

std::vector<unsigned char> Repeated(const std::vector<unsigned char>& value, std::uint64_t bytes) {
  std::vector<unsigned char> run(bytes);
  for (std::uint64_t at = 0; at + value.size() <= bytes; at += value.size()) {
    std::memcpy(&run[at], value.data(), value.size());
  }
  return run;
}

std::string FaultOfUnnamed(const std::string& path, const std::string& why) {
  const std::size_t reason = why.rfind(": ");
  return reason != why.npos ? path + why.substr(reason) : path + ": " + why;
}

OpenBlocks::OpenBlocks(std::string path, std::vector<unsigned char> fill, std::uint64_t mostBytes)
    : path_(std::move(path)),
      slotBytes_(mostBytes),
      fill_(std::move(fill)),
      fillsZero_(std::all_of(fill_.begin(), fill_.end(), [](unsigned char b) { return b == 0; })) {}

OpenBlock* OpenBlocks::Find(unsigned level, std::uint64_t block) {
  const auto at = open_.find({level, block});
  return at != open_.end() ? &at->second : nullptr;
}

OpenBlock* OpenBlocks::Open(unsigned level, std::uint64_t block, std::uint64_t bytes) {
  if (held_ + bytes > kMostHeld) CloseUnchanged();
  OpenBlock opened;
  if (held_ + bytes <= kMostHeld) {
    opened.pixels = fillsZero_ ? std::vector<unsigned char>(bytes) : Repeated(fill_, bytes);
    held_ += bytes;
  } else if (!Spill(opened, bytes, nullptr)) {
    return nullptr;
  }
  return &open_.insert_or_assign({level, block}, std::move(opened)).first->second;
}

OpenBlock* OpenBlocks::OpenWith(unsigned level, std::uint64_t block,
                                std::vector<unsigned char> pixels) {
  if (held_ + pixels.size() > kMostHeld) CloseUnchanged();
  OpenBlock opened;
  if (held_ + pixels.size() <= kMostHeld) {
    held_ += pixels.size();
    opened.pixels = std::move(pixels);
  } else if (!Spill(opened, pixels.size(), pixels.data())) {
    return nullptr;
  }
  return &open_.insert_or_assign({level, block}, std::move(opened)).first->second;
}

/// Gives a block a place in the file.
bool OpenBlocks::Spill(OpenBlock& block, std::uint64_t bytes, const unsigned char* pixels) {
  std::string why;
  if (file_ == nullptr) {
    file_ = platform::RandomAccessFile::CreateUnnamed(
        std::filesystem::path(path_).parent_path().string(), &why);
    if (file_ == nullptr) return Refuse(FaultOfUnnamed(path_, why));
  }
  const bool isFresh = freeSlots_.empty();
  if (isFresh) {
    block.slot = slots_;
    slots_ += slotBytes_;
    if (!file_->SetSize(slots_, &why)) return Refuse(FaultOfUnnamed(path_, why));
  } else {
    block.slot = freeSlots_.back();
    freeSlots_.pop_back();
  }
  if (pixels == nullptr && isFresh && fillsZero_) return true;
  const std::vector<unsigned char> filled =
      pixels == nullptr ? Repeated(fill_, bytes) : std::vector<unsigned char>();
  return Write(block, 0, pixels == nullptr ? filled.data() : pixels, bytes);
}

void OpenBlocks::Close(unsigned level, std::uint64_t block) {
  const auto at = open_.find({level, block});
  if (at == open_.end()) return;
  if (at->second.slot != OpenBlock::kNoSlot) {
    freeSlots_.push_back(at->second.slot);
  } else {
    held_ -= at->second.pixels.size();
  }
  open_.erase(at);
}

void OpenBlocks::CloseUnchanged() {
  for (auto at = open_.begin(); at != open_.end();) {
    const auto next = std::next(at);
    if (!at->second.isChanged) Close(at->first.first, at->first.second);
    at = next;
  }
}

bool OpenBlocks::Write(OpenBlock& block, std::uint64_t at, const void* data, std::size_t bytes) {
  if (block.slot == OpenBlock::kNoSlot) {
    std::memcpy(block.pixels.data() + at, data, bytes);
    return true;
  }
  std::string why;
  return file_->Write(block.slot + at, data, bytes, &why) || Refuse(FaultOfUnnamed(path_, why));
}

bool OpenBlocks::Read(const OpenBlock& block, std::uint64_t at, void* data,
                      std::size_t bytes) const {
  if (block.slot == OpenBlock::kNoSlot) {
    std::memcpy(data, block.pixels.data() + at, bytes);
    return true;
  }
  std::string why;
  return file_->Read(block.slot + at, data, bytes, &why) || Refuse(FaultOfUnnamed(path_, why));
}

bool OpenBlocks::Load(OpenBlock& block, std::uint64_t bytes) {
  if (block.slot == OpenBlock::kNoSlot) return true;
  std::vector<unsigned char> pixels(bytes);
  if (!Read(block, 0, pixels.data(), bytes)) return false;
  freeSlots_.push_back(block.slot);
  block.slot = OpenBlock::kNoSlot;
  block.pixels = std::move(pixels);
  held_ += bytes;
  return true;
}

std::vector<std::uint64_t> OpenBlocks::Changed(unsigned level) const {
  std::vector<std::uint64_t> blocks;
  for (auto at = open_.lower_bound({level, 0}); at != open_.end() && at->first.first == level;
       ++at) {
    if (at->second.isChanged && !at->second.isQueued) blocks.push_back(at->first.second);
  }
  return blocks;
}

}  // namespace lumo::tiff
