#pragma once

#include <cstddef>

/// The contract of libvexgdrawing.so, which draws text with Cairo. The host loads it when it draws
/// some: Cairo and what stands behind it would cost each start of the program time.
extern "C" {

/// Measures a line of text, or draws it.
/// @param text    UTF-8, of one line.
/// @param size    of the letters, in pixels.
/// @param width   [in,out] pixels; `height` likewise. What the text takes, where `cover` is null.
/// @param cover   null, or width x height bytes, each the share of a pixel that the text covers, of
///                255; the upper line first.
/// @return false when it can't be drawn.
using VexgDrawTextFunction = bool(const char* text, double size, unsigned* width, unsigned* height,
                                  unsigned char* cover);
VexgDrawTextFunction VexgDrawText;
}
