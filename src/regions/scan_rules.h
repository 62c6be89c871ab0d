#pragma once

#include <cstdint>
#include <span>

#include "commands/value_text.h"
#include "platform/export.h"

namespace lumo {

/// Says how strictly the scan of shapes compares. Told: numbers as they come out. Steady: vertices
/// equal to their neighbour are dropped, and running columns compare with a tolerance, so that a
/// polygon moved by whole pixels keeps its mask.
enum class ScanRules : std::int32_t { kTold = 0, kSteady = 1 };

/// "Told", "Steady".
VEXG_EXPORT std::span<const EnumWord<ScanRules>> WordsOf(ScanRules);

/// Says how the coordinates of shapes are taken. Told: as pixels unless the shapes have a
/// coordinate system and the raster a geo-reference. Map: as map coordinates on every raster with a
/// geo-reference. Pixel: as pixels.
enum class ShapeCoordinates : std::int32_t { kTold = 0, kMap = 1, kPixel = 2 };

/// "Told", "Map", "Pixel".
VEXG_EXPORT std::span<const EnumWord<ShapeCoordinates>> WordsOf(ShapeCoordinates);

/// Says which pixels a polygon has. Told: those of the inclusive scan. Center: those whose centre
/// lies inside, so that polygons side by side share none. Touched: those whose area it touches.
enum class PixelRule : std::int32_t { kTold = 0, kCenter = 1, kTouched = 2 };

/// "Told", "Center", "Touched".
VEXG_EXPORT std::span<const EnumWord<PixelRule>> WordsOf(PixelRule);

/// Says how shapes become pixels. The default is the told form of each.
struct ScanOptions {
  ScanRules rules = ScanRules::kTold;
  ShapeCoordinates coordinates = ShapeCoordinates::kTold;
  PixelRule pixels = PixelRule::kTold;
};

}  // namespace lumo
