#include "foundation/containers.h"

#include <stdexcept>
#include <thread>

namespace lumo {
namespace {

/// A value that can't be copied while `fail` is set.
struct Fragile {
  Fragile() = default;
  explicit Fragile(int number) : value(number) {}
  Fragile(const Fragile& other) : value(other.value) {
    if (fail) throw std::bad_alloc();
  }
  Fragile& operator=(const Fragile&) = default;
  friend bool operator<(const Fragile& a, const Fragile& b) { return a.value < b.value; }
  int value = 0;
  static bool fail;
};
bool Fragile::fail = false;

template <typename Container, typename Operation>
void ExpectKeepsItsContents(Container& container, Operation operation) {
  const unsigned count = container.GetCount();
  Fragile::fail = true;
  EXPECT_FALSE(operation(container));
  Fragile::fail = false;
  EXPECT_EQ(container.GetCount(), count);
  EXPECT_FALSE(container.IsValid());
  EXPECT_EQ(container.GetErrorState().code, ObjectErrorOutOfMemory::Code);
}

TEST(Containers, TurnAnAllocationFailureIntoAState) {
  const Fragile two(2);
  Deque<Fragile> deque;
  deque.PushBack(Fragile(1));
  ExpectKeepsItsContents(deque, [&](auto& c) { return c.PushBack(two); });
  Stack<Fragile> stack;
  stack.Push(Fragile(1));
  ExpectKeepsItsContents(stack, [&](auto& c) { return c.Push(two); });
  EXPECT_EQ(stack.Top().value, 1);
  List<Fragile> list;
  ExpectKeepsItsContents(list, [&](auto& c) { return c.PushFront(two); });
  Set<Fragile> set;
  ExpectKeepsItsContents(set, [&](auto& c) { return c.Insert(two); });
  Map<int, Fragile> map;
  ExpectKeepsItsContents(map, [&](auto& c) {
    c[5].value = 9;  // a place to write to all the same
    return c.HasKey(5);
  });
}

TEST(Map, FindsWithoutInsertingAndIndexesWithIt) {
  Map<String, int> map(-1);
  EXPECT_EQ(map.Find("a"), -1);
  EXPECT_EQ(map.GetCount(), 0U);
  EXPECT_EQ(map["b"], -1);
  map["a"] = 1;
  const Array<String> keys = map.GetKeys();
  ASSERT_EQ(keys.GetCount(), 2U);
  EXPECT_TRUE(keys[0] == "a");
  map.Remove("a");
  map.Remove("a");
  EXPECT_EQ(map.GetCount(), 1U);
}

TEST(LockableMap, ServesManyThreads) {
  LockableMap<int, int> map;
  std::vector<std::thread> threads;
  for (int t = 0; t < 4; ++t) {
    threads.emplace_back([&map, t] {
      for (int i = 0; i < 500; ++i) {
        map[t * 1000 + i];
        map.HasKey(i);
        if (i % 2 == 0) map.Remove(t * 1000 + i);
      }
    });
  }
  for (std::thread& thread : threads) thread.join();
  EXPECT_EQ(map.GetCount(), 4U * 250U);
}

TEST(QueuingRWMutex, LetsWritersAloneAndReadersTogether) {
  QueuingRWMutex mutex;
  int value = 0;
  std::vector<std::thread> threads;
  for (int t = 0; t < 4; ++t) {
    threads.emplace_back([&] {
      for (int i = 0; i < 200; ++i) {
        QueuingRWMutexLock lock(mutex, i % 2 == 0);
        if (i % 2 != 0) lock.UpgradeToWriter();
        ++value;
        lock.DowngradeToReader();
        EXPECT_GE(value, 1);
      }
    });
  }
  for (std::thread& thread : threads) thread.join();
  EXPECT_EQ(value, 800);
  const QueuingRWMutexLock first(mutex, false);
  const QueuingRWMutexLock second(mutex, false);  // would not return if readers were alone
}

}  // namespace
}  // namespace lumo
