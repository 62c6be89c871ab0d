#pragma once

#include <optional>
#include <string>

#include "jobs/raster_job.h"

namespace lumo::host {

/// How a raster is divided into segments.
struct SegmentRequest {
  std::string algorithm = "sobel";          ///< what is flooded: sobel or intensity
  std::string mergeAlgorithm = "schedule";  ///< or rigorous
  std::optional<double> segmentValue, segmentPercent, mergeValue, mergePercent;
  std::optional<unsigned> tileMemory;  ///< bytes
  std::optional<unsigned> tileBorder;  ///< pixels, with tiles; 10 when not given
  std::uint64_t memory = 0;            ///< bytes for merging, without tiles; 0 for those by default
  std::optional<unsigned> minSize, maxSize;  ///< pixels, without tiles
  std::optional<double> compactness;         ///< a power of border lengths, without tiles
  std::string order = "global";              ///< of merging by schedule, without tiles; or local
  std::optional<unsigned> rounds;            ///< of the local order
  std::string tree;                          ///< file of all merges; empty for none
  bool isTiled = false;                      ///< tile by tile, and not as a whole
  bool isBorders = false;                    ///< an image of the borders is made instead
  bool isEstimate = false;                   ///< costs are counted, and nothing made

  /// Throws HostError for percentages out of bounds, for a value beside a percentage, and for what
  /// goes with tiles alone or without them.
  void Check() const;
  /// True when any option beside those of a threshold is given.
  bool IsSegmenting() const;
};

constexpr const char* kFitStep = "fit";

/// The rasters that are segmented, as variables.
struct SegmentSources {
  String shown;  ///< whose gradients are flooded
  String merge;  ///< whose bands drive merging
};

/// Adds the command that finds limits, and what percentages stand for, into variables.
void AddFit(JobDraft& draft, const SegmentRequest& request, const SegmentSources& sources);

/// Adds the command that segments, or estimates, with what AddFit found. The labels go into
/// "$target".
void AddSegment(JobDraft& draft, const char* step, const SegmentRequest& request,
                const SegmentSources& sources);

/// Adds to the command that makes the raster of labels what they are.
void AddLabels(JobWriterCommand& create, const SegmentRequest& request);

}  // namespace lumo::host
