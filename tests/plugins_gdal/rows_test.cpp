#include <filesystem>

#include "raster/creation_options.h"
#include "support/raster_sources.h"
#include "support/run_command.h"
#include "support/temporary_directory.h"

namespace lumo::test {
namespace {

namespace fs = std::filesystem;

constexpr unsigned kSide = 64, kTile = 16;

/// Makes a packed TIFF file of whole lines, whose pixels tell their place.
void MakeFile(const std::string& path, unsigned firstLine, unsigned lines) {
  RasterDef def;
  def.format = "TIFF";
  def.samples = kSide;
  def.lines = lines;
  def.bands = 1;
  def.dataType = kDataTypeOf<unsigned char>;
  def.interleave = Interleave::BSQ;
  def.creation.compression = BlockCompression::kDeflate;
  def.creation.tile = kTile;
  def.tileWidth = def.tileHeight = kTile;
  RasterDataConnectionPtr source = CreateSource({"TIFF", path}, def);
  ASSERT_TRUE(source) << TakeFault().ToUTF8();
  Block<unsigned char> block{{0, 0, kSide - 1, lines - 1}, {0}, {}, {}};
  for (unsigned i = 0; i < kSide * lines; ++i) {
    block.pixels.push_back(static_cast<unsigned char>((firstLine * kSide + i) * 7 / 3));
  }
  block.state.assign(block.pixels.size(), 0);
  EXPECT_TRUE(block.Write(*ReaderOf<unsigned char>(source)));
  EXPECT_EQ(Release(source), "");
}

/// Raises an abort flag once some work is done.
class AbortOnTheWay final : public AsyncCallback {
 public:
  explicit AbortOnTheWay(const AbortFlagPtr& abort) : abort_(abort) {}
  void OnProgress(double progress) override {
    if (progress > 0) abort_->Set(true);
  }

 private:
  const AbortFlagPtr abort_;
};

/// A new raster that takes packed blocks tells how far it is, and ends by an abort without a file.
TEST(TakenRows, ShowProgressAndCanBeAborted) {
  const TemporaryDirectory directory;
  const auto place = [&](const char* name) { return (directory.Path() / name).string(); };
  MakeFile(place("whole.tif"), 0, kSide);
  MakeFile(place("a.tif"), 0, kSide / 2);
  MakeFile(place("b.tif"), kSide / 2, kSide / 2);
  const CommandOutcome opened = RunCommand("OpenRasterCommand", {{"ConnStr", place("whole.tif")}});
  const CommandOutcome joined =
      RunCommand("CreateJoinedRowsRasterCommand", {{"SrcURI", opened.outputs.at("URI")},
                                                   {"Files", place("a.tif") + "|" + place("b.tif")},
                                                   {"Lines", "1:2 [32 32] "}});
  ASSERT_TRUE(joined.Succeeded()) << joined.reason;
  for (const bool isAborted : {true, false}) {
    SCOPED_TRACE(isAborted);
    const AbortFlagPtr abort(new StandardAbortFlag);
    const AsyncCallbackPtr onTheWay(isAborted ? new AbortOnTheWay(abort) : nullptr);
    const IPC ipc(abort, ProgressReportPtr(new StandardProgressReport(onTheWay)));
    const CommandOutcome made = RunCommand("CreateRasterCommand",
                                           {{"ConnStr", place("o.tif")},
                                            {"SrcURI", joined.outputs.at("URI")},
                                            {"RowsURI", joined.outputs.at("URI")},
                                            {"Format", "TIFF"},
                                            {"Compress", "DEFLATE"},
                                            {"Tile", std::to_string(kTile)}},
                                           ipc);
    EXPECT_EQ(made.Succeeded(), !isAborted) << made.reason;
    if (isAborted) {
      EXPECT_NE(made.reason.find("aborted"), std::string::npos) << made.reason;
      EXPECT_FALSE(fs::exists(place("o.tif")));
      continue;
    }
    EXPECT_EQ(ipc.progress->GetProgress(), 1.0);
    RunCommand("CloseRasterCommand", {{"URI", made.outputs.at("URI")}});
    EXPECT_EQ(fs::file_size(place("o.tif")), fs::file_size(place("whole.tif")));
  }
  for (const CommandOutcome* const each : {&joined, &opened}) {
    RunCommand("CloseRasterCommand", {{"URI", each->outputs.at("URI")}});
  }
}

}  // namespace
}  // namespace lumo::test
