#pragma once

#include <atomic>
#include <mutex>
#include <set>
#include <stdexcept>
#include <thread>
#include <vector>

#include "data/raster_reader.h"
#include "foundation/fault.h"
#include "support/test_rasters.h"

// A plug-in inside the test program: a format whose one source is a ramp.

namespace lumo::test {

/// Orders for the fake, and a record of the calls that it got. Threads: filled before it is used.
struct FakeBehaviour {
  unsigned samples = 7, lines = 5, bands = 3;
  unsigned dataType = kDataTypeOf<std::int16_t>;
  Interleave interleave = Interleave::BSQ;
  bool willing = true;        // CanConnect
  unsigned failConnects = 0;  // so many calls of Connect fail
  bool throwInCanConnect = false, throwInConnect = false, throwInRead = false;
  bool writable = true;
  unsigned tileWidth = 4, tileHeight = 2;  // of the description
  std::int32_t readerType = 17;
  bool hasLevels = false;   // says so; blocks of them can't be read
  bool hasMask = false;     // every third pixel, counted along the lines, is masked
  unsigned failAtRead = 0;  // so many reads after now; 0 for none
  lumo::String uri = "fake://source";
  GeoRefPtr geoRef;

  std::atomic<unsigned> asked{0}, connects{0}, made{0}, destroyed{0}, reads{0}, inRead{0};
  std::atomic<bool> overlapped{false};
  std::vector<bool> metadataSeen;  // for each Connect, whether it got any
  Array<lumo::String> lastStrings;
  std::mutex mutex;
  std::set<std::thread::id> threads;  // on which the source was used

  void Visit() {
    const std::lock_guard lock(mutex);
    threads.insert(std::this_thread::get_id());
  }
};

template <typename T>
class FakeReader final : public RasterReader<T> {
 public:
  FakeReader(RasterDataConnection* connection, FakeBehaviour& fake)
      : RasterReader<T>(connection), fake_(fake) {}

  bool OpBool() override { return true; }
  std::int32_t ReaderType() override { return fake_.readerType; }
  lumo::RasterDef RasterDef() override {
    lumo::RasterDef def;
    def.samples = fake_.samples;
    def.lines = fake_.lines;
    def.bands = fake_.bands;
    def.interleave = fake_.interleave;
    def.dataType = kDataTypeOf<T>;
    def.format = "EXTERNAL";
    def.tileWidth = fake_.tileWidth;
    def.tileHeight = fake_.tileHeight;
    def.SetGeoRef(fake_.geoRef);
    return def;
  }
  unsigned Samples(unsigned level) override { return fake_.samples >> level; }
  unsigned Lines(unsigned level) override { return fake_.lines >> level; }
  unsigned Bands() override { return fake_.bands; }
  std::int32_t PyramidType() override { return 2; }
  std::int32_t PyramidResamplingMethod() override { return 2; }
  std::int32_t PyramidLevelMin() override { return 1; }
  std::int32_t PyramidLevelMax() override { return 2; }
  bool PyramidExists() override { return fake_.hasLevels; }
  bool PyramidBuild(std::int32_t, std::int32_t, std::int32_t, const TileDimensions&) override {
    return false;
  }
  bool PyramidRebuild() override { return false; }
  bool PyramidDelete() override { return false; }
  bool PyramidRefresh() override { return false; }
  std::int32_t StatsMask() override { return lumo::StatsMask::Min | lumo::StatsMask::Max; }
  bool StatsExist(unsigned band) override { return band == 1; }
  bool CanWriteStats() override { return false; }
  bool CanWriteHistogram() override { return false; }
  bool HasNoDataValue(unsigned band) override { return band == 2; }
  bool CanInheritNoDataValues() override { return false; }
  void InheritNoDataValues(const lumo::RasterDef&) override {}
  bool HasPalette(unsigned band) override { return band == 0; }
  lumo::Palette Palette(unsigned) override {
    lumo::Palette palette;
    palette.Append(FindNamedColor("red"));
    return palette;
  }
  bool WritePalette(unsigned band, const lumo::Palette& palette) override {
    return band == 0 && palette.GetCount() == 2;
  }
  bool DeletePalette(unsigned band) override { return band == 0; }
  bool CanWritePixels(unsigned) override { return fake_.writable; }

  RasterBandStats<T> ReadStats(unsigned band) override {
    RasterBandStats<T> stats;
    stats.band = band;
    stats.mask = static_cast<unsigned>(StatsMask());
    return stats;
  }
  bool WriteStats(const Array<RasterBandStats<T>>&) override { return false; }
  Array<RasterBandHistogram<T>> Histogram(unsigned) override { return {}; }
  bool WriteHistogram(const Array<RasterBandHistogram<T>>&) override { return false; }
  T NoDataValue(unsigned) override { return RampValue<T>(3, 0, 0); }

  bool ReadPixels(unsigned left, unsigned top, unsigned width, unsigned height,
                  const Array<unsigned>& bands, unsigned level, T* pixels,
                  unsigned char* state) override {
    if (level != 0 || (fake_.failAtRead != 0 && --fake_.failAtRead == 0)) {
      SetFault("fake: this block is stuck");
      return false;
    }
    fake_.Visit();
    if (++fake_.inRead != 1) fake_.overlapped = true;
    ++fake_.reads;
    std::this_thread::yield();
    if (fake_.throwInRead) {
      --fake_.inRead;
      throw std::runtime_error("the disk is on fire");
    }
    std::vector<T> bip;
    std::vector<unsigned char> states;
    for (unsigned y = top; y < top + height; ++y) {
      for (unsigned x = left; x < left + width; ++x) {
        for (const unsigned band : bands) {
          bip.push_back(RampValue<T>(x, y, band));
          states.push_back(StateAt(x, y, band));
        }
      }
    }
    ConvertInterleave(bip.data(), Interleave::BIP, pixels, fake_.interleave, width, height,
                      bands.GetCount(), sizeof(T));
    ConvertInterleave(states.data(), Interleave::BIP, state, fake_.interleave, width, height,
                      bands.GetCount(), 1);
    --fake_.inRead;
    return true;
  }
  bool WritePixels(unsigned left, unsigned top, unsigned width, unsigned height,
                   const Array<unsigned>& bands, unsigned, const T* pixels,
                   const unsigned char*) override {
    fake_.Visit();
    std::vector<T> bip(std::size_t{width} * height * bands.GetCount());
    ConvertInterleave(pixels, fake_.interleave, bip.data(), Interleave::BIP, width, height,
                      bands.GetCount(), sizeof(T));
    const T* pixel = bip.data();
    for (unsigned y = top; y < top + height; ++y)
      for (unsigned x = left; x < left + width; ++x)
        for (const unsigned band : bands)
          if (!(*pixel++ == RampValue<T>(x, y, band))) return false;
    return true;
  }

  /// The pixels of band 2 at sample 3 hold no data.
  unsigned char StateAt(unsigned x, unsigned y, unsigned band) const {
    const bool isMasked = fake_.hasMask && (y * fake_.samples + x) % 3 == 0;
    return static_cast<unsigned char>((band == 2 && x == 3 ? 1 : 0) + (isMasked ? 2 : 0));
  }

 private:
  FakeBehaviour& fake_;
};

class FakeConnection final : public RasterDataConnection {
 public:
  explicit FakeConnection(FakeBehaviour& fake) : fake_(fake) { ++fake_.made; }
  ~FakeConnection() override {
    fake_.Visit();
    ++fake_.destroyed;
  }

  bool Connect(const Array<lumo::String>&, const GeoRefPtr&, const MetadataPtr&) override {
    return false;
  }
  void Disconnect() override {}
  bool IsConnected() override { return true; }
  Array<lumo::String> ConnectionStrings() override { return fake_.lastStrings; }
  lumo::URI URI() override { return lumo::URI(fake_.uri); }
  std::int32_t DataSourceType() override { return 1; }
  std::int32_t DataType() override { return static_cast<std::int32_t>(fake_.dataType); }
  bool CanWrite() override { return fake_.writable; }
  bool GetMetadata(const lumo::String&, const LockableMetadataImplPtr&) override { return true; }
  RasterReaderDispatchPtr RasterReaderDispatch() override {
    fake_.Visit();
    RasterReaderDispatchPtr made(new lumo::RasterReaderDispatch);
    DispatchType(TwelveTypes{}, fake_.dataType, [&]<typename T>() {
      made.Reset(
          new lumo::RasterReaderDispatch(RasterReaderPtr<T>(new FakeReader<T>(this, fake_))));
      return true;
    });
    return made;
  }
  lumo::RasterDef RasterDef() override { return RasterReaderDispatch()->GetBasic()->RasterDef(); }
  bool CreateRaster(const Array<lumo::String>&, const lumo::RasterDef&) override { return false; }
  DataConnectionPtr SelfPointer() override { return DataConnectionPtr(this, true); }

 private:
  FakeBehaviour& fake_;
};

/// Stands in a row of the table as long as it lives. The row is one whose plug-in isn't there.
class FakeFormat final : public DataConnectionFactory {
 public:
  explicit FakeFormat(const char* row) : record_(FindFormat(row)) { record_->factory = this; }
  ~FakeFormat() override { record_->factory = nullptr; }

  bool IsAvailable() override { return true; }
  bool CanConnect(const Array<lumo::String>&) override {
    ++fake.asked;
    if (fake.throwInCanConnect) throw std::runtime_error("can't look");
    return fake.willing;
  }
  DataConnectionPtr Connect(const Array<lumo::String>& connStrings, const GeoRefPtr&,
                            const MetadataPtr& metadata) override {
    ++fake.connects;
    fake.metadataSeen.push_back(bool(metadata));
    fake.lastStrings = connStrings;
    if (fake.throwInConnect) throw std::runtime_error("no way in");
    if (fake.failConnects > 0) {
      --fake.failConnects;
      SetFault("fake: shut today");
      return {};
    }
    return DataConnectionPtr(new FakeConnection(fake));
  }
  DataConnectionPtr CreateRaster(const Array<lumo::String>& connStrings,
                                 const RasterDef& def) override {
    fake.lastStrings = connStrings;
    fake.samples = def.samples;
    fake.lines = def.lines;
    fake.bands = def.bands;
    fake.dataType = def.dataType;
    return DataConnectionPtr(new FakeConnection(fake));
  }
  DataConnectionPtr CreateVector(const Array<lumo::String>&, const VectorDef&) override {
    return {};
  }

  FakeBehaviour fake;

 private:
  FormatRecord* record_;
};

}  // namespace lumo::test
