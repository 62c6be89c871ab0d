#include <cpl_string.h>
#include <gdal.h>
#include <ogr_srs_api.h>
#include <sys/wait.h>
#include <unistd.h>

#include "support/raster_sources.h"
#include "support/temporary_directory.h"

namespace lumo {
namespace {

using test::Block;
using test::OpenSource;
using test::ReaderOf;

/// A file whose blocks several threads decode, in a system of the registry.
void MakeFile(const std::string& path, const char* compression) {
  GDALAllRegister();
  CPLStringList options;
  options.AddString((std::string("COMPRESS=") + compression).c_str());
  options.AddString("TILED=YES");
  GDALDatasetH const file =
      GDALCreate(GDALGetDriverByName("GTiff"), path.c_str(), 900, 800, 1, GDT_Byte, options.List());
  OGRSpatialReferenceH const system = OSRNewSpatialReference(nullptr);
  ASSERT_EQ(OSRImportFromEPSG(system, 32633), OGRERR_NONE);
  double grid[] = {500000, 30, 0, 4000000, 0, -30};
  GDALSetGeoTransform(file, grid);
  GDALSetSpatialRef(file, system);
  OSRRelease(system);
  std::vector<unsigned char> values(900 * 800);
  for (std::size_t i = 0; i < values.size(); ++i) values[i] = static_cast<unsigned char>(i / 7);
  ASSERT_EQ(GDALRasterIO(GDALGetRasterBand(file, 1), GF_Write, 0, 0, 900, 800, values.data(), 900,
                         800, GDT_Byte, 0, 0),
            CE_None);
  GDALClose(file);
}

/// Opens a file and reads all of it. True when both are as they were made.
bool IsReadWhole(const std::string& path) {
  const auto source = OpenSource({path});
  if (!source) return false;
  const RasterDef def = source->RasterDef();
  if (!def.geoRef || def.geoRef->CoordinateSystem().Info()->unitCode != 9001) return false;
  Block<std::uint8_t> block{{0, 0, 899, 799}, {0}, {}, {}};
  if (!block.Read(*ReaderOf<std::uint8_t>(source))) return false;
  for (std::size_t i = 0; i < block.pixels.size(); ++i) {
    if (block.pixels[i] != static_cast<std::uint8_t>(i / 7)) return false;
  }
  return true;
}

/// A process forks after it has used everything: threads of sources and the crew are gone in the
/// child, and what they left behind must do for it.
TEST(Forking, TheChildOpensAndReads) {
#if defined(__SANITIZE_THREAD__)
  GTEST_SKIP() << "the thread sanitizer ends a forked process that starts threads";
#endif
  const test::TemporaryDirectory directory;
  const std::string own = (directory.Path() / "ownx.tif").string();
  const std::string byGdal = (directory.Path() / "gdalx.tif").string();
  MakeFile(own, "DEFLATE");
  MakeFile(byGdal, "PACKBITS");
  ASSERT_TRUE(IsReadWhole(own) && IsReadWhole(byGdal));
  auto before = OpenSource({own});
  auto reader = ReaderOf<std::uint8_t>(before);
  ASSERT_TRUE(reader);

  const pid_t child = fork();
  ASSERT_NE(child, -1);
  if (child == 0) {
    alarm(60);  // instead of hanging for ever
    if (!IsReadWhole(own)) _exit(1);
    if (!IsReadWhole(byGdal)) _exit(2);
    Block<std::uint8_t> old{{0, 0, 9, 9}, {0}, {}, {}};
    if (old.Read(*reader) || TakeFault().Find("forked") == String::kNotFound) _exit(3);
    reader.Reset();
    before.Reset();
    _exit(0);
  }
  int status = 0;
  ASSERT_EQ(waitpid(child, &status, 0), child);
  EXPECT_TRUE(WIFEXITED(status)) << status;
  EXPECT_EQ(WEXITSTATUS(status), 0);
  // The parent goes on with what it had.
  Block<std::uint8_t> block{{0, 0, 9, 9}, {0}, {}, {}};
  EXPECT_TRUE(block.Read(*reader));
  EXPECT_TRUE(IsReadWhole(own));
}

}  // namespace
}  // namespace lumo
