#include "geometry/fxv_file.h"

#include <filesystem>
#include <fstream>
#include <iterator>
#include <string>

#include <gtest/gtest.h>

#include "foundation/fault.h"
#include "geometry/raster_to_vector.h"
#include "geometry/vector_read_task.h"
#include "support/file_bytes.h"
#include "support/file_size_limit.h"
#include "support/run_command.h"
#include "support/sample_data.h"
#include "support/temporary_directory.h"
#include "support/test_rasters.h"
#include "tasks/task_errors.h"

namespace lumo {
namespace {

namespace fs = std::filesystem;
using test::FileBytes;
using Reader = FxvPolygonReader<std::int32_t, std::uint32_t>;
using Writer = FxvPolygonWriter<std::int32_t, std::uint32_t>;

Contour2DArray<std::uint32_t> Frame() {
  return {{{{4, 4}, {0, 4}, {0, 0}, {4, 0}, {4, 4}}, false},
          {{{3, 3}, {3, 1}, {1, 1}, {1, 3}, {3, 3}}, true}};
}

class FxvFile : public testing::Test {
 protected:
  std::string Path() const { return (directory_.Path() / "shapes.fxv").string(); }

  void WriteTwo() {
    Writer writer{URI(String(Path()))};
    ASSERT_TRUE(writer.Write(Polygon2D<std::uint32_t>(Frame(), -7)));
    const std::vector<std::uint32_t> box{1, 1, 0, 1, 0, 0, 1, 0, 1, 1};
    const unsigned char flag = 0;
    const std::uint32_t start = 0;
    ASSERT_TRUE(writer.WriteFlat(9, 1, &flag, &start, box.size(), box.data()));
    ASSERT_TRUE(writer.Close());
  }

  test::TemporaryDirectory directory_;
};

TEST_F(FxvFile, GivesBackWhatWasWrittenInEitherByteOrder) {
  WriteTwo();
  std::string bytes = FileBytes(Path());
  for (const bool isSwapped : {false, true}) {
    if (isSwapped) {
      const auto swap = [&](std::size_t at, std::size_t size) {
        std::reverse(bytes.begin() + static_cast<long>(at),
                     bytes.begin() + static_cast<long>(at + size));
      };
      bytes[5] = 1;
      swap(6, 2);
      swap(8, 2);
      swap(10, 4);
      std::size_t at = kFxvHeaderSize;
      for (const auto& [rings, coordinates] : {std::pair{2U, 20U}, std::pair{1U, 10U}}) {
        for (int i = 0; i < 3; ++i, at += 4) swap(at, 4);
        at += rings;
        for (unsigned i = 0; i < rings + coordinates; ++i, at += 4) swap(at, 4);
      }
      ASSERT_EQ(at, bytes.size());
      std::ofstream(Path(), std::ios::binary) << bytes;
    }
    Reader reader{URI(String(Path()))};
    ASSERT_TRUE(reader.IsValid());
    EXPECT_EQ(reader.Count(), 2U);
    Polygon2D<std::uint32_t> polygon;
    ASSERT_TRUE(reader.Read(polygon));
    EXPECT_EQ(polygon.Label(), -7);
    ASSERT_EQ(polygon.Rings().size(), 2U);
    EXPECT_EQ(polygon.Rings()[1].points, Frame()[1].points);
    EXPECT_TRUE(polygon.Rings()[1].hole);
    EXPECT_EQ(polygon.Measure(PolygonMeasure::kSignedArea), 12);
    std::int32_t label = 0;
    Deque<bool> holes;
    Deque<unsigned> starts;
    Deque<std::uint32_t> coordinates;
    ASSERT_TRUE(reader.Read(label, holes, starts, coordinates));
    EXPECT_EQ(label, 9);
    EXPECT_EQ(coordinates.GetCount(), 10U);
    EXPECT_FALSE(reader.Read(polygon));
  }
}

TEST_F(FxvFile, RefusesWhatIsNotWhole) {
  WriteTwo();
  const std::string whole = FileBytes(Path());
  for (std::size_t size = 0; size < whole.size(); size += size < kFxvHeaderSize ? 100 : 1) {
    std::ofstream(Path(), std::ios::binary) << whole.substr(0, size);
    Reader reader{URI(String(Path()))};
    EXPECT_EQ(reader.IsValid(), size >= kFxvHeaderSize);
    Polygon2D<std::uint32_t> polygon;
    unsigned read = 0;
    while (reader.Read(polygon)) ++read;
    EXPECT_LT(read, 2U) << size;
  }
  for (const std::size_t at : {0U, 4U, 6U, 8U}) {
    std::string foreign = whole;
    foreign[at] = 77;
    std::ofstream(Path(), std::ios::binary) << foreign;
    EXPECT_FALSE(Reader{URI(String(Path()))}.IsValid()) << at;
  }
  std::string huge = whole;  // as many rings and coordinates as 32 bits can say
  huge.replace(kFxvHeaderSize + 4, 8, 8, '\xff');
  std::ofstream(Path(), std::ios::binary) << huge;
  Polygon2D<std::uint32_t> polygon;
  EXPECT_FALSE((Reader{URI(String(Path()))}.Read(polygon)));
}

TEST_F(FxvFile, AReadTaskGivesAsManyAsTheHeaderSays) {
  WriteTwo();
  const std::string whole = FileBytes(Path());
  for (const bool isCut : {false, true}) {
    std::ofstream(Path(), std::ios::binary) << whole.substr(0, whole.size() - (isCut ? 1 : 0));
    ArgList setup(1);
    setup.Set(0, Pointer<Reader>(new Reader{URI(String(Path()))}));
    VectorReadTask<std::int32_t, std::uint32_t> task(setup);
    ASSERT_FALSE(task.HasError());
    ArgList token(1);
    ASSERT_TRUE(task.Execute(token));
    EXPECT_EQ(Polygon2DPtr<std::uint32_t>(token.Get(0))->Label(), -7);
    EXPECT_EQ(task.Execute(token), !isCut);
    EXPECT_FALSE(task.Execute(token));
    EXPECT_EQ(task.HasError(), isCut);  // without an error false is the end of the data
    const bool isTold = TakeFault().ToUTF8().find("polygon 2 of 2") != std::string::npos;
    EXPECT_EQ(isTold, isCut);
    task.ClearErrorState();
  }
  ArgList none(1);
  EXPECT_EQ((VectorReadTask<std::int32_t, std::uint32_t>(none).GetErrorState().code),
            TaskErrorBadParams::Code);
}

TEST_F(FxvFile, AFailedOrAbandonedWriterLeavesNoMark) {
  {
    Writer writer{URI(String(Path()))};
    ASSERT_TRUE(writer.Write(Polygon2D<std::uint32_t>(Frame(), 1)));
    writer.Abandon();
  }
  EXPECT_FALSE(Reader{URI(String(Path()))}.IsValid());
  {
    const test::FileSizeLimit limit(4096);
    Writer writer{URI(String(Path())), 1024};
    const Polygon2D<std::uint32_t> polygon(Frame(), 1);
    bool isWritten = true;
    for (int i = 0; i < 100 && isWritten; ++i) isWritten = writer.Write(polygon);
    EXPECT_FALSE(isWritten);
    EXPECT_NE(TakeFault().ToUTF8().find("shapes.fxv"), std::string::npos);
    EXPECT_FALSE(writer.Close());
  }
  EXPECT_FALSE(Reader{URI(String(Path()))}.IsValid());
  EXPECT_FALSE((Writer{URI(String((directory_.Path() / "none" / "a.fxv").string()))}.IsValid()));
}

TEST_F(FxvFile, TheCommandMakesTheExpectedFilesByteForByte) {
  const std::string cases = test::SampleData("cases/vector");
  if (cases.empty()) GTEST_SKIP() << "no sample data";
  unsigned count = 0;
  for (const fs::directory_entry& entry : fs::directory_iterator(cases)) {
    const auto opened = test::RunCommand("OpenRasterCommand",
                                         {{"ConnStr", (entry.path() / "labels.tif").string()}});
    ASSERT_TRUE(opened.Succeeded()) << opened.reason;
    const auto made = test::RunCommand(
        "FxRasterToVectorCommand", {{"LabelURI", opened.outputs.at("URI")}, {"VectorFXV", Path()}});
    EXPECT_TRUE(made.Succeeded()) << made.reason;
    EXPECT_EQ(FileBytes(Path()), FileBytes((entry.path() / "expected.fxv").string()))
        << entry.path();
    ++count;
  }
  EXPECT_GT(count, 5U);
}

}  // namespace
}  // namespace lumo
