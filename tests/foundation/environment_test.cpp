#include "foundation/environment.h"

#include <cstdlib>
#include <filesystem>
#include <set>

#include "commands/value_text.h"
#include "foundation/color.h"
#include "platform/module.h"
#include "support/temporary_directory.h"

namespace lumo {
namespace {

TEST(Environment, KeepsTextsUnderKeys) {
  EXPECT_EQ(&GetGlobalEnvironmentImpl(), &GetGlobalEnvironmentImpl());
  Context context;
  EXPECT_TRUE(context.WorkingDirectory() == "");
  EXPECT_EQ(context.GetCount(), 0U);
  EXPECT_TRUE(context[Environment::kPeDirectory].text == "");
  EXPECT_EQ(context.GetCount(), 1U);
  context[Context::kWorkingDirectory].text = "/tmp";
  EXPECT_TRUE(context.WorkingDirectory() == "/tmp");
}

TEST(Environment, InitFindsWhatNobodyHasSet) {
  namespace fs = std::filesystem;
  EnvironmentImpl& environment = GetGlobalEnvironmentImpl();
  const auto path = [&](const ContextKey& key) { return fs::path(environment.Find(key).ToUTF8()); };
  const test::TemporaryDirectory home;
  fs::create_directories(home.Path() / "vexg/pedata");
  setenv("XDG_DATA_HOME", home.Path().c_str(), 1);
  environment[Environment::kXmlDirectory].text = "/chosen";
  InitEnvironment();
  EXPECT_TRUE(fs::exists(path(Environment::kBinDirectory) / platform::ModuleFileName("vexgdal")));
  EXPECT_FALSE(fs::is_empty(path(Environment::kMdfDirectory)));
  EXPECT_TRUE(fs::equivalent(path(Environment::kPeDirectory), home.Path() / "vexg/pedata"));
  EXPECT_EQ(path(Environment::kXmlDirectory), "/chosen");
  for (const ContextKey& key :
       {Environment::kBinDirectory, Environment::kXmlDirectory, Environment::kPeDirectory,
        Environment::kGdalDirectory, Environment::kMdfDirectory}) {
    environment[key].text = "";
  }
}

TEST(Color, TableHasItsFixedRows) {
  const struct {
    const char* name;
    std::uint32_t value;
  } rows[] = {{"red", 0xFF0000FF},    {"green", 0xFF008000},       {"blue", 0xFFFF0000},
              {"gray", 0xFF808080},   {"navy", 0xFF800000},        {"pink", 0xFFCBC0FF},
              {"orange", 0xFF0080FF}, {"mediumpurple", 0xFFDB7093}};
  for (const auto& row : rows) {
    const Color color = FindNamedColor(row.name);
    EXPECT_EQ(color.r | color.g << 8 | color.b << 16 | std::uint32_t{color.a} << 24, row.value);
  }
  std::set<std::string> names;
  for (const NamedColor& row : kNamedColors) {
    names.insert(row.name);
    EXPECT_EQ(row.isNull, std::string(row.name) == "null");
    EXPECT_EQ(row.value >> 24, row.isNull ? 0U : 255U) << row.name;
  }
  EXPECT_EQ(names.size(), 146U);
  EXPECT_TRUE(FindNamedColor("no such colour").isNull);
}

TEST(Color, HasATextForm) {
  EXPECT_EQ(FormatValue(Color()).ToUTF8(), "null 0 0 0 0 1");
  const auto read = ParseValue<Color>(" teal 0 128 128 255 0 ");
  EXPECT_TRUE(read.name == "teal");
  EXPECT_EQ(read.g, 128);
  EXPECT_FALSE(read.isNull);
}

TEST(Palette, SharesItsColoursOnlyByPointer) {
  Palette palette;
  EXPECT_TRUE(palette.At(7)->name == "null");
  EXPECT_EQ(palette.GetCount(), 0U);
  const ColorPtr held = palette.At(7);
  palette.Set(7, FindNamedColor("white"));
  EXPECT_TRUE(held->name == "white");
  Palette copy(palette);
  copy.Set(7, FindNamedColor("black"));
  EXPECT_TRUE(held->name == "white");
}

TEST(Palette, HasATextForm) {
  Palette palette;
  palette.Append(FindNamedColor("black"));
  palette.Append(FindNamedColor("white"));
  const String text = FormatValue(palette);
  EXPECT_EQ(text.ToUTF8(), "2 [(black 0 0 0 255 0) (white 255 255 255 255 0) ] ");
  EXPECT_TRUE(FormatValue(ParseValue<Palette>(text)) == text);
  EXPECT_EQ(ParseValue<Palette>("0 [] ").GetCount(), 0U);
  EXPECT_EQ(ParseValue<Palette>("3 [(black 0 0 0 255 0) (wh").GetCount(), 3U);
  EXPECT_EQ(ParseValue<Palette>("4000000000 [(black").GetCount(), 0U);

  Array<Palette> both{ArrayDims(2)};
  both[1].Append(FindNamedColor("red"));
  const String arrayText = FormatValue(both);
  EXPECT_EQ(arrayText.ToUTF8(), "1:2 [0 []  1 [(red 255 0 0 255 0) ] ] ");
  EXPECT_EQ(ParseValue<Array<Palette>>(arrayText)[1].GetCount(), 1U);
}

}  // namespace
}  // namespace lumo
