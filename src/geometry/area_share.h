#pragma once

#include <memory>
#include <string>
#include <vector>

#include "commands/share_file.h"
#include "foundation/run_controls.h"
#include "geometry/boundary_tracer.h"
#include "geometry/label_mask.h"

namespace lumo {

// The polygons of a label raster in shares. An area is of the share in whose lines its first pixel
// lies, so that each polygon comes whole out of one share, as LabelVectorizer gives it.

/// Vectorizes the areas of a share of the lines of a label raster, and puts their polygons, in the
/// order of the vectorizer. Lines are read on to the end of the last of these areas: one that goes
/// through the whole raster makes its share as long as all work. Exists for EightTypes.
///
/// @param mask  of the pixels that count; null where all do.
/// @return false, with the fault set, when the raster can't be read, and at an abort.
template <typename T>
bool PutAreas(const RasterPtr<T>& raster, unsigned band, const LabelMaskPtr& mask,
              const Share& share, ShareWriter& out, const IPC& ipc);

/// Reads the polygons of all shares in the order in which the vectorizer gives those of the whole
/// raster. The shares that follow each other by turns are in memory.
///
///     JoinedAreas areas(files, key, raster->Lines());
///     while (areas.Next(label, polygon)) Use(label, polygon);
///     if (areas.HasFailed()) return false;  // with the fault set
class VEXG_EXPORT JoinedAreas {
 public:
  /// @param lines  of the raster.
  JoinedAreas(std::vector<std::string> files, std::string key, unsigned lines);

  /// Gives the next polygon. False at the end, and after a failure.
  bool Next(double& label, TracedPolygon& polygon);
  bool HasFailed() const { return hasFailed_; }

 private:
  /// The corner at which a polygon is completed, by which polygons are in order.
  struct Ending {
    std::uint32_t y = 0, x = 0;
    friend auto operator<=>(const Ending&, const Ending&) = default;
  };
  /// The file of a share with the polygon that comes next.
  struct Source {
    std::size_t number = 0;
    std::unique_ptr<ShareReader> reader{};
    double label = 0;
    TracedPolygon polygon{};
    Ending ending{};
  };

  static Ending EndingOf(const TracedPolygon& polygon);
  bool Open();
  bool Read(Source& source, bool& isThere);
  bool Fail(std::size_t number);

  const std::vector<std::string> files_;
  const std::string key_;
  const unsigned lines_;
  std::size_t opened_ = 0;  // files
  std::vector<Source> sources_;
  bool hasFailed_ = false;
};

}  // namespace lumo
