#pragma once

#include <vector>

#include "commands/value_text.h"
#include "foundation/run_controls.h"
#include "geometry/polygon2d.h"

namespace lumo {

/// Says why both scenes of a pair keep all of the ground that they have in common.
enum class PairLeftAlone {
  kNested,        ///< one lies within the other
  kSeveralParts,  ///< one has several parts
  kTooThin,       ///< what they have in common is thinner than 10 pixels
  kComesApart,    ///< both would come apart, and what they have in common has several rings
  kImpossible,    ///< there is no seam, see SplitOverlap
};

/// A pair of scenes, by their numbers, that was left alone.
struct LonePair {
  unsigned first = 0;
  unsigned second = 0;
  PairLeftAlone why = PairLeftAlone::kNested;
};

/// Cuts the footprints of scenes, in pixels of one grid, so that the parts tile what they cover.
///
///     SeamGenerator seams(footprints);
///     if (!seams.CutPairs(ipc) || !seams.AssignRest(ipc)) return false;  // aborted
///     Write(seams.Parts());
///
/// Cost: pairs are looked at by their boxes first, so that it grows with the overlaps, not with the
///       pairs. Threads: one at a time.
class VEXG_EXPORT SeamGenerator {
 public:
  /// @param footprints  with closed rings.
  /// @param sides       see SplitOverlap.
  explicit SeamGenerator(std::vector<Polygon2D<double>> footprints, Form sides = Form::kTold);

  /// Divides the overlaps, pair by pair. @return false when it was aborted.
  bool CutPairs(const IPC& ipc);
  /// Gives ground that is nobody's after that to the first scene that covers it. @return false when
  /// it was aborted.
  bool AssignRest(const IPC& ipc);

  /// The ground that each scene shows. That of a scene that shows nothing isn't valid.
  const std::vector<Polygon2D<double>>& Parts() const { return parts_; }
  /// The pairs whose overlap stays with both.
  const std::vector<LonePair>& LeftAlone() const { return leftAlone_; }

 private:
  void CutPair(unsigned first, unsigned second);

  const std::vector<Polygon2D<double>> footprints_;
  const Form sides_;
  std::vector<Polygon2D<double>> parts_;
  std::vector<LonePair> leftAlone_;
};

}  // namespace lumo
