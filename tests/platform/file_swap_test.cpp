#include "platform/file_swap.h"

#include <filesystem>
#include <fstream>
#include <iterator>
#include <map>
#include <sys/wait.h>
#include <unistd.h>

#include <gtest/gtest.h>

#include "platform/folder_lock.h"
#include "support/temporary_directory.h"

namespace lumo::platform {
namespace {

namespace fs = std::filesystem;
using Files = std::map<std::string, std::string>;

/// The names of a folder with the contents.
Files In(const fs::path& folder) {
  Files files;
  for (const auto& entry : fs::directory_iterator(folder)) {
    std::ifstream in(entry.path(), std::ios::binary);
    files[entry.path().filename().string()] = {std::istreambuf_iterator<char>(in),
                                               std::istreambuf_iterator<char>()};
  }
  return files;
}

/// Each step of a swap fails in turn; the state of the folder is compared as a whole.
TEST(FileSwap, LeavesAllOrNothing) {
  for (const int failing : {0, 1, 2, 3, 4}) {  // 0: none
    for (const bool isKept : {true, false}) {
      SCOPED_TRACE(testing::Message() << "step " << failing << ", kept " << isKept);
      const test::TemporaryDirectory folder;
      const auto path = [&](const char* name) { return (folder.Path() / name).string(); };
      const Files before{{"main", "old main"}, {"main.hdr", "old header"}, {"main.aux", "old aux"},
                         {"new", "new main"},  {"new.hdr", "new header"},  {"new.msk", "new mask"}};
      for (const auto& [name, text] : before) std::ofstream(path(name.c_str())) << text;
      bool isDone = false;
      {
        FileSwap swap;
        const auto from = [&](int step, const char* name) {
          return path(step == failing ? "missing" : name);
        };
        std::string fault;
        isDone = swap.MoveAside(path("main.aux"), &fault) &&
                 swap.MoveAside(path("never there"), &fault) &&
                 swap.MoveAside(failing == 1 ? path("main") + "/in" : path("main.hdr"), &fault) &&
                 swap.MoveIn(from(2, "new"), path("main"), &fault) &&
                 swap.MoveIn(from(3, "new.hdr"), path("main.hdr"), &fault) &&
                 swap.MoveIn(from(4, "new.msk"), path("main.msk"), &fault);
        EXPECT_EQ(isDone, failing == 0);
        if (!isDone) {
          EXPECT_EQ(fault.find(".tmp"), fault.npos) << fault;
          EXPECT_TRUE(
              fault.ends_with(failing == 1 ? ": Not a directory" : ": No such file or directory"))
              << fault;
        }
        if (isDone && isKept) swap.Keep();
      }
      const Files after{{"main", "new main"}, {"main.hdr", "new header"}, {"main.msk", "new mask"}};
      EXPECT_EQ(In(folder.Path()), isDone && isKept ? after : before);
    }
  }
}

TEST(FolderLock, IsHeldByOneProcessAtATime) {
  const test::TemporaryDirectory folder;
  const std::string counter = (folder.Path() / "counter").string();
  std::ofstream(counter) << 0;
  constexpr int kProcesses = 4, kRounds = 25;
  for (int i = 0; i < kProcesses; ++i) {
    if (fork() != 0) continue;
    for (int round = 0; round < kRounds; ++round) {
      const FolderLock lock(counter);
      int value = 0;
      std::ifstream(counter) >> value;
      usleep(200);
      std::ofstream(counter) << value + 1;
    }
    _exit(0);
  }
  for (int i = 0; i < kProcesses; ++i) wait(nullptr);
  int value = 0;
  std::ifstream(counter) >> value;
  EXPECT_EQ(value, kProcesses * kRounds);
  EXPECT_TRUE(FolderLock("no/such/folder/file").IsHeld())
      << "what can't be locked is not waited for";
}

}  // namespace
}  // namespace lumo::platform
