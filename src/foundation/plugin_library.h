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

/// Loads a plug-in from a file. One that comes with the library (VEXG_OWN_PLUGIN) is linked as its
/// functions are called: of the tens of thousands that GDAL and PROJ bring along few ever are.
/// @param fault  [out] why it could not be loaded.
VEXG_EXPORT platform::Module LoadPluginFile(const std::string& path, std::string& fault);

}  // namespace lumo
