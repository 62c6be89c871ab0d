#include "foundation/async.h"

#include <chrono>
#include <latch>
#include <new>
#include <thread>

#include "foundation/thread_roll.h"

namespace lumo {
namespace {

/// Writes down each call.
struct Recorder : AsyncCallback {
  void OnStart() override { Add("start"); }
  void OnFinish() override { Add("finish"); }
  void OnAbort(const bool& abort) override { Add(abort ? "abort" : "go on"); }
  void OnProgress(double progress) override {
    Add(std::to_string(static_cast<int>(progress * 100)));
  }
  void Add(const std::string& word) { said += word + " "; }
  std::string said;
};

struct Work : Async {
  using Async::Async;
  void Execute() override {
    if (body) body();
  }
  std::function<void()> body;
};

TEST(RunControls, ReadAndWriteForeignMemory) {
  unsigned char byte = 5;
  ExternalAbortFlag<unsigned char> flag(&byte);
  EXPECT_FALSE(flag.IsSet());
  flag.Set(true);
  EXPECT_EQ(byte, 1);
  byte = 2;
  EXPECT_FALSE((ExternalAbortFlag<bool>(reinterpret_cast<bool*>(&byte)).IsSet()));

  float value = 0.5F;
  ExternalProgressReport<float> report(&value);
  report.Update(1.5);
  EXPECT_EQ(value, 1.0F);
  report.Update(-0.5);
  EXPECT_EQ(report.GetProgress(), -0.5);
}

TEST(IPC, ACopySharesAndADefaultIsNew) {
  const IPC first;
  const IPC copy(first);
  const IPC other;
  copy.abort->Set(true);
  copy.progress->Update(0.25);
  EXPECT_TRUE(first.abort->IsSet());
  EXPECT_EQ(first.progress->GetProgress(), 0.25);
  EXPECT_FALSE(other.abort->IsSet());
}

TEST(ScaledProgressReport, AddsItsShareToWhatWentBefore) {
  const ProgressReportPtr parent(new StandardProgressReport);
  parent->Update(0.25);
  ScaledProgressReport stage(parent, 4);
  stage.Update(0.5);
  EXPECT_EQ(parent->GetProgress(), 0.375);
  stage.Update(1.0);
  EXPECT_EQ(parent->GetProgress(), 0.5);
}

TEST(ConcurrentProgressReport, ReportsTheMeanAndNeverGoesBack) {
  struct Rising : AsyncCallback {
    void OnProgress(double progress) override {
      fell = fell || progress < last;
      last = progress;
    }
    bool fell = false;
    double last = 0.0;
  } rising;
  const ProgressReportPtr target(new StandardProgressReport);
  ConcurrentProgressReport report(target, AsyncCallbackPtr(&rising, true), 4);
  report.GetSlot(2)->Update(1.0);
  EXPECT_EQ(target->GetProgress(), 0.25);
  std::vector<std::thread> threads;
  for (unsigned slot = 0; slot < 4; ++slot) {
    threads.emplace_back([&report, slot] {
      for (int i = slot == 2 ? 100 : 0; i <= 100; ++i) report.GetSlot(slot)->Update(i / 100.0);
    });
  }
  for (std::thread& thread : threads) thread.join();
  EXPECT_EQ(target->GetProgress(), 1.0);
  EXPECT_FALSE(rising.fell);
}

TEST(Async, RunsOnceAndTellsItsObserver) {
  Recorder recorder;
  const AsyncPtr work(new Work(AsyncCallbackPtr(&recorder, true)));
  EXPECT_TRUE(SubmitAsync(work, false));
  EXPECT_EQ(recorder.said, "start 0 finish 100 ");
  EXPECT_TRUE(work->IsFinished());

  Recorder done;
  EXPECT_TRUE(DoneAsync(AsyncCallbackPtr(&done, true)).IsFinished());
  EXPECT_EQ(done.said, "start 0 finish 100 ");
}

TEST(Async, InTheBackgroundWakesItsWaiters) {
  auto* const body = new Work;
  const AsyncPtr work(body);
  std::latch go(1);
  body->body = [&] { go.wait(); };
  ASSERT_TRUE(SubmitAsync(work, true));
  work->WaitStarted();
  EXPECT_FALSE(work->IsFinished());
  go.count_down();
  work->WaitFinished();
  EXPECT_TRUE(work->IsFinished());
}

TEST(Async, ThatThrowsIsFinishedAndInvalid) {
  auto* const body = new Work;
  const AsyncPtr work(body);
  body->body = [] { throw 1; };
  EXPECT_FALSE(SubmitAsync(work, false));
  EXPECT_TRUE(work->IsFinished());
  EXPECT_EQ(work->GetErrorState().code, AsyncErrorExecuteFailed::Code);
}

TEST(AsyncQueue, RunsInOrderAndDropsWhatIsAborted) {
  EXPECT_EQ(&GetAsyncQueue("one name"), &GetAsyncQueue("another"));
  std::string order;
  std::latch go(1);
  std::vector<AsyncPtr> items;
  for (const char name : {'a', 'b', 'c'}) {
    auto* const work = new Work;
    work->body = [&order, &go, name] {
      go.wait();
      order += name;
    };
    items.emplace_back(work);
    EnqueueAsync(items.back(), "");
  }
  items[1]->Abort();
  go.count_down();
  items[2]->WaitFinished();
  EXPECT_EQ(order, "ac");
  EXPECT_FALSE(items[1]->IsStarted());
}

TEST(AggragateAsync, ActsAsOne) {
  AggragateAsync none(0);
  EXPECT_FALSE(none.IsStarted());
  EXPECT_TRUE(none.IsFinished());

  Recorder recorder;
  AggragateAsync group(2, AsyncCallbackPtr(&recorder, true));
  AsyncPtr children[2];
  for (unsigned i = 0; i < 2; ++i) {
    const IPC ipc(group.GetSharedAbort(), group.GetChildProgress(i));
    children[i] = AsyncPtr(new Work(ipc, group.GetChildCallback(i)));
    group.SetChild(i, children[i]);
  }
  SubmitAsync(children[0], false);
  EXPECT_EQ(group.GetProgress(), 0.5);
  EXPECT_FALSE(group.IsFinished());
  children[0]->Abort();
  EXPECT_TRUE(children[1]->IsAborted());
  EnqueueAsync(children[1], "");  // is dropped there
  group.WaitFinished();
  EXPECT_FALSE(children[1]->IsStarted());
  EXPECT_THAT(recorder.said, testing::StartsWith("start "));
}

// Whoever raises the flag, who waits for a child that nobody will start any more must wake.
TEST(AggragateAsync, AnAbortEndsTheWaitForAChildThatNeverStarts) {
  using Raise = std::function<void(AggragateAsync&, AsyncPtr&)>;
  const Raise raises[] = {
      [](AggragateAsync&, AsyncPtr& other) { other->Abort(); },
      [](AggragateAsync& group, AsyncPtr&) { group.GetSharedAbort()->Set(true); },
      [](AggragateAsync& group, AsyncPtr&) { group.Abort(); },
      [](AggragateAsync& group, AsyncPtr&) { group.GetChildCallback(0)->OnAbort(true); }};
  for (const Raise& raise : raises) {
    AggragateAsync group(2);
    AsyncPtr children[2];
    for (unsigned i = 0; i < 2; ++i) {
      const IPC ipc(group.GetSharedAbort(), group.GetChildProgress(i));
      children[i] = AsyncPtr(new Work(ipc, group.GetChildCallback(i)));
      group.SetChild(i, children[i]);
    }
    SubmitAsync(children[0], false);
    std::atomic<bool> woke{false};
    std::thread waiting([&] {
      group.WaitFinished();
      woke = true;
    });
    std::this_thread::sleep_for(std::chrono::milliseconds(20));
    EXPECT_FALSE(woke);
    raise(group, children[0]);
    waiting.join();  // or the test runs into its time limit
  }
}

TEST(Threads, AreWaitedForToTheirEndAndKeepExceptionsIn) {
  static std::atomic<bool> atEnd{false};
  struct AtEnd {
    ~AtEnd() {
      std::this_thread::sleep_for(std::chrono::milliseconds(50));
      atEnd = true;
    }
  };
  ASSERT_TRUE(Thread().Start([] {
    thread_local AtEnd last;  // goes after the body
    static_cast<void>(last);
    throw std::bad_alloc();
  }));
  EXPECT_TRUE(JoinThreads(10.0));
  EXPECT_TRUE(atEnd);

  std::latch leave(1);
  ASSERT_TRUE(Thread().Start([&] { leave.wait(); }));
  EXPECT_FALSE(JoinThreads(0.05));
  leave.count_down();
  EXPECT_TRUE(JoinThreads(10.0));

  struct Thrower : SimpleThread {
    void Run() override { throw std::bad_alloc(); }
  };
  const SimpleThreadPtr thrower(new Thrower);
  ASSERT_TRUE(StartThread(thrower));
  thrower->WaitEnded();
}

}  // namespace
}  // namespace lumo
