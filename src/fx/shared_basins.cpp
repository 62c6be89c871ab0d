#include "fx/shared_basins.h"

#include <algorithm>

namespace lumo {
namespace {

/// The lines of labels that are in a section.
std::uint32_t LinesOfSection(std::uint32_t width) {
  constexpr std::uint32_t kPixels = 1U << 17U;
  return std::max(kPixels / width, 1U);
}

}  // namespace

void PutLabels(ShareWriter& to, const std::int32_t* labels, std::uint32_t width,
               std::uint32_t lines) {
  const std::uint32_t most = LinesOfSection(width);
  for (std::uint32_t line = 0; line < lines; line += most) {
    to.PutAll(labels + std::size_t{width} * line,
              std::size_t{width} * std::min(most, lines - line));
    to.EndSection();
  }
}

std::uint64_t SectionsOfLabels(std::uint32_t width, std::uint32_t lines) {
  const std::uint32_t most = LinesOfSection(width);
  return (std::uint64_t{lines} + most - 1) / most;
}

bool SharedBasins::Open(const SegmentShares& shares, const ShareCut& cut, std::uint32_t stripLines,
                        bool isRanked) {
  shares_ = shares;
  cut_ = cut;
  stripLines_ = stripLines;
  return seams_.Read(shares, cut, isRanked);
}

bool SharedBasins::ReadLabelsAbove(unsigned strip, std::vector<std::int32_t>& line) const {
  line.resize(strip == 0 ? 0 : cut_.width);
  return line.empty() || ReadLines(FirstLineOf(strip) - 1, 1, line.data());
}

bool SharedBasins::ReadLabelsBelow(unsigned strip, std::vector<std::int32_t>& line) const {
  line.resize(strip + 1 == Strips() ? 0 : cut_.width);
  return line.empty() || ReadLines(FirstLineOf(strip + 1), 1, line.data());
}

std::uint32_t SharedBasins::LinesOf(unsigned strip) const {
  return std::min(stripLines_, cut_.height - FirstLineOf(strip));
}

/// Reads lines, which may be of several shares.
bool SharedBasins::ReadLines(std::uint32_t first, std::uint32_t lines, std::int32_t* labels) const {
  const std::uint32_t most = LinesOfSection(cut_.width);
  std::vector<std::int32_t> section;
  for (std::uint32_t line = first; line < first + lines;) {
    const unsigned share = line / cut_.shareLines;
    const std::uint32_t inShare = line - cut_.FirstLineOf(share), number = inShare / most;
    const std::uint32_t begin = number * most;
    const std::uint32_t held = std::min(most, cut_.LinesOf(share) - begin);
    section.resize(std::size_t{cut_.width} * held);
    ShareReader from;
    if (!shares_->Open(2, share, number, from)) return false;
    const bool isSound = from.GetAll(section.data(), section.size()) && from.IsAtEnd() &&
                         std::all_of(section.begin(), section.end(), [&](std::int32_t label) {
                           return label >= 0 && static_cast<std::uint32_t>(label) <= Count();
                         });
    if (!isSound) return shares_->Refuse(2, share);
    const std::uint32_t taken = std::min(begin + held - inShare, first + lines - line);
    labels = std::copy_n(
        section.begin() + static_cast<std::ptrdiff_t>(std::size_t{cut_.width} * (inShare - begin)),
        std::size_t{cut_.width} * taken, labels);
    line += taken;
  }
  return true;
}

}  // namespace lumo
