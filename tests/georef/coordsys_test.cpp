#include "georef/coordsys.h"

#include <algorithm>
#include <filesystem>
#include <fstream>
#include <memory>
#include <sstream>
#include <thread>

#include "georef/coordsys_factory.h"
#include "georef/coordsys_log.h"
#include "support/temporary_directory.h"

namespace lumo {
namespace {

TEST(CoordSys, ConvertsUnits) {
  const struct {
    double value;
    int from, to;
    double latitude, x, y, tolerance;
  } cases[] = {
      {1, 9001, 9001, 0, 1, 1, 0},
      {1, 9001, 12345, 0, 1, 1, 0},
      {1, 12345, 9001, 0, 1, 1, 0},
      {7, 9002, 9003, 0, 7 * 0.3048 / 0.3048006096012192, 7 * 0.3048 / 0.3048006096012192, 0},
      {1, 9036, 9001, 0, 1000, 1000, 0},
      // Lengths of a degree on WGS 84, in metres, from its radii of curvature.
      {1, 9102, 9001, 0, 111319.49, 110574.28, 0.01},
      {1, 9102, 9001, 45, 78846.84, 111131.78, 0.01},
      {60, 9103, 9036, 0, 111.31949, 110.57428, 1e-5},
      {111319.49, 9001, 9102, 0, 1, 1.006739, 1e-5},
  };
  for (const auto& c : cases) {
    double x = 0, y = 0;
    CoordSys::ConvertUnits(c.value, c.value, c.from, c.to, x, y, c.latitude);
    EXPECT_NEAR(x, c.x, c.tolerance) << c.from << ' ' << c.to;
    EXPECT_NEAR(y, c.y, c.tolerance) << c.from << ' ' << c.to;
  }
}

TEST(CoordSys, EmptySystemsAreAlikeAndCountsHold) {
  CoordSys empty, other;
  EXPECT_TRUE(empty.IsEqual(other));
  EXPECT_TRUE(empty.SameDatum(other));
  EXPECT_NE(empty.Identifier(), other.Identifier());
  EXPECT_EQ(empty.Info()->datumName.ToUTF8(), "D_Unknown");
  EXPECT_EQ(empty.Info()->unitCode, 9001);
  CoordSys geographic;
  ASSERT_TRUE(geographic.SetGeographic());
  {
    CoordSys copy(geographic);
    const CoordSys& self = copy;
    copy = self;
    other = copy;
  }
  EXPECT_EQ(other.Type(), 1);
  EXPECT_TRUE(other.IsEqual(geographic));
  other = empty;
  EXPECT_TRUE(other.IsEmpty());
  EXPECT_EQ(geographic.Type(), 1);
}

TEST(CoordSysFuncPtrs, RefusesWhatIsNoPlugin) {
  CoordSysFuncPtrs functions;
  EXPECT_FALSE(functions.LoadFuncPtrs(""));
  EXPECT_FALSE(functions.LoadFuncPtrs("/no/such/directory"));
}

std::string ReadAll(const std::filesystem::path& path) {
  std::stringstream all;
  all << std::ifstream(path).rdbuf();
  return all.str();
}

std::unique_ptr<CoordSysLog> LogIn(const std::filesystem::path& directory) {
  return std::unique_ptr<CoordSysLog>(CoordSysLog::Create(String(directory.string())));
}

TEST(CoordSysLog, TakesOnlyTheExactSettingLine) {
  const struct {
    const char* text;
    std::uint32_t mask;
  } cases[] = {{"# 1\n0110,0000,0000,0001\n", 0x2001}, {"0110, 0000, 0000, 0001\n", 0},
               {"0000,0000,0000,0001\n", 0},           {"0111,1111,1111,1111 rest", 0x3FFF},
               {"1100,0000,0000,0000\n", 0},           {"0110,0000,0000,000\n", 0},
               {"01100,000,0000,0001\n", 0},           {"0000,0000\n0110,0000,0000,0001\n", 0}};
  for (const auto& c : cases) {
    SCOPED_TRACE(c.text);
    const test::TemporaryDirectory directory;
    std::ofstream(directory.Path() / "pelog.txt") << c.text;
    EXPECT_EQ(LogIn(directory.Path())->EnabledMask(), c.mask);
    EXPECT_EQ(std::filesystem::exists(directory.Path() / "logs"), c.mask != 0);
  }
}

TEST(CoordSysLog, MakesItsControlFileSwitchedOff) {
  const test::TemporaryDirectory directory;
  EXPECT_EQ(LogIn(directory.Path())->EnabledMask(), 0U);
  const std::string text = ReadAll(directory.Path() / "pelog.txt");
  EXPECT_EQ(std::count(text.begin(), text.end(), '\n'), 35);
  EXPECT_EQ(text.find('\n'), 79U);
  EXPECT_TRUE(text.ends_with("\n0000, 0000, 0000, 0000\n"));
  EXPECT_EQ(LogIn(directory.Path() / "none"), nullptr);
}

TEST(CoordSysLog, WritesLinesAndTakesTurnsWithItsFiles) {
  const test::TemporaryDirectory directory;
  std::ofstream(directory.Path() / "pelog.txt") << "0110,0000,0000,0000\n";
  const auto first = directory.Path() / "logs/vexpe_pe_1.log";
  const auto second = directory.Path() / "logs/vexpe_pe_2.log";
  {
    const auto log = LogIn(directory.Path());
    log->Write(CoordSysLog::kErrors, "value %d", 7);
    log->Write(CoordSysLog::kAllTransforms, "not this");
    log->Write(CoordSysLog::kErrors, "two");
  }
  const std::string lines = ReadAll(first);
  EXPECT_THAT(lines, testing::MatchesRegex("[A-Z][a-z][a-z] [A-Z][a-z][a-z] .* [0-9]+,     0,     "
                                           "1, value 7 \n.*,     0,     2, two \n"));
  std::filesystem::resize_file(first, 500000 - 10);
  std::ofstream(second) << "old";
  {
    const auto log = LogIn(directory.Path());
    log->Write(CoordSysLog::kErrors, "fills the first");
    EXPECT_EQ(std::filesystem::file_size(second), 0U);
    log->Write(CoordSysLog::kErrors, "goes to the second");
  }
  EXPECT_NE(ReadAll(second).find("goes to the second"), std::string::npos);
  std::filesystem::resize_file(first, 500000);
  std::filesystem::resize_file(second, 500000);
  LogIn(directory.Path());
  EXPECT_EQ(std::filesystem::file_size(first), 0U);
}

TEST(CoordSysLog, NumbersTheLinesOfAllThreads) {
  const test::TemporaryDirectory directory;
  std::ofstream(directory.Path() / "pelog.txt") << "0110,0000,0000,0000\n";
  const auto log = LogIn(directory.Path());
  std::vector<std::thread> threads;
  for (int t = 0; t < 4; ++t) {
    threads.emplace_back([&] {
      for (int i = 0; i < 50; ++i) log->Write(CoordSysLog::kErrors, "line");
    });
  }
  for (std::thread& thread : threads) thread.join();
  const std::string lines = ReadAll(directory.Path() / "logs/vexpe_pe_1.log");
  EXPECT_NE(lines.find(",     0,   200, line \n"), std::string::npos);
  EXPECT_EQ(std::count(lines.begin(), lines.end(), '\n'), 200);
}

}  // namespace
}  // namespace lumo
