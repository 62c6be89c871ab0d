#include "tasks/crew.h"

#include <atomic>
#include <set>
#include <stdexcept>
#include <thread>
#include <vector>

#include <gtest/gtest.h>

#include "foundation/library.h"

namespace lumo {
namespace {

TEST(Crew, RunsEachPartOnceForAnyNumberOfCallers) {
  for (const unsigned callers : {1U, 7U}) {
    std::vector<std::vector<std::atomic<int>>> runs(callers);
    std::vector<std::thread> threads;
    for (unsigned caller = 0; caller < callers; ++caller) {
      runs[caller] = std::vector<std::atomic<int>>(500);
      threads.emplace_back([&, caller] {
        for (unsigned count : {0U, 1U, 2U, 3U, 500U}) {
          RunByCrew(count, [&](unsigned part) {
            // One that calls the crew itself has to come to an end as well.
            if (part == 2) RunByCrew(3, [&](unsigned inner) { runs[caller][10 + inner] += 1000; });
            ++runs[caller][part];
          });
        }
      });
    }
    for (std::thread& thread : threads) thread.join();
    for (const auto& parts : runs) {
      for (std::size_t part = 0; part < parts.size(); ++part) {
        const int outer = part == 0 ? 4 : part == 1 ? 3 : part == 2 ? 2 : 1;
        const int inner = part >= 10 && part < 13 ? 2000 : 0;
        EXPECT_EQ(parts[part], outer + inner) << part;
      }
    }
  }
}

TEST(Crew, GivesAnExceptionToItsCallerAlone) {
  std::atomic<int> others{0};
  std::thread other([&] {
    for (int i = 0; i < 200; ++i) RunByCrew(4, [&](unsigned) { ++others; });
  });
  for (int i = 0; i < 200; ++i) {
    EXPECT_THROW(RunByCrew(64,
                           [](unsigned part) {
                             if (part % 5 == 3) throw std::runtime_error("a part");
                           }),
                 std::runtime_error);
  }
  other.join();
  EXPECT_EQ(others, 800);
}

/// Helpers come to jobs whose last part has just been taken.
TEST(Crew, ServesManyShortJobs) {
  std::atomic<unsigned> runs{0};
  std::vector<std::thread> callers;
  for (int caller = 0; caller < 4; ++caller) {
    callers.emplace_back([&] {
      for (int i = 0; i < 20000; ++i) RunByCrew(3, [&](unsigned) { ++runs; });
    });
  }
  for (std::thread& caller : callers) caller.join();
  EXPECT_EQ(runs, 4U * 20000 * 3);
}

TEST(Crew, UsesOtherThreadsWhereThereAreAny) {
  if (CrewSize() == 1) GTEST_SKIP() << "one thread";
  // Two parts that each wait for the other need two threads.
  std::atomic<int> there{0};
  RunByCrew(2, [&](unsigned) {
    ++there;
    const double start = WallSeconds();
    while (there < 2 && WallSeconds() < start + 20) std::this_thread::yield();
  });
  EXPECT_EQ(there, 2);
}

}  // namespace
}  // namespace lumo
