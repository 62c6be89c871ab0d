#include <unistd.h>

#include "platform/clock.h"
#include "platform/module.h"
#include "platform/shared_memory.h"

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
