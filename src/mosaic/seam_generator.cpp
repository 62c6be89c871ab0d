#include "mosaic/seam_generator.h"

#include <iterator>

#include "geometry/polygon_clip.h"
#include "mosaic/seam_geometry.h"
#include "mosaic/seam_split.h"

namespace lumo {
namespace {

using Outline = Polygon2D<double>;

// Ground of less area, in square pixels, is given to nobody.
constexpr double kLeastRest = 3.0;

/// Drops what is no ground but the noise of clipping.
void Tidy(Outline& outline) {
  RemoveSpikes(outline, kSpikeAngle);
  if (outline.IsValid()) RemoveSmallRings(outline, kLeastRest);
}

/// True for the result of a clipping that could not be done, which an empty one isn't.
bool HasFailed(const Outline& clipped) {
  return clipped.HasError() && clipped.GetErrorState().code != PolygonErrorBadPolygon::Code;
}

std::vector<OutlineBox> BoxesOf(const std::vector<Outline>& outlines) {
  return {outlines.begin(), outlines.end()};
}

/// Moves the rings that may meet a box out of `rings`.
Contour2DArray<double> TakeRingsNear(Contour2DArray<double>& rings, const OutlineBox& box) {
  Contour2DArray<double> near, far;
  for (Contour2D<double>& ring : rings) {
    const bool isNear = OutlineBox(Outline({ring})).Meets(box);
    (isNear ? near : far).push_back(std::move(ring));
  }
  rings = std::move(far);
  return near;
}

}  // namespace

SeamGenerator::SeamGenerator(std::vector<Polygon2D<double>> footprints, Form sides)
    : footprints_(std::move(footprints)), sides_(sides), parts_(footprints_) {}

bool SeamGenerator::CutPairs(const IPC& ipc) {
  const auto count = static_cast<unsigned>(footprints_.size());
  const double pairs = 0.5 * count * (count - 1.0);
  const std::vector<OutlineBox> boxes = BoxesOf(footprints_);
  double done = 0;
  for (unsigned i = 0; i < count; ++i) {
    for (unsigned j = i + 1; j < count; ++j) {
      ++done;
      if (!boxes[i].Meets(boxes[j])) continue;
      if (ipc.abort->IsSet()) return false;
      CutPair(i, j);
      ipc.progress->Update(done / pairs);
    }
    if (ipc.abort->IsSet()) return false;
  }
  return true;
}

void SeamGenerator::CutPair(unsigned first, unsigned second) {
  const Outline &a = footprints_[first], &b = footprints_[second];
  const Outline common = Clip(ClipOperation::kIntersection, a, b);
  const auto leave = [&](PairLeftAlone why) { leftAlone_.push_back({first, second, why}); };
  if (HasFailed(common)) leave(PairLeftAlone::kImpossible);
  if (IsEmptyOutline(common)) return;
  if (IsEmptyOutline(Clip(ClipOperation::kDifference, a, b)) ||
      IsEmptyOutline(Clip(ClipOperation::kDifference, b, a))) {
    leave(PairLeftAlone::kNested);
    return;
  }
  if (CountOuterRings(a) > 1 || CountOuterRings(b) > 1) {
    leave(PairLeftAlone::kSeveralParts);
    return;
  }
  Outline ofA, ofB;
  const SplitOutcome outcome = SplitOverlap(a, b, common, sides_, ofA, ofB);
  if (outcome != SplitOutcome::kDivided) {
    leave(outcome == SplitOutcome::kTooThin      ? PairLeftAlone::kTooThin
          : outcome == SplitOutcome::kComesApart ? PairLeftAlone::kComesApart
                                                 : PairLeftAlone::kImpossible);
    return;
  }
  ofA = Clip(ClipOperation::kIntersection, parts_[first], ofA);
  ofB = Clip(ClipOperation::kIntersection, parts_[second], ofB);
  if (HasFailed(ofA) || HasFailed(ofB)) {
    leave(PairLeftAlone::kImpossible);
    return;
  }
  parts_[first] = std::move(ofA);
  parts_[second] = std::move(ofB);
}

bool SeamGenerator::AssignRest(const IPC& ipc) {
  if (footprints_.size() < 2) return true;
  Outline rest = Clip(ClipOperation::kDifference, UnionOf(footprints_), UnionOf(parts_));
  Tidy(rest);
  Contour2DArray<double> rings = rest.Rings();
  for (std::size_t i = 0; i < parts_.size() && !rings.empty(); ++i) {
    if (ipc.abort->IsSet()) return false;
    Outline near(TakeRingsNear(rings, OutlineBox(footprints_[i])));
    const Outline taken = Clip(ClipOperation::kIntersection, footprints_[i], near);
    if (!IsEmptyOutline(taken)) {
      Outline more = Clip(ClipOperation::kUnion, parts_[i], taken);
      Outline left = Clip(ClipOperation::kDifference, near, taken);
      if (!HasFailed(more) && !HasFailed(left)) {
        RemoveSmallRings(more, kLeastRest);
        Tidy(left);
        parts_[i] = std::move(more);
        near = std::move(left);
      }
      ipc.progress->Update(static_cast<double>(i + 1) / static_cast<double>(parts_.size()));
    }
    rings.insert(rings.end(), near.Rings().begin(), near.Rings().end());
  }
  return true;
}

}  // namespace lumo
