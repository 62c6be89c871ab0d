#include "fx/seamless_watershed.h"

#include <algorithm>
#include <limits>
#include <numeric>

#include "foundation/fault.h"
#include "fx/work_file.h"
#include "tasks/parallel.h"

namespace lumo {
namespace {

using Cell = StripDrains::Cell;

/// Gives the memory of some containers back.
template <typename... Containers>
void Release(Containers&... containers) {
  ((containers = {}), ...);
}

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
  const bool hasAbove = strip > 0, hasBelow = strip + 1 < strips_.size();
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
  Strip& made = strips_[strip];
  made.same.assign(cells.begin(), cells.begin() + width);
  if (!WriteCells(strip, cells)) return false;
  drains->Begin(std::move(cells), width);
  made.first.resize(width);
  made.last.resize(width);
  drains->DrainPlateaus({}, made.first.data(), made.last.data());
  if (!cut_.isRanked) return true;
  const std::int32_t* const levels = from.levels + (hasAbove ? width : 0);
  drains->ForEachMinimum([&](std::uint32_t first) {
    made.minima.push_back({first, levels[first]});
  });
  made.minima.shrink_to_fit();
  return true;
}

StripDrains::Beyond SeamlessWatershed::BeyondOf(unsigned strip) const {
  StripDrains::Beyond beyond;
  if (strip > 0) beyond.above = strips_[strip - 1].last.data();
  if (strip + 1 < strips_.size()) beyond.below = strips_[strip + 1].first.data();
  return beyond;
}

/// True when a line beside a strip brings lower ground nearer to it.
bool SeamlessWatershed::ComesNearer(unsigned strip) const {
  const auto isNearer = [this](const std::vector<Cell>& same,
                               const std::vector<std::uint32_t>& from,
                               const std::vector<std::uint32_t>& to) {
    for (std::uint32_t x = 0; x < cut_.width; ++x) {
      if (from[x] >= to[x] || to[x] - from[x] < 2) continue;
      if ((same[x] & StripDrains::SameBit(StripDrains::kUp)) != 0) return true;
    }
    return false;
  };
  const Strip& own = strips_[strip];
  if (strip > 0 && isNearer(own.same, strips_[strip - 1].last, own.first)) return true;
  return strip + 1 < strips_.size() &&
         isNearer(strips_[strip + 1].same, strips_[strip + 1].first, own.last);
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

/// Finds the drains on the plateaus of a strip anew, with the distances beside it as they are.
bool SeamlessWatershed::Drain(unsigned strip, StripDrains& drains) {
  if (!ReadCells(strip, drains)) return false;
  Strip& own = strips_[strip];
  drains.DrainPlateaus(BeyondOf(strip), own.first.data(), own.last.data());
  return true;
}

/// Has strips begin again as long as lower ground comes nearer. Every second one at once, as each
/// looks at those beside it.
bool SeamlessWatershed::Settle(const AbortFlag* abort) {
  for (unsigned quiet = 0, parity = 0; quiet < 2; parity = 1 - parity) {
    if (abort != nullptr && abort->IsSet()) return true;
    std::vector<unsigned> again;
    for (unsigned strip = parity; strip < strips_.size(); strip += 2) {
      if (ComesNearer(strip)) again.push_back(strip);
    }
    quiet = again.empty() ? quiet + 1 : 0;
    const bool well = ForEachStrip(
        again, abort, [this](unsigned strip) { return Drain(strip, *drains_.Borrow()); });
    if (!well) return false;
  }
  return true;
}

/// Finds the final drains of a strip, its minima, and where the pixels of its first and its last
/// line drain to: a minimum, by its number in the strip and 1, or a column x of the line above as
/// -1 - x, or of the line below as -1 - width - x.
bool SeamlessWatershed::FindWays(unsigned strip) {
  const auto drains = drains_.Borrow();
  if (!ReadCells(strip, *drains)) return false;
  Strip& own = strips_[strip];
  std::vector<std::uint32_t> first(cut_.width), last(cut_.width);  // others read those kept
  drains->DrainPlateaus(BeyondOf(strip), first.data(), last.data());
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
  own.firstLabels.assign(labels.begin(), labels.begin() + width);
  own.lastLabels.assign(labels.end() - width, labels.end());
  return true;
}

/// Finds the ways of all strips, and the minima that go on in the strip below. Some strips at a
/// time: with their numbers the distances can go.
bool SeamlessWatershed::FindAllWays(const AbortFlag* abort, std::vector<Join>& joins) {
  constexpr std::size_t kAtOnce = 16;
  std::uint64_t total = 0;
  for (std::size_t begin = 0; begin < strips_.size(); begin += kAtOnce) {
    if (abort != nullptr && abort->IsSet()) return true;
    std::vector<unsigned> now(std::min(kAtOnce, strips_.size() - begin));
    std::iota(now.begin(), now.end(), static_cast<unsigned>(begin));
    if (!ForEachStrip(now, abort, [this](unsigned strip) { return FindWays(strip); })) return false;
    if (abort != nullptr && abort->IsSet()) return true;
    for (const unsigned strip : now) {
      strips_[strip].firstNumber = static_cast<std::uint32_t>(total);
      total += strips_[strip].minimumCount;
      if (total > static_cast<std::uint64_t>(std::numeric_limits<std::int32_t>::max())) {
        SetFault("the raster has more minima than labels have numbers");
        return false;
      }
      if (strip == 0) continue;
      ListJoins(strip, joins);
      Release(strips_[strip - 1].first, strips_[strip - 1].last, strips_[strip - 1].same);
    }
  }
  return true;
}

/// Lists the minima that go on from the strip above.
void SeamlessWatershed::ListJoins(unsigned strip, std::vector<Join>& joins) const {
  const Strip& upper = strips_[strip - 1];
  const Strip& lower = strips_[strip];
  for (std::uint32_t x = 0; x < cut_.width; ++x) {
    // On one level, or one of them would have a way down.
    if (upper.last[x] != StripDrains::kFar || lower.first[x] != StripDrains::kFar) continue;
    if (upper.lastLabels[x] <= 0 || lower.firstLabels[x] <= 0) continue;  // excluded
    const Join join{upper.firstNumber + static_cast<std::uint32_t>(upper.lastLabels[x]) - 1,
                    lower.firstNumber + static_cast<std::uint32_t>(lower.firstLabels[x]) - 1};
    if (joins.empty() || joins.back() != join) joins.push_back(join);
  }
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
    Release(strip.minima);
  }
  std::sort(keys.begin(), keys.end());
  ranks_.assign(std::size_t{count_} + 1, 0);
  for (std::uint32_t i = 0; i < count_; ++i) ranks_[keys[i] & 0xFFFFFFFFU] = i + 1;
}

/// The label at the place that a label below 0, of a strip, stands for.
std::int32_t& SeamlessWatershed::SeamLabel(unsigned strip, std::int32_t beyond) {
  const auto at = static_cast<std::uint32_t>(-1 - beyond);
  return at < cut_.width ? strips_[strip - 1].lastLabels[at]
                         : strips_[strip + 1].firstLabels[at - cut_.width];
}

/// Gives all pixels where strips meet the labels of the minima that they drain to.
void SeamlessWatershed::FollowSeams() {
  for (unsigned strip = 0; strip < strips_.size(); ++strip) {
    for (std::vector<std::int32_t>* const line :
         {&strips_[strip].firstLabels, &strips_[strip].lastLabels}) {
      for (std::int32_t& label : *line) {
        if (label <= 0) continue;
        label = static_cast<std::int32_t>(LabelOf(strip, static_cast<std::uint32_t>(label) - 1));
      }
    }
  }
  const auto stripBeyond = [this](unsigned strip, std::int32_t beyond) {
    return static_cast<std::uint32_t>(-1 - beyond) < cut_.width ? strip - 1 : strip + 1;
  };
  for (unsigned strip = 0; strip < strips_.size(); ++strip) {
    for (std::vector<std::int32_t>* const line :
         {&strips_[strip].firstLabels, &strips_[strip].lastLabels}) {
      for (std::int32_t& start : *line) {
        unsigned at = strip;
        std::int32_t label = start;
        while (label < 0) {
          const std::int32_t beyond = label;
          label = SeamLabel(at, beyond);
          at = stripBeyond(at, beyond);
        }
        at = strip;
        for (std::int32_t* way = &start; *way < 0;) {
          const std::int32_t beyond = *way;
          *way = label;
          way = &SeamLabel(at, beyond);
          at = stripBeyond(at, beyond);
        }
      }
    }
  }
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
  FollowSeams();
  return true;
}

std::vector<bool> SeamlessWatershed::MarkSeamBasins() const {
  std::vector<bool> marks(std::size_t{count_} + 1);
  for (std::size_t strip = 1; strip < strips_.size(); ++strip) {
    for (const std::int32_t label : strips_[strip].firstLabels) {
      marks[static_cast<std::size_t>(label)] = true;
    }
  }
  return marks;
}

bool SeamlessWatershed::Label(unsigned strip, std::int32_t* labels) const {
  const auto drains = drains_.Borrow();
  if (!ReadCells(strip, *drains)) return false;
  const Strip& own = strips_[strip];
  std::uint32_t number = own.firstNumber, label = own.firstLabel;
  auto part = parts_.cbegin() + static_cast<std::ptrdiff_t>(own.firstPart);
  const std::int32_t* const above = LabelsAbove(strip);
  const std::int32_t* const below = LabelsBelow(strip);
  drains->Label(
      labels,
      [&](std::uint32_t) {
        const bool isPart = part != parts_.cend() && part->number == number++;
        return static_cast<std::int32_t>(isPart ? (part++)->label : ++label);
      },
      [above](std::uint32_t x) { return above[x]; }, [below](std::uint32_t x) { return below[x]; });
  return true;
}

}  // namespace lumo
