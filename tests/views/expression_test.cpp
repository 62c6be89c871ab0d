#include <cmath>
#include <limits>
#include <random>

#include <gtest/gtest.h>

#include "commands/catalog.h"
#include "foundation/fault.h"
#include "raster/block_strides.h"
#include "raster/raster_details.h"
#include "support/placed_raster.h"
#include "support/run_command.h"
#include "support/test_rasters.h"
#include "tasks/thread_limit.h"
#include "views/expression_raster.h"

namespace lumo {
namespace {

using test::CommandOutcome;
using test::RunCommand;

constexpr double kNaN = std::numeric_limits<double>::quiet_NaN();
constexpr double kInfinity = std::numeric_limits<double>::infinity();

/// The result of an expression for a pixel with these bands.
double Evaluate(const std::string& text, const std::vector<double>& bands) {
  BandNames names({{"", static_cast<unsigned>(bands.size())}});
  EXPECT_TRUE(names.AddRole("red", "b0") && names.AddRole("nir", "b1"));
  const std::optional<Expression> expression = Expression::Parse(text, names);
  EXPECT_TRUE(expression) << text << ": " << TakeFault().ToUTF8();
  if (!expression) return kNaN;
  std::vector<const double*> inputs;
  for (const BandNames::Band& band : expression->Inputs()) inputs.push_back(&bands[band.band]);
  Expression::Scratch scratch(*expression);
  double result = 0;
  expression->Evaluate(inputs, 1, scratch, &result);
  return result;
}

TEST(Expression, GivesWhatItsFormulaSays) {
  using std::pow;
  const double a = 7, b = 3, c = -2.5;
  const struct {
    const char* text;
    double want;
  } cases[] = {
      {"b0", a},
      {"42", 42},
      {" b0+b1 * b2 ", a + b * c},
      {"(b0+b1)*b2", (a + b) * c},
      {"b0-b1-b2", a - b - c},
      {"b0/b1/b2", a / b / c},
      {"-b1^2", -(b * b)},
      {"(-b1)^2", b * b},
      {"2^b1^2", pow(2, b * b)},
      {"2**-b1", pow(2, -b)},
      {"b0^b2", pow(a, c)},
      {"(b0+b1)^2", (a + b) * (a + b)},
      {"1e-3*.5+5.", 1e-3 * .5 + 5.},
      {"b0 > b1", 1},
      {"b0 <= b1", 0},
      {"b0 >= 7", 1},
      {"b1 < b1", 0},
      {"b0 == 7 && b1 != 3", 0},
      {"b0 == 7 || 0", 1},
      {"!(b0 > b1) + 1", 1},
      {"!b0 == 0", 1},
      {"1 || 0 && 0", 1},
      {"b0 + 1 > b1 * 2", 1},
      {"where(b0 > 5, b1, b2)", b},
      {"where(b0 > 9, b1, b2)", c},
      {"min(b0, b1, b2) + max(b0, b1, b2, 100)", 100 + c},
      {"abs(b2) + sqrt(b0) + exp(b1) + log(b0) + log2(b0) + log10(b0)",
       2.5 + std::sqrt(a) + std::exp(b) + std::log(a) + std::log2(a) + std::log10(a)},
      {"sin(b0) + cos(b0) + tan(b0)", std::sin(a) + std::cos(a) + std::tan(a)},
      {"asin(b1/9) + acos(b1/9) + atan(b1) + atan2(b2, b1)",
       std::asin(b / 9) + std::acos(b / 9) + std::atan(b) + std::atan2(c, b)},
      {"floor(b2) + 10*ceil(b2) + 100*round(b2)", -3 - 20 - 300},
      {"pow(b0, 0.5)", pow(a, 0.5)},
      {"B0 + NIR + Min(b1, RED)", a + b + b},
      {"ndvi", (b - a) / (b + a)},
      {"ndvi(b2, b0 + 1)", (c - 8) / (c + 8)},
      {"ndwi(b0, b1)", (a - b) / (a + b)},
      {"savi(b0, b1)", 1.5 * (a - b) / (a + b + 0.5)},
      {"evi(b0, b1, b2)", 2.5 * (a - b) / (a + 6 * b - 7.5 * c + 1)},
      {"savi(ndvi(b0, b1), ndvi(b1, b0)) * ndvi(ndvi(b0, 1), 2)",
       1.5 * 0.8 / 0.5 * ((a - 1) / (a + 1) - 2) / ((a - 1) / (a + 1) + 2)},
      // NaN stays NaN.
      {"log(-b0) > 0", kNaN},
      {"min(b0, log(-b0))", kNaN},
      {"max(log(-b0), b0)", kNaN},
      {"log(-b0) || 1", kNaN},
      {"!log(-b0)", kNaN},
      {"where(log(-b0), 1, 2)", kNaN},
      {"where(b0 > 0, 5, log(-b0))", 5},
      {"where(b0 < 0, b1, nan)", kNaN},
      {"b0 / (b1 - 3)", kInfinity},
      {"1 / (b0 / (b1 - 3))", 0},
  };
  for (const auto& test : cases) {
    const double got = Evaluate(test.text, {a, b, c});
    if (std::isnan(test.want)) {
      EXPECT_TRUE(std::isnan(got)) << test.text;
    } else {
      EXPECT_DOUBLE_EQ(got, test.want) << test.text;
    }
  }
}

TEST(Expression, SaysWhereItCannotBeRead) {
  std::string brackets(5000, '('), signs(5000, '-');
  brackets += "b0";
  signs += "b0";
  const struct {
    std::string text;
    const char* position;
    const char* token;
    const char* why;
  } cases[] = {
      {"", "1", "the end", "missing"},
      {"b0 +", "5", "the end", "missing"},
      {"(b0 + b1", "9", "the end", "\")\" is missing"},
      {"b0)", "3", "\")\"", "no \"(\""},
      {"b0 b1", "4", "\"b1\"", "operator"},
      {"b0 - b3", "6", "\"b3\"", "b0 to b1, a_b0"},
      {"b01", "1", "\"b01\"", "no such band"},
      {"a_b1", "1", "\"a_b1\"", "no such band"},
      {"c_b0", "1", "\"c_b0\"", "no such band"},
      {"frob(b0)", "1", "\"frob\"", "function"},
      {"where(b0, b1)", "1", "\"where\"", "3 values, and not 2"},
      {"min(b0)", "1", "\"min\"", "2 or more values, and not 1"},
      {"ndvi", "1", "\"ndvi\"", "role nir"},
      {"ndvi(b0)", "1", "\"ndvi\"", "2 values, and not 1"},
      {"ndvi(1, -1)", "1", "\"ndvi\"", "division by 0"},
      {"b0 / 0", "6", "\"0\"", "division by 0"},
      {"b0 / (2 - 2)", "6", "\"(\"", "division by 0"},
      {"b0 + log(0)", "6", "\"log\"", "no number"},
      {"b0 = 2", "4", "\"=\"", "\"==\" compares"},
      {"b0 & b1", "4", "\"&\"", "&&"},
      {"0 < b0 < 2", "8", "\"<\"", "&&"},
      {"2b0", "1", "\"2b0\"", "no number"},
      {"1.2.3", "4", "\".3\"", "operator"},
      {"1e999", "1", "\"1e999\"", "no number"},
      {"b0 \u00d7 b1 # 2", "4", "\"\u00d7\"", "nothing"},
      {"b0 + \u00e9", "6", "\"\u00e9\"", "nothing"},
      {brackets, "201", "\"(\"", "deep"},
      {signs, "400", "\"-\"", "deep"},
  };
  const BandNames names({{"", 2}, {"a", 1}});
  for (const auto& test : cases) {
    EXPECT_FALSE(Expression::Parse(test.text, names)) << test.text;
    const std::string fault = TakeFault().ToUTF8();
    const std::string place = std::string(", position ") + test.position + ", " + test.token + ": ";
    EXPECT_NE(fault.find(place), fault.npos) << test.text.substr(0, 40) << ": " << fault;
    EXPECT_NE(fault.find(test.why), fault.npos) << test.text.substr(0, 40) << ": " << fault;
  }
}

TEST(Expression, TakesNamesOfBandsApart) {
  const BandNames names({{"", 2}});
  const auto all = ParseExpressions("NDVI_2=b0/b1; b0 == b1;\n x= b0>=b1 ;", names);
  ASSERT_EQ(all.size(), 3U);
  EXPECT_EQ(CountExpressions("NDVI_2=b0/b1; b0 == b1;\n x= b0>=b1 ;"), 3U);
  EXPECT_EQ(all[0].name, "NDVI_2");
  EXPECT_EQ(all[1].name, "");
  EXPECT_EQ(all[2].name, "x");
  for (const char* text : {"b0=b1", "(b0=b1)", "b0; ; b1", "a b=b0", "=b0", ""}) {
    EXPECT_TRUE(ParseExpressions(text, names).empty()) << text;
    EXPECT_NE(TakeFault().ToUTF8().find("position"), std::string::npos) << text;
  }
}

/// A view of type T on one raster.
template <typename T>
RasterPtr<T> View(const std::vector<BasicRasterPtr>& rasters, const std::string& text) {
  std::vector<BandNames::Source> sources;
  for (const BasicRasterPtr& raster : rasters) {
    sources.push_back(
        {sources.empty() ? "" : std::string(1, char('a' + sources.size() - 1)), raster->Bands()});
  }
  return RasterPtr<T>(new ExpressionRaster<T>(rasters, ParseExpressions(text, BandNames(sources))));
}

/// Bits of all values and states of a block.
template <typename T>
struct Block {
  Array<T> pixels;
  Array<unsigned char> states;
  Block(const RasterPtr<T>& raster, const SubRect& rect, const Array<unsigned>& bands,
        Interleave order = Interleave::BIP) {
    EXPECT_TRUE(raster->GetSubRect(rect, bands, order, pixels, states));
  }
};

TEST(ExpressionRaster, SaysWhichPixelsAreNotValid) {
  const Pointer<MemoryTestRaster<float>> source(new MemoryTestRaster<float>(8, 1, 2));
  source->pixels = {1, 2, 3, 0, 4, 5, -9, 8, 6, 1, 7, 2, 1e30F, 1e30F, NAN, 1};
  source->states[source->At(1, 0, 1)] = 1;
  source->states[source->At(2, 0, 0)] = 2;
  source->states[source->At(3, 0, 0)] = 4;
  source->states[source->At(3, 0, 1)] = 2;
  constexpr unsigned char kNoData = PixelValueState::NoData;
  const auto bands = MakeArray<unsigned>({0, 1, 2});
  const Block<float> real(View<float>({source}, "b0 / b1; b0 * b1; b0 > 2"), {0, 0, 7, 0}, bands,
                          Interleave::BSQ);
  const std::vector<int> wanted{0, 1, 2, 6, 0, 0, 0,       kNoData,   // the states of both, and NaN
                                0, 1, 2, 6, 0, 0, kNoData, kNoData,   // 1e60 is beyond a float
                                0, 0, 2, 4, 0, 0, 0,       kNoData};  // the second band isn't used
  EXPECT_EQ(std::vector<int>(real.states.begin(), real.states.end()), wanted);
  EXPECT_EQ(real.pixels[0], 0.5F);
  EXPECT_EQ(real.pixels[1], 0);  // of one that isn't valid
  EXPECT_EQ(real.pixels[4], 6);

  const Pointer<MemoryTestRaster<double>> numbers(new MemoryTestRaster<double>(8, 1, 1));
  numbers->pixels = {2.5, -2.5, 0.49999999999999994, 127.49, 127.5, -128.5, -128.4, 300};
  const Block<std::int8_t> whole(View<std::int8_t>({numbers}, "b0"), {0, 0, 7, 0},
                                 MakeArray<unsigned>({0}));
  const std::vector<int> rounded{3, -3, 0, 127, 0, 0, -128, 0}, fits{0, 0, 0, 0, 1, 1, 0, 1};
  EXPECT_EQ(std::vector<int>(whole.pixels.begin(), whole.pixels.end()), rounded);
  EXPECT_EQ(std::vector<int>(whole.states.begin(), whole.states.end()), fits);
}

/// Numbers and states at random, stored in an order.
template <typename T>
BasicRasterPtr MakeRandom(unsigned width, unsigned height, unsigned bands, Interleave order,
                          unsigned seed) {
  const Pointer<OrderedTestRaster<T>> raster(new OrderedTestRaster<T>(width, height, bands, order));
  std::mt19937 random(seed);
  for (T& pixel : raster->pixels) pixel = static_cast<T>(random() % 200);
  for (unsigned char& state : raster->states) state = random() % 50 == 0 ? 1 : 0;
  return raster;
}

TEST(ExpressionRaster, GivesTheSameBitsForAllBlocksOrdersAndThreads) {
  constexpr unsigned kWidth = 2500, kHeight = 40;  // lines of three runs
  const BasicRasterPtr first = MakeRandom<std::uint16_t>(kWidth, kHeight, 3, Interleave::BIP, 1);
  const BasicRasterPtr second = MakeRandom<double>(kWidth, kHeight, 2, Interleave::BIL, 2);
  const RasterPtr<float> view = View<float>(
      {first, second}, "ndvi(b2, b1); exp(-b0/50) * sin(a_b1); where(a_b0 > b0, b1 ^ 0.3, a_b1)");
  const auto bands = MakeArray<unsigned>({2, 0, 1, 0});
  const Block<float> whole(view, {0, 0, kWidth - 1, kHeight - 1}, bands);

  // By plain arithmetic.
  const auto all = MakeArray<unsigned>({0, 1, 2});
  Block<std::uint16_t> b(RasterPtr<std::uint16_t>(first), {0, 0, kWidth - 1, kHeight - 1}, all);
  Block<double> a(RasterPtr<double>(second), {0, 0, kWidth - 1, kHeight - 1},
                  MakeArray<unsigned>({0, 1}), Interleave::BIL);
  for (std::size_t i = 0; i < std::size_t{kWidth} * kHeight; ++i) {
    const std::size_t inA = i / kWidth * 2 * kWidth + i % kWidth;
    const double b0 = b.pixels[3 * i], b1 = b.pixels[3 * i + 1], b2 = b.pixels[3 * i + 2];
    const double a0 = a.pixels[inA], a1 = a.pixels[inA + kWidth];
    const auto check = [&](unsigned place, double value, int state) {
      const std::size_t at = 4 * i + place;
      if (state == 0 && !std::isfinite(value)) state = 1;
      ASSERT_EQ(whole.states[at], state) << i << " " << place;
      ASSERT_EQ(whole.pixels[at], state == 0 ? static_cast<float>(value) : 0) << i << " " << place;
    };
    const int s0 = b.states[3 * i], s1 = b.states[3 * i + 1], s2 = b.states[3 * i + 2];
    const int t0 = a.states[inA], t1 = a.states[inA + kWidth];
    check(0, a0 > b0 ? std::pow(b1, 0.3) : a1, s0 | s1 | t0 | t1);
    check(1, (b2 - b1) / (b2 + b1), s1 | s2);
    check(2, std::exp(-b0 / 50) * std::sin(a1), s0 | t1);
    check(3, (b2 - b1) / (b2 + b1), s1 | s2);
  }

  std::mt19937 random(3);
  for (const unsigned threads : {1, 2, 4}) {
    const ThreadLimit limit(threads);
    for (int round = 0; round < 20; ++round) {
      const unsigned left = random() % kWidth, top = random() % kHeight;
      const SubRect rect(left, top, left + random() % (kWidth - left),
                         top + random() % (kHeight - top));
      const auto order = static_cast<Interleave>(random() % 3);
      const Block<float> part(view, rect, bands, order);
      const BlockStrides strides(order, rect.Width(), rect.Height(), 4);
      for (unsigned y = rect.top; y <= rect.bottom; ++y)
        for (unsigned x = rect.left; x <= rect.right; ++x)
          for (unsigned band = 0; band < 4; ++band) {
            const std::size_t at =
                (x - left) * strides.pixel + (y - top) * strides.line + band * strides.band;
            const std::size_t inWhole = 4 * (std::size_t{y} * kWidth + x) + band;
            ASSERT_EQ(part.pixels[at], whole.pixels[inWhole]);
            ASSERT_EQ(part.states[at], whole.states[inWhole]);
          }
    }
  }
}

TEST(ExpressionRaster, HasStatisticsDescriptionAndPlaceOfItsOwn) {
  const Pointer<MemoryTestRaster<std::uint8_t>> source(new MemoryTestRaster<std::uint8_t>(4, 1, 1));
  source->pixels = {1, 2, 3, 10};
  const RasterPtr<double> view = View<double>({source}, "Twice=2*b0; b0/4");
  EXPECT_EQ(view->Max(0, IPC()), 20);
  EXPECT_EQ(view->Mean(1, IPC()), 1);
  EXPECT_FALSE(view->HasNoDataValue(0));
  EXPECT_FALSE(view->CanWrite());
  EXPECT_FALSE(view->StoredPyramidLevel(1));
  const RasterDef def = view->GetRasterDef();
  EXPECT_EQ(def.bands, 2U);
  EXPECT_EQ(def.dataType, kDataTypeOf<double>);
  EXPECT_EQ(FindDetail(def.metadata, BandDetailPath(0, "Description")), "Twice");

  Array<double> pixels;
  Array<unsigned char> states;
  const auto band = MakeArray<unsigned>({0}), none = MakeArray<unsigned>({2});
  EXPECT_FALSE(view->GetSubRect({0, 0, 4, 0}, band, Interleave::BIP, pixels, states));
  EXPECT_FALSE(view->GetSubRect({0, 0, 3, 0}, none, Interleave::BIP, pixels, states));
  const auto ramp = MakeRamp<float>(4, 4, 1);
  ramp->failAtRead = 0;
  EXPECT_FALSE(
      View<double>({ramp}, "b0")->GetSubRect({0, 0, 3, 3}, band, Interleave::BIP, pixels, states));

  EXPECT_FALSE(View<float>({source, ramp}, "b0 - a_b0")->IsValid());
  EXPECT_NE(TakeFault().ToUTF8().find("4 by 1"), std::string::npos);
  EXPECT_FALSE(View<float>({MakeRamp<Complex<float>>(4, 1, 1)}, "b0")->IsValid());
  EXPECT_NE(TakeFault().ToUTF8().find("complex"), std::string::npos);
  // 64-bit integers count as numbers of 53 bits.
  EXPECT_TRUE(View<float>({MakeRamp<std::uint64_t>(4, 1, 1)}, "b0")->IsValid());
}

class ExpressionCommandTest : public testing::Test {
 protected:
  ExpressionCommandTest() {
    for (const double tie : {0.0, 0.0, 3.0}) {
      rasters_.push_back(MakePlaced<std::uint8_t>(
          MakeGrid(tie, 0, 1, 5, 3), 2,
          [](unsigned x, unsigned y, unsigned band) { return x + 10 * y + 100 * band; }));
      catalog::Add(rasters_.back());
    }
  }
  ~ExpressionCommandTest() override {
    for (const BasicRasterPtr& raster : rasters_) catalog::Remove(raster);
  }

  CommandOutcome Make(unsigned count, std::map<std::string, std::string> inputs) {
    Array<URI> uris{ArrayDims(count)};
    for (unsigned i = 0; i < count; ++i) uris[i] = rasters_[i]->GetURI();
    inputs["SrcURI"] = FormatValue(uris).ToUTF8();
    return RunCommand("CreateExpressionRasterCommand", inputs);
  }

  std::vector<BasicRasterPtr> rasters_;
};

TEST_F(ExpressionCommandTest, NamesRastersAndRoles) {
  const CommandOutcome made = Make(2, {{"Expressions", "D=old_b1 - RED; red"},
                                       {"Names", "OLD"},
                                       {"Roles", "red=b0|nir=old_b1"},
                                       {"DataType", "Int16"}});
  ASSERT_TRUE(made.Succeeded()) << made.reason;
  EXPECT_EQ(made.outputs.at("DataType"), "Int16");
  const RasterPtr<std::int16_t> view(
      catalog::Find(ParseValue<URI>(String(made.outputs.at("URI")))));
  ASSERT_TRUE(view);
  const Block<std::int16_t> block(view, {4, 2, 4, 2}, MakeArray<unsigned>({0, 1}));
  EXPECT_EQ(block.pixels[0], 100);
  EXPECT_EQ(block.pixels[1], 24);
  catalog::Remove(view);
  EXPECT_EQ(made.outputs.count("Warning"), 0U);

  const CommandOutcome apart = Make(3, {{"Expressions", "b0 + a_b0 + b_b0"}});
  ASSERT_TRUE(apart.Succeeded()) << apart.reason;
  EXPECT_EQ(apart.outputs.at("Warning").find(rasters_[2]->GetURI().ToUTF8() + ": not where"), 0U)
      << apart.outputs.at("Warning");
  catalog::Remove(catalog::Find(ParseValue<URI>(String(apart.outputs.at("URI")))));
}

TEST_F(ExpressionCommandTest, RefusesWhatCannotBeMeant) {
  const struct {
    std::map<std::string, std::string> inputs;
    const char* why;
  } cases[] = {
      {{{"Expressions", "b2"}}, "there are b0 to b1, a_b0 to a_b1"},
      {{{"Expressions", "b0"}, {"Names", "x|y"}}, "there are 2 for 1"},
      {{{"Expressions", "b0"}, {"Names", "2x"}}, "is no name"},
      {{{"Expressions", "b0"}, {"Roles", "red"}}, "ROLE=BAND"},
      {{{"Expressions", "b0"}, {"Roles", "red=b7"}}, "no band \"b7\""},
      {{{"Expressions", "b0"}, {"Roles", "b1=b0"}}, "names a band already"},
      {{{"Expressions", "b0"}, {"Roles", "red=b0|red=b1"}}, "names a band already"},
      {{{"Expressions", "b0"}, {"DataType", "Int64"}}, "DataType"},
  };
  for (const auto& test : cases) {
    const CommandOutcome made = Make(2, test.inputs);
    EXPECT_FALSE(made.Succeeded()) << test.why;
    EXPECT_NE(made.reason.find(test.why), std::string::npos) << made.reason;
  }
  const CommandOutcome twice = Make(3, {{"Expressions", "b0"}, {"Names", "x|X"}});
  EXPECT_NE(twice.reason.find("comes twice"), std::string::npos) << twice.reason;
}

}  // namespace
}  // namespace lumo
