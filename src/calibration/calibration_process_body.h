#pragma once

#include <algorithm>
#include <vector>

#include "calibration/calibration_process.h"
#include "calibration/value_conversion.h"
#include "foundation/fault.h"
#include "raster/pixel_states.h"
#include "raster/tile_functions.h"
#include "tasks/scratch_pool.h"

namespace lumo::detail {

/// Puts the values of `fill`, one for each band, where pixels are not valid.
template <typename T>
void FillInvalid(const unsigned char* state, T* out, std::size_t pixels,
                 const std::vector<T>& fill) {
  const std::size_t bands = fill.size();
  if (AllValid(state, pixels * bands)) return;
  for (std::size_t pixel = 0, i = 0; pixel < pixels; ++pixel) {
    for (std::size_t band = 0; band < bands; ++band, ++i) {
      if (!IsValidState(state[i])) out[i] = fill[band];
    }
  }
}

inline bool CheckFit(const BasicRaster& source, const BasicRaster& target,
                     const CalibrationFormula& formula) {
  if (formula.Bands() != source.Bands()) {
    SetFault("there are constants for " + std::to_string(formula.Bands()) +
             " bands, and the raster has " + std::to_string(source.Bands()));
    return false;
  }
  if (source.Samples() == target.Samples() && source.Lines() == target.Lines() &&
      source.Bands() == target.Bands() && target.CanWrite()) {
    return true;
  }
  SetFault(target.CanWrite() ? "CalibratedURI: the raster has another size or number of bands"
                             : "CalibratedURI: the raster can't be written");
  return false;
}

}  // namespace lumo::detail

namespace lumo {

template <typename TIn, typename TOut>
bool Calibrate(const char* name, const CalibrationFormula& formula, const RasterPtr<TIn>& source,
               const RasterPtr<TOut>& target, const IPC& ipc) {
  if (!source || !target || !detail::CheckFit(*source, *target, formula)) return false;
  std::vector<TOut> fill;  // for each band, what stands where nothing is computed
  for (unsigned band = 0; band < source->Bands(); ++band) {
    fill.push_back(target->HasNoDataValue(band) ? target->NoDataValue(band) : TOut());
  }
  const std::size_t atOnce = formula.PixelsAtOnce();
  ScratchPool<std::vector<double>> scratch;
  const auto calibrate = [&](const Tile<TIn>& in, Tile<TOut>& out, const TilePart& part) {
    const auto values = scratch.Borrow(atOnce * fill.size());
    for (unsigned y = part.rowFrom; y < part.rowTo; ++y) {
      for (std::size_t x = part.columnFrom; x < part.columnTo; x += atOnce) {
        const std::size_t pixels = std::min<std::size_t>(atOnce, part.columnTo - x);
        const std::size_t at = in.Offset(static_cast<std::int64_t>(x), y);
        ToDoubles(in.PixelArray().GetData() + at, values->data(), pixels * fill.size());
        formula.Apply(values->data(), pixels);
        TOut* const to = out.PixelArray().GetData() + at;
        FromDoubles(values->data(), to, pixels * fill.size());
        detail::FillInvalid(out.StateArray().GetData() + at, to, pixels, fill);
      }
    }
  };
  return MapTiles(name, TilesOf(source), target, calibrate, ipc);
}

}  // namespace lumo
