#pragma once

#include <cstdint>
#include <memory>
#include <vector>

#include "foundation/string.h"
#include "platform/random_access_file.h"

namespace lumo {

/// Reads columns of a file of regions: one attribute of one band of all of them, by label.
///
///     const AttributeColumns columns(URI("fields.shape.fxa"));
///     std::vector<float> areas;
///     if (!columns.IsValid() || !columns.Read(0, 0, areas)) return false;  // TakeFault() says why
///
/// Cost: reads the whole file for a column, and holds a megabyte of it.
/// Threads: any number at once.
/// Failure: false, with the fault set, for a file that isn't one of whole records of regions.
class VEXG_EXPORT AttributeColumns {
 public:
  explicit AttributeColumns(const URI& uri);

  bool IsValid() const { return file_ != nullptr; }
  unsigned Bands() const { return bands_; }
  unsigned Attributes() const { return attributes_; }
  /// One above the largest label.
  std::uint64_t Records() const { return records_; }

  /// Reads a column. @param values  [out] one for each record.
  bool Read(unsigned band, unsigned attribute, std::vector<float>& values) const;

 private:
  std::unique_ptr<platform::RandomAccessFile> file_;
  unsigned bands_ = 0;
  unsigned attributes_ = 0;
  std::uint64_t records_ = 0;
};

}  // namespace lumo
