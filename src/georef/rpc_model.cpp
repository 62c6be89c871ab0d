#include "georef/rpc_model.h"

#include <cmath>

#include "platform/vector_clones.h"

namespace lumo {
namespace {

constexpr double kPixelTolerance = 0.0001;
constexpr double kStepDegrees = 1e-5;
constexpr int kMostRounds = 50;

/// The 20 terms in RPC00B order, of normalised longitude l, latitude p and height h.
[[gnu::always_inline]] inline double Sum(const double* c, double l, double p, double h) {
  return c[0] + c[1] * l + c[2] * p + c[3] * h + c[4] * (l * p) + c[5] * (l * h) + c[6] * (p * h) +
         c[7] * (l * l) + c[8] * (p * p) + c[9] * (h * h) + c[10] * (p * l * h) +
         c[11] * (l * l * l) + c[12] * (l * p * p) + c[13] * (l * h * h) + c[14] * (l * l * p) +
         c[15] * (p * p * p) + c[16] * (p * h * h) + c[17] * (l * l * h) + c[18] * (p * p * h) +
         c[19] * (h * h * h);
}

/// One evaluation of the model for the points of a block, displaced by a step.
/// Whole blocks are computed, so that the loop has a fixed length; unused points hold any value.
VEXG_VECTOR_CLONES
void Evaluate(const RpcCoefficients& rpc, const double* longitude, const double* latitude,
              const double* height, double stepX, double stepY, double* __restrict sample,
              double* __restrict line) {
  const RpcCoefficients c = rpc;  // so that no store can change it
  for (std::size_t i = 0; i < RpcBlock::kPoints; ++i) {
    const double l = (longitude[i] + stepX - c.longitudeOffset) / c.longitudeScale;
    const double p = (latitude[i] + stepY - c.latitudeOffset) / c.latitudeScale;
    const double h = height[i];
    sample[i] = Sum(c.sampleNumerator.data(), l, p, h) / Sum(c.sampleDenominator.data(), l, p, h) *
                    c.sampleScale +
                c.sampleOffset;
    line[i] = Sum(c.lineNumerator.data(), l, p, h) / Sum(c.lineDenominator.data(), l, p, h) *
                  c.lineScale +
              c.lineOffset;
  }
}

/// How far the points are from their pixels.
struct Misses {
  double dx[RpcBlock::kPoints];
  double dy[RpcBlock::kPoints];
  double distance[RpcBlock::kPoints];
};

VEXG_VECTOR_CLONES
void Measure(const RpcBlock& block, const double* sample, const double* line,
             Misses& __restrict misses) {
  for (std::size_t i = 0; i < RpcBlock::kPoints; ++i) {
    misses.dx[i] = block.sample[i] - sample[i];
    misses.dy[i] = block.line[i] - line[i];
    misses.distance[i] = std::sqrt(misses.dx[i] * misses.dx[i] + misses.dy[i] * misses.dy[i]);
  }
}

/// The model at the points, and a step east and north of them.
struct Stencil {
  double sample[3][RpcBlock::kPoints];
  double line[3][RpcBlock::kPoints];
};

VEXG_VECTOR_CLONES
void Step(const Stencil& at, const Misses& misses, double* __restrict longitude,
          double* __restrict latitude) {
  for (std::size_t i = 0; i < RpcBlock::kPoints; ++i) {
    const double sx = (at.sample[1][i] - at.sample[0][i]) / kStepDegrees;
    const double sy = (at.sample[2][i] - at.sample[0][i]) / kStepDegrees;
    const double lx = (at.line[1][i] - at.line[0][i]) / kStepDegrees;
    const double ly = (at.line[2][i] - at.line[0][i]) / kStepDegrees;
    const double determinant = sx * ly - sy * lx;
    const double east = (ly * misses.dx[i] - sy * misses.dy[i]) / determinant;
    const double north = (sx * misses.dy[i] - lx * misses.dx[i]) / determinant;
    const bool far = misses.distance[i] >= kPixelTolerance;
    longitude[i] = far ? longitude[i] + east : longitude[i];
    latitude[i] = far ? latitude[i] + north : latitude[i];
  }
}

bool AnyFar(const Misses& misses, std::size_t count) {
  bool any = false;
  for (std::size_t i = 0; i < count; ++i) any |= misses.distance[i] > kPixelTolerance;
  return any;
}

/// Gives the unused points of a block the values of its first one.
void Fill(RpcBlock& block) {
  for (std::size_t i = block.count; i < RpcBlock::kPoints; ++i) {
    block.longitude[i] = block.longitude[0];
    block.latitude[i] = block.latitude[0];
    block.height[i] = block.height[0];
    block.sample[i] = block.sample[0];
    block.line[i] = block.line[0];
  }
}

}  // namespace

void RpcModel::Project(RpcBlock& block) const {
  block.sample[0] = 0;
  block.line[0] = 0;
  Fill(block);
  Evaluate(rpc_, block.longitude, block.latitude, block.height, 0, 0, block.sample, block.line);
}

void RpcModel::Locate(RpcBlock& block) const {
  Fill(block);
  Stencil at;
  Misses misses;
  for (int round = 0; round < kMostRounds; ++round) {
    const auto evaluate = [&](int point, double stepX, double stepY) {
      Evaluate(rpc_, block.longitude, block.latitude, block.height, stepX, stepY, at.sample[point],
               at.line[point]);
    };
    evaluate(0, 0, 0);
    Measure(block, at.sample[0], at.line[0], misses);
    if (!AnyFar(misses, block.count)) break;
    evaluate(1, kStepDegrees, 0);
    evaluate(2, 0, kStepDegrees);
    Step(at, misses, block.longitude, block.latitude);
  }
  for (std::size_t i = 0; i < block.count; ++i) {
    if (!std::isnan(misses.distance[i])) continue;
    block.longitude[i] = misses.distance[i];
    block.latitude[i] = misses.distance[i];
  }
}

}  // namespace lumo
