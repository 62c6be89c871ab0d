#include "geometry/raster_to_vector.h"

#include <random>

#include <gtest/gtest.h>

#include "geometry/fxv_file.h"
#include "support/file_bytes.h"
#include "support/run_command.h"
#include "support/temporary_directory.h"
#include "tasks/task_errors.h"
#include "views/sources/memory_raster.h"

namespace lumo {
namespace {

using Writer = FxvPolygonWriter<std::int32_t, std::uint32_t>;

/// A raster of labels in memory that the test owns.
template <typename T>
struct LabelRaster {
  LabelRaster(unsigned w, unsigned h) : width(w), height(h), pixels(std::size_t{w} * h) {}
  RasterPtr<T> Get() {
    return RasterPtr<T>(new MemoryRaster<T>("labels", pixels.data(), width, height, 1,
                                            Interleave::BSQ, GeoRefPtr()));
  }
  unsigned width;
  unsigned height;
  std::vector<T> pixels;
};

template <typename T>
LabelRaster<T> Noise(unsigned width, unsigned height) {
  LabelRaster<T> raster(width, height);
  std::mt19937 random(3);
  for (T& pixel : raster.pixels) pixel = static_cast<T>(random() % 3);
  return raster;
}

class RasterToVector : public testing::Test {
 protected:
  std::string Path(const char* name) const { return (directory_.Path() / name).string(); }
  Pointer<Writer> MakeWriter(const char* name) const {
    return Pointer<Writer>(new Writer(URI(String(Path(name)))));
  }
  test::TemporaryDirectory directory_;
};

TEST_F(RasterToVector, LineByLineAndInBlocksGiveOneFile) {
  LabelRaster<std::int16_t> labels = Noise<std::int16_t>(700, 900);  // of several blocks
  {
    const Pointer<Writer> writer = MakeWriter("blocks.fxv");
    RasterToVectorProcess<std::int16_t> process(labels.Get(), 0, writer);
    ASSERT_TRUE(process.RunProcess(process.kHere));
    EXPECT_EQ(process.Counts().polygons, writer->Count());
    ASSERT_TRUE(writer->Close());
  }
  const Pointer<Writer> writer = MakeWriter("lines.fxv");
  {
    const RasterIteratorPtr<std::int16_t> lines(
        new RasterIteratorScanline<std::int16_t>(labels.Get()));
    ArgList setup(2);
    setup.Set(0, lines);
    setup.Set(1, writer);
    RasterToVectorTask<std::int16_t> task(setup);
    ASSERT_TRUE(task.IsValid());
    ArgList token(1);
    for (unsigned y = 0; y < labels.height; ++y) {
      const TilePtr<std::int16_t> tile(new Tile<std::int16_t>);
      ASSERT_TRUE(lines->Read(0, y, *tile));
      token.Set(0, tile);
      ASSERT_TRUE(task.Execute(token));
    }
    const TilePtr<std::int16_t> tall(new Tile<std::int16_t>(TileDimensions{700, 2, 1}));
    token.Set(0, tall);
    EXPECT_FALSE(task.Execute(token));
    EXPECT_EQ(task.GetErrorState().code, TaskErrorBadArgs::Code);
    task.ClearErrorState();
  }
  ASSERT_TRUE(writer->Close());
  EXPECT_EQ(test::FileBytes(Path("lines.fxv")), test::FileBytes(Path("blocks.fxv")));
}

TEST_F(RasterToVector, LabelsThatTheFileCantHoldAreCounted) {
  LabelRaster<std::uint32_t> labels(3, 1);
  labels.pixels = {7, 0x80000000U, 0xFFFFFFFFU};  // the last one is excluded
  const Pointer<Writer> writer = MakeWriter("labels.fxv");
  RasterToVectorProcess<std::uint32_t> process(labels.Get(), 0, writer);
  ASSERT_TRUE(process.RunProcess(process.kHere));
  EXPECT_EQ(process.Counts().polygons, 2U);
  EXPECT_EQ(process.Counts().changed, 1U);
  ASSERT_TRUE(writer->Close());
  FxvPolygonReader<std::int32_t, std::uint32_t> reader{URI(String(Path("labels.fxv")))};
  Polygon2D<std::uint32_t> polygon;
  ASSERT_TRUE(reader.Read(polygon));
  EXPECT_EQ(polygon.Label(), 7);
  ASSERT_TRUE(reader.Read(polygon));
  EXPECT_EQ(polygon.Label(), INT32_MIN);
}

TEST_F(RasterToVector, AnAbortOrARefusalEndsTheRun) {
  LabelRaster<std::uint8_t> labels = Noise<std::uint8_t>(2000, 2000);
  bool isAborted = true;
  IPC ipc;
  ipc.abort.Reset(new ExternalAbortFlag<bool>(&isAborted));
  const Pointer<Writer> writer = MakeWriter("aborted.fxv");
  RasterToVectorProcess<std::uint8_t> process(labels.Get(), 0, writer, ipc);
  EXPECT_TRUE(process.RunProcess(process.kHere));
  EXPECT_EQ(writer->Count(), 0U);

  const Pointer<Writer> closed = MakeWriter("closed.fxv");
  closed->Close();
  RasterToVectorProcess<std::uint8_t> refused(labels.Get(), 0, closed);
  EXPECT_FALSE(refused.RunProcess(refused.kHere));
  RasterToVectorProcess<std::uint8_t> nowhere(labels.Get(), 1, closed);
  EXPECT_FALSE(nowhere.RunProcess(nowhere.kHere));
}

}  // namespace
}  // namespace lumo
