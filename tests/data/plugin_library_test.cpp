#include <filesystem>
#include <fstream>
#include <thread>

#include "data/data_manager.h"
#include "data/raster_reader.h"
#include "foundation/environment.h"
#include "foundation/fault.h"
#include "platform/module.h"
#include "support/temporary_directory.h"

namespace lumo {
namespace {

namespace fs = std::filesystem;

fs::path Built(const char* path) {
  return fs::path(platform::LibraryDirectory()).parent_path() / path;
}

/// Each test of this file runs in a process of its own: a plug-in that is loaded stays.
void LookForPluginsIn(const fs::path& directory) {
  GetGlobalEnvironmentImpl()[Environment::kBinDirectory].text = String(directory.string());
}

TEST(PluginLibrary, TheExampleServesItsFormat) {
  LookForPluginsIn(Built("examples/plugins"));
  ASSERT_GT(FormatCount(), kFormatCount);  // beside those that come with the library
  ASSERT_NE(FindFormat("Plane"), nullptr);
  const RasterDataConnectionPtr plane(
      GetGlobalDataManager().Connect(ConnStrings({"plane:5x4"}), {}, {}));
  ASSERT_TRUE(plane) << TakeFault().ToUTF8();
  EXPECT_EQ(plane->URI(), URI(String("plane:5x4")));
  const auto reader = plane->RasterReaderDispatch()->Get<float>();
  Array<float> pixels;
  Array<unsigned char> state;
  Array<unsigned> band{ArrayDims(1)};
  band[0] = 0;
  ASSERT_TRUE(reader->ReadBlock({3, 1, 4, 3}, band, 0, Interleave::BIP, pixels, state));
  EXPECT_EQ(std::vector<float>(pixels.begin(), pixels.end()),
            (std::vector<float>{5, 6, 7, 8, 9, 10}));
  EXPECT_FALSE(GetGlobalDataManager().Connect(ConnStrings({"Plane", "plane:5x"}), {}, {}));
  EXPECT_THAT(TakeFault().ToUTF8(), testing::HasSubstr("plane:<samples>x<lines>"));
}

TEST(PluginLibrary, ManyThreadsMakeOneFactory) {
  LookForPluginsIn(Built("examples/plugins"));
  std::vector<DataConnectionFactory*> found(8);
  std::vector<std::thread> threads;
  for (auto& factory : found) {
    threads.emplace_back([&factory] { factory = FactoryForFormat("Plane"); });
  }
  for (auto& thread : threads) thread.join();
  for (const auto* factory : found) EXPECT_EQ(factory, found.front());
  EXPECT_NE(found.front(), nullptr);
}

TEST(PluginLibrary, OneWithoutTheEntryPointCountsAsMissing) {
  const test::TemporaryDirectory directory;
  fs::create_symlink(Built("lib/libvexg_example_commands.so"), directory.Path() / "libvexgdb.so");
  LookForPluginsIn(directory.Path());
  EXPECT_EQ(FactoryForFormat("GDBRaster"), nullptr);
  EXPECT_THAT(TakeFault().ToUTF8(), testing::HasSubstr("CreateDataConnectionFactory"));
  std::ofstream(directory.Path() / "libvexgdb2.so") << "no library";
  fs::remove(directory.Path() / "libvexgdb.so");
  fs::rename(directory.Path() / "libvexgdb2.so", directory.Path() / "libvexgdb.so");
  EXPECT_EQ(FactoryForFormat("GDBRaster"), nullptr);
  EXPECT_THAT(TakeFault().ToUTF8(), testing::HasSubstr("libvexgdb.so"));
  // It is tried again when there is another file, and not before.
  EXPECT_EQ(FactoryForFormat("GDBRaster"), nullptr);
  fs::remove(directory.Path() / "libvexgdb.so");
  EXPECT_EQ(FactoryForFormat("GDBRaster"), nullptr);
  fs::create_symlink(Built("lib/libvexg_example_commands.so"), directory.Path() / "libvexgdb.so");
  EXPECT_EQ(FactoryForFormat("GDBRaster"), nullptr);
  EXPECT_THAT(TakeFault().ToUTF8(), testing::HasSubstr("CreateDataConnectionFactory"));
}

}  // namespace
}  // namespace lumo
