#pragma once

#include <cstdint>
#include <memory>
#include <vector>

#include "georef/georef.h"
#include "regions/region_window.h"

namespace lumo {

/// The box of a record, in pixels.
struct RecordBox {
  std::int32_t record = 0;
  MapRect bounds;
};

/// Finds the records whose boxes a window touches, without looking at the others.
///
/// Cost: 40 bytes a record; a look-up goes with the records that are found. Threads: any number.
class VEXG_EXPORT RecordIndex {
 public:
  /// @param boxes  of all records, in any order; they are copied.
  explicit RecordIndex(const std::vector<RecordBox>& boxes);
  ~RecordIndex();
  RecordIndex(const RecordIndex&) = delete;
  RecordIndex& operator=(const RecordIndex&) = delete;

  /// The records that the pixels of a window may touch, ascending.
  std::vector<std::int32_t> Find(const RegionWindow& window) const;

 private:
  struct Tree;
  std::unique_ptr<Tree> tree_;
};

}  // namespace lumo
