#include "fx/label_forest.h"

#include <algorithm>

#include "fx/work_file.h"

namespace lumo {
namespace {

constexpr std::size_t kLeastPages = 8;

}  // namespace

void LabelForest::Begin(std::uint64_t labelCount, std::uint64_t bytes) {
  constexpr std::uint64_t kPageBytes = std::uint64_t{kPageLabels} * sizeof(std::uint32_t);
  pages_.assign((labelCount + kPageLabels - 1) / kPageLabels, nullptr);
  isInFile_.assign(pages_.size(), false);
  mostPages_ = std::max<std::size_t>(bytes / kPageBytes, kLeastPages);
  frames_.clear();
  file_.reset();
  numbers_ = 0;
  joins_ = 0;
  isWell_ = true;
}

void LabelForest::Fail(const std::string& fault) {
  if (!fault.empty()) FailByWorkFile(fault);
  isWell_ = false;
}

/// Gives memory for a page: that of the page which came first, where there are enough.
std::unique_ptr<std::uint32_t[]> LabelForest::MakeRoom() {
  if (frames_.size() < mostPages_) return std::make_unique<std::uint32_t[]>(kPageLabels);
  Frame oldest = std::move(frames_.front());
  frames_.pop_front();
  pages_[oldest.page] = nullptr;
  if (!file_ && !(file_ = MakeWorkFile())) Fail("");
  constexpr std::uint64_t kBytesOfPage = kPageLabels * sizeof(std::uint32_t);
  std::string fault;
  if (isWell_ &&
      !file_->Write(oldest.page * kBytesOfPage, oldest.labels.get(), kBytesOfPage, &fault)) {
    Fail(fault);
  }
  isInFile_[oldest.page] = true;
  return std::move(oldest.labels);
}

std::uint32_t& LabelForest::Fetch(std::uint32_t label) {
  const std::size_t page = label >> kPageBits;
  std::unique_ptr<std::uint32_t[]> labels = isWell_ ? MakeRoom() : nullptr;
  if (!isWell_) return none_ = 0;
  constexpr std::uint64_t kBytesOfPage = kPageLabels * sizeof(std::uint32_t);
  std::string fault;
  if (!isInFile_[page]) {
    std::fill_n(labels.get(), kPageLabels, 0U);
  } else if (!file_->Read(page * kBytesOfPage, labels.get(), kBytesOfPage, &fault)) {
    Fail(fault);
    return none_ = 0;
  }
  pages_[page] = labels.get();
  frames_.push_back({page, std::move(labels)});
  return pages_[page][label & (kPageLabels - 1)];
}

std::uint32_t LabelForest::RootOf(std::uint32_t label) {
  std::uint32_t root = label;
  while (const std::uint32_t next = At(root)) root = next;
  while (label != root) {
    std::uint32_t& held = At(label);
    if (held == 0) break;  // it could not be fetched
    label = held;
    held = root;
  }
  return root;
}

std::uint32_t LabelForest::FindNumber(std::uint32_t label) {
  std::uint32_t root = label, held = At(root);
  while (held != 0 && (held & kNumbered) == 0) {
    root = held;
    held = At(root);
  }
  if (held == 0) held = At(root) = ++numbers_ | kNumbered;
  At(label) = held;
  return held & ~kNumbered;
}

}  // namespace lumo
