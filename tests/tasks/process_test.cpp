#include "tasks/process.h"

#include <atomic>
#include <chrono>
#include <functional>
#include <latch>
#include <stdexcept>
#include <thread>

#include "foundation/scalar.h"
#include "tasks/process_builder.h"
#include "tasks/task_errors.h"
#include "tasks/thread_limit.h"

namespace lumo {
namespace {

using Number = Scalar<int>;
using NumberPtr = ScalarPtr<int>;

Array<ArgID> Ids(std::initializer_list<ArgID> ids) {
  Array<ArgID> array{ArrayDims(static_cast<unsigned>(ids.size()))};
  std::copy(ids.begin(), ids.end(), array.begin());
  return array;
}

int ValueOf(const ObjectPtr& object) {
  const int* const value = FindScalarValue<int>(object);
  return value != nullptr ? *value : -1;
}

/// Shared by the tasks of a test: their notes, and orders for each.
struct Script : Object {
  int tokens = 5;  // the source gives so many
  std::function<void(int)> atSource;
  std::function<bool(Task&, int)> atStage = [](Task&, int) { return true; };
  std::vector<int> written;  // by the sink
  std::atomic<int> executed{0};
  std::atomic<int> inFlight{0};
  std::atomic<int> mostInFlight{0};
  std::atomic<int> alive{0};
};
using ScriptPtr = Pointer<Script>;

/// A task with the script as its first setup argument.
template <typename Base>
class ScriptTask : public Base {
 public:
  ScriptTask(const char* name, ArgList& setup) : Base(name) {
    script_ = dynamic_cast<Script*>(setup.Get(0).Get());
    if (script_ == nullptr) {
      this->SetErrorState(TaskErrorBadParams());
    } else {
      ++script_->alive;
    }
  }
  ~ScriptTask() override {
    if (script_ != nullptr) --script_->alive;
  }

 protected:
  Script* script_ = nullptr;
};

class SourceTask final : public ScriptTask<SequentialTask> {
 public:
  explicit SourceTask(ArgList& setup) : ScriptTask("SourceTask", setup) {}
  bool Execute(ArgList& args) override {
    ++script_->executed;
    if (next_ == script_->tokens) return false;
    if (script_->atSource) script_->atSource(next_);
    const int now = ++script_->inFlight;
    script_->mostInFlight = std::max(script_->mostInFlight.load(), now);
    return args.Set(0, NumberPtr(new Number(next_++)));
  }

 private:
  int next_ = 0;
};

/// Squares the number.
class StageTask final : public ScriptTask<ConcurrentTask> {
 public:
  explicit StageTask(ArgList& setup) : ScriptTask("StageTask", setup) {}
  bool Execute(ArgList& args) override {
    ++script_->executed;
    const int value = ValueOf(args.Get(0));
    if (!script_->atStage(*this, value)) return false;
    return args.Set(0, NumberPtr(new Number(value * value)));
  }
};

class SinkTask final : public ScriptTask<SequentialTask> {
 public:
  explicit SinkTask(ArgList& setup) : ScriptTask("SinkTask", setup) {}
  bool Execute(ArgList& args) override {
    ++script_->executed;
    script_->written.push_back(ValueOf(args.Get(0)));
    --script_->inFlight;
    return true;
  }
};

/// Source, stage, sink on one slot of the token.
class SquareProcess : public ProcessBuilder<Process> {
 public:
  explicit SquareProcess(const ScriptPtr& script, const IPC& ipc = {},
                         const AsyncCallbackPtr& callback = {}, std::uint64_t totalTokens = 5)
      : ProcessBuilder("SquareProcess", ipc, callback) {
    Process& process = GetPipeline();
    const ArgID scriptId = process.TakeSetupArg();
    const ArgID number = process.TakeTokenArg();
    for (TaskFactory* const factory :
         std::initializer_list<TaskFactory*>{&source_, &stage_, &sink_})
      process.AddTask(process.GetTaskCount(),
                      TaskDescriptor(factory, Ids({number}), Ids({scriptId})));
    SetArg(scriptId, script);
    process.SetTotalTokens(totalTokens);
    SetBuilt();
  }

  Process& Pipeline() { return GetPipeline(); }
  ArgList& Args() { return GetArgs(); }

 private:
  ManagedTask<SourceTask> source_;
  ManagedTask<StageTask> stage_;
  ManagedTask<SinkTask> sink_;
};

struct ProgressRecorder : ProgressReport {
  void Update(double progress) override { values.push_back(progress); }
  std::vector<double> values;
};

IPC Recorded(const Pointer<ProgressRecorder>& recorder) {
  return {AbortFlagPtr(new StandardAbortFlag), ProgressReportPtr(recorder)};
}

std::vector<int> Squares(int count) {
  std::vector<int> squares;
  for (int i = 0; i < count; ++i) squares.push_back(i * i);
  return squares;
}

TEST(Process, HandsEveryTokenOnInOrderForAnyNumberOfTokensAndThreads) {
  for (const unsigned threads : {1U, 2U, 4U}) {
    const ThreadLimit limit(threads);
    for (const int tokens : {0, 1, 2, 1000}) {
      SCOPED_TRACE(testing::Message() << threads << " threads, " << tokens << " tokens");
      const ScriptPtr script(new Script);
      script->tokens = tokens;
      SquareProcess process(script);
      EXPECT_TRUE(process.RunProcess(SquareProcess::kHere));
      EXPECT_TRUE(process.IsFinished());
      EXPECT_EQ(script->written, Squares(tokens));
      EXPECT_EQ(script->alive, 0) << "the tasks are destroyed with the run";
      EXPECT_LE(script->mostInFlight, 3) << "no more tokens than stages";
      EXPECT_LE(script->executed, 3 * tokens + 3) << "after the end only the source is asked";
    }
  }
}

TEST(Process, ReportsProgressThatNeverGoesBack) {
  const Pointer<ProgressRecorder> progress(new ProgressRecorder);
  const ScriptPtr script(new Script);
  SquareProcess process(script, Recorded(progress));
  EXPECT_TRUE(process.RunProcess(0));
  EXPECT_EQ(progress->values, (std::vector<double>{0, 0, 0, 0.2, 0.4, 0.6, 0.8, 1.0, 1.0, 1.0}));

  const Pointer<ProgressRecorder> unknown(new ProgressRecorder);
  SquareProcess untold(script, Recorded(unknown), {}, 0);
  EXPECT_TRUE(untold.RunProcess(0));
  EXPECT_EQ(unknown->values, (std::vector<double>{0, 0, 0, 1.0, 1.0})) << "no total, no steps";
}

TEST(Process, StopsAtTheFirstFailureAndSaysSo) {
  const Pointer<ProgressRecorder> progress(new ProgressRecorder);
  const ScriptPtr script(new Script);
  script->tokens = 1000;
  script->atStage = [](Task& task, int value) {
    if (value == 3) task.SetErrorState(TaskError());
    return value != 3;
  };
  SquareProcess process(script, Recorded(progress), {}, 1000);
  EXPECT_FALSE(process.RunProcess(0));
  EXPECT_EQ(process.GetErrorState().code, AsyncErrorExecuteFailed::Code);
  EXPECT_EQ(script->written, Squares(3)) << "tokens read before were finished, none after";
  ASSERT_EQ(progress->values.size(), 8U);
  EXPECT_EQ(progress->values[5], 0.003);
  EXPECT_EQ(progress->values[6], 1.0);
}

TEST(Process, TakesFalseWithoutAnErrorAtAnyStageForTheEndOfTheData) {
  const ScriptPtr script(new Script);
  script->tokens = 1000;
  script->atStage = [](Task&, int value) { return value < 4; };
  SquareProcess process(script);
  EXPECT_TRUE(process.RunProcess(0));
  EXPECT_EQ(script->written, Squares(4));
}

TEST(Process, ThatIsAbortedBeforeItsRunExecutesNothing) {
  const ScriptPtr script(new Script);
  SquareProcess process(script);
  process.Abort();
  EXPECT_TRUE(process.RunProcess(0)) << "an abort is no failure; the caller looks at the flag";
  EXPECT_EQ(script->executed, 0);
  EXPECT_TRUE(script->written.empty());
}

TEST(Process, ThatIsAbortedHalfWayEndsWithWhatWasDone) {
  const ScriptPtr script(new Script);
  script->tokens = 1'000'000;
  IPC ipc;
  script->atSource = [&](int next) {
    if (next == 500) ipc.abort->Set(true);
  };
  SquareProcess process(script, ipc, {}, 1'000'000);
  EXPECT_TRUE(process.RunProcess(0));
  EXPECT_LE(script->written.size(), 500U);
  EXPECT_EQ(script->written, Squares(static_cast<int>(script->written.size())));
}

TEST(Process, RefusesWhatCannotRun) {
  const ScriptPtr script(new Script);
  ManagedTask<SourceTask> source;
  const TaskDescriptor stage(&source, Ids({0}), Ids({0}));
  ArgList none;
  ArgList one;
  one.Set(0, script);

  Process empty("empty");
  EXPECT_FALSE(empty.Run(one)) << "no stages";

  Process process("process");
  EXPECT_FALSE(process.AddTask(0, TaskDescriptor())) << "no factory";
  TaskDescriptor broken(stage);
  broken.SetErrorState(ObjectErrorNotConstructed());
  EXPECT_FALSE(process.AddTask(0, broken));
  EXPECT_EQ(process.GetTaskCount(), 0U);
  EXPECT_TRUE(process.AddTask(0, stage));
  EXPECT_FALSE(process.Run(none)) << "too few arguments";
  EXPECT_FALSE(process.HasError()) << "with no error stored";

  EXPECT_TRUE(process.AddTask(2, stage)) << "stage 1 is a gap";
  EXPECT_EQ(process.GetTaskCount(), 3U);
  EXPECT_FALSE(process.Run(one)) << "the first token fails at the gap";

  ArgList wrong;
  wrong.Set(0, NumberPtr(new Number(1)));
  Process unusable("unusable");
  EXPECT_TRUE(unusable.AddTask(0, stage));
  EXPECT_FALSE(unusable.Run(wrong)) << "the task took TaskErrorBadParams";
}

TEST(Process, LetsAnExceptionOfATaskOutAndDestroysItsTasks) {
  const ScriptPtr script(new Script);
  script->atStage = [](Task&, int value) -> bool {
    if (value == 2) throw std::runtime_error("a task threw");
    return true;
  };
  {
    SquareProcess process(script);
    EXPECT_THROW(process.Pipeline().Run(process.Args()), std::runtime_error);
    EXPECT_EQ(script->alive, 0);
  }
  SquareProcess process(script);
  EXPECT_FALSE(process.RunProcess(0)) << "the builder makes a failed run of it";
  EXPECT_TRUE(process.IsFinished());
}

TEST(Process, RunsInsideATaskOfAnother) {
  const ScriptPtr outer(new Script);
  std::atomic<int> inner{0};
  outer->atStage = [&](Task&, int) {
    const ScriptPtr script(new Script);
    SquareProcess process(script);
    if (process.RunProcess(0) && script->written == Squares(5)) ++inner;
    return true;
  };
  SquareProcess process(outer);
  EXPECT_TRUE(process.RunProcess(0));
  EXPECT_EQ(inner, 5);
}

TEST(ProcessBuilder, InTheBackgroundIsKeptByItsThread) {
  const ScriptPtr script(new Script);
  std::latch released(1);
  script->atSource = [&](int next) {
    if (next == 0) released.wait();
  };
  struct Ended : AsyncCallback {
    void OnFinish() override { done.count_down(); }
    std::latch done{1};
  };
  const Pointer<Ended> ended(new Ended);
  {
    const Pointer<SquareProcess> process(new SquareProcess(script, {}, ended));
    EXPECT_TRUE(process->RunProcess(SquareProcess::kInBackground));
  }  // nobody but the thread holds it now
  released.count_down();
  ended->done.wait();
  EXPECT_EQ(script->written, Squares(5));
}

TEST(ProcessBuilder, RunsOnlyWhatIsBuiltAndOwned) {
  struct Unbuilt : ProcessBuilder<Process> {
    Unbuilt() : ProcessBuilder("Unbuilt") {}
  } unbuilt;
  EXPECT_FALSE(unbuilt.RunProcess(0));
  EXPECT_FALSE(unbuilt.IsStarted());

  SquareProcess onTheStack{ScriptPtr(new Script)};
  EXPECT_FALSE(onTheStack.RunProcess(SquareProcess::kInBackground));
  EXPECT_FALSE(onTheStack.IsStarted());
}

TEST(ProcessBuilder, TellsItsReceiverOfAnEndThatWasNotAnAbort) {
  struct Receiver {
    void OnProcessEnd(const ProcessBuilder<Process>& process) {
      ++calls;
      progress = process.GetProgress();
    }
    int calls = 0;
    double progress = -1;
  };
  struct Told : ProcessBuilderCallback<Process, Receiver> {
    explicit Told(Receiver* receiver) : ProcessBuilderCallback("Told", receiver) { SetBuilt(); }
  };
  Receiver receiver;
  Told run(&receiver);
  run.RunProcess(0);
  EXPECT_EQ(receiver.calls, 1);
  EXPECT_EQ(receiver.progress, 1.0);

  Told aborted(&receiver);
  aborted.Abort();
  aborted.RunProcess(0);
  EXPECT_EQ(receiver.calls, 1);
}

TEST(Process, EndsSoonAfterAnAbort) {
  const ScriptPtr script(new Script);
  script->tokens = 1'000'000'000;
  const Pointer<SquareProcess> process(new SquareProcess(script));
  std::latch running(1);
  script->atSource = [&](int next) {
    if (next == 100) running.count_down();
    std::this_thread::sleep_for(std::chrono::microseconds(100));
  };
  ASSERT_TRUE(process->RunProcess(SquareProcess::kInBackground));
  running.wait();
  const auto start = std::chrono::steady_clock::now();
  process->Abort();
  process->WaitFinished();
  const auto took = std::chrono::steady_clock::now() - start;
  RecordProperty(
      "milliseconds",
      static_cast<int>(std::chrono::duration_cast<std::chrono::milliseconds>(took).count()));
  EXPECT_LT(took, std::chrono::seconds(5)) << "the rule is 200 ms on an idle machine";
}

}  // namespace
}  // namespace lumo
