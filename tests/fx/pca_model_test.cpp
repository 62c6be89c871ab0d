#include "fx/pca_model.h"

#include <cmath>
#include <random>

#include <gtest/gtest.h>

namespace lumo {
namespace {

/// Regions around centres, with correlated attributes of unlike spread.
struct Scene {
  static constexpr unsigned kAttributes = 3;
  std::vector<double> z;  // attribute by attribute
  std::vector<unsigned> classes;
  unsigned count = 0;

  explicit Scene(unsigned each) {
    std::mt19937 random(7);
    std::normal_distribution<double> noise;
    const double centres[][2] = {{0, 0}, {5, 0}, {2, 1.5}};
    std::vector<double> rows;
    for (unsigned c = 0; c < 3; ++c) {
      for (unsigned i = 0; i < each; ++i, ++count) {
        const double a = noise(random), b = noise(random);
        const double x = centres[c][0] + a, y = centres[c][1] + 0.8 * a + 0.3 * b;
        rows.insert(rows.end(), {x, y, 2 * x - y});  // the third says nothing new
        classes.push_back(c);
      }
    }
    z.resize(rows.size());
    for (unsigned j = 0; j < count; ++j) {
      for (unsigned i = 0; i < kAttributes; ++i) z[i * count + j] = rows[j * kAttributes + i];
    }
  }
  std::vector<double> Row(unsigned region) const {
    return {z[region], z[count + region], z[2 * count + region]};
  }
};

double ScoreOf(const PcaModel& model, unsigned classes, const std::vector<double>& z, unsigned c) {
  double score = 0;
  for (unsigned k = 0; k < model.components; ++k) {
    double y = 0;
    for (std::size_t i = 0; i < z.size(); ++i) {
      y += z[i] * model.coefficients[i * model.components + k];
    }
    score += (y - model.thresholds[k * classes + c]) * model.weights[k * classes + c];
  }
  return score;
}

TEST(PcaModel, PutsRegionsIntoTheClassOfTheNearestMeanByMahalanobis) {
  constexpr unsigned kClasses = 4;  // the last without examples
  const Scene scene(60);
  PcaFit fit(Scene::kAttributes);
  fit.AddRegions(scene.count, scene.z.data());
  ASSERT_TRUE(fit.FindComponents(1));
  for (unsigned j = 0; j < scene.count; ++j) {
    ASSERT_TRUE(fit.AddExample(scene.classes[j], scene.Row(j).data()));
  }
  const PcaModel model = fit.GetModel(kClasses);
  ASSERT_EQ(model.components, 2U);  // as many as attributes that say something of their own
  EXPECT_NEAR(model.shares[0] + model.shares[1], 1, 1e-9);
  double dot = 0;
  for (unsigned i = 0; i < 3; ++i) dot += model.coefficients[i * 2] * model.coefficients[i * 2 + 1];
  EXPECT_NEAR(dot, 0, 1e-9);

  // Means and pooled covariance of the first two attributes, which the third follows from.
  double mean[3][2] = {}, s[3] = {};
  for (unsigned j = 0; j < scene.count; ++j) {
    for (unsigned i = 0; i < 2; ++i) mean[scene.classes[j]][i] += scene.Row(j)[i] / 60;
  }
  for (unsigned j = 0; j < scene.count; ++j) {
    const double x = scene.Row(j)[0] - mean[scene.classes[j]][0];
    const double y = scene.Row(j)[1] - mean[scene.classes[j]][1];
    s[0] += x * x, s[1] += x * y, s[2] += y * y;
  }
  const double determinant = s[0] * s[2] - s[1] * s[1];
  unsigned same = 0;
  for (unsigned j = 0; j < scene.count; ++j) {
    unsigned nearest = 0, best = 0;
    double least = INFINITY, most = -INFINITY;
    for (unsigned c = 0; c < 3; ++c) {
      const double x = scene.Row(j)[0] - mean[c][0], y = scene.Row(j)[1] - mean[c][1];
      const double distance = (s[2] * x * x - 2 * s[1] * x * y + s[0] * y * y) / determinant;
      const double score = ScoreOf(model, kClasses, scene.Row(j), c);
      if (distance < least) nearest = c, least = distance;
      if (score > most) best = c, most = score;
    }
    EXPECT_GE(most, 0);
    EXPECT_EQ(ScoreOf(model, kClasses, scene.Row(j), 3), 0);
    same += best == nearest ? 1 : 0;
  }
  EXPECT_GE(same, scene.count - 2);  // the small number on the diagonal may move one
}

TEST(PcaModel, CopesWithFewExamplesAndOddValues) {
  PcaFit none(2);
  const double flat[] = {1, 1, 2, 2};
  none.AddRegions(2, flat);
  EXPECT_FALSE(none.FindComponents(0.9));

  PcaFit fit(2);
  const double z[] = {-1, 1, NAN, 0.5, -1, 1, 3, 0.4};
  fit.AddRegions(4, z);
  ASSERT_TRUE(fit.FindComponents(0.9));
  const double left[] = {-1, -1}, right[] = {1, 1}, odd[] = {INFINITY, 0};
  EXPECT_TRUE(fit.AddExample(0, left));
  EXPECT_TRUE(fit.AddExample(1, right));
  EXPECT_FALSE(fit.AddExample(1, odd));
  const PcaModel model = fit.GetModel(2);
  EXPECT_EQ(model.components, 1U);
  EXPECT_GT(ScoreOf(model, 2, {-0.2, -0.3}, 0), 0);
  EXPECT_LT(ScoreOf(model, 2, {-0.2, -0.3}, 1), 0);
  EXPECT_GT(ScoreOf(model, 2, {0.2, 0.3}, 1), 0);
}

}  // namespace
}  // namespace lumo
