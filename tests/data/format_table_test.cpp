#include "data/format_table.h"

#include "foundation/environment.h"
#include "foundation/fault.h"
#include "support/temporary_directory.h"

namespace lumo {
namespace {

TEST(FormatTable, KeysAreFoundExactly) {
  Array<String> rest;
  EXPECT_EQ(SplitConnStr(ConnStrings({"x.tif", "TIFF", "PNG"}), rest), "TIFF");
  ASSERT_EQ(rest.GetCount(), 1u);
  EXPECT_EQ(rest[0], "x.tif");
  EXPECT_EQ(FindFormatName(ConnStrings({"tiff", "x.tif"})).GetLength(), 0u);
  EXPECT_EQ(FindFormatName(ConnStrings({"GDBRaster"})), "GDBRaster");
  EXPECT_EQ(FindFormatName({}).GetLength(), 0u);
}

TEST(FormatTable, RowsStandInTheOrderOfDetection) {
  ASSERT_EQ(gCdfFormatRecordCount, 27u);
  const struct {
    unsigned row;
    const char *name, *library, *driver;
    int kind;
  } rows[] = {{0, "MemoryRaster", "libvexraster.so", "MemoryRaster", 1},
              {2, "GDBRaster", "libvexgdb.so", "", 1},
              {4, "TIFF", "libvexgdal.so", "GTiff", 1},
              {16, "Spot", "libvexgdal.so", "DIMAP", 1},
              {21, "Shapefile", "libvexshapefile.so", "Shapefile", 2},
              {26, "CEOS", "libvexgdal.so", "CEOS", 1}};
  for (const auto& row : rows) {
    const FormatRecord& record = gCdfFormatRecords[row.row];
    EXPECT_EQ(record.name, row.name);
    EXPECT_EQ(record.linuxLibrary, row.library);
    EXPECT_STREQ(record.driver.ToUTF8().c_str(), row.driver);
    EXPECT_EQ(record.kind, row.kind);
    EXPECT_EQ(FindFormat(record.name), &record);
  }
}

TEST(FormatTable, APluginThatIsMissingOrNoneSaysSo) {
  EXPECT_EQ(FactoryForFormat("JPIP"), nullptr);
  EXPECT_NE(TakeFault().Find("libvexjpip.so"), String::kNotFound);
  EXPECT_EQ(FactoryForFormat("jpip"), nullptr);
  EXPECT_NE(TakeFault().Find("no such format"), String::kNotFound);
  LoadFormat(99);
}

}  // namespace
}  // namespace lumo
