#pragma once

#include <cmath>

#include <gtest/gtest.h>

namespace lumo::test {

/// Whether two numbers agree to 1e-12 of the second. What both have no number for agrees.
inline testing::AssertionResult Near(long double got, long double want) {
  if (std::isnan(got) && std::isnan(want)) return testing::AssertionSuccess();
  if (got == want || std::fabs(got - want) <= 1e-12L * std::fabs(want)) {
    return testing::AssertionSuccess();
  }
  return testing::AssertionFailure()
         << static_cast<double>(got) << " instead of " << static_cast<double>(want);
}

}  // namespace lumo::test
