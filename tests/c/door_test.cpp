#include <atomic>
#include <chrono>
#include <fstream>
#include <memory>
#include <numeric>
#include <random>
#include <thread>

#include "c/vexg.h"
#include "commands/catalog.h"
#include "commands/catalog_session.h"
#include "support/temporary_directory.h"
#include "support/test_rasters.h"

namespace lumo {
namespace {

/// A fault text, given back in the end.
class Fault {
 public:
  ~Fault() { vexg_free(text_); }
  char** At() {
    vexg_free(text_);
    text_ = nullptr;
    return &text_;
  }
  std::string Text() const { return text_ != nullptr ? text_ : ""; }

 private:
  char* text_ = nullptr;
};

/// A text of the door's as a string; empty for none.
std::string Take(char* text) {
  const std::string taken = text != nullptr ? text : "";
  vexg_free(text);
  return taken;
}

/// A raster that is open in the catalog while this lives.
template <typename T>
struct OpenRamp {
  explicit OpenRamp(unsigned samples, unsigned lines, unsigned bands)
      : raster(MakeRamp<T>(samples, lines, bands)) {
    catalog::Add(raster);
    name = "[" + raster->GetURI().ToUTF8() + "] ";
  }
  ~OpenRamp() { catalog::Remove(raster); }

  Pointer<RampRaster<T>> raster;
  std::string name;
};

/// The job that shows a rectangle of an open raster.
std::string PartOf(const std::string& name, unsigned left, unsigned top, unsigned right,
                   unsigned bottom) {
  return "<Job Checks=\"Strict\"><Command Name=\"part\" ID=\"CreateSpatialSubsetRasterCommand\">"
         "<Input SrcURI=\"" +
         name + "\" SubRect=\"" + std::to_string(left) + " " + std::to_string(top) + " " +
         std::to_string(right) + " " + std::to_string(bottom) +
         "\"/><Output URI=\"$part\"/></Command></Job>";
}

template <typename T>
vexg_block BlockOf(const vexg_rect& rect, const std::vector<std::uint32_t>& bands, int order,
                   std::vector<T>& pixels, std::vector<std::uint8_t>* states) {
  const std::size_t values =
      std::size_t{rect.right - rect.left + 1} * (rect.bottom - rect.top + 1) * bands.size();
  pixels.assign(values, T(99));
  if (states != nullptr) states->assign(values, 99);
  return {rect,          bands.data(),       static_cast<std::uint32_t>(bands.size()),
          order,         kDataTypeOf<T>,     0,
          pixels.data(), values * sizeof(T), states != nullptr ? states->data() : nullptr};
}

/// Where the value of a sample, line and band of a block stands.
std::size_t PlaceOf(const vexg_block& block, unsigned sample, unsigned line, unsigned band) {
  const std::size_t width = block.rect.right - block.rect.left + 1;
  const std::size_t height = block.rect.bottom - block.rect.top + 1;
  const std::size_t count = block.band_count;
  switch (block.order) {
    case VEXG_BIP:
      return (line * width + sample) * count + band;
    case VEXG_BIL:
      return (line * count + band) * width + sample;
    default:
      return (band * height + line) * width + sample;
  }
}

template <typename T>
void ExpectRamp(const OpenRamp<T>& ramp, const vexg_rect& rect,
                const std::vector<std::uint32_t>& bands, int order, bool withStates) {
  std::vector<T> pixels;
  std::vector<std::uint8_t> states;
  const vexg_block block = BlockOf(rect, bands, order, pixels, withStates ? &states : nullptr);
  Fault fault;
  ASSERT_EQ(vexg_read(ramp.name.c_str(), &block, nullptr, fault.At()), 1) << fault.Text();
  for (unsigned band = 0; band < bands.size(); ++band) {
    for (unsigned line = rect.top; line <= rect.bottom; ++line) {
      for (unsigned sample = rect.left; sample <= rect.right; ++sample) {
        const std::size_t place = PlaceOf(block, sample - rect.left, line - rect.top, band);
        ASSERT_EQ(pixels[place], RampValue<T>(sample, line, bands[band])) << place;
        ASSERT_TRUE(!withStates || states[place] == 0) << place;
      }
    }
  }
}

TEST(CDoor, ReadsBlocksInEveryOrder) {
  const OpenRamp<std::uint16_t> small(50, 40, 4);
  const OpenRamp<float> large(700, 3000, 3);  // 25 MB: blocks come in pieces
  std::mt19937 random(4);
  const auto below = [&](unsigned end) { return static_cast<unsigned>(random() % end); };
  for (int turn = 0; turn < 60; ++turn) {
    SCOPED_TRACE(turn);
    const unsigned left = below(50), top = below(40);
    const vexg_rect rect{left, top, left + below(50 - left), top + below(40 - top)};
    std::vector<std::uint32_t> bands(1 + below(5));
    for (auto& band : bands) band = below(4);
    ExpectRamp(small, rect, bands, turn % 3, turn % 2 == 0);
  }
  for (const int order : {VEXG_BIP, VEXG_BIL, VEXG_BSQ}) {
    ExpectRamp(large, {3, 1, 698, 2998}, {2, 0, 1}, order, true);
    ExpectRamp(large, {0, 5, 699, 2999}, {1}, order, false);
  }
}

TEST(CDoor, WritesBlocksAndLeavesTheCallersMemoryAlone) {
  Fault fault;
  const std::string made =
      Take(vexg_run("<Job><Command ID=\"CreateTempRasterCommand\"><Input Samples=\"900\" "
                    "Lines=\"2000\" Bands=\"3\" DataType=\"Int32\"/></Command></Job>",
                    nullptr, nullptr, fault.At()));
  const std::size_t begin = made.find("URI=\"") + 5;
  const std::string name = made.substr(begin, made.find('"', begin) - begin);
  std::vector<std::int32_t> pixels, back;
  std::vector<std::uint8_t> states;
  const std::vector<std::uint32_t> bands{0, 1, 2};
  const vexg_rect all{0, 0, 899, 1999};
  const vexg_block block = BlockOf(all, bands, VEXG_BSQ, pixels, &states);
  std::iota(pixels.begin(), pixels.end(), 7);
  states.assign(states.size(), 0);
  const auto before = pixels;
  ASSERT_EQ(vexg_write(name.c_str(), &block, nullptr, fault.At()), 1) << fault.Text();
  EXPECT_EQ(pixels, before);
  vexg_block read = BlockOf(all, bands, VEXG_BIL, back, nullptr);
  ASSERT_EQ(vexg_read(name.c_str(), &read, nullptr, fault.At()), 1) << fault.Text();
  for (std::size_t line = 0; line < 2000; line += 37) {
    for (std::size_t band = 0; band < 3; ++band) {
      ASSERT_EQ(back[(line * 3 + band) * 900 + 5],
                7 + (std::int32_t(band) * 2000 + std::int32_t(line)) * 900 + 5);
    }
  }
  Take(vexg_run(
      ("<Job><Command ID=\"CloseRasterCommand\"><Input URI=\"" + name + "\"/></Command></Job>")
          .c_str(),
      nullptr, nullptr, fault.At()));
  EXPECT_EQ(vexg_write(name.c_str(), &block, nullptr, fault.At()), 0);
  EXPECT_NE(fault.Text().find("no open raster"), std::string::npos);
}

TEST(CDoor, ManyThreadsAskForMoreRastersThanAreKept) {
  const OpenRamp<std::int32_t> ramp(300, 300, 2);
  std::atomic<unsigned> wrong{0};
  const auto work = [&](unsigned seed) {
    std::mt19937 random(seed);
    for (int turn = 0; turn < 150; ++turn) {
      const auto at = static_cast<unsigned>(random() % 100);  // the same for several threads
      const std::string part = PartOf(ramp.name, at, at, at + 20, at + 30);
      std::vector<std::int32_t> pixels;
      std::vector<std::uint32_t> bands{1};
      const vexg_block block = BlockOf({2, 3, 9, 8}, bands, VEXG_BSQ, pixels, nullptr);
      Fault fault;
      if (vexg_read(part.c_str(), &block, nullptr, fault.At()) != 1 ||
          pixels.back() != RampValue<std::int32_t>(at + 9, at + 8, 1)) {
        ++wrong;
      }
      if (turn % 50 == 49) vexg_close(seed % 2 == 0 ? nullptr : part.c_str(), nullptr);
    }
  };
  std::vector<std::thread> threads;
  for (unsigned seed = 0; seed < 6; ++seed) threads.emplace_back(work, seed);
  for (std::thread& thread : threads) thread.join();
  EXPECT_EQ(wrong, 0U);
  vexg_close(nullptr, nullptr);
  const std::size_t open = catalog::ListOpenObjects().size();
  EXPECT_EQ(open, 1U);  // the ramp: what was let go is closed
}

TEST(CDoor, AbortsAndTellsProgress) {
  const OpenRamp<float> ramp(4000, 4000, 4);
  const std::string job = "<Job><Command ID=\"GetBasicRasterStatsCommand\"><Input URI=\"" +
                          ramp.name + "\"/></Command></Job>";
  std::uint8_t abort = 0;
  double progress = -1;
  Fault fault;
  std::thread other([&] {
    std::this_thread::sleep_for(std::chrono::milliseconds(20));
    std::atomic_ref(abort).store(1);
  });
  const auto start = std::chrono::steady_clock::now();
  Take(vexg_run(job.c_str(), &abort, &progress, fault.At()));
  other.join();
  EXPECT_GE(progress, 0);
  EXPECT_LT(std::chrono::steady_clock::now() - start, std::chrono::seconds(20));
  const std::string late = Take(vexg_run(job.c_str(), &abort, &progress, fault.At()));
  EXPECT_NE(late.find("Result=\"Aborted\""), std::string::npos) << late;
  std::vector<float> pixels;
  const std::vector<std::uint32_t> bands{0};
  const vexg_block block = BlockOf({0, 0, 99, 99}, bands, VEXG_BSQ, pixels, nullptr);
  EXPECT_EQ(vexg_read(ramp.name.c_str(), &block, &abort, fault.At()), 0);
  EXPECT_EQ(fault.Text(), "aborted");
}

TEST(CDoor, OpensASourceAnewWhoseFileHasChanged) {
  const test::TemporaryDirectory folder;
  const std::string file = (folder.Path() / "a.dat").string();
  const auto write = [&](char value) {
    std::ofstream(file + ".hdr") << "ORVA\nsamples = 4\nlines = 3\nbands = 1\nheader offset = 0\n"
                                    "data type = Byte\ninterleave = BIP\nbyte order = little "
                                    "endian\nend = ORVA\n";
    const std::string next = file + ".next";
    std::ofstream(next) << std::string(12, value);
    std::filesystem::rename(next, file);
  };
  std::vector<std::uint8_t> pixels;
  const std::vector<std::uint32_t> bands{0};
  const vexg_block block = BlockOf({0, 0, 3, 2}, bands, VEXG_BSQ, pixels, nullptr);
  Fault fault;
  for (const char value : {'a', 'b', 'c'}) {
    write(value);
    for (int turn = 0; turn < 2; ++turn) {
      ASSERT_EQ(vexg_read(file.c_str(), &block, nullptr, fault.At()), 1) << fault.Text();
      EXPECT_EQ(pixels, std::vector<std::uint8_t>(12, static_cast<std::uint8_t>(value)));
    }
  }
  std::filesystem::remove(file);
  EXPECT_EQ(vexg_read(file.c_str(), &block, nullptr, fault.At()), 0);
  EXPECT_NE(fault.Text().find("a.dat"), std::string::npos);
  vexg_close(nullptr, nullptr);
}

TEST(CDoor, RefusesInOneLine) {
  const OpenRamp<float> ramp(20, 10, 2);
  std::vector<float> pixels;
  const std::vector<std::uint32_t> bands{0}, beyond{2};
  const vexg_block good = BlockOf({0, 0, 9, 9}, bands, VEXG_BSQ, pixels, nullptr);
  const auto with = [&](auto change) {
    vexg_block block = good;
    change(block);
    return block;
  };
  const struct {
    const char* words;
    std::string raster;
    vexg_block block;
  } cases[] = {
      {"not inside", ramp.name, with([](vexg_block& b) { b.rect.bottom = 10; })},
      {"not inside", ramp.name, with([](vexg_block& b) { b.rect.left = 10; })},
      {"no band 2", ramp.name, with([&](vexg_block& b) { b.bands = beyond.data(); })},
      {"no bands", ramp.name, with([](vexg_block& b) { b.band_count = 0; })},
      {"order", ramp.name, with([](vexg_block& b) { b.order = -1; })},
      {"of type Single", ramp.name, with([](vexg_block& b) { b.data_type = 5; })},
      {"too small", ramp.name, with([](vexg_block& b) { --b.size; })},
      {"no memory", ramp.name, with([](vexg_block& b) { b.pixels = nullptr; })},
      {"aligned", ramp.name, with([](vexg_block& b) {
         b.pixels = static_cast<char*>(b.pixels) + 1;
         b.rect.right = 8;
       })},
      {"no raster", "", good},
      {"no such file", "/no/such/file", good},
      {"not well formed", "<Job", good},
      {"opens one", "<Job/>", good},
      {"NoSuchCommand", "<Job><Reasons/><Command ID=\"NoSuchCommand\"/></Job>", good},
      {"only opens", "<Job><Command ID=\"ListFormatsCommand\"/></Job>", good},
      {"only opens", "<Job><Command ID=\"CreateRasterCommand\"/></Job>", good},
      {"[gone]", PartOf("[gone] ", 0, 0, 1, 1), good},
  };
  for (const auto& c : cases) {
    SCOPED_TRACE(c.words + (" " + c.raster));
    Fault fault;
    EXPECT_EQ(vexg_read(c.raster.c_str(), &c.block, nullptr, fault.At()), 0);
    EXPECT_NE(fault.Text().find(c.words), std::string::npos) << fault.Text();
    EXPECT_EQ(fault.Text().find('\n'), std::string::npos);
    EXPECT_EQ(vexg_read(c.raster.c_str(), &c.block, nullptr, nullptr), 0);
  }
  Fault fault;
  EXPECT_EQ(vexg_write(ramp.name.c_str(), &good, nullptr, fault.At()), 0);
  EXPECT_EQ(vexg_describe(nullptr, fault.At()), nullptr);
  EXPECT_EQ(vexg_thread_limit(-1, fault.At()), 0);
  EXPECT_NE(fault.Text(), "");
}

}  // namespace
}  // namespace lumo
