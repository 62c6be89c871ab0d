#pragma once

#include <string>

#include "platform/export.h"

namespace lumo {

/// True when the plug-in that LoadPlugin would load under the name is one that comes with the
/// library: its file holds the mark of VEXG_OWN_PLUGIN. It isn't loaded to find out.
///
/// Threads: any number.
VEXG_EXPORT bool IsOwnPlugin(const std::string& name);

}  // namespace lumo

/// Marks a plug-in as one that comes with the library, in one of its sources: an ELF note, which
/// lies among the first bytes of the file. The library knows what such a plug-in would answer, and
/// asks it only where it has to; never put it into another one.
#define VEXG_OWN_PLUGIN                                                                       \
  extern "C" __attribute__((section(".note.vexg"), used, aligned(4))) const struct VexgNote { \
    unsigned nameBytes, textBytes, type;                                                      \
    char name[8];                                                                             \
    char text[16];                                                                            \
  } kVexgNote = {8, 16, 1, "vexg-pi", "comes with vexg"}
