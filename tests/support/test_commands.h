#pragma once

#include <atomic>
#include <condition_variable>
#include <functional>
#include <mutex>
#include <string>
#include <vector>

#include "commands/command.h"
#include "commands/job_parser.h"
#include "commands/job_result.h"

// Commands for jobs in tests. A source that uses them defines the factories by
// RegisterTestCommands.

namespace lumo::test {

/// A place at which commands of a job meet a test: they say that they are there, and stay until the
/// test lets them go.
class Gate {
 public:
  void Enter(const std::string& who) {
    std::unique_lock lock(mutex_);
    inside_.push_back(who);
    changed_.notify_all();
    changed_.wait(lock, [this] { return open_; });
  }
  /// Blocks until `count` have come, and gives them in order.
  std::vector<std::string> Await(std::size_t count) {
    std::unique_lock lock(mutex_);
    changed_.wait(lock, [&] { return inside_.size() >= count; });
    return inside_;
  }
  void Open() {
    const std::lock_guard lock(mutex_);
    open_ = true;
    changed_.notify_all();
  }
  void Close() {
    const std::lock_guard lock(mutex_);
    open_ = false;
    inside_.clear();
  }

 private:
  std::mutex mutex_;
  std::condition_variable changed_;
  std::vector<std::string> inside_;
  bool open_ = false;
};

inline Gate gGate;

inline const CommandDeclaration kEcho{
    "TestEchoCommand",
    "Tests",
    "Gives its input back.",
    {{"Text", Presence::kRequired, ValueKind::kText, "what to give back"},
     {"Times", Presence::kOptional, ValueKind::kInteger, "how often"}},
    {{"Text", ValueKind::kText, "the input, so often"},
     {"Hidden", ValueKind::kText, "not for the result document", "", false}}};

class EchoCommand final : public Command {
  CommandResult Execute() override {
    if (!CheckInputs()) return Fail();
    const unsigned times = HasInput("Times") ? Read<unsigned>("Times") : 1;
    String text("");
    for (unsigned i = 0; i < times; ++i) text += Read<String>("Text");
    Write("Text", text);
    Write("Hidden", text);
    return Succeed();
  }
};

inline const CommandDeclaration kGate{"TestGateCommand",
                                      "Tests",
                                      "Waits at the gate.",
                                      {{"Who", Presence::kRequired, ValueKind::kText, "as whom"}},
                                      {{"Who", ValueKind::kText, "the same"}}};

class GateCommand final : public Command {
  CommandResult Execute() override {
    if (!CheckInputs()) return Fail();
    gGate.Enter(Read<String>("Who").ToUTF8());
    Write("Who", Read<String>("Who"));
    return Succeed();
  }
};

inline const CommandDeclaration kThrow{"TestThrowCommand", "Tests", "Throws.", {}, {}};

class ThrowCommand final : public Command {
  CommandResult Execute() override { throw std::runtime_error("thrown on purpose"); }
};

/// The factories; one object for a test program.
struct RegisterTestCommands {
  CommandFactoryT<EchoCommand> echo{kEcho};
  CommandFactoryT<GateCommand> gate{kGate};
  CommandFactoryT<ThrowCommand> thrower{kThrow};
};

/// Parses, runs and answers a job, as a server does.
inline std::string RunDocument(const std::string& document) {
  Job job;
  JobParser(job).Parse(String(document));
  RunJob(job);
  return JobResultWriter(job).Write().ToUTF8();
}

/// The results by name of a job that is run.
inline Map<String, JobResult> ResultsOf(const std::string& document) {
  Map<String, JobResult> results;
  JobResultParser(results).Parse(String(RunDocument(document)));
  return results;
}

}  // namespace lumo::test
