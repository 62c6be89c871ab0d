#include <fstream>

#include <gtest/gtest.h>

#include "commands/catalog.h"
#include "support/placed_raster.h"
#include "support/run_command.h"
#include "support/temporary_directory.h"

namespace lumo {
namespace {

using test::CommandOutcome;
using test::RunCommand;

// Two squares that overlap, and a point without a value.
constexpr const char* kShapes = R"({"type":"FeatureCollection","features":[
{"type":"Feature","properties":{"class":7,"share":0.5},"geometry":{"type":"Polygon",
"coordinates":[[[0,0],[3,0],[3,-2],[0,-2],[0,0]]]}},
{"type":"Feature","properties":{"class":300,"share":-1},"geometry":{"type":"Polygon",
"coordinates":[[[2,-1],[4,-1],[4,-3],[2,-3],[2,-1]]]}},
{"type":"Feature","properties":{"class":null,"share":null},"geometry":{"type":"Point",
"coordinates":[4.5,-0.5]}}]})";

class ShapesRasterTest : public testing::Test {
 protected:
  ShapesRasterTest() {
    path_ = (directory_.Path() / "shapes.geojson").string();
    std::ofstream(path_) << kShapes;
    const auto like = MakePlaced<std::uint8_t>(MakeGrid(0, 0, 1, 5, 3), 1,
                                               [](unsigned, unsigned, unsigned) { return 1; });
    like_ = like;
    catalog::Add(like_);
  }
  ~ShapesRasterTest() override { catalog::Remove(like_); }

  CommandOutcome Make(std::map<std::string, std::string> inputs) {
    inputs["Vectors"] = path_;
    inputs["LikeURI"] = FormatValue(like_->GetURI()).ToUTF8();
    inputs["Coordinates"] = "Map";
    return RunCommand("RasterizeCommand", inputs);
  }

  /// The pixels of the raster that a command made, and a digit of its state behind those not valid.
  static std::vector<std::string> Show(const CommandOutcome& made) {
    const BasicRasterPtr raster(catalog::Find(ParseValue<URI>(String(made.outputs.at("URI")))));
    std::vector<std::string> lines;
    DispatchType(EightTypes{}, raster->DataType(), [&]<typename T>() {
      Array<T> pixels;
      Array<unsigned char> states;
      Array<unsigned> bands{ArrayDims(2)};
      bands[0] = bands[1] = 0;
      EXPECT_TRUE(
          RasterPtr<T>(raster)->GetSubRect({0, 0, 4, 2}, bands, Interleave::BIP, pixels, states));
      for (unsigned y = 0; y < 3; ++y) {
        lines.emplace_back();
        for (unsigned x = 0; x < 5; ++x) {
          const std::size_t at = 2 * (y * 5 + x);
          EXPECT_EQ(pixels[at], pixels[at + 1]);
          EXPECT_EQ(states[at], states[at + 1]);
          std::ostringstream text;
          text << +pixels[at] << (states[at] == PixelValueState::NoData ? "! " : " ");
          lines.back() += text.str();
        }
      }
      return true;
    });
    return lines;
  }

  test::TemporaryDirectory directory_;
  std::string path_;
  BasicRasterPtr like_;
};

TEST_F(ShapesRasterTest, ShowsTheLastShapeOfEachPixel) {
  const struct {
    std::map<std::string, std::string> inputs;
    const char* type;
    const char* shapes;
    std::vector<std::string> want;
  } cases[] = {
      {{}, "Byte", "3", {"1 1 1 0 1 ", "1 1 1 1 0 ", "0 0 1 1 0 "}},
      {{{"Field", "class"}}, "Int16", "2", {"7 7 7 0 0 ", "7 7 300 300 0 ", "0 0 300 300 0 "}},
      {{{"Field", "share"}, {"Background", "2"}},
       "Double",
       "2",
       {"0.5 0.5 0.5 2 2 ", "0.5 0.5 -1 -1 2 ", "2 2 -1 -1 2 "}},
      {{{"Value", "9"}, {"Where", "class=7"}, {"NoData", "255"}, {"DataType", "UInt16"}},
       "UInt16",
       "1",
       {"9 9 9 255! 255! ", "9 9 9 255! 255! ", "255! 255! 255! 255! 255! "}},
  };
  for (const auto& c : cases) {
    const CommandOutcome made = Make(c.inputs);
    ASSERT_TRUE(made.Succeeded()) << made.reason;
    EXPECT_EQ(made.outputs.at("DataType"), c.type);
    EXPECT_EQ(made.outputs.at("Shapes"), c.shapes);
    EXPECT_EQ(Show(made), c.want);
  }
}

TEST_F(ShapesRasterTest, RefusesWhatPixelsCannotHold) {
  const struct {
    std::map<std::string, std::string> inputs;
    const char* reason;
  } cases[] = {
      {{{"Field", "class"}, {"DataType", "Byte"}}, "can't hold all values"},
      {{{"Value", "0.5"}, {"DataType", "Int32"}}, "can't hold all values"},
      {{{"Field", "clas"}}, "no field \"clas\"; did you mean class?"},
      {{{"Where", "class=8"}}, "no shape to show"},
  };
  for (const auto& c : cases) {
    const CommandOutcome made = Make(c.inputs);
    EXPECT_FALSE(made.Succeeded()) << c.reason;
    EXPECT_NE(made.reason.find(c.reason), std::string::npos) << made.reason;
  }
}

}  // namespace
}  // namespace lumo
