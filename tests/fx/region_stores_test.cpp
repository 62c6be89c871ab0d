#include "foundation/fault.h"
#include "fx/region_attribute_histogram.h"
#include "fx/region_attribute_stats.h"
#include "fx/region_kinds.h"
#include "support/file_bytes.h"
#include "support/file_size_limit.h"
#include "support/temporary_directory.h"

namespace lumo {
namespace {

namespace fs = std::filesystem;
using test::FileBytes;
using FileStore = RegionAttributesFile<float>;

class RegionStores : public testing::Test {
 protected:
  void PutBytes(const std::string& bytes) const { std::ofstream(path_, std::ios::binary) << bytes; }

  test::TemporaryDirectory directory_;
  const fs::path path_ = directory_.Path() / "store";
  const URI uri_{String(path_.string())};
};

/// Little-endian bytes of numbers of any type.
template <typename T>
std::string Bytes(std::initializer_list<T> numbers) {
  return {reinterpret_cast<const char*>(numbers.begin()), numbers.size() * sizeof(T)};
}

std::string Padded(const std::string& bytes, std::size_t size) {
  std::string padded(size, '\0');
  std::copy(bytes.begin(), bytes.end(), padded.begin());
  return padded;
}

TEST_F(RegionStores, RegionsInAFile) {
  FileStore store(uri_, 2, 3);
  EXPECT_TRUE(store.IsValid());
  EXPECT_EQ(store.RegionCount(), 0U);
  store.Value(2, 1, 2) = 1.0F;
  store.Value(1, 0, 1) = -4.5F;
  store.Clear();
  EXPECT_EQ(store.RegionCount(), 3U);
  EXPECT_TRUE(store.RegionExists(2, 1));
  EXPECT_FALSE(store.RegionExists(2, 0));
  EXPECT_FALSE(store.RegionExists(7, 0));
  EXPECT_TRUE(store.Close());
  std::vector<float> values(18);
  values[7] = -4.5F;
  values[17] = 1.0F;
  const std::string want =
      Padded(std::string("FXA50\x02\0\x03\0", 9), 1024) +
      std::string(reinterpret_cast<const char*>(values.data()), values.size() * sizeof(float));
  EXPECT_EQ(FileBytes(path_), want);

  const FileStore read(uri_, false);
  EXPECT_TRUE(read.IsValid());
  EXPECT_EQ(read.Bands(), 2U);
  EXPECT_EQ(read.Attributes(), 3U);
  EXPECT_EQ(read.Value(1, 0, 1), -4.5F);
  EXPECT_TRUE(read.RegionExists(2, 1));
  EXPECT_EQ(FileBytes(path_), want);
  FileStore changed(uri_, true);
  changed.Value(0, 0, 0) = 9.0F;
  EXPECT_TRUE(changed.Close());
  EXPECT_EQ(FileBytes(path_), want.substr(0, 1024) + Bytes({9.0F}) + want.substr(1028));
}

TEST_F(RegionStores, RegionsOfAMap) {
  RegionAttributesMap<float> store(2, 3);
  EXPECT_EQ(store.RegionCount(), 0U);
  EXPECT_FALSE(store.RegionExists(5, 1));
  EXPECT_EQ(store.RegionCount(), 1U);  // by reading
  float& kept = store.Value(0xFFFFFFFF, 1, 2);
  kept = 1.0F;
  EXPECT_FALSE(store.RegionExists(0xFFFFFFFF, 0));
  EXPECT_EQ(store.Value(5, 0, 0), 0.0F);
  store.Value(2, 1, 1) += 2.0F;
  EXPECT_TRUE(store.RegionExists(0xFFFFFFFF, 1));
  EXPECT_EQ(&kept, &store.Value(0xFFFFFFFF, 1, 2));
  const Array<unsigned> regions = store.GetRegions();
  EXPECT_EQ(std::vector<unsigned>(regions.begin(), regions.end()),
            (std::vector<unsigned>{2, 5, 0xFFFFFFFF}));
  store.Clear();
  EXPECT_EQ(store.RegionCount(), 0U);
  EXPECT_EQ(store.Value(2, 1, 1), 0.0F);
}

TEST_F(RegionStores, RegionsBeyondFourGigabytes) {
  constexpr unsigned kLast = 700'000'000;
  {
    SpectralRegionAttributesFile store(uri_, 3U);
    store.Value(kLast, 2, store.kMax) = 8.0F;
    store.Value(1, 0, store.kMin) = 7.0F;
    EXPECT_TRUE(store.Close());
  }
  EXPECT_GT(fs::file_size(path_), std::uintmax_t{1} << 32U);
  SpectralRegionAttributesFile store(uri_, false);
  EXPECT_EQ(store.Value(kLast, 2, store.kMax), 8.0F);
  EXPECT_EQ(store.Value(1, 0, store.kMin), 7.0F);
  EXPECT_EQ(store.RegionCount(), kLast);  // the record of the last isn't full
}

TEST_F(RegionStores, Kinds) {
  SpatialRegionAttributesMap shapes;
  EXPECT_EQ(shapes.Bands(), 1U);
  EXPECT_EQ(shapes.Attributes(), 15U);
  shapes.Value(1, 0, shapes.kPresence) = 1.0F;
  EXPECT_TRUE(shapes.RegionExists(1, 0));
  RegionMeansFile means(uri_, 4U);
  EXPECT_EQ(means.Attributes(), 2U);
  EXPECT_TRUE(means.IsA(RegionMeansFile::TypeCode));
  EXPECT_TRUE(means.IsA(FileStore::TypeCode));
  EXPECT_TRUE(means.IsA(RegionAttributes<float>::TypeCode));
  EXPECT_FALSE(means.IsA(SpectralRegionAttributesFile::TypeCode));
  EXPECT_TRUE(means.Close());
  EXPECT_TRUE(RegionMeansFile(uri_, false).IsValid());
  EXPECT_FALSE(TextureRegionAttributesFile(uri_, false).IsValid());
  EXPECT_FALSE(SpatialRegionAttributesFile(uri_, true).IsValid());
  EXPECT_FALSE(RegionClassificationProbabilityFile(uri_, true).IsValid());
  RegionClassificationProbabilityFile scores(uri_, 3U);
  EXPECT_TRUE(scores.RegionExists(12, 0));
  EXPECT_EQ(scores.RegionCount(), 0U);
}

TEST_F(RegionStores, StatisticsInAFile) {
  RegionAttributeStatsFile<float> store(uri_, 2, 2);
  store.Mean(1, 0) = 1.0F;
  store.StdDev(1, 0) = 2.0F;
  store.Min(1, 0) = 3.0F;
  store.Max(1, 0) = 4.0F;
  store.Count(1, 0) = 5.0F;
  EXPECT_TRUE(store.Close());
  EXPECT_EQ(FileBytes(path_), Padded(std::string("FXAS50\x02\0\x02\0", 10), 1024 + 40) +
                                  Bytes({1.0F, 2.0F, 3.0F, 4.0F, 5.0F}));
  RegionAttributeStatsFile<float> again(uri_);
  EXPECT_TRUE(again.IsValid());
  EXPECT_EQ(again.Bands(), 2U);
  EXPECT_EQ(std::as_const(again).Max(1, 0), 4.0F);
  EXPECT_EQ(std::as_const(again).Value(1, 1, 0), 0.0F);
}

TEST_F(RegionStores, HistogramsInAFile) {
  RegionAttributeHistogramFile<float> store(uri_, 2, 3);
  EXPECT_EQ(store.Bins(), 256U);
  store.LowerLimit(1, 2) = -1.0F;
  store.UpperLimit(1, 2) = 509.0F;
  EXPECT_EQ(store.BinSize(1, 2), 2.0F);
  ++store.Count(1, 2, 255);
  EXPECT_TRUE(store.Close());
  const std::string want =
      Padded(Padded(std::string("FXAH50\x02\0\x03\0\0\x01", 12), 12 + 40) + Bytes({-1.0F, 509.0F}),
             65536 + 4 * (6 * 256 - 1)) +
      Bytes({1U});
  EXPECT_EQ(FileBytes(path_), want);

  RegionAttributeHistogramMap<float> single(1, 2, 1);
  single.UpperLimit(0, 1) = 5.0F;
  EXPECT_EQ(single.BinSize(0, 1), 6.0F);
  EXPECT_EQ(single.Count(0, 1, 0)++, 0U);
  EXPECT_EQ(single.Count(0, 0, 0), 0U);
}

TEST_F(RegionStores, LimitsOfHeaders) {
  EXPECT_TRUE((RegionAttributeHistogramFile<float>(uri_, 819, 10).IsValid()));
  EXPECT_TRUE((FileStore(uri_, 65535, 65535).IsValid()));
  PutBytes("older");
  EXPECT_FALSE((RegionAttributeHistogramFile<float>(uri_, 8191, 1).IsValid()));
  EXPECT_EQ(TakeFault().ToUTF8(), path_.string() +
                                      ": a file holds histograms of 8190 pairs of band "
                                      "and attribute, not of 8191");
  EXPECT_FALSE((FileStore(uri_, 65536, 1).IsValid()));
  EXPECT_EQ(TakeFault().ToUTF8(),
            path_.string() + ": no region file has 65536 bands or attributes");
  EXPECT_FALSE((RegionAttributeStatsFile<float>(uri_, 1, 70000).IsValid()));
  EXPECT_EQ(FileBytes(path_), "older");
}

TEST_F(RegionStores, OtherFilesAreRefusedAndLeftAlone) {
  for (const std::string& bytes :
       {std::string(), Padded("FXA50\x01", 1023), Padded("FXA51", 2000), Padded("fxa50", 1024),
        Padded("FXAS51", 1024), Padded("FXAS50", 700), std::string(3000, '\0')}) {
    PutBytes(bytes);
    {
      FileStore store(uri_, true);
      EXPECT_FALSE(store.IsValid()) << bytes.substr(0, 6);
      EXPECT_EQ(store.Bands(), 0U);
      store.Value(0, 0, 0) = 1.0F;
      EXPECT_EQ(store.Value(9, 0, 0), 0.0F);
      EXPECT_FALSE(store.Close());
      RegionAttributeStatsFile<float> stats(uri_);
      EXPECT_FALSE(stats.IsValid());
      stats.Mean(0, 0) = 1.0F;
    }
    EXPECT_EQ(FileBytes(path_), bytes);
  }
}

TEST_F(RegionStores, CountsOfNothing) {
  PutBytes(Padded("FXA50", 1024) + Bytes({0.5F, 2.0F}));
  FileStore store(uri_, false);
  EXPECT_TRUE(store.IsValid());
  EXPECT_EQ(store.RegionCount(), 0U);
  EXPECT_FALSE(store.RegionExists(0, 0));
  EXPECT_TRUE(store.RegionExists(1, 0));
}

TEST_F(RegionStores, AKilledWriterLeavesAFileThatIsRefused) {
  test::DoAndBeKilled([&] {
    FileStore store(uri_, 1, 5);
    for (unsigned region = 0; region < 100'000; ++region) store.Value(region, 0, 4) = 1.0F;
    raise(SIGKILL);
  });
  EXPECT_GT(fs::file_size(path_), 1024U);
  EXPECT_FALSE(FileStore(uri_, false).IsValid());
  RegionAttributeStatsFile<float>(uri_, 3, 1).Mean(0, 0) = 1.0F;
  EXPECT_TRUE(RegionAttributeStatsFile<float>(uri_).IsValid());
  test::DoAndBeKilled([&] {
    RegionAttributeStatsFile<float> store(uri_);
    for (unsigned i = 0; i < 10'000; ++i) store.Mean(i, 0) = 2.0F;
    raise(SIGKILL);
  });
  EXPECT_FALSE(RegionAttributeStatsFile<float>(uri_).IsValid());
}

TEST_F(RegionStores, AFullDiskIsTold) {
  const auto expect_told = [&](auto& store) {
    EXPECT_FALSE(store.Close());
    EXPECT_EQ(store.GetErrorState().code, ObjectErrorIO::Code);
    EXPECT_EQ(TakeFault().ToUTF8(), path_.string() + ": File too large");
    EXPECT_FALSE(store.IsValid());
  };
  const test::FileSizeLimit limit(2000);
  FileStore regions(uri_, 1, 5);
  regions.Value(100, 0, 4) = 1.0F;
  expect_told(regions);
  RegionAttributeHistogramFile<float> histograms(uri_, 1, 5);
  histograms.Count(0, 0, 3) = 1;
  expect_told(histograms);
}

}  // namespace
}  // namespace lumo
