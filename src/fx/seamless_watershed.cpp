#include "fx/seamless_watershed.h"

#include <algorithm>
#include <limits>
#include <numeric>

#include "foundation/fault.h"
#include "fx/seam_ways.h"
#include "fx/work_file.h"
#include "tasks/parallel.h"

namespace lumo {
namespace {

using Cell = StripDrains::Cell;

}  // namespace

bool SeamlessWatershed::Begin(const Cut& cut) {
  constexpr std::uint64_t kMostPixels = 1U << 30U;  // of a strip
  cut_ = cut;
  if (cut.width == 0 || cut.height == 0 || cut.stripLines == 0 || cut.width > kMostPixels / 2 ||
      std::uint64_t{cut.width} * std::min(cut.stripLines, cut.height) > kMostPixels) {
    SetFault("a strip of lines has too many pixels, or none");
    return false;
  }
  file_ = MakeWorkFile();
  if (!file_) return false;
  lines_.Begin(*file_, std::uint64_t{cut.width} * cut.height, cut.width);
  parts_.clear();
  strips_.clear();
  strips_.resize((std::uint64_t{cut.height} + cut.stripLines - 1) / cut.stripLines);
  return true;
}

std::uint32_t SeamlessWatershed::LinesOf(unsigned strip) const {
  const std::uint64_t begin = std::uint64_t{strip} * cut_.stripLines;
  return static_cast<std::uint32_t>(std::min<std::uint64_t>(cut_.stripLines, cut_.height - begin));
}

bool SeamlessWatershed::ReadCells(unsigned strip, StripDrains& drains) const {
  std::vector<Cell> cells = drains.TakeCells();
  cells.resize(std::size_t{cut_.width} * LinesOf(strip));
  std::string fault;
  const std::uint64_t place = std::uint64_t{strip} * cut_.stripLines * cut_.width;
  const bool isRead = file_->Read(place, cells.data(), cells.size(), &fault);
  drains.Begin(std::move(cells), cut_.width);
  return isRead || FailByWorkFile(fault);
}

bool SeamlessWatershed::WriteCells(unsigned strip, const std::vector<Cell>& cells) {
  std::string fault;
  const std::uint64_t place = std::uint64_t{strip} * cut_.stripLines * cut_.width;
  return file_->Write(place, cells.data(), cells.size(), &fault) || FailByWorkFile(fault);
}

bool SeamlessWatershed::AddStrip(unsigned strip, const StripLevels& from) {
  const auto drains = drains_.Borrow();
  const std::uint32_t width = cut_.width, lines = LinesOf(strip);
  const bool hasAbove = strip > 0, hasBelow = HasBelow(strip);
  std::vector<Cell> cells = drains->TakeCells();
  cells.resize(std::size_t{width} * lines);
  for (std::uint32_t y = 0; y < lines; ++y) {
    const std::size_t at = std::size_t{width} * (y + (hasAbove ? 1 : 0));
    StripDrains::Levels levels;
    levels.line = from.levels + at;
    if (from.excluded != nullptr) levels.excluded = from.excluded + at;
    if (y > 0 || hasAbove) {
      levels.above = levels.line - width;
      if (from.excluded != nullptr) levels.excludedAbove = levels.excluded - width;
    }
    if (y + 1 < lines || hasBelow) {
      levels.below = levels.line + width;
      if (from.excluded != nullptr) levels.excludedBelow = levels.excluded + width;
    }
    StripDrains::MarkLine(levels, width, cells.data() + std::size_t{width} * y);
  }
  const std::vector<Cell> same(cells.begin(), cells.begin() + width);
  if (!lines_.Write(strip, SeamLines::kSame, same) || !WriteCells(strip, cells)) return false;
  drains->Begin(std::move(cells), width);
  std::vector<std::uint32_t> firstLine(width), lastLine(width);
  drains->DrainPlateaus({}, firstLine.data(), lastLine.data());
  if (!lines_.Write(strip, SeamLines::kFirstDistances, firstLine) ||
      !lines_.Write(strip, SeamLines::kLastDistances, lastLine)) {
    return false;
  }
  if (!cut_.isRanked) return true;
  Strip& made = strips_[strip];
  const std::int32_t* const levels = from.levels + (hasAbove ? width : 0);
  drains->ForEachMinimum([&](std::uint32_t first) {
    made.minima.push_back({first, levels[first]});
  });
  made.minima.shrink_to_fit();
  return true;
}

bool SeamlessWatershed::ReadBeside(unsigned strip, Beside& beside) const {
  return (strip == 0 || lines_.Read(strip - 1, SeamLines::kLastDistances, beside.above)) &&
         (!HasBelow(strip) || lines_.Read(strip + 1, SeamLines::kFirstDistances, beside.below));
}

/// Finds whether the upper one of two strips brings lower ground nearer to the other, or the lower
/// one to it.
bool SeamlessWatershed::IsNearer(unsigned upper, bool isUpward, bool& isNearer) const {
  std::vector<Cell> same;
  std::vector<std::uint32_t> last, first;
  if (!lines_.Read(upper + 1, SeamLines::kSame, same) ||
      !lines_.Read(upper, SeamLines::kLastDistances, last) ||
      !lines_.Read(upper + 1, SeamLines::kFirstDistances, first)) {
    return false;
  }
  const std::vector<std::uint32_t>& from = isUpward ? first : last;
  const std::vector<std::uint32_t>& to = isUpward ? last : first;
  for (std::uint32_t x = 0; x < cut_.width && !isNearer; ++x) {
    if (from[x] >= to[x] || to[x] - from[x] < 2) continue;
    isNearer = (same[x] & StripDrains::SameBit(StripDrains::kUp)) != 0;
  }
  return true;
}

/// Finds whether a line beside a strip brings lower ground nearer to it. Only a line that has
/// changed since can.
bool SeamlessWatershed::ComesNearer(unsigned strip, bool& comes) {
  Strip& own = strips_[strip];
  comes = false;
  if (strip > 0 && std::exchange(own.isAboveNew, false) && !IsNearer(strip - 1, false, comes)) {
    return false;
  }
  return !HasBelow(strip) || !std::exchange(own.isBelowNew, false) || comes ||
         IsNearer(strip, true, comes);
}

template <typename Work>
bool SeamlessWatershed::ForEachStrip(const std::vector<unsigned>& strips, const AbortFlag* abort,
                                     const Work& work) {
  ParallelResult result;
  ParallelFor(static_cast<unsigned>(strips.size()), abort, [&](unsigned i) {
    if (!result.Failed() && !work(strips[i])) result.Fail();
  });
  return result.Close();
}

std::vector<unsigned> SeamlessWatershed::AllStrips() const {
  std::vector<unsigned> all(strips_.size());
  std::iota(all.begin(), all.end(), 0U);
  return all;
}

/// Finds the distances in the lines of a strip anew, with those beside it as they are.
bool SeamlessWatershed::Drain(unsigned strip) {
  const auto drains = drains_.Borrow();
  Beside beside;
  if (!ReadBeside(strip, beside) || !ReadCells(strip, *drains)) return false;
  std::vector<std::uint32_t> first(cut_.width), last(cut_.width);
  drains->DrainPlateaus(beside.Distances(), first.data(), last.data());
  if (strip > 0) strips_[strip - 1].isBelowNew = true;
  if (HasBelow(strip)) strips_[strip + 1].isAboveNew = true;
  return lines_.Write(strip, SeamLines::kFirstDistances, first) &&
         lines_.Write(strip, SeamLines::kLastDistances, last);
}

/// Has strips begin again as long as lower ground comes nearer. Every second one at once, as each
/// looks at those beside it.
bool SeamlessWatershed::Settle(const AbortFlag* abort) {
  for (unsigned quiet = 0, parity = 0; quiet < 2; parity = 1 - parity) {
    if (abort != nullptr && abort->IsSet()) return true;
    std::vector<unsigned> again;
    for (unsigned strip = parity; strip < strips_.size(); strip += 2) {
      bool comes = false;
      if (!ComesNearer(strip, comes)) return false;
      if (comes) again.push_back(strip);
    }
    quiet = again.empty() ? quiet + 1 : 0;
    if (!ForEachStrip(again, abort, [this](unsigned strip) { return Drain(strip); })) return false;
  }
  return true;
}

/// Finds the final drains of a strip, its minima, and where the pixels of its first and its last
/// line drain to: a minimum, by its number in the strip and 1, or a column x of the line above as
/// -1 - x, or of the line below as -1 - width - x.
bool SeamlessWatershed::FindWays(unsigned strip) {
  const auto drains = drains_.Borrow();
  Beside beside;
  if (!ReadBeside(strip, beside) || !ReadCells(strip, *drains)) return false;
  Strip& own = strips_[strip];
  std::vector<std::uint32_t> first(cut_.width), last(cut_.width);  // the same as are kept
  drains->DrainPlateaus(beside.Distances(), first.data(), last.data());
  if (!WriteCells(strip, drains->Cells())) return false;
  // Those found in the strip alone, less those which drain into another one.
  std::size_t candidate = 0;
  std::uint32_t kept = 0;
  const auto width = static_cast<std::int32_t>(cut_.width);
  std::vector<std::int32_t> labels(drains->Cells().size());
  drains->Label(
      labels.data(),
      [&](std::uint32_t pixel) {
        if (cut_.isRanked) {
          while (own.minima[candidate].first != pixel) ++candidate;
          own.minima[kept] = own.minima[candidate];
        }
        return static_cast<std::int32_t>(++kept);
      },
      [](std::uint32_t x) { return -1 - static_cast<std::int32_t>(x); },
      [width](std::uint32_t x) { return -1 - width - static_cast<std::int32_t>(x); });
  own.minimumCount = kept;
  if (cut_.isRanked) own.minima.resize(kept);
  const std::vector<std::int32_t> lastLabels(labels.end() - width, labels.end());
  labels.resize(cut_.width);
  return lines_.Write(strip, SeamLines::kFirstLabels, labels) &&
         lines_.Write(strip, SeamLines::kLastLabels, lastLabels);
}

/// Finds the ways of all strips, and the minima that go on in the strip below.
bool SeamlessWatershed::FindAllWays(const AbortFlag* abort, std::vector<Join>& joins) {
  const bool well =
      ForEachStrip(AllStrips(), abort, [this](unsigned strip) { return FindWays(strip); });
  if (!well) return false;
  if (abort != nullptr && abort->IsSet()) return true;
  std::uint64_t total = 0;
  for (unsigned strip = 0; strip < strips_.size(); ++strip) {
    strips_[strip].firstNumber = static_cast<std::uint32_t>(total);
    total += strips_[strip].minimumCount;
    if (total > static_cast<std::uint64_t>(std::numeric_limits<std::int32_t>::max())) {
      SetFault("the raster has more minima than labels have numbers");
      return false;
    }
    if (strip > 0 && !ListJoins(strip, joins)) return false;
  }
  return true;
}

/// Lists the minima that go on from the strip above.
bool SeamlessWatershed::ListJoins(unsigned strip, std::vector<Join>& joins) const {
  std::vector<std::uint32_t> upper, lower;  // distances
  std::vector<std::int32_t> upperLabels, lowerLabels;
  if (!lines_.Read(strip - 1, SeamLines::kLastDistances, upper) ||
      !lines_.Read(strip - 1, SeamLines::kLastLabels, upperLabels) ||
      !lines_.Read(strip, SeamLines::kFirstDistances, lower) ||
      !lines_.Read(strip, SeamLines::kFirstLabels, lowerLabels)) {
    return false;
  }
  const std::uint32_t upperFirst = strips_[strip - 1].firstNumber;
  const std::uint32_t lowerFirst = strips_[strip].firstNumber;
  for (std::uint32_t x = 0; x < cut_.width; ++x) {
    // On one level, or one of them would have a way down.
    if (upper[x] != StripDrains::kFar || lower[x] != StripDrains::kFar) continue;
    if (upperLabels[x] <= 0 || lowerLabels[x] <= 0) continue;  // excluded
    const Join join{upperFirst + static_cast<std::uint32_t>(upperLabels[x]) - 1,
                    lowerFirst + static_cast<std::uint32_t>(lowerLabels[x]) - 1};
    if (joins.empty() || joins.back() != join) joins.push_back(join);
  }
  return true;
}

/// Finds which parts of minima are one.
void SeamlessWatershed::FindParts(const std::vector<Join>& joins) {
  parts_.reserve(2 * joins.size());
  for (const auto& [a, b] : joins) {
    parts_.push_back({a, a});
    parts_.push_back({b, b});
  }
  std::sort(parts_.begin(), parts_.end(),
            [](const Part& a, const Part& b) { return a.number < b.number; });
  const auto isSame = [](const Part& a, const Part& b) { return a.number == b.number; };
  parts_.erase(std::unique(parts_.begin(), parts_.end(), isSame), parts_.end());
  const auto partOf = [this](std::uint32_t number) -> Part& {
    return *std::lower_bound(parts_.begin(), parts_.end(), number,
                             [](const Part& part, std::uint32_t at) { return part.number < at; });
  };
  const auto rootOf = [&](std::uint32_t number) {
    for (Part* part = &partOf(number); part->label != part->number; part = &partOf(part->label)) {
      number = part->label = partOf(part->label).label;
    }
    return number;
  };
  for (const auto& [a, b] : joins) {
    const std::uint32_t one = rootOf(a), other = rootOf(b);
    partOf(std::max(one, other)).label = std::min(one, other);
  }
  for (Part& part : parts_) part.label = rootOf(part.number);
  std::erase_if(parts_, [](const Part& part) { return part.label == part.number; });
  parts_.shrink_to_fit();
}

/// Numbers minima in raster order, those that strips cut where they begin.
void SeamlessWatershed::NumberMinima() {
  std::size_t part = 0;
  for (Strip& strip : strips_) {
    strip.firstPart = part;
    strip.firstLabel = strip.firstNumber - static_cast<std::uint32_t>(part);
    while (part < parts_.size() && parts_[part].number < strip.firstNumber + strip.minimumCount) {
      ++part;
    }
  }
  count_ = strips_.back().firstNumber + strips_.back().minimumCount -
           static_cast<std::uint32_t>(parts_.size());
  // A whole is no part, so that the number of parts in front of it is known.
  const auto isBefore = [](const Part& at, std::uint32_t number) { return at.number < number; };
  for (Part& at : parts_) {
    const auto before = std::lower_bound(parts_.begin(), parts_.end(), at.label, isBefore);
    at.label = at.label + 1 - static_cast<std::uint32_t>(before - parts_.begin());
  }
}

/// Gives the label of a minimum of a strip, counted there from 0.
std::uint32_t SeamlessWatershed::LabelOf(unsigned strip, std::uint32_t minimum) const {
  const Strip& own = strips_[strip];
  const std::uint32_t number = own.firstNumber + minimum;
  const auto part = std::lower_bound(
      parts_.begin() + static_cast<std::ptrdiff_t>(own.firstPart), parts_.end(), number,
      [](const Part& at, std::uint32_t wanted) { return at.number < wanted; });
  if (part != parts_.end() && part->number == number) return part->label;
  return number + 1 - static_cast<std::uint32_t>(part - parts_.begin());
}

SeamlessWatershed::Labels SeamlessWatershed::LabelsOf(unsigned strip) const {
  const std::uint32_t first = strips_[strip].firstLabel;
  const std::uint32_t end = strip + 1 < strips_.size() ? strips_[strip + 1].firstLabel : count_;
  return {first, end - first};
}

/// Ranks the minima by their levels.
void SeamlessWatershed::RankMinima() {
  constexpr std::int64_t kLeast = std::numeric_limits<std::int32_t>::min();
  std::vector<std::uint64_t> keys;
  keys.reserve(count_);
  auto part = parts_.cbegin();
  std::uint32_t number = 0;
  for (Strip& strip : strips_) {
    for (const Minimum& minimum : strip.minima) {
      if (part != parts_.cend() && part->number == number++) {
        ++part;
        continue;
      }
      const auto level = static_cast<std::uint64_t>(std::int64_t{minimum.level} - kLeast);
      keys.push_back(level << 32U | (keys.size() + 1));
    }
    strip.minima = {};
  }
  std::sort(keys.begin(), keys.end());
  ranks_.assign(std::size_t{count_} + 1, 0);
  for (std::uint32_t i = 0; i < count_; ++i) ranks_[keys[i] & 0xFFFFFFFFU] = i + 1;
}

/// Gives the pixels of the lines of a strip that drain to one of its minima the label of that.
/// @param isOpen  [out] true where others drain out of the strip.
bool SeamlessWatershed::NameSeam(unsigned strip, bool& isOpen) {
  isOpen = false;
  std::vector<std::int32_t> line;
  for (const SeamLines::Kind kind : {SeamLines::kFirstLabels, SeamLines::kLastLabels}) {
    if (!lines_.Read(strip, kind, line)) return false;
    std::int32_t last = 0, found = 0;
    for (std::int32_t& label : line) {
      if (label < 0) isOpen = true;
      if (label <= 0) continue;
      if (std::exchange(last, label) != label) {
        found = static_cast<std::int32_t>(LabelOf(strip, static_cast<std::uint32_t>(label) - 1));
      }
      label = found;
    }
    if (!lines_.Write(strip, kind, line)) return false;
  }
  return true;
}

/// Gives all pixels where strips meet the labels of the minima that they drain to.
bool SeamlessWatershed::FollowSeams(const AbortFlag* abort) {
  std::vector<std::uint8_t> open(strips_.size());
  const bool well = ForEachStrip(AllStrips(), abort, [&](unsigned strip) {
    bool isOpen = false;
    if (!NameSeam(strip, isOpen)) return false;
    open[strip] = isOpen ? 1 : 0;
    return true;
  });
  if (!well) return false;
  return (abort != nullptr && abort->IsSet()) ||
         SeamWays(lines_, cut_.width, std::move(open)).Follow(abort);
}

bool SeamlessWatershed::Connect(const AbortFlag* abort) {
  const auto isAborted = [abort] { return abort != nullptr && abort->IsSet(); };
  if (!Settle(abort)) return false;
  if (isAborted()) return true;
  std::vector<Join> joins;
  if (!FindAllWays(abort, joins)) return false;
  if (isAborted()) return true;
  FindParts(joins);
  NumberMinima();
  if (cut_.isRanked) RankMinima();
  return FollowSeams(abort);
}

bool SeamlessWatershed::MarkSeamBasins(std::vector<bool>& marks) const {
  marks.assign(std::size_t{count_} + 1, false);
  std::vector<std::int32_t> line;
  for (unsigned strip = 1; strip < strips_.size(); ++strip) {
    if (!lines_.Read(strip, SeamLines::kFirstLabels, line)) return false;
    for (const std::int32_t label : line) marks[static_cast<std::size_t>(label)] = true;
  }
  return true;
}

bool SeamlessWatershed::ReadLabelsAbove(unsigned strip, std::vector<std::int32_t>& line) const {
  line.clear();
  return strip == 0 || lines_.Read(strip - 1, SeamLines::kLastLabels, line);
}

bool SeamlessWatershed::ReadLabelsBelow(unsigned strip, std::vector<std::int32_t>& line) const {
  line.clear();
  return !HasBelow(strip) || lines_.Read(strip + 1, SeamLines::kFirstLabels, line);
}

bool SeamlessWatershed::Label(unsigned strip, std::int32_t* labels) const {
  const auto drains = drains_.Borrow();
  std::vector<std::int32_t> above, below;
  if (!ReadLabelsAbove(strip, above) || !ReadLabelsBelow(strip, below)) return false;
  if (!ReadCells(strip, *drains)) return false;
  const Strip& own = strips_[strip];
  std::uint32_t number = own.firstNumber, label = own.firstLabel;
  auto part = parts_.cbegin() + static_cast<std::ptrdiff_t>(own.firstPart);
  drains->Label(
      labels,
      [&](std::uint32_t) {
        const bool isPart = part != parts_.cend() && part->number == number++;
        return static_cast<std::int32_t>(isPart ? (part++)->label : ++label);
      },
      [&](std::uint32_t x) { return above[x]; }, [&](std::uint32_t x) { return below[x]; });
  return true;
}

}  // namespace lumo
