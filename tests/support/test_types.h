#pragma once

#include <gtest/gtest.h>

#include "raster/pixel_types.h"

namespace lumo::test {

/// Gives a list of pixel types in the form that TYPED_TEST_SUITE takes:
///
///     TYPED_TEST_SUITE(StatsOfType, typename test::AsTestTypes<TwelveTypes>::Types);
template <typename List>
struct AsTestTypes;
template <typename... Ts>
struct AsTestTypes<TypeList<Ts...>> {
  using Types = testing::Types<Ts...>;
};

}  // namespace lumo::test
