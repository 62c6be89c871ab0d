#include <algorithm>
#include <atomic>
#include <fcntl.h>
#include <signal.h>
#include <sys/mman.h>
#include <sys/stat.h>
#include <sys/wait.h>
#include <thread>
#include <unistd.h>

#include "platform/clock.h"
#include "platform/module.h"
#include "platform/process_watch.h"
#include "platform/shared_memory.h"
#include "platform/temporary_file.h"
#include "support/temporary_directory.h"

namespace lumo::platform {
namespace {

TEST(SharedMemoryBlock, IsFoundByNameAndOnlyAsLargeAsItIs) {
  const std::string name = "vexg-block-" + std::to_string(getpid());
  EXPECT_EQ(SharedMemoryBlock::Open(name, 1), nullptr);
  {
    const auto made = SharedMemoryBlock::Create(name, 100);
    ASSERT_NE(made, nullptr);
    EXPECT_EQ(SharedMemoryBlock::Create(name, 100), nullptr);
    const auto opened = SharedMemoryBlock::Open(name, 100);
    ASSERT_NE(opened, nullptr);
    made->GetData()[99] = 7;
    EXPECT_EQ(opened->GetData()[99], 7);
    EXPECT_NE(SharedMemoryBlock::Open(name, 10), nullptr);
    // A larger view would fault where the block ends, even inside its last page.
    EXPECT_EQ(SharedMemoryBlock::Open(name, 101), nullptr);
    EXPECT_EQ(SharedMemoryBlock::Open(name, 0), nullptr);
  }
  EXPECT_EQ(SharedMemoryBlock::Open(name, 100), nullptr);
  for (const char* bad : {"", "a/b", "..", "../etc"}) {
    EXPECT_EQ(SharedMemoryBlock::Create(bad, 10), nullptr) << bad;
    EXPECT_EQ(SharedMemoryBlock::Open(bad, 10), nullptr) << bad;
  }
}

TEST(SharedMemoryBlock, SurvivesWhoeverCutsIt) {
  const std::string name = "vexg-cut-" + std::to_string(getpid());
  const std::size_t size = 64 << 10;
  const int file = shm_open(name.c_str(), O_RDWR | O_CREAT | O_EXCL, S_IRUSR | S_IWUSR);
  ASSERT_GE(file, 0);
  ASSERT_EQ(ftruncate(file, size), 0);
  struct stat status {};
  auto block = SharedMemoryBlock::Open(name, size);
  ASSERT_NE(block, nullptr);
  fstat(file, &status);
  EXPECT_GE(static_cast<std::size_t>(status.st_blocks) * 512, size);  // it only promised before
  ASSERT_EQ(ftruncate(file, 100 * size), 0);
  const auto part = SharedMemoryBlock::Open(name, 100 * size, 2 * size);
  ASSERT_NE(part, nullptr);
  EXPECT_EQ(part->GetSize(), 2 * size);
  fstat(file, &status);
  EXPECT_LT(static_cast<std::size_t>(status.st_blocks) * 512, 3 * size);  // no more than is used
  const auto other = SharedMemoryBlock::Create(name + "-other", size);
  ASSERT_NE(other, nullptr);
  std::fill_n(block->GetData(), size, 5);
  EXPECT_FALSE(block->WasCut());

  ASSERT_EQ(ftruncate(file, 0), 0);
  std::vector<std::thread> threads;
  for (int i = 0; i < 4; ++i) {
    threads.emplace_back([&, i] {
      for (std::size_t at = i; at < size; at += 4) block->GetData()[at] += 1;
    });
  }
  for (std::thread& thread : threads) thread.join();
  EXPECT_TRUE(block->WasCut());
  EXPECT_FALSE(other->WasCut());
  EXPECT_EQ(SharedMemoryBlock::Open(name, 1), nullptr);
  ASSERT_EQ(ftruncate(file, size), 0);
  EXPECT_FALSE(SharedMemoryBlock::Open(name, size)->WasCut());
  if (geteuid() == 0) {
    ASSERT_EQ(fchown(file, 12345, 12345), 0);
    EXPECT_EQ(SharedMemoryBlock::Open(name, size), nullptr);  // somebody else's
  }
  close(file);
  shm_unlink(name.c_str());
  // A bus error elsewhere ends the process as it always does.
  EXPECT_DEATH(raise(SIGBUS), "");
}

TEST(ProcessWatch, TellsTheEndOfAnotherProcess) {
  const pid_t child = fork();
  if (child == 0) {
    pause();
    _exit(0);
  }
  std::atomic<int> told{0};
  const auto until = [&](int count) {
    for (int i = 0; i < 2000 && told < count; ++i) usleep(5'000);
    return told == count;
  };
  ProcessWatch own(getpid(), [&] { told += 100; });
  const ProcessWatch watch(child, [&] { ++told; });
  {
    const ProcessWatch dropped(child, [&] { told += 100; });
  }
  usleep(20'000);
  EXPECT_EQ(told, 0);
  kill(child, SIGKILL);
  EXPECT_TRUE(until(1));
  waitpid(child, nullptr, 0);
  const ProcessWatch late(child, [&] { ++told; });  // of one that has ended already
  EXPECT_TRUE(until(2));
}

TEST(TemporaryFile, OfAProcessThatHasEndedIsAbandonedBeforeItsParentNotices) {
  const test::TemporaryDirectory directory;
  const std::string path = (directory.Path() / "scene.tif").string();
  int ends[2];
  ASSERT_EQ(pipe(ends), 0);
  const pid_t child = fork();
  if (child == 0) {
    mkdir(TemporaryFolderBeside(path).c_str(), 0700);
    [[maybe_unused]] const auto told = write(ends[1], "m", 1);
    pause();
    _exit(0);
  }
  char told = 0;
  ASSERT_EQ(read(ends[0], &told, 1), 1);
  EXPECT_TRUE(FindAbandonedFolders(path).empty());
  kill(child, SIGKILL);
  siginfo_t ended;
  ASSERT_EQ(waitid(P_PID, static_cast<id_t>(child), &ended, WEXITED | WNOWAIT), 0);
  EXPECT_EQ(FindAbandonedFolders(path).size(), 1U);
  waitpid(child, nullptr, 0);
  EXPECT_EQ(FindAbandonedFolders(path).size(), 1U);
  close(ends[0]);
  close(ends[1]);
}

TEST(TemporaryFile, IsNeverNamedToAUser) {
  const std::string folder = TemporaryFolderBeside("/data/scene.tif");
  const std::string inside = TemporaryPathBeside(folder + "/scene.tif");
  const struct {
    std::string text, want;
  } cases[] = {
      {TemporaryPathBeside("/data/scene.tif") + ": full", "/data/scene.tif: full"},
      {TemporaryPathBeside("scene.tif") + ".tif: full", "scene.tif: full"},
      {TemporaryPathBeside("scene.tif") + ".msk: full", "scene.tif.msk: full"},
      {folder + "/scene.tif: full", "/data/scene.tif: full"},
      {TemporaryFolderBeside("scene.tif") + "/scene.tif: full", "scene.tif: full"},
      {"can't move " + inside + ".tif to " + folder + "/scene.tif",
       "can't move /data/scene.tif to /data/scene.tif"},
      {"v1.2-3-4-5-6.tiff: is no file", "v1.2-3-4-5-6.tiff: is no file"},
      {"/data/a.b-c.tmp: full", "/data/a.b-c.tmp: full"},
      {"", ""},
  };
  for (const auto& c : cases) EXPECT_EQ(WithoutTemporaryNames(c.text), c.want) << c.text;
}

TEST(Module, SaysWhyItCannotBeLoaded) {
  std::string fault;
  EXPECT_FALSE(Module::Load("/no/such/library.so", &fault).IsLoaded());
  EXPECT_THAT(fault, testing::HasSubstr("/no/such/library.so"));
  const Module self = Module::Load(LibraryDirectory() + "/" + ModuleFileName("vexg"));
  ASSERT_TRUE(self.IsLoaded());
  EXPECT_EQ(self.Find<void()>("no_such_function"), nullptr);
  EXPECT_EQ(Module().Find<void()>("any"), nullptr);
}

TEST(Clock, CountsProcessorTimeApartFromWallTime) {
  const double wall = MonotonicSeconds();
  const double cpu = ProcessCpuSeconds();
  usleep(50'000);
  const double slept = MonotonicSeconds() - wall;
  EXPECT_GE(slept, 0.05);
  EXPECT_LT(ProcessCpuSeconds() - cpu, slept);
}

}  // namespace
}  // namespace lumo::platform
