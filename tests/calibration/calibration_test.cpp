#include <cmath>
#include <cstring>
#include <random>

#include "calibration/calibrated_raster.h"
#include "calibration/value_conversion.h"
#include "commands/catalog.h"
#include "raster/block_strides.h"
#include "raster/valid_pixels.h"
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

Array<double> ListOf(std::initializer_list<double> values) {
  Array<double> list{ArrayDims(static_cast<unsigned>(values.size()))};
  std::copy(values.begin(), values.end(), list.begin());
  return list;
}

CalibrationConstants ConstantsOf(CalibrationQuantity quantity) {
  CalibrationConstants constants;
  constants.quantity = quantity;
  constants.gains = ListOf({0.5, 1.25, -0.1});
  constants.offsets = ListOf({-3, -70.5, 12});
  if (quantity == CalibrationQuantity::kReflectance) {
    constants.irradiances = ListOf({1969, 1840, 1551});
  }
  constants.sunElevation = 51.5;
  constants.earthSunDistance = 1.0138;
  constants.k1 = ListOf({10, 600, 774});
  constants.k2 = ListOf({1000, 1200, 1321});
  constants.scale = 2.7;
  return constants;
}

/// Reads blocks of a view of all places, bands and interleaves, and compares them with what a told
/// command put into the target.
template <typename TIn, typename TOut>
void ExpectSameBits(const Scene<TIn, TOut>& scene, CalibrationQuantity quantity, unsigned seed) {
  using Made = Scene<TIn, TOut>;
  CalibratedRaster<TOut> view(BasicRasterPtr(scene.source), ConstantsOf(quantity));
  ASSERT_TRUE(view.IsValid());
  std::mt19937 random(seed);
  const auto pick = [&](unsigned most) { return static_cast<unsigned>(random() % most); };
  for (const Interleave order : {Interleave::BIP, Interleave::BIL, Interleave::BSQ}) {
    const unsigned left = pick(Made::kSamples), top = pick(Made::kLines);
    const SubRect rect{left, top, left + pick(Made::kSamples - left),
                       top + pick(Made::kLines - top)};
    Array<unsigned> bands{ArrayDims(1 + pick(4))};
    for (unsigned& band : bands) band = pick(Made::kBands);
    if (order == Interleave::BIP && pick(2) == 0) {
      bands.Resize(ArrayDims(3));
      for (unsigned band = 0; band < 3; ++band) bands[band] = band;
    }
    Array<TOut> pixels;
    Array<unsigned char> states;
    ASSERT_TRUE(view.GetSubRect(rect, bands, order, pixels, states));
    const BlockStrides strides(order, rect.Width(), rect.Height(), bands.GetCount());
    for (unsigned y = 0; y < rect.Height(); ++y) {
      for (unsigned x = 0; x < rect.Width(); ++x) {
        for (unsigned i = 0; i < bands.GetCount(); ++i) {
          const std::size_t at = x * strides.pixel + y * strides.line + i * strides.band;
          const std::size_t made =
              ((top + y) * std::size_t{Made::kSamples} + left + x) * Made::kBands + bands[i];
          ASSERT_EQ(std::memcmp(&pixels[at], &scene.target->pixels[made], sizeof(TOut)), 0)
              << "seed " << seed << ", element " << made;
          ASSERT_EQ(states[at], scene.target->states[made]);
        }
      }
    }
  }
}

TEST(CalibratedRaster, HasTheBitsThatTheCommandsMakeInAnyBlock) {
  const struct {
    CalibrationQuantity quantity;
    const char* command;
  } cases[] = {{CalibrationQuantity::kRadiance, "CalibrateRasterRadianceCommand"},
               {CalibrationQuantity::kReflectance, "CalibrateRasterTOAReflectanceCommand"},
               {CalibrationQuantity::kTemperature, "CalibrateRasterBrightnessTemperatureCommand"}};
  const auto compare = [&]<typename TIn, typename TOut>(TIn, TOut) {
    for (const auto& c : cases) {
      const Scene<TIn, TOut> scene;
      ASSERT_TRUE(RunCommand(c.command, scene.Inputs({{"SolarIrradiance", "1:3 [1969 1840 1551] "},
                                                      {"SunElevation", "51.5"},
                                                      {"EarthSunDistance", "1.0138"},
                                                      {"K1", "1:3 [10 600 774] "},
                                                      {"K2", "1:3 [1000 1200 1321] "},
                                                      {"ScaleFactor", "2.7"}}))
                      .Succeeded());
      for (unsigned seed = 1; seed <= 8; ++seed) ExpectSameBits(scene, c.quantity, seed);
    }
  };
  const auto forEach = [&]<typename... Ts>(TypeList<Ts...>) {
    const auto toAll = [&]<typename TIn>(TIn in) { (compare(in, Ts()), ...); };
    (toAll(Ts()), ...);
  };
  forEach(EightTypes{});
}

TEST(CalibratedRaster, KnowsReflectanceOfRescaledCountsAndCelsius) {
  const Scene<std::int16_t, double> scene;
  const struct {
    std::map<std::string, std::string> inputs;
    std::function<double(double r, unsigned band)> formula;
    double none;  // where r isn't above 0
  } cases[] = {{{{"Quantity", "Reflectance"}, {"SunElevation", "30"}, {"ScaleFactor", "10000"}},
                [](double r, unsigned) { return r * 10000 / 0.5; },
                0.0},
               {{{"Quantity", "Reflectance"}}, [](double r, unsigned) { return r; }, 0.0},
               {{{"Quantity", "Temperature"},
                 {"K1", "1:3 [10 600 774] "},
                 {"K2", "1:3 [1000 1200 1321] "},
                 {"Unit", "Celsius"},
                 {"ScaleFactor", "10"}},
                [](double r, unsigned band) {
                  constexpr double kK1[] = {10, 600, 774}, kK2[] = {1000, 1200, 1321};
                  return 10 * (kK2[band] / std::log(kK1[band] / r + 1) - 273.15);
                },
                -2731.5}};
  for (const auto& c : cases) {
    auto inputs = scene.Inputs(c.inputs);
    inputs["SrcURI"] = inputs["SourceURI"];
    inputs.erase("SourceURI");
    inputs.erase("CalibratedURI");
    inputs["DataType"] = "Double";
    const auto outcome = RunCommand("CreateCalibratedRasterCommand", inputs);
    ASSERT_TRUE(outcome.Succeeded()) << outcome.reason;
    const RasterPtr<double> view(
        BasicRasterPtr(catalog::Find(ParseValue<URI>(String(outcome.outputs.at("URI"))))));
    ASSERT_TRUE(view);
    Array<double> pixels;
    Array<unsigned char> states;
    const SubRect all{0, 0, view->Samples() - 1, view->Lines() - 1};
    ASSERT_TRUE(view->GetSubRect(all, AllBands(*view), Interleave::BIP, pixels, states));
    for (std::size_t i = 0; i < scene.source->pixels.size(); ++i) {
      const unsigned band = i % 3;
      const double r = scene.source->pixels[i] * kGains[band] + kOffsets[band];
      const double want = scene.source->states[i] != 0 ? 0.0 : r > 0 ? c.formula(r, band) : c.none;
      ASSERT_NEAR(pixels[i], want, 1e-12 * std::abs(want)) << i;
    }
    catalog::Remove(BasicRasterPtr(view));
  }
}

TEST(CalibratedRaster, RefusesWhatIsMissing) {
  const Scene<std::uint8_t, float> scene;
  const struct {
    std::map<std::string, std::string> inputs;
    const char* want;
  } cases[] = {{{{"Quantity", "Temperature"}, {"K1", "1:3 [1 1 1] "}}, "K2"},
               {{{"Quantity", "Reflectance"}, {"SolarIrradiance", "1:3 [1 1 1] "}}, "SunElevation"},
               {{{"Quantity", "Radiance"}, {"Gain", "1:2 [1 1] "}}, "Gain: the raster has 3 bands"},
               {{{"Quantity", "Colour"}}, "Quantity"},
               {{{"Quantity", "Radiance"}, {"Unit", "K"}}, "Unit"},
               {{{"Quantity", "Radiance"}, {"DataType", "ComplexSingle"}}, "DataType"}};
  for (const auto& c : cases) {
    auto inputs = scene.Inputs(c.inputs);
    inputs["SrcURI"] = inputs["SourceURI"];
    const auto outcome = RunCommand("CreateCalibratedRasterCommand", inputs);
    EXPECT_EQ(outcome.result, CommandResult::kFailed) << c.want;
    EXPECT_THAT(outcome.reason, testing::HasSubstr(c.want));
  }
}

}  // namespace
}  // namespace lumo
