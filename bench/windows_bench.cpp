// Reads random windows of a raster and prints the seconds that it took, without those of the start:
//   windows_bench FILE WINDOWS SIDE THREADS
// peers.py runs it beside rasterio.

#include <atomic>
#include <chrono>
#include <cstdio>
#include <cstdlib>
#include <random>
#include <thread>
#include <vector>

#include "data/data_manager.h"
#include "data/raster_reader.h"
#include "foundation/environment.h"
#include "foundation/fault.h"
#include "foundation/library.h"

namespace {

using namespace lumo;

/// Reads windows until all are taken. The same windows for any number of threads.
template <typename T>
void ReadWindows(RasterReader<T>& reader, const RasterDef& def, const std::vector<SubRect>& windows,
                 std::atomic<std::size_t>& next, std::atomic<bool>& isRead) {
  Array<unsigned> bands{ArrayDims(def.bands)};
  for (unsigned i = 0; i < def.bands; ++i) bands[i] = i;
  Array<T> pixels;
  Array<unsigned char> state;
  for (std::size_t i = next++; i < windows.size(); i = next++) {
    if (!reader.ReadBlock(windows[i], bands, 0, def.interleave, pixels, state)) isRead = false;
  }
}

}  // namespace

int main(int argc, char** argv) {
  if (argc != 5) return 2;
  const auto side = static_cast<unsigned>(std::atoi(argv[3]));
  InitEnvironment();
  VEXInit();
  const RasterDataConnectionPtr source(
      GetGlobalDataManager().Connect(ConnStrings({String(argv[1])}), GeoRefPtr(), MetadataPtr()));
  if (!source) return 1;
  const RasterDef def = source->RasterDef();
  std::mt19937 random(3);
  std::vector<SubRect> windows;
  for (int i = 0; i < std::atoi(argv[2]); ++i) {
    const unsigned left = static_cast<unsigned>(random()) % (def.samples - side);
    const unsigned top = static_cast<unsigned>(random()) % (def.lines - side);
    windows.push_back({left, top, left + side - 1, top + side - 1});
  }
  std::atomic<std::size_t> next{0};
  std::atomic<bool> isRead{true};
  const auto start = std::chrono::steady_clock::now();
  DispatchType(TwelveTypes{}, def.dataType, [&]<typename T>() {
    const RasterReaderPtr<T> reader = source->RasterReaderDispatch()->template Get<T>();
    std::vector<std::thread> threads;
    for (int i = 0; i < std::atoi(argv[4]); ++i) {
      threads.emplace_back([&] { ReadWindows<T>(*reader, def, windows, next, isRead); });
    }
    for (std::thread& thread : threads) thread.join();
    return true;
  });
  const std::chrono::duration<double> seconds = std::chrono::steady_clock::now() - start;
  std::printf("%.4f\n", seconds.count());
  return isRead ? 0 : 1;
}
