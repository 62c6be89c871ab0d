// The text of a coordinate system: what the plug-in takes, it writes, and takes again.

#include <cstdint>
#include <cstdlib>
#include <string>

#include "georef/coordsys.h"

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t* data, std::size_t size) {
  lumo::CoordSys system;
  const lumo::String text(std::string(reinterpret_cast<const char*>(data), size));
  if (!system.SetFromString(text)) return 0;
  lumo::String written;
  system.ToString(written);
  lumo::CoordSys again;
  if (!again.SetFromString(written)) std::abort();
  if (again.Type() != system.Type()) std::abort();
  double longitude = 0, latitude = 0;
  system.MapToGeo(1, 2, longitude, latitude);
  return 0;
}
