#include "platform/file_fence.h"

#include <cstdio>
#include <cstdlib>
#include <filesystem>
#include <fstream>

#include "support/temporary_directory.h"

namespace lumo {
namespace {

namespace fs = std::filesystem;

bool CanRead(const fs::path& path) {
  return std::ifstream(path).good();
}

bool CanWrite(const fs::path& path) {
  return std::ofstream(path, std::ios::app).good();
}

/// Ends the process with the number of what does not hold; 0 when all does.
[[noreturn]] void TryTheFence(const fs::path& base) {
  platform::FileFence fence;
  fence.writable = {(base / "in").string(), (base / "missing").string()};
  fence.readable = {(base / "read").string()};
  std::string fault;
  if (!platform::RaiseFileFence(fence, fault)) {
    std::fprintf(stderr, "%s\n", fault.c_str());
    std::exit(99);
  }
  const bool holds[] = {CanRead(base / "in/a"),
                        CanWrite(base / "in/new"),
                        CanRead(base / "read/b"),
                        !CanWrite(base / "read/b"),
                        !CanRead(base / "out/c"),
                        !CanWrite(base / "out/new"),
                        !CanRead(base / "in/link"),
                        std::rename((base / "in/a").c_str(), (base / "in/z").c_str()) == 0,
                        std::rename((base / "in/z").c_str(), (base / "out/z").c_str()) != 0};
  int number = 0;
  for (const bool held : holds) {
    ++number;
    if (!held) std::exit(number);
  }
  std::exit(0);
}

TEST(FileFenceDeathTest, KeepsTheProcessInside) {
  testing::FLAGS_gtest_death_test_style = "threadsafe";
  const test::TemporaryDirectory directory;
  const fs::path base(directory.Path());
  for (const char* folder : {"in", "read", "out"}) fs::create_directory(base / folder);
  for (const char* file : {"in/a", "read/b", "out/c"}) std::ofstream(base / file) << 1;
  fs::create_symlink(base / "out/c", base / "in/link");
  EXPECT_EXIT(
      TryTheFence(base),
      [](int status) {
        // 99: this kernel has no such fence, which the server says at its start.
        return testing::ExitedWithCode(0)(status) || testing::ExitedWithCode(99)(status);
      },
      "");
}

}  // namespace
}  // namespace lumo
