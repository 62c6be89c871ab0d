#pragma once

#include <string>

#include "options/option.h"
#include "rasters/raster_chain.h"

namespace lumo::host {

/// Another pixel type, and a line along which values go on the way to it.
struct PixelConversion {
  std::string type;         ///< empty: that of the source
  std::string scale;        ///< LO,HI or LO,HI,TO-LO,TO-HI; empty: values stay
  bool isUnscaled = false;  ///< pixels become what scales and offsets make of them

  /// Adds --type.
  void AddTypeTo(OptionSet& line, const std::string& meaning);
  /// Adds --scale and --unscale.
  void AddScaleTo(OptionSet& line);

  /// True when pixels of a type become others.
  bool IsNeeded(unsigned dataType) const;
  /// The code of the type that pixels of a type become.
  unsigned TypeOf(unsigned dataType) const;
  /// Adds the view that converts the uppermost raster, where it is needed, into the variable
  /// "$" name. Throws HostError for a scale that can't be.
  /// @param dataType  of that raster.
  void AddView(RasterChain& chain, const std::string& name, unsigned dataType) const;
};

}  // namespace lumo::host
