#include "fx/seamless_watershed.h"

#include <algorithm>
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
  numbers_.Clear();
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
  StripDrains::MarkLines({from.levels, from.excluded, lines, hasAbove, hasBelow}, width,
                         cells.data());
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

/// Finds the final drains of a strip, its minima, and its StripWays.
bool SeamlessWatershed::FindWays(unsigned strip) {
  const auto drains = drains_.Borrow();
  Beside beside;
  if (!ReadBeside(strip, beside) || !ReadCells(strip, *drains)) return false;
  Strip& own = strips_[strip];
  std::vector<std::uint32_t> first(cut_.width), last(cut_.width);  // the same as are kept
  drains->DrainPlateaus(beside.Distances(), first.data(), last.data());
  if (!WriteCells(strip, drains->Cells())) return false;
  const StripWays ways =
      StripWays::Find(*drains, cut_.width, cut_.isRanked ? &own.minima : nullptr);
  own.minimumCount = ways.minima;
  return lines_.Write(strip, SeamLines::kFirstLabels, ways.firstLabels) &&
         lines_.Write(strip, SeamLines::kLastLabels, ways.lastLabels);
}

/// Finds the ways of all strips, and the minima that go on in the strip below.
bool SeamlessWatershed::FindAllWays(const AbortFlag* abort, std::vector<Join>& joins) {
  const bool well =
      ForEachStrip(AllStrips(), abort, [this](unsigned strip) { return FindWays(strip); });
  if (!well) return false;
  if (abort != nullptr && abort->IsSet()) return true;
  for (unsigned strip = 0; strip < strips_.size(); ++strip) {
    if (!numbers_.AddStrip(strips_[strip].minimumCount)) return false;
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
  const std::uint32_t upperFirst = numbers_.FirstNumberOf(strip - 1);
  const std::uint32_t lowerFirst = numbers_.FirstNumberOf(strip);
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

/// Ranks the minima by their levels.
void SeamlessWatershed::RankMinima() {
  MinimumNumbers::Ranking ranking(numbers_);
  for (Strip& strip : strips_) {
    for (const StripMinimum& minimum : strip.minima) ranking.Add(minimum.level);
    strip.minima = {};
  }
  ranks_ = ranking.Finish();
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
        const auto minimum = static_cast<std::uint32_t>(label) - 1;
        found = static_cast<std::int32_t>(numbers_.LabelOf(strip, minimum));
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
  numbers_.Connect(joins);
  if (cut_.isRanked) RankMinima();
  return FollowSeams(abort);
}

bool SeamlessWatershed::MarkSeamBasins(std::vector<bool>& marks) const {
  marks.assign(std::size_t{Count()} + 1, false);
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
  LabelStrip(*drains, {numbers_, strip}, above.data(), below.data(), labels);
  return true;
}

}  // namespace lumo
