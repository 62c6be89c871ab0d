#pragma once

#include <gtest/gtest.h>

#include "georef/coordsys.h"

namespace lumo::test {

/// A coordinate system that a test takes for granted.
inline CoordSys MakeCoordSys(const char* text) {
  CoordSys system;
  EXPECT_TRUE(system.SetFromString(text)) << text;
  return system;
}

}  // namespace lumo::test
