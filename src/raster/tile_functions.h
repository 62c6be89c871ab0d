#pragma once

#include <tuple>

#include "raster/tile_process.h"
#include "raster/tile_strips.h"

// A computation over the tiles of rasters is a function. While one tile is written others are
// computed, as many at once as there are threads, and the next ones are read; a large tile is
// computed by all threads that are idle. Order, borders, abort, progress and faults are looked
// after here.
//
//   MapTiles("Sum", TilesOf(a).With(b), target,
//            [](const Tile<float>& a, const Tile<float>& b, Tile<double>& sum, const TilePart&
//            part) {
//              for (unsigned y = part.rowFrom; y < part.rowTo; ++y) …
//            },
//            ipc);
//
// Functions are called on any thread, for several tiles and for several parts of a tile at once. A
// function whose last parameter is a TilePart gets its tile in strips; one without, which needs the
// whole tile, once. It gives a bool, or nothing; false, or an exception, ends the run as a failure.
//
// All of them give true when the run has ended well or was aborted, which the caller sees by the
// flag; false, with the fault text set, when a raster doesn't fit, or something failed. They block
// until then.

namespace lumo {

/// The bytes of the first input of a tile that is computed on: what goes with it stays in a second
/// cache from the reading to the writing.
inline constexpr unsigned kComputedTile = 0x20000;

/// Gives the tiles of one raster, or of several of one size on one grid.
template <typename... Ts>
struct TileInputs {
  std::tuple<RasterIteratorPtr<Ts>...> iterators;

  /// The same, and the tiles of another raster on the grid of the first, with its borders.
  template <typename T>
  TileInputs<Ts..., T> With(const RasterPtr<T>& raster) const {
    const RasterIteratorPtr<T> more(
        new RasterIteratorFromTemplate<T>(raster, *std::get<0>(iterators)));
    return {std::tuple_cat(iterators, std::tuple(more))};
  }
};

/// Gives the tiles of an iterator of one's own.
template <typename T>
TileInputs<T> TilesBy(const RasterIteratorPtr<T>& iterator) {
  return {{iterator}};
}

/// Pixel-interleaved tiles of all bands, in the blocks in which the source is stored.
/// @param border  on all sides, filled with no data where there is no raster.
template <typename T>
TileInputs<T> TilesOf(const RasterPtr<T>& raster, unsigned border = 0) {
  TileDimensions tiles =
      StreamTiles(raster.Get(), sizeof(T), kComputedTile, raster.IsNull() ? 0 : raster->Bands());
  tiles.borderLeft = tiles.borderRight = tiles.borderTop = tiles.borderBottom = border;
  return TilesBy(RasterIteratorPtr<T>(new RasterIterator<T>(raster, tiles)));
}

namespace detail {

/// Gives `to` the states of the inner part of `from`: band by band where there are as many, else
/// for every band the bits that some band of `from` has. `to` was sized with all of it valid.
VEXG_EXPORT void TakeStates(const BasicTile& from, BasicTile& to);

/// True when both rasters are there and of one size; else sets the fault text.
VEXG_EXPORT bool CheckSize(const BasicRaster* first, const BasicRaster* other);

template <typename... Ts>
bool CheckInputs(const TileInputs<Ts...>& inputs) {
  return std::apply(
      [](const auto& first, const auto&... more) {
        const BasicRaster* const raster = first->GetRaster().Get();
        return CheckSize(raster, raster) && (CheckSize(raster, more->GetRaster().Get()) && ...);
      },
      inputs.iterators);
}

/// Calls a function for the strips of `shape`, or once where it takes whole tiles.
template <typename F, typename... Tiles>
bool WorkOnTile(const BasicTile& shape, const AbortFlag* abort, const F& work, Tiles&... tiles) {
  if constexpr (std::is_invocable_v<const F&, Tiles&..., const TilePart&>) {
    return ForEachStrip(shape, LeastStripPixels(shape.Bands()), abort,
                        [&](const TilePart& part) { return Succeeds(work, tiles..., part); });
  } else {
    return Succeeds(work, tiles...);
  }
}

/// Places the stages that read, and gives their slots.
template <typename Process, typename... Ts>
auto ReadAll(Process& process, const TileInputs<Ts...>& inputs) {
  return std::apply([&](const auto&... iterator) { return std::tuple{process.Read(iterator)...}; },
                    inputs.iterators);
}

/// Calls `work(const Tile&...)` with the tiles of a token.
template <typename... Ts, typename F>
bool WithTiles(const std::tuple<TileSlot<Ts>...>& slots, const ArgList& token, const F& work) {
  const std::tuple<TilePtr<Ts>...> tiles(
      std::apply([&](const auto&... slot) { return std::tuple{slot.In(token)...}; }, slots));
  return std::apply(
      [&](const auto&... tile) {
        return ((tile && tile->IsValid()) && ...) && work(std::as_const(*tile)...);
      },
      tiles);
}

template <typename R>
struct ResultOf {
  using Type = R;
};
template <typename R>
struct ResultOf<std::optional<R>> {
  using Type = R;
};

/// Finds the type that a part of a reduction gives, without the optional.
template <typename Part, typename... Ts>
auto FindResult() {
  if constexpr (std::is_invocable_v<const Part&, const Tile<Ts>&..., const TilePart&>) {
    return ResultOf<std::invoke_result_t<const Part&, const Tile<Ts>&..., const TilePart&>>();
  } else {
    return ResultOf<std::invoke_result_t<const Part&, const Tile<Ts>&...>>();
  }
}
template <typename Part, typename... Ts>
using PartResult = typename decltype(FindResult<Part, Ts...>())::Type;

}  // namespace detail

/// Makes a raster out of others: `body(const Tile<TIn>&..., Tile<TOut>&)`, perhaps with a TilePart,
/// fills tiles of `output` from those of the inputs at the same place. Their order of the axes is
/// that of the first input, and they come with its states, which the body may change.
///
/// @param name    of the process.
/// @param output  of the inputs' size, can be written; may have another number of bands.
/// @param body    is called on many threads at once.
template <typename... TIn, typename TOut, typename F>
bool MapTiles(const char* name, const TileInputs<TIn...>& inputs, const RasterPtr<TOut>& output,
              const F& body, const IPC& ipc = {}) {
  const auto& first = std::get<0>(inputs.iterators);
  if (!detail::CheckInputs(inputs) || !detail::CheckSize(first->GetRaster().Get(), output.Get())) {
    return false;
  }
  TilePool<TOut> pool;
  TileProcess<> process(name, ipc);
  const auto slots = detail::ReadAll(process, inputs);
  const TileSlot<TOut> result{std::get<0>(slots).id};  // lets go of the first input
  process.Add(name, StageOrder::kSeveralAtOnce, [&](ArgList& token, const AbortFlag* abort) {
    return detail::WithTiles(slots, token, [&](const auto& in, const auto&... more) {
      const TilePtr<TOut> tile = pool.Take();
      const TileDimensions size{in.Width(), in.Height(), output->Bands()};
      if (!tile->ResizeAllValid(size, in.Order())) return false;
      tile->SetIndex(in.Index());
      tile->SetOrigin(in.Origin());
      detail::TakeStates(in, *tile);
      return detail::WorkOnTile(*tile, abort, body, in, more..., *tile) && result.Put(token, tile);
    });
  });
  process.Write(
      result, RasterIteratorPtr<TOut>(new RasterIteratorFromTemplateSpatial<TOut>(output, *first)));
  process.Close();
  return process.RunProcess(process.kHere);
}

/// Copies a raster: `body(Tile<T>&)`, perhaps with a TilePart, changes tiles on the way, in place.
///
///     CopyTiles("Negate", TilesOf(source), target, [](Tile<float>& tile) {
///       for (float& value : tile.PixelArray()) value = -value;
///     });
template <typename T, typename F>
bool CopyTiles(const char* name, const TileInputs<T>& input, const RasterPtr<T>& output,
               const F& body, const IPC& ipc = {}) {
  const RasterIteratorPtr<T>& from = std::get<0>(input.iterators);
  if (!detail::CheckInputs(input) || !detail::CheckSize(from->GetRaster().Get(), output.Get())) {
    return false;
  }
  TileProcess<> process(name, ipc);
  const auto slot = process.Read(from);
  process.Add(name, StageOrder::kSeveralAtOnce, [&](ArgList& token, const AbortFlag* abort) {
    const TilePtr<T> tile = slot.In(token);
    return tile && tile->IsValid() && detail::WorkOnTile(*tile, abort, body, *tile);
  });
  process.Write(slot, RasterIteratorPtr<T>(new RasterIteratorFromTemplate<T>(output, *from)));
  process.Close();
  return process.RunProcess(process.kHere);
}

/// Looks at tiles: `body(const Tile<T>&...)`, perhaps with a TilePart. Nothing is written; results
/// that it gathers it keeps itself, safe from its other calls.
template <typename... Ts, typename F>
bool ForEachTile(const char* name, const TileInputs<Ts...>& inputs, const F& body,
                 const IPC& ipc = {}) {
  if (!detail::CheckInputs(inputs)) return false;
  TileProcess<> process(name, ipc);
  const auto slots = detail::ReadAll(process, inputs);
  process.Add(name, StageOrder::kSeveralAtOnce, [&](ArgList& token, const AbortFlag* abort) {
    return detail::WithTiles(slots, token, [&](const auto& in, const auto&... more) {
      return detail::WorkOnTile(in, abort, body, in, more...);
    });
  });
  process.Close();
  return process.RunProcess(process.kHere);
}

/// Places the two stages of a reduction in a process; see ReduceTiles. `total` outlives it.
/// @param leastPixels  of a strip; 0 for a number that suits work of a few steps a value.
template <typename Base, typename... Ts, typename Total, typename Part, typename Merge>
void AddReduction(TileProcess<Base>& process, const char* name,
                  const std::tuple<TileSlot<Ts>...>& slots, Total& total, const Part& part,
                  const Merge& merge, std::size_t leastPixels = 0) {
  using R = detail::PartResult<Part, Ts...>;
  const auto partOfTile = [=](const AbortFlag* abort, const auto& first,
                              const auto&... more) -> std::optional<R> {
    if constexpr (std::is_invocable_v<const Part&, const Tile<Ts>&..., const TilePart&>) {
      const std::size_t least = leastPixels != 0 ? leastPixels : LeastStripPixels(first.Bands());
      return ReduceStrips<R>(
          first, least, abort, [&](const TilePart& strip) { return part(first, more..., strip); },
          merge);
    } else {
      return part(first, more...);
    }
  };
  const auto result = process.template TakeSlot<ValueSlot<R>>();
  process.Add(name, StageOrder::kSeveralAtOnce,
              [slots, result, partOfTile](ArgList& token, const AbortFlag* abort) {
                return detail::WithTiles(slots, token, [&](const auto&... tiles) {
                  std::optional<R> ofTile = partOfTile(abort, tiles...);
                  return ofTile && result.Put(token, std::move(*ofTile));
                });
              });
  process.Add(name, StageOrder::kOneByOne,
              [result, &total, merge](ArgList& token, const AbortFlag*) {
                R* const ofTile = result.In(token);
                return ofTile != nullptr && detail::Succeeds(merge, total, *ofTile);
              });
}

/// Joins the results of `part(const Tile<T>&...)`, perhaps with a TilePart, for all tiles to
/// `total`. A part gives an R, or an optional that is empty where it failed. `merge(left, right)`
/// joins parts of a tile, and then tiles, to the total, in a fixed order, one at a time: so the
/// result has the same bits for any number of threads. It may move what it joins out of its right
/// side.
///
///     double total = 0;
///     const bool well = ReduceTiles(
///         "Total", TilesOf(raster), total,
///         [](const Tile<float>& tile) {
///           const Array<float>& pixels = tile.PixelArray();
///           return std::accumulate(pixels.begin(), pixels.end(), 0.0);
///         },
///         [](double& left, double right) { left += right; });
template <typename... Ts, typename Total, typename Part, typename Merge>
bool ReduceTiles(const char* name, const TileInputs<Ts...>& inputs, Total& total, const Part& part,
                 const Merge& merge, const IPC& ipc = {}) {
  if (!detail::CheckInputs(inputs)) return false;
  TileProcess<> process(name, ipc);
  const auto slots = detail::ReadAll(process, inputs);
  AddReduction(process, name, slots, total, part, merge);
  process.Close();
  return process.RunProcess(process.kHere);
}

}  // namespace lumo
