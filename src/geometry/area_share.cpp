#include "geometry/area_share.h"

#include <algorithm>
#include <cmath>
#include <numeric>
#include <optional>

#include "foundation/fault.h"
#include "geometry/label_vectorizer.h"
#include "raster/raster.h"

namespace lumo {
namespace {

/// Where an area begins.
enum class Beginning : unsigned char { kBefore, kInShare, kBehind };

/// Follows which areas of a share are open in the line that was added last.
template <typename T>
class OpenAreas {
 public:
  /// Adds the next line.
  /// @param line  where the areas begin that it shows first.
  void AddLine(const T* labels, const unsigned char* states, std::size_t width, Beginning line) {
    before_.swap(runs_);
    areasBefore_ = beginnings_.size();
    FindRuns(labels, states, width);
    // Areas of the line before, then one for each run, are joined where they touch.
    above_.resize(areasBefore_ + runs_.size());
    std::iota(above_.begin(), above_.end(), 0U);
    beginnings_.resize(above_.size(), line);
    JoinTouching();
    Renumber();
  }

  /// True when an area of the share has a pixel in the line.
  bool HasOwn() const {
    return std::find(beginnings_.begin(), beginnings_.end(), Beginning::kInShare) !=
           beginnings_.end();
  }

 private:
  /// Pixels of one label side by side.
  struct Run {
    std::size_t first, end;
    T label;
    std::uint32_t area;
  };

  void FindRuns(const T* labels, const unsigned char* states, std::size_t width) {
    runs_.clear();
    for (std::size_t x = 0; x < width; ++x) {
      const T label = labels[x];
      if (!IsValidState(states[x]) || label == LabelVectorizer<T>::kExcluded) continue;
      if constexpr (std::is_floating_point_v<T>) {
        if (std::isnan(label)) continue;
      }
      if (!runs_.empty() && runs_.back().end == x && runs_.back().label == label) {
        ++runs_.back().end;
      } else {
        runs_.push_back({x, x + 1, label, 0});
      }
    }
  }

  std::uint32_t RootOf(std::uint32_t area) {
    while (above_[area] != area) area = above_[area] = above_[above_[area]];
    return area;
  }

  /// An area begins where the first of its parts does.
  void JoinTouching() {
    std::size_t old = 0;
    for (std::size_t i = 0; i < runs_.size(); ++i) {
      const Run& run = runs_[i];
      while (old < before_.size() && before_[old].end <= run.first) ++old;
      for (std::size_t j = old; j < before_.size() && before_[j].first < run.end; ++j) {
        if (before_[j].label != run.label) continue;
        const std::uint32_t one = RootOf(before_[j].area);
        const std::uint32_t other = RootOf(static_cast<std::uint32_t>(areasBefore_ + i));
        beginnings_[one] = std::min(beginnings_[one], beginnings_[other]);
        above_[other] = one;
      }
    }
  }

  /// Keeps the areas that the line has.
  void Renumber() {
    constexpr std::uint32_t kNone = 0xFFFFFFFF;
    numbers_.assign(above_.size(), kNone);
    kept_.clear();
    for (std::size_t i = 0; i < runs_.size(); ++i) {
      const std::uint32_t root = RootOf(static_cast<std::uint32_t>(areasBefore_ + i));
      if (numbers_[root] == kNone) {
        numbers_[root] = static_cast<std::uint32_t>(kept_.size());
        kept_.push_back(beginnings_[root]);
      }
      runs_[i].area = numbers_[root];
    }
    beginnings_.swap(kept_);
  }

  std::vector<Run> before_, runs_;
  std::size_t areasBefore_ = 0;
  std::vector<Beginning> beginnings_, kept_;    // by area
  std::vector<std::uint32_t> above_, numbers_;  // of the union-find
};

/// Puts the polygons of the areas that begin in some lines.
class OwnPolygonSink final : public LabelPolygonSink {
 public:
  /// @param offset   line of the raster that was the first to be vectorized.
  /// @param isFirst  the areas of that line are of the share.
  OwnPolygonSink(std::uint32_t offset, bool isFirst, std::uint32_t end, ShareWriter& out)
      : offset_(offset), isFirst_(isFirst), end_(end), out_(out) {}

  bool Take(double label, TracedPolygon& polygon) override {
    std::uint32_t top = 0xFFFFFFFF;
    for (std::size_t i = 1; i < polygon.coordinates.size(); i += 2) {
      top = std::min(top, polygon.coordinates[i]);
    }
    if ((top == 0 && !isFirst_) || top + offset_ >= end_) return true;
    for (std::size_t i = 1; i < polygon.coordinates.size(); i += 2) {
      polygon.coordinates[i] += offset_;
    }
    out_.Put(label);
    const std::uint64_t rings = polygon.holes.size(), numbers = polygon.coordinates.size();
    out_.Put(rings);
    out_.Put(numbers);
    out_.PutAll(polygon.holes.data(), polygon.holes.size());
    out_.PutAll(polygon.starts.data(), polygon.starts.size());
    out_.PutAll(polygon.coordinates.data(), polygon.coordinates.size());
    return true;
  }

 private:
  const std::uint32_t offset_;
  const bool isFirst_;
  const std::uint32_t end_;
  ShareWriter& out_;
};

}  // namespace

template <typename T>
bool PutAreas(const RasterPtr<T>& raster, unsigned band, const LabelMaskPtr& mask,
              const Share& share, ShareWriter& out, const IPC& ipc) {
  constexpr unsigned kBlockBytes = 1 << 20;
  const unsigned samples = raster->Samples(), lines = raster->Lines();
  const auto begin = static_cast<unsigned>(share.Begin(lines));
  const auto end = static_cast<unsigned>(share.End(lines));
  if (begin == end) return true;
  // The line before shows which areas have begun there.
  const unsigned first = begin == 0 ? 0 : begin - 1;
  OwnPolygonSink sink(first, begin == 0, end, out);
  LabelVectorizer<T> vectorizer(samples, sink);
  OpenAreas<T> open;
  Array<unsigned> bands{ArrayDims(1)};
  bands[0] = band;
  Array<T> labels;
  Array<unsigned char> states;
  const unsigned most = std::max<unsigned>(1, kBlockBytes / (samples * sizeof(T)));
  for (unsigned top = first; top < lines;) {
    const unsigned bottom = std::min(lines, top + most) - 1;
    if (!raster->GetSubRect({0, top, samples - 1, bottom}, bands, Interleave::BSQ, labels,
                            states) ||
        (mask && !mask->Apply(top, bottom - top + 1, states.GetData()))) {
      SetFault(TakeFaultOr("the raster can't be read"));
      return false;
    }
    for (unsigned line = top; line <= bottom; ++line) {
      const std::size_t at = std::size_t{line - top} * samples;
      vectorizer.AddLine(labels.GetData() + at, states.GetData() + at);
      open.AddLine(labels.GetData() + at, states.GetData() + at, samples,
                   line < begin ? Beginning::kBefore
                   : line < end ? Beginning::kInShare
                                : Beginning::kBehind);
      if (line >= end && !open.HasOwn()) return true;
    }
    top = bottom + 1;
    ipc.progress->Update(std::min(1.0, (top - first) / double(end - first)));
    if (ipc.abort->IsSet()) {
      SetFault("the vectorizing was aborted");
      return false;
    }
  }
  vectorizer.Finish();
  return true;
}

JoinedAreas::JoinedAreas(std::vector<std::string> files, std::string key, unsigned lines)
    : files_(std::move(files)), key_(std::move(key)), lines_(lines) {}

bool JoinedAreas::Fail(std::size_t number) {
  SetShareFault(files_[number]);
  hasFailed_ = true;
  return false;
}

/// The vectorizer completes a polygon at the first corner, from the left, at which an edge of its
/// lowest line ends.
JoinedAreas::Ending JoinedAreas::EndingOf(const TracedPolygon& polygon) {
  constexpr std::uint32_t kNone = 0xFFFFFFFF;
  // The outer ring comes first, and repeats its first vertex.
  const std::size_t end =
      polygon.starts.size() > 1 ? std::size_t{polygon.starts[1]} * 2 : polygon.coordinates.size();
  Ending ending;
  std::uint32_t left = kNone;
  for (std::size_t i = 0; i + 3 < end; i += 2) {
    const std::uint32_t x = polygon.coordinates[i], y = polygon.coordinates[i + 1];
    if (y < ending.y) continue;
    if (y > ending.y) {
      ending = {y, kNone};
      left = kNone;
    }
    if (x < left) {
      ending.x = left;
      left = x;
    } else {
      ending.x = std::min(ending.x, x);
    }
  }
  return ending;
}

/// Reads the next polygon of a share.
bool JoinedAreas::Read(Source& source, bool& isThere) {
  isThere = !source.reader->IsAtEnd();
  if (!isThere) return true;
  std::uint64_t rings = 0, numbers = 0;
  ShareReader& in = *source.reader;
  if (!in.Get(source.label) || !in.Get(rings) || !in.Get(numbers) || numbers < 2 || rings == 0 ||
      rings > in.Left() || numbers > in.Left() / sizeof(std::uint32_t)) {
    return Fail(source.number);
  }
  TracedPolygon& polygon = source.polygon;
  polygon.holes.resize(rings);
  polygon.starts.resize(rings);
  polygon.coordinates.resize(numbers);
  if (!in.GetAll(polygon.holes.data(), rings) || !in.GetAll(polygon.starts.data(), rings) ||
      !in.GetAll(polygon.coordinates.data(), numbers) ||
      (rings > 1 && polygon.starts[1] > numbers / 2)) {
    return Fail(source.number);
  }
  source.ending = EndingOf(polygon);
  return true;
}

/// Opens files until the polygon that comes next is known: those of a share end below its first
/// line.
bool JoinedAreas::Open() {
  while (opened_ < files_.size()) {
    const Share share{static_cast<unsigned>(opened_), static_cast<unsigned>(files_.size())};
    const auto first = static_cast<std::uint32_t>(share.Begin(lines_));
    const bool isKnown = std::any_of(sources_.begin(), sources_.end(), [&](const Source& source) {
      return source.ending.y <= first;
    });
    if (isKnown) return true;
    Source source;
    source.number = opened_++;
    source.reader = std::make_unique<ShareReader>();
    if (!source.reader->Open(files_[source.number], key_, share)) {
      hasFailed_ = true;
      return false;
    }
    bool isThere = false;
    if (!Read(source, isThere)) return false;
    if (isThere) sources_.push_back(std::move(source));
  }
  return true;
}

bool JoinedAreas::Next(double& label, TracedPolygon& polygon) {
  if (hasFailed_ || !Open() || sources_.empty()) return false;
  const auto next =
      std::min_element(sources_.begin(), sources_.end(),
                       [](const Source& a, const Source& b) { return a.ending < b.ending; });
  label = next->label;
  std::swap(polygon, next->polygon);
  bool isThere = false;
  if (!Read(*next, isThere)) return false;
  if (!isThere) sources_.erase(next);
  return true;
}

#define VEXG_AREAS_ONE(T)                                                                   \
  template VEXG_EXPORT bool PutAreas<T>(const RasterPtr<T>&, unsigned, const LabelMaskPtr&, \
                                        const Share&, ShareWriter&, const IPC&);
VEXG_FOR(EIGHT, VEXG_AREAS_ONE);
#undef VEXG_AREAS_ONE

}  // namespace lumo
