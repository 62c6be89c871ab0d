#pragma once

#include <vector>

#include "platform/export.h"

namespace lumo {

/// A model by which FxComputePCAClassificationCommand scores regions.
struct PcaModel {
  unsigned components = 0;
  std::vector<double> coefficients;  ///< a row for each attribute, a column for each component
  std::vector<double> weights;       ///< a row for each component, a column for each class
  std::vector<double> thresholds;    ///< the same
  std::vector<double> shares;        ///< of all variance, of each component
};

/// Adds up standardized attributes of regions, for their principal components.
///
/// The components are the eigenvectors of the covariance of z, by falling eigenvalue (Hotelling
/// 1933); the first that hold a share of all variance are kept. In their space the classes are told
/// apart by linear discriminants (Fisher 1936; Hastie, Tibshirani, Friedman, The Elements of
/// Statistical Learning, 2009, 4.3): with the mean m_c of the examples of class c and their pooled
/// covariance S within the classes, w_c = S^-1 m_c and b_c = -w_c m_c / 2, all classes as likely. A
/// thousandth of the mean variance is added to the diagonal of S, so that few examples do (Friedman
/// 1989). The mean of w and b over the classes is taken off: a score is the lead on the mean of all
/// classes, and the best is never below 0. Weights are w, and thresholds such that the sum of
/// (y - threshold) weight is w y + b.
///
///     PcaFit fit(attributes);
///     fit.AddRegions(count, z);             // of all regions, as often as there are blocks
///     fit.FindComponents(0.99);
///     fit.AddExample(classIndex, z);        // of each example
///     const PcaModel model = fit.GetModel(classes);
///
/// Threads: one at a time.
class VEXG_EXPORT PcaFit {
 public:
  explicit PcaFit(unsigned attributes);

  /// Adds regions. @param z  attribute i of region j at i * count + j; a region with a value that
  /// is not finite is left out.
  void AddRegions(unsigned count, const double* z);

  /// Finds the components. @param share  of the variance that they hold at least, above 0 to 1.
  /// @return false where the regions do not vary.
  bool FindComponents(double share);

  /// Adds an example. @param z  a value for each attribute. An example with one that is not finite
  /// is left out: false.
  bool AddExample(unsigned classIndex, const double* z);

  /// Gives the model; a class without examples has no weights. Needs examples of two classes.
  PcaModel GetModel(unsigned classes) const;

 private:
  struct Example {
    unsigned classIndex;
    std::vector<double> place;  // among the components
  };

  unsigned attributes_;
  double regions_ = 0;
  std::vector<double> sums_;      // of z
  std::vector<double> products_;  // of z_i and z_j, where i is at most j
  PcaModel model_;
  std::vector<Example> examples_;
};

}  // namespace lumo
