#pragma once

#include "commands/declaration.h"
#include "output/json_number.h"

namespace lumo::host {

/// A value of a command in JSON, from its text form: numbers, booleans, lists (of lists, for arrays
/// of several dimensions) and objects as such. NaN and infinities are null. Texts, words, URIs and
/// geo-references are texts; so is a text that holds no value of its kind.
///
/// Rectangles are {"left", "top", "right", "bottom"}, tiles {"width", "height", "bands",
/// "borderLeft", "borderRight", "borderTop", "borderBottom", "borderClamp"}, palettes lists of
/// {"name", "red", "green", "blue", "alpha", "isNull"}.
Json ValueAsJson(const String& text, ValueKind kind);

/// The seconds of a duration as result documents give it, such as "167ms"; null for other texts.
Json SecondsAsJson(const String& text);

}  // namespace lumo::host
