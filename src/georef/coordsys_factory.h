#pragma once

#include "georef/coordsys_impl.h"
#include "platform/export.h"
#include "platform/module.h"

namespace lumo {

// The functions of the projection plug-in, null until it is loaded.
VEXG_EXPORT extern void (*fp_Esri_Pe_Initialize)(String& peDirectory, String& gdalDirectory);
VEXG_EXPORT extern CoordSysImpl* (*fp_Esri_Pe_CreateFromString)(const String& text);
VEXG_EXPORT extern CoordSysImpl* (*fp_Esri_Pe_CreateFromCode)(int code);
VEXG_EXPORT extern int (*fp_Esri_Pe_Release)(CoordSysImpl* impl);

/// Finds the plug-in's functions and puts them into the four globals.
class VEXG_EXPORT CoordSysFuncPtrs {
 public:
  /// Loads the plug-in from `directory`. The globals are set only when all four are there.
  /// @return false, with a line in the log, when the directory is empty, the plug-in can't be
  ///         loaded or a function is missing.
  bool LoadFuncPtrs(const String& directory);

 private:
  platform::Module module_;
};

/// Makes coordinate systems through the projection plug-in, which it loads at the first use: from
/// the directory of Environment::kBinDirectory, or from beside libvexg.so when it is not there.
class VEXG_EXPORT CoordSysFactory {
 public:
  /// The one factory; null while the plug-in can't be had. Each call then tries anew, so a host may
  /// still set the environment. Any thread.
  static CoordSysFactory* GetFactory();

 private:
  bool Init();

  CoordSysFuncPtrs functions_;
};

/// The one factory, null before its first use; ask CoordSysFactory::GetFactory for it.
VEXG_EXPORT extern CoordSysFactory* gpCoordSysFactoryInstance;

}  // namespace lumo
