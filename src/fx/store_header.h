#pragma once

#include <initializer_list>
#include <optional>
#include <span>
#include <string_view>

#include "foundation/buffer.h"

namespace lumo::detail {

/// Bands and attributes, as the headers of region files tell them.
struct StoreCounts {
  unsigned bands = 0;
  unsigned attributes = 0;
};

/// Fills a header: the mark, then the counts of 16 bits.
VEXG_EXPORT void WriteStoreHeader(std::span<unsigned char> header, std::string_view mark,
                                  std::initializer_list<unsigned> counts);

/// What the header of a buffer that was just opened tells, where it begins with `mark`; nothing of
/// another, or of one that isn't whole.
VEXG_EXPORT std::optional<StoreCounts> ReadStoreHeader(const BasicBuffer& buffer,
                                                       std::string_view mark);

/// True when all of the counts can stand in a header. Else the fault names the file.
VEXG_EXPORT bool FitsStoreHeader(const String& path, std::initializer_list<unsigned> counts);

}  // namespace lumo::detail
