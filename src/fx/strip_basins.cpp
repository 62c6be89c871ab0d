#include "fx/strip_basins.h"

namespace lumo {

/// Makes numbers of labels: for its own their order, for others that in which they are met.
void StripBasins::Number(std::int32_t* labels, std::size_t count, const Labels& own) {
  std::int32_t last = 0, number = 0;
  for (std::size_t i = 0; i < count; ++i) {
    if (labels[i] != last) {
      last = labels[i];
      const std::uint32_t place = static_cast<std::uint32_t>(last) - own.first;  // far off below it
      if (last == 0) {
        number = 0;
      } else if (place - 1 < own.count) {
        number = static_cast<std::int32_t>(place);
      } else {
        const auto next = static_cast<std::uint32_t>(own.count + others_.size() + 1);
        number = static_cast<std::int32_t>(others_.try_emplace(last, next).first->second);
      }
    }
    labels[i] = number;
  }
}

void StripBasins::Mark(const Lines& lines, const std::vector<std::int32_t>& below) {
  if (lines.hasAbove) {
    for (std::uint32_t x = 0; x < lines.width; ++x) {
      basins[static_cast<std::size_t>(lines.labels[x])].continues = true;
    }
  }
  for (const std::int32_t number : below) basins[static_cast<std::size_t>(number)].goesOn = true;
  basins[0] = {};
}

void StripBasins::ListRuns(const Lines& lines) {
  for (std::size_t at = 0; at < lines.pixels;) {
    const std::int32_t number = lines.labels[at];
    const std::size_t first = at;
    for (++at; at % lines.width != 0 && lines.labels[at] == number;) ++at;
    if (basins[static_cast<std::size_t>(number)].continues) {
      runs.push_back(
          {first, static_cast<std::uint32_t>(at - first), static_cast<std::uint32_t>(number)});
    }
  }
}

void StripBasins::Find(const Lines& lines, const Labels& own, LabelPairs& scratch) {
  std::vector<std::int32_t> below;
  if (lines.below != nullptr) below.assign(lines.below, lines.below + lines.width);
  Number(lines.labels, lines.pixels, own);
  Number(below.data(), below.size(), own);
  basins.resize(std::size_t{own.count} + others_.size() + 1);
  for (std::uint32_t i = 1; i <= own.count; ++i) basins[i].label = own.first + i;
  for (const auto& [label, number] : others_) {
    basins[number].label = static_cast<std::uint32_t>(label);
  }
  others_ = {};
  Mark(lines, below);
  ListRuns(lines);
  scratch.Begin(basins.size());
  ForEachStripEdge(lines.labels, lines.pixels, lines.width, below.empty() ? nullptr : below.data(),
                   [&](std::uint32_t a, std::uint32_t b) { scratch.AddEdge(a, b); });
  pairs = scratch.Pairs();
}

}  // namespace lumo
