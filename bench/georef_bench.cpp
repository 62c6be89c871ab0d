// Points per second of the models and of a projection, on one thread, beside gdaltransform in the
// same run (its rate includes reading and writing text, which is how it is used). Aim: affine and
// RPC arrays at least 5 times the peer's rate.

#include <array>
#include <chrono>
#include <cmath>
#include <cstdlib>
#include <string>
#include <vector>

#include <benchmark/benchmark.h>

#include "georef/rpc_georef.h"
#include "georef/std_georef.h"
#include "support/peer_program.h"
#include "support/rpc_file.h"
#include "support/sample_data.h"

namespace {

using lumo::Array;
using lumo::ArrayDims;
using Points = std::vector<std::array<double, 3>>;

constexpr unsigned kPoints = 100000;

/// Pixels all over the sample scene.
Points ScenePixels() {
  Points points(kPoints);
  for (unsigned i = 0; i < kPoints; ++i) {
    points[i] = {i % 349 + 0.25, (i * 7 % 352) + 0.75, 95};
  }
  return points;
}

Array<double> ToArray(const Points& points) {
  Array<double> array{ArrayDims(kPoints, 2)};
  for (unsigned i = 0; i < kPoints; ++i) {
    array[2 * i] = points[i][0];
    array[2 * i + 1] = points[i][1];
  }
  return array;
}

void Require(bool holds) {
  if (!holds) std::abort();
}

/// Runs `convert` on a fresh copy of the points each time; the copy is not counted.
template <typename Convert>
void Measure(benchmark::State& state, const Points& input, Convert&& convert) {
  const Array<double> start = ToArray(input);
  Array<double> points = start;
  for (auto _ : state) {
    const auto begin = std::chrono::steady_clock::now();
    Require(convert(points));
    const std::chrono::duration<double> taken = std::chrono::steady_clock::now() - begin;
    state.SetIterationTime(taken.count());
    points = start;
  }
  state.SetItemsProcessed(state.iterations() * kPoints);
}

void MeasurePeer(benchmark::State& state, const Points& input, const std::string& command) {
  if (!lumo::test::HasProgram("gdaltransform")) {
    state.SkipWithError("no gdaltransform");
    return;
  }
  // Less what it takes on one point, which is the start of the program.
  const Points one(input.begin(), input.begin() + 1);
  const auto seconds = [&](const Points& points) {
    const auto begin = std::chrono::steady_clock::now();
    Require(lumo::test::RunOnPoints(command, points, 3).size() == points.size());
    return std::chrono::duration<double>(std::chrono::steady_clock::now() - begin).count();
  };
  for (auto _ : state) state.SetIterationTime(seconds(input) - seconds(one));
  state.SetItemsProcessed(state.iterations() * kPoints);
}

lumo::RpcGeoRef SceneModel() {
  lumo::RpcGeoRef model;
  model.SetCoefficients(lumo::test::LoadRpb(lumo::test::SampleData("rpc_scene.RPB")));
  return model;
}

bool HasScene(benchmark::State& state) {
  const bool has = !lumo::test::SampleData("rpc_scene.tif").empty();
  if (!has) state.SkipWithError("no sample data");
  return has;
}

Points OnGround(const lumo::GeoRef& model) {
  Points points = ScenePixels();
  Array<double> ground = ToArray(points);
  Require(model.PixelToMap(ground));
  for (unsigned i = 0; i < kPoints; ++i) points[i] = {ground[2 * i], ground[2 * i + 1], 95};
  return points;
}

Points NearMeridian() {
  Points points(kPoints);
  for (unsigned i = 0; i < kPoints; ++i) points[i] = {-78 + i % 600 * 0.01, 20 + i % 331 * 0.1, 0};
  return points;
}

void AffineToMap(benchmark::State& state) {
  lumo::StdGeoRef grid;
  grid.SetPixelSize(28.5, 28.5);
  grid.SetTieMap(288776, 9120760);
  double x = 0, y = 0;
  grid.PixelToMap(2, 4, x, y);
  Require(x == 288776 + 57 && y == 9120760 - 114);
  Measure(state, ScenePixels(), [&](Array<double>& points) { return grid.PixelToMap(points); });
}
BENCHMARK(AffineToMap)->UseManualTime();

void AffineRotatedToPixel(benchmark::State& state) {
  lumo::StdGeoRef grid;
  grid.SetPixelSize(28.5, 28.5);
  grid.SetRotation(30);
  Measure(state, ScenePixels(), [&](Array<double>& points) { return grid.MapToPixel(points); });
}
BENCHMARK(AffineRotatedToPixel)->UseManualTime();

void AffineToMapPeer(benchmark::State& state) {
  if (!HasScene(state)) return;
  MeasurePeer(state, ScenePixels(),
              "gdaltransform " + lumo::test::SampleData("landsat7_olinda.tif"));
}
BENCHMARK(AffineToMapPeer)->UseManualTime()->Iterations(2)->Unit(benchmark::kMillisecond);

void RpcToPixel(benchmark::State& state) {
  if (!HasScene(state)) return;
  const lumo::RpcGeoRef model = SceneModel();
  const Points ground = OnGround(model);
  Array<double> back = ToArray(ground);
  Require(model.MapToPixel(back) && std::abs(back[2] - ScenePixels()[1][0]) < 1e-3);
  Measure(state, ground, [&](Array<double>& points) { return model.MapToPixel(points); });
}
BENCHMARK(RpcToPixel)->UseManualTime();

void RpcToPixelPeer(benchmark::State& state) {
  if (!HasScene(state)) return;
  MeasurePeer(state, OnGround(SceneModel()),
              "gdaltransform -rpc -i " + lumo::test::SampleData("rpc_scene.tif"));
}
BENCHMARK(RpcToPixelPeer)->UseManualTime()->Iterations(2)->Unit(benchmark::kMillisecond);

void RpcToMap(benchmark::State& state) {
  if (!HasScene(state)) return;
  const lumo::RpcGeoRef model = SceneModel();
  Measure(state, ScenePixels(), [&](Array<double>& points) { return model.PixelToMap(points); });
}
BENCHMARK(RpcToMap)->UseManualTime();

void RpcToMapPeer(benchmark::State& state) {
  if (!HasScene(state)) return;
  MeasurePeer(state, ScenePixels(),
              "gdaltransform -rpc " + lumo::test::SampleData("rpc_scene.tif"));
}
BENCHMARK(RpcToMapPeer)->UseManualTime()->Iterations(2)->Unit(benchmark::kMillisecond);

void UtmForward(benchmark::State& state) {
  lumo::CoordSys utm;
  Require(utm.SetFromString("EPSG:32618"));
  double middle[] = {-75, 0};
  Array<double> one(middle, ArrayDims(1, 2));
  utm.Project(one);
  Require(std::abs(middle[0] - 500000) < 1e-6 && std::abs(middle[1]) < 1e-6);
  Measure(state, NearMeridian(), [&](Array<double>& points) {
    utm.Project(points);
    return true;
  });
}
BENCHMARK(UtmForward)->UseManualTime();

void UtmForwardPeer(benchmark::State& state) {
  MeasurePeer(state, NearMeridian(), "gdaltransform -s_srs OGC:CRS84 -t_srs EPSG:32618");
}
BENCHMARK(UtmForwardPeer)->UseManualTime()->Iterations(2)->Unit(benchmark::kMillisecond);

}  // namespace
