#pragma once

#include <cstdint>
#include <memory>
#include <string>
#include <thread>

#include "rasters/attribute_steps.h"
#include "viewer/viewed_raster.h"
#include "viewer/work_folder.h"

namespace lumo::host {

/// The values and shapes of all regions of a label raster, for the one that a user clicks. They are
/// computed once, on a thread of its own that the first question starts.
///
/// Threads: any. Failure: Find gives the reason as "fault".
class SegmentAttributes {
 public:
  SegmentAttributes(std::shared_ptr<const ViewedRaster> scene,
                    std::shared_ptr<const ViewedRaster> labels, WorkFolder& folder);
  /// Aborts the computation and waits for it.
  ~SegmentAttributes();
  SegmentAttributes(const SegmentAttributes&) = delete;
  SegmentAttributes& operator=(const SegmentAttributes&) = delete;

  /// The attributes of a region as {"label", "attributes": [{"name", "value"}]}; {"progress"} while
  /// they are computed.
  Json Find(std::uint32_t label);

 private:
  enum class State { kIdle, kRuns, kDone, kFailed };
  void Compute();

  const std::shared_ptr<const ViewedRaster> scene_, labels_;
  const std::string name_;  // of the files, without endings
  std::mutex mutex_;        // of what follows, and of reading the files
  State state_ = State::kIdle;
  std::string fault_;
  std::thread thread_;
  std::uint8_t abort_ = 0;
  double progress_ = 0;
};

}  // namespace lumo::host
