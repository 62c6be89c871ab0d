#pragma once

#include <string_view>

#include "metadata/mdf_format.h"
#include "metadata/metadata_object.h"

namespace lumo {

/// The outcome for a text that an entry wants as a value.
enum class Conversion {
  kDone,       ///< the value stands in the target
  kStaysText,  ///< the text holds no value of the type; nothing was stored
  kFailed,     ///< the value has no place in the target
};

/// Makes the value of the entry's type and shape from `text`, and stores it at the entry's `dest`.
Conversion ConvertText(std::u16string_view text, const MdfEntry& entry, const MdfFormat& format,
                       MetadataContainer& target);

}  // namespace lumo
