#include "data/data_errors.h"
#include "data/data_manager.h"
#include "data/mt_connection.h"
#include "foundation/fault.h"
#include "raster/interleave.h"
#include "support/fake_source.h"

namespace lumo {
namespace {

using test::FakeFormat;

const char* const kFirst = "EsriImageService";  // rows without a plug-in, in table order
const char* const kSecond = "EXTERNAL";

DataConnectionPtr Open(std::initializer_list<String> strings, const MetadataPtr& metadata = {}) {
  return GetGlobalDataManager().Connect(ConnStrings(strings), GeoRefPtr(), metadata);
}

MetadataPtr SomeMetadata() {
  return MetadataPtr(new Metadata);
}

TEST(Connecting, ANamedFormatAsksNoOtherRow) {
  FakeFormat first(kFirst), second(kSecond);
  ASSERT_TRUE(Open({kSecond, "x"}));
  EXPECT_EQ(first.fake.asked + first.fake.connects, 0u);
  EXPECT_EQ(second.fake.asked, 0u);
  EXPECT_EQ(second.fake.connects, 1u);
  EXPECT_EQ(second.fake.lastStrings.GetCount(), 2u);  // the plug-in sees the key too
}

TEST(Connecting, TriesTheWillingInOrder) {
  FakeFormat first(kFirst), second(kSecond);
  first.fake.failConnects = 99;
  const DataConnectionPtr made =
      GetGlobalDataManager().ConnectDirect(ConnStrings({"x"}), GeoRefPtr(), SomeMetadata());
  ASSERT_TRUE(made);
  EXPECT_EQ(first.fake.connects, 1u);
  EXPECT_EQ(second.fake.metadataSeen, std::vector<bool>{false});
}

TEST(Connecting, AloneWillingGetsASecondTryWithoutMetadata) {
  FakeFormat only(kFirst);
  only.fake.failConnects = 1;
  ASSERT_TRUE(
      GetGlobalDataManager().ConnectDirect(ConnStrings({"x"}), GeoRefPtr(), SomeMetadata()));
  EXPECT_EQ(only.fake.metadataSeen, (std::vector<bool>{true, false}));
}

TEST(Connecting, FailuresSayWhy) {
  FakeFormat only(kFirst);
  const struct {
    const char* name;
    std::function<void(test::FakeBehaviour&)> set;
    std::initializer_list<String> strings;
    const char* want;
  } cases[] = {
      {"connect throws",
       [](auto& fake) { fake.throwInConnect = true; },
       {kFirst, "x"},
       "no way in"},
      {"plug-in's own words",
       [](auto& fake) { fake.failConnects = 1; },
       {kFirst, "x"},
       "shut today"},
      {"asking throws",
       [](auto& fake) { fake.throwInCanConnect = true; },
       {"/none"},
       "no such file"},
      {"a directory", [](auto& fake) { fake.willing = false; }, {"/tmp"}, "is a directory"},
      {"nothing named", [](auto& fake) { fake.willing = false; }, {}, "no source"},
      {"plug-in missing", [](auto&) {}, {"JPIP", "x"}, "libvexjpip.so"},
  };
  for (const auto& c : cases) {
    SCOPED_TRACE(c.name);
    only.fake.throwInConnect = only.fake.throwInCanConnect = false;
    only.fake.failConnects = 0;
    only.fake.willing = true;
    c.set(only.fake);
    TakeFault();
    EXPECT_FALSE(Open(c.strings));
    EXPECT_THAT(TakeFault().ToUTF8(), testing::HasSubstr(c.want));
  }
  EXPECT_EQ(only.fake.made, only.fake.destroyed);
}

TEST(Connecting, CreatesByTheFormatOfTheDescription) {
  FakeFormat format(kSecond);
  RasterDef def;
  def.samples = 4;
  def.lines = 3;
  def.bands = 2;
  def.dataType = kDataTypeOf<float>;
  EXPECT_FALSE(GetGlobalDataManager().CreateRaster(ConnStrings({kSecond, "x"}), def));
  EXPECT_THAT(TakeFault().ToUTF8(), testing::HasSubstr("Unknown"));
  def.format = kSecond;
  const RasterDataConnectionPtr made(
      GetGlobalDataManager().CreateRaster(ConnStrings({kFirst, "x"}), def));
  ASSERT_TRUE(made);
  EXPECT_EQ(format.fake.lastStrings.GetCount(), 1u);  // the key is dropped
  EXPECT_TRUE(made->RasterReaderDispatch()->Get<float>());
  EXPECT_EQ(made->RasterDef().lines, 3u);
}

TEST(Proxy, ServesManyThreadsOnOneOfItsOwn) {
  FakeFormat format(kFirst);
  {
    const RasterDataConnectionPtr source(Open({kFirst, "x"}));
    ASSERT_TRUE(source);
    const auto reader = source->RasterReaderDispatch()->Get<std::int16_t>();
    std::vector<std::thread> threads;
    std::atomic<unsigned> good{0};
    for (int t = 0; t < 4; ++t) {
      threads.emplace_back([&] {
        for (int i = 0; i < 50; ++i) {
          Array<std::int16_t> pixels;
          Array<unsigned char> state;
          good += reader->ReadBlock({0, 0, 6, 4}, MakeArray<unsigned>({0, 2}), 0, Interleave::BIP,
                                    pixels, state) &&
                  pixels[13] == RampValue<std::int16_t>(6, 0, 2);
        }
      });
    }
    for (auto& thread : threads) thread.join();
    EXPECT_EQ(good, 200u);
  }
  EXPECT_FALSE(format.fake.overlapped);
  EXPECT_EQ(format.fake.threads.size(), 1u);  // the destructor ran there too
  EXPECT_EQ(format.fake.threads.count(std::this_thread::get_id()), 0u);
  EXPECT_EQ(format.fake.destroyed, 1u);
}

TEST(Proxy, ConnectsAndDisconnectsTwice) {
  FakeFormat format(kFirst);
  MtRasterDataConnection proxy;
  EXPECT_FALSE(proxy.IsConnected());
  ASSERT_TRUE(proxy.Connect(ConnStrings({kFirst, "a"}), {}, SomeMetadata()));
  ASSERT_TRUE(proxy.Connect(ConnStrings({kFirst, "b"}), {}, {}));
  EXPECT_EQ(format.fake.destroyed, 1u);
  EXPECT_EQ(format.fake.metadataSeen, (std::vector<bool>{false, false}));
  EXPECT_EQ(proxy.ConnectionStrings()[1], "b");
  EXPECT_FALSE(proxy.GetMetadata("x", {}));
  proxy.Disconnect();
  proxy.Disconnect();
  EXPECT_EQ(format.fake.destroyed, 2u);
  EXPECT_EQ(proxy.DataType(), 0);
  EXPECT_TRUE(proxy.RasterReaderDispatch()->HasError());
  EXPECT_EQ(proxy.RasterReaderDispatch()->GetErrorState().code, RasterReaderErrorInvalid::Code);
}

TEST(Proxy, AReaderOfAnotherTypeAnswersNothing) {
  FakeFormat format(kFirst);
  const RasterDataConnectionPtr source(Open({kFirst, "x"}));
  EXPECT_FALSE(source->RasterReaderDispatch()->Get<std::uint32_t>());
  const auto reader = source->RasterReaderDispatch()->Get<std::int16_t>();
  format.fake.dataType = kDataTypeOf<double>;
  EXPECT_EQ(reader->Samples(0), 0u);
  format.fake.dataType = 98;
  EXPECT_EQ(reader->Bands(), 0u);
  EXPECT_EQ(format.fake.reads, 0u);
  const RasterDataConnectionPtr other(Open({kFirst, "x"}));
  EXPECT_EQ(other->RasterReaderDispatch()->GetErrorState().code, RasterReaderErrorInvalid::Code);
}

TEST(Proxy, AnExceptionEndsTheOneCall) {
  FakeFormat format(kFirst);
  const RasterDataConnectionPtr source(Open({kFirst, "x"}));
  const auto reader = source->RasterReaderDispatch()->Get<std::int16_t>();
  std::int16_t pixel = 5;
  unsigned char state = 0;
  format.fake.throwInRead = true;
  TakeFault();
  EXPECT_FALSE(reader->ReadPixels(0, 0, 1, 1, MakeArray<unsigned>({0}), 0, &pixel, &state));
  EXPECT_THAT(TakeFault().ToUTF8(), testing::HasSubstr("the disk is on fire"));
  format.fake.throwInRead = false;
  EXPECT_TRUE(reader->ReadPixels(2, 1, 1, 1, MakeArray<unsigned>({0}), 0, &pixel, &state));
  EXPECT_EQ(pixel, RampValue<std::int16_t>(2, 1, 0));
}

TEST(ReadBlock, GivesEveryInterleaveFromEveryOther) {
  FakeFormat format(kFirst);
  for (const Interleave native : {Interleave::BIP, Interleave::BIL, Interleave::BSQ}) {
    format.fake.interleave = native;
    const RasterDataConnectionPtr source(Open({kFirst, "x"}));
    const auto reader = source->RasterReaderDispatch()->Get<std::int16_t>();
    for (const Interleave wanted : {Interleave::BIP, Interleave::BIL, Interleave::BSQ}) {
      Array<std::int16_t> pixels;
      Array<unsigned char> state;
      const auto bands = MakeArray<unsigned>({2, 0, 1, 2});
      ASSERT_TRUE(reader->ReadBlock({2, 1, 6, 3}, bands, 0, wanted, pixels, state));
      ASSERT_EQ(pixels.GetDims(), BlockDims(wanted, 5, 3, 4));
      const ArrayDims& dims = pixels.GetDims();
      for (unsigned at = 0; at < dims.count; ++at) {
        const unsigned i0 = at / (dims.extent[1] * dims.extent[2]);
        const unsigned i1 = at / dims.extent[2] % dims.extent[1], i2 = at % dims.extent[2];
        unsigned x = i2, y = i1, b = i0;  // BSQ
        if (wanted == Interleave::BIP) std::tie(y, x, b) = std::tie(i0, i1, i2);
        if (wanted == Interleave::BIL) std::tie(y, b, x) = std::tie(i0, i1, i2);
        ASSERT_EQ(pixels[at], RampValue<std::int16_t>(x + 2, y + 1, bands[b]));
        ASSERT_EQ(state[at], bands[b] == 2 && x + 2 == 3 ? 1 : 0);
      }
      EXPECT_TRUE(reader->WriteBlock({2, 1, 6, 3}, bands, 0, wanted, pixels, state));
    }
    Array<std::int16_t> pixels;
    Array<unsigned char> state;
    ASSERT_TRUE(reader->ReadBlock({0, 0, 6, 4}, MakeArray<unsigned>({1, 0, 2}), 0, Interleave::None,
                                  pixels, state));
    EXPECT_EQ(pixels.GetDims(), ArrayDims(5, 7));
    EXPECT_EQ(pixels[8], RampValue<std::int16_t>(1, 1, 1));
    const unsigned before = format.fake.reads;
    EXPECT_FALSE(reader->ReadBlock({0, 0, 6, 4}, MakeArray<unsigned>({1}), 0,
                                   static_cast<Interleave>(3), pixels, state));
    EXPECT_EQ(format.fake.reads, before);
  }
}

TEST(DataManager, EachThreadCountsItsOwn) {
  DataManager& mine = GetLocalDataManager();
  EXPECT_EQ(&GetLocalDataManager(), &mine);
  std::thread([&] {
    EXPECT_NE(&GetLocalDataManager(), &mine);
    FreeLocalDataManager();
    FreeLocalDataManager();  // one too many does nothing
  }).join();
  FreeLocalDataManager();
  EXPECT_EQ(&GetLocalDataManager(), &mine);
  FreeLocalDataManager();
  FreeLocalDataManager();
}

}  // namespace
}  // namespace lumo
