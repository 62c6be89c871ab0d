#pragma once

#include <random>

#include "support/test_rasters.h"

namespace lumo {

template <typename T>
using MemoryPtr = Pointer<MemoryTestRaster<T>>;

/// A scene of noise, a few of its pixels not valid. Values are fractions, so that sums depend on
/// their order.
template <typename T>
MemoryPtr<T> MakeScene(unsigned samples, unsigned lines, unsigned bands, unsigned seed) {
  const MemoryPtr<T> scene(new MemoryTestRaster<T>(samples, lines, bands));
  std::mt19937 random(seed);
  for (std::size_t i = 0; i < scene->pixels.size(); ++i) {
    scene->pixels[i] = static_cast<T>(static_cast<double>(random() % 1000) / 7);
    scene->states[i] = random() % 900 == 0 ? 1U << random() % 3 : 0;
  }
  return scene;
}

}  // namespace lumo
