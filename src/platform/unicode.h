#pragma once

#include <string>
#include <string_view>

#include "platform/export.h"

namespace lumo::platform {

/// UTF-8 bytes as UTF-16 units. Each byte that can't be part of a well-formed sequence (a stray
/// continuation, an overlong form, a surrogate, a value over U+10FFFF, a sequence that breaks
/// off) becomes one U+FFFD, and nothing behind the end of `bytes` is looked at.
VEXG_EXPORT std::u16string Utf8ToUtf16(std::string_view bytes);

/// UTF-16 units as UTF-8 bytes. A surrogate without its partner becomes U+FFFD.
VEXG_EXPORT std::string Utf16ToUtf8(std::u16string_view units);

}  // namespace lumo::platform
