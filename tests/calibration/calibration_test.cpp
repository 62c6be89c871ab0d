#include <cmath>

#include "calibration/value_conversion.h"
#include "commands/catalog.h"
#include "support/run_command.h"
#include "support/test_rasters.h"

namespace lumo {
namespace {

using test::RunCommand;

/// A raster of digital numbers with some invalid pixels, and one to calibrate into, both open.
template <typename TIn, typename TOut>
struct Scene {
  static constexpr unsigned kSamples = 517, kLines = 9, kBands = 3;

  Scene()
      : source(new MemoryTestRaster<TIn>(kSamples, kLines, kBands)),
        target(new MemoryTestRaster<TOut>(kSamples, kLines, kBands)) {
    for (std::size_t i = 0; i < source->pixels.size(); ++i) {
      source->pixels[i] = static_cast<TIn>(i % 251 + (std::is_signed_v<TIn> ? -100.0 : 0.0));
      source->states[i] = i % 97 == 5 ? 1 : i % 89 == 7 ? 2 : i % 83 == 1 ? 4 : 0;
    }
    std::fill(target->pixels.begin(), target->pixels.end(), TOut(7));
    catalog::Add(source);
    catalog::Add(target);
  }
  ~Scene() {
    catalog::Remove(source);
    catalog::Remove(target);
  }

  std::map<std::string, std::string> Inputs(std::map<std::string, std::string> more) const {
    more["SourceURI"] = FormatValue(source->GetURI()).ToUTF8();
    more["CalibratedURI"] = FormatValue(target->GetURI()).ToUTF8();
    more.emplace("Gain", "1:3 [0.5 1.25 -0.1] ");
    more.emplace("Offset", "1:3 [-3 -70.5 12] ");
    return more;
  }

  Pointer<MemoryTestRaster<TIn>> source;
  Pointer<MemoryTestRaster<TOut>> target;
};

constexpr double kGains[] = {0.5, 1.25, -0.1}, kOffsets[] = {-3, -70.5, 12};

/// The low bits of the whole number that is left of a value.
template <typename TOut>
TOut Stored(double value) {
  if constexpr (std::is_floating_point_v<TOut>) {
    return static_cast<TOut>(value);
  } else {
    const auto bits = static_cast<std::uint64_t>(static_cast<std::int64_t>(std::trunc(value)));
    return static_cast<TOut>(bits);
  }
}

/// Runs a command and compares every pixel with `formula(r, band)`.
template <typename TIn, typename TOut, typename Formula>
void ExpectCalibrated(const char* command, std::map<std::string, std::string> inputs,
                      const Formula& formula) {
  const Scene<TIn, TOut> scene;
  const auto outcome = RunCommand(command, scene.Inputs(std::move(inputs)));
  ASSERT_TRUE(outcome.Succeeded()) << outcome.reason;
  for (std::size_t i = 0; i < scene.source->pixels.size(); ++i) {
    const unsigned band = i % 3;
    const double r = static_cast<double>(scene.source->pixels[i]) * kGains[band] + kOffsets[band];
    const bool valid = scene.source->states[i] == 0;
    const TOut want = valid ? Stored<TOut>(r > 0 ? formula(r, band) : 0.0) : TOut(0);
    ASSERT_EQ(scene.target->pixels[i], want) << "element " << i;
    ASSERT_EQ(scene.target->states[i], scene.source->states[i]);
  }
}

template <typename TIn, typename TOut>
void ExpectAllThree() {
  SCOPED_TRACE(DataTypeName(kDataTypeOf<TIn>).ToUTF8() + " to " +
               DataTypeName(kDataTypeOf<TOut>).ToUTF8());
  const double scale = static_cast<double>(Stored<TOut>(2.7));  // in the output's precision
  ExpectCalibrated<TIn, TOut>("CalibrateRasterRadianceCommand", {{"ScaleFactor", "2.7"}},
                              [&](double r, unsigned) { return scale * r; });
  const double k1[] = {10, 600, 774}, k2[] = {1000, 1200, 1321};
  ExpectCalibrated<TIn, TOut>(
      "CalibrateRasterBrightnessTemperatureCommand",
      {{"K1", "1:3 [10 600 774] "}, {"K2", "1:3 [1000 1200 1321] "}, {"ScaleFactor", "2.7"}},
      [&](double r, unsigned band) { return k2[band] / std::log(k1[band] / r + 1.0) * scale; });
  const double irradiance[] = {1969, 1840, 1551};
  const double sine = std::sin(51.5 * 3.141592653589793 / 180.0);
  ExpectCalibrated<TIn, TOut>("CalibrateRasterTOAReflectanceCommand",
                              {{"SolarIrradiance", "1:3 [1969 1840 1551] "},
                               {"SunElevation", "51.5"},
                               {"EarthSunDistance", "1.0138"},
                               {"ScaleFactor", "10000.5"}},
                              [&](double r, unsigned band) {
                                return r * 3.141592653589 * 1.0138 * 1.0138 * 10000.5 /
                                       (sine * irradiance[band]);
                              });
}

TEST(Calibration, ComputesTheFormulasForEveryPairOfTypes) {
  const auto forEach = []<typename... Ts>(TypeList<Ts...>) {
    const auto toAll = []<typename TIn>(TIn) { (ExpectAllThree<TIn, Ts>(), ...); };
    (toAll(Ts()), ...);
  };
  forEach(EightTypes{});
}

TEST(Calibration, ConvertsByLowBits) {
  EXPECT_EQ(FromDouble<std::uint8_t>(300.7), 44);
  EXPECT_EQ(FromDouble<std::int8_t>(-129.9), 127);
  EXPECT_EQ(FromDouble<std::uint32_t>(4294967295.5), 4294967295u);
  EXPECT_EQ(FromDouble<std::uint16_t>(4294967296.0 + 65535.0), 65535);
  EXPECT_EQ(FromDouble<std::int32_t>(1e300), 0);  // the low bits of the smallest 64-bit integer
  EXPECT_EQ(FromDouble<std::uint16_t>(NAN), 0);
  EXPECT_EQ(FromDouble<float>(0.1), 0.1f);
}

TEST(Calibration, RefusesWhatDoesNotFitAndWritesNothing) {
  const Scene<std::uint8_t, float> scene;
  const struct {
    const char *input, *value, *want;
  } cases[] = {{"Gain", "1:2 [1 2] ", "Gain"},
               {"Offset", "1:4 [1 2 3 4] ", "Offset"},
               {"Offset", "none", "Offset"},
               {"SourceURI", "[none] ", "none"},
               {"CalibratedURI", "[none] ", "none"}};
  for (const auto& c : cases) {
    auto inputs = scene.Inputs({});
    inputs[c.input] = c.value;
    const auto outcome = RunCommand("CalibrateRasterRadianceCommand", inputs);
    EXPECT_EQ(outcome.result, CommandResult::kFailed) << c.input;
    EXPECT_THAT(outcome.reason, testing::HasSubstr(c.want));
  }
  EXPECT_FALSE(RunCommand("CalibrateRasterTOAReflectanceCommand", scene.Inputs({})).Succeeded());
  const BasicRasterPtr small(new MemoryTestRaster<float>(4, 4, 3));
  catalog::Add(small);
  auto inputs = scene.Inputs({});
  inputs["CalibratedURI"] = FormatValue(small->GetURI()).ToUTF8();
  EXPECT_THAT(RunCommand("CalibrateRasterRadianceCommand", inputs).reason,
              testing::HasSubstr("another size"));
  catalog::Remove(small);
  for (const float pixel : scene.target->pixels) ASSERT_EQ(pixel, 7.0f);
}

}  // namespace
}  // namespace lumo
