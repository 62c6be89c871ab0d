#pragma once

#include <string>
#include <vector>

#include "platform/module.h"

namespace lumo {

/// The folders in which plug-ins are looked for, in this order: the environment's binary directory,
/// the folder for the plug-ins of this version of the library, vexg/plugins-<major>.<minor> beside
/// libvexg.so, and that of libvexg.so itself.
VEXG_EXPORT std::vector<std::string> PluginDirectories();

/// Loads a plug-in by its file name from the first of PluginDirectories that has it, else by the
/// system's rules. A plug-in that could not be loaded is remembered: it is tried again only when a
/// file of its name has appeared, changed or gone in one of the folders.
///
/// Threads: any number.
/// @param fault  [out] why it could not be loaded.
VEXG_EXPORT platform::Module LoadPlugin(const std::string& name, std::string& fault);

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
