#include "fx/pca_model.h"

#include <Eigen/Dense>
#include <algorithm>
#include <cmath>

namespace lumo {
namespace {

constexpr double kNegligible = 1e-12;  // of the variance: what rounding leaves of none
constexpr double kRidge = 1e-3;

bool IsFinite(const double* values, unsigned count, std::size_t step) {
  for (unsigned i = 0; i < count; ++i) {
    if (!std::isfinite(values[i * step])) return false;
  }
  return true;
}

}  // namespace

PcaFit::PcaFit(unsigned attributes)
    : attributes_(attributes), sums_(attributes), products_(std::size_t{attributes} * attributes) {}

void PcaFit::AddRegions(unsigned count, const double* z) {
  std::vector<double> one(attributes_);
  for (unsigned j = 0; j < count; ++j) {
    if (!IsFinite(z + j, attributes_, count)) continue;
    for (unsigned i = 0; i < attributes_; ++i) one[i] = z[std::size_t{i} * count + j];
    for (unsigned i = 0; i < attributes_; ++i) {
      sums_[i] += one[i];
      double* const row = products_.data() + std::size_t{i} * attributes_;
      for (unsigned k = i; k < attributes_; ++k) row[k] += one[i] * one[k];
    }
    ++regions_;
  }
}

bool PcaFit::FindComponents(double share) {
  if (regions_ < 2) return false;
  Eigen::MatrixXd covariance(attributes_, attributes_);
  for (unsigned i = 0; i < attributes_; ++i) {
    for (unsigned k = i; k < attributes_; ++k) {
      const double product = products_[std::size_t{i} * attributes_ + k];
      covariance(i, k) = covariance(k, i) =
          (product - sums_[i] * sums_[k] / regions_) / (regions_ - 1);
    }
  }
  const Eigen::SelfAdjointEigenSolver<Eigen::MatrixXd> solver(covariance);
  const double total = covariance.trace();
  if (solver.info() != Eigen::Success || !(total > 0)) return false;

  unsigned kept = 0;
  for (double held = 0; kept < attributes_ && held < share; ++kept) {
    const double variance = solver.eigenvalues()(attributes_ - 1 - kept);
    if (variance <= kNegligible * total) break;
    held += variance / total;
    model_.shares.push_back(variance / total);
  }
  if (kept == 0) return false;
  model_.components = kept;
  model_.coefficients.resize(std::size_t{attributes_} * kept);
  for (unsigned k = 0; k < kept; ++k) {
    Eigen::VectorXd vector = solver.eigenvectors().col(attributes_ - 1 - k);
    Eigen::Index largest = 0;
    vector.cwiseAbs().maxCoeff(&largest);
    if (vector(largest) < 0) vector = -vector;  // of both directions always the same
    for (unsigned i = 0; i < attributes_; ++i) {
      model_.coefficients[std::size_t{i} * kept + k] = vector(i);
    }
  }
  return true;
}

bool PcaFit::AddExample(unsigned classIndex, const double* z) {
  if (!IsFinite(z, attributes_, 1)) return false;
  std::vector<double> place(model_.components);
  for (unsigned i = 0; i < attributes_; ++i) {
    for (unsigned k = 0; k < model_.components; ++k) {
      place[k] += z[i] * model_.coefficients[std::size_t{i} * model_.components + k];
    }
  }
  examples_.push_back({classIndex, std::move(place)});
  return true;
}

PcaModel PcaFit::GetModel(unsigned classes) const {
  const unsigned components = model_.components;
  Eigen::MatrixXd means = Eigen::MatrixXd::Zero(components, classes);
  Eigen::VectorXd members = Eigen::VectorXd::Zero(classes);
  const auto placeOf = [&](const Example& example) {
    return Eigen::Map<const Eigen::VectorXd>(example.place.data(), components);
  };
  for (const Example& example : examples_) {
    means.col(example.classIndex) += placeOf(example);
    ++members(example.classIndex);
  }
  for (unsigned c = 0; c < classes; ++c) {
    if (members(c) > 0) means.col(c) /= members(c);
  }
  Eigen::MatrixXd within = Eigen::MatrixXd::Zero(components, components);
  for (const Example& example : examples_) {
    const Eigen::VectorXd off = placeOf(example) - means.col(example.classIndex);
    within += off * off.transpose();
  }
  const auto present = static_cast<double>((members.array() > 0).count());
  const double freedom = static_cast<double>(examples_.size()) - present;
  if (freedom > 0) within /= freedom;
  const double spread = within.trace() / components;
  within.diagonal().array() += spread > 0 ? kRidge * spread : 1.0;  // none: the nearest mean

  Eigen::MatrixXd weights = within.ldlt().solve(means);
  Eigen::VectorXd offsets = -0.5 * (weights.cwiseProduct(means)).colwise().sum();
  const Eigen::VectorXd meanWeights = weights.rowwise().sum() / present;
  const double meanOffset = offsets.sum() / present;
  for (unsigned c = 0; c < classes; ++c) {
    if (members(c) == 0) continue;
    weights.col(c) -= meanWeights;
    offsets(c) -= meanOffset;
    const double least = 1e-9 * (1 + meanWeights.norm());
    if (weights.col(c).norm() < least) weights(0, c) = least;  // it carries the offset
  }
  PcaModel model = model_;
  model.weights.resize(std::size_t{components} * classes);
  model.thresholds.resize(model.weights.size());
  for (unsigned c = 0; c < classes; ++c) {
    const double square = weights.col(c).squaredNorm();
    for (unsigned k = 0; k < components; ++k) {
      const std::size_t at = std::size_t{k} * classes + c;
      model.weights[at] = weights(k, c);
      model.thresholds[at] = square > 0 ? -offsets(c) * weights(k, c) / square : 0;
    }
  }
  return model;
}

}  // namespace lumo
