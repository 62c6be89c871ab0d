// Runs the files of a directory through a fuzz target, and each of them cut at every place.

#include <algorithm>
#include <cstdint>
#include <cstdio>
#include <filesystem>
#include <fstream>
#include <iterator>
#include <string>

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t* data, std::size_t size);

int main(int argc, char** argv) {
  if (argc != 2) return 2;
  std::size_t seeds = 0;
  for (const auto& entry : std::filesystem::directory_iterator(argv[1])) {
    std::ifstream file(entry.path(), std::ios::binary);
    const std::string text{std::istreambuf_iterator<char>(file), std::istreambuf_iterator<char>()};
    const std::size_t step = std::max<std::size_t>(text.size() / 256, 1);
    for (std::size_t size = 0; size < text.size(); size += step) {
      LLVMFuzzerTestOneInput(reinterpret_cast<const std::uint8_t*>(text.data()), size);
    }
    LLVMFuzzerTestOneInput(reinterpret_cast<const std::uint8_t*>(text.data()), text.size());
    ++seeds;
  }
  std::printf("%zu seeds\n", seeds);
  return seeds != 0 ? 0 : 1;
}
