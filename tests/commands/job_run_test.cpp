#include "commands/job_run.h"

#include <thread>

#include "support/test_commands.h"

namespace lumo {
namespace {

using test::gGate;

std::string ResultOf(const Job& job, unsigned index) {
  return GetResultWord(job.commands[index]->command->GetResult());
}

/// A job that runs on a thread of its own, with the gate closed at the start.
class RunningJob {
 public:
  explicit RunningJob(const std::string& document) {
    gGate.Close();
    JobParser(job).Parse(String(document));
    thread_ = std::thread([this] { RunJob(job); });
  }
  ~RunningJob() { Finish(); }
  void Finish() {
    gGate.Open();
    if (thread_.joinable()) thread_.join();
  }

  Job job;

 private:
  std::thread thread_;
};

std::string GateAt(const std::string& name, const std::string& more = "") {
  return "<Command Name=\"" + name + "\" ID=\"TestGateCommand\">" + more + "<Input Who=\"" + name +
         "\"/></Command>";
}

TEST(RunJob, MovesOutputsToLaterInputs) {
  const Map<String, JobResult> results = test::ResultsOf(R"(<Job>
    <Command Name="a" ID="TestEchoCommand"><Input Text="x"/><Output Text="$v" Nothing="$n"/></Command>
    <Command Name="b" ID="TestEchoCommand"><DependsOn Name="a"/><Input Text="$v" Times="3"/></Command>
    <Command Name="c" ID="TestEchoCommand"><DependsOn Name="a"/><Input Text="$n"/></Command>
    <Command Name="d" ID="TestEchoCommand"><DependsOn Name="a"/><Input Text="$never"/></Command>
    <Command Name="e" ID="TestEchoCommand"><DependsOn Name="c"/><Input Text="x"/></Command>
    <Command Name="f" ID="TestEchoCommand"><Input Text=""/></Command>
    </Job>)");
  EXPECT_EQ(results.Find("b").returns.Find("Text").ToUTF8(), "xxx");
  EXPECT_EQ(results.Find("c").result.ToUTF8(), "Failed");   // the output was never stored
  EXPECT_EQ(results.Find("d").result.ToUTF8(), "Failed");   // nobody writes the variable
  EXPECT_EQ(results.Find("e").result.ToUTF8(), "Success");  // runs though what it waited for failed
  EXPECT_EQ(results.Find("f").result.ToUTF8(), "Success");  // an empty literal is a value
}

TEST(RunJob, AJobOfOneCommandRunsOnTheCallersThread) {
  static std::thread::id ran;
  struct WhereCommand final : Command {
    CommandResult Execute() override {
      ran = std::this_thread::get_id();
      return Succeed();
    }
  };
  const CommandDeclaration where{"TestWhereCommand", "Tests", "Notes its thread.", {}, {}};
  const CommandFactoryT<WhereCommand> factory(where);
  test::RunDocument("<Job><Command ID=\"TestWhereCommand\"/></Job>");
  EXPECT_EQ(ran, std::this_thread::get_id());
  test::RunDocument(
      "<Job><Command ID=\"TestWhereCommand\"/><Command ID=\"TestEchoCommand\"/></Job>");
  EXPECT_NE(ran, std::this_thread::get_id());
}

TEST(RunJob, CommandsWithoutDependenciesRunAtOnce) {
  RunningJob running("<Job>" + GateAt("a") + GateAt("b") + GateAt("c") + "</Job>");
  EXPECT_THAT(gGate.Await(3), testing::UnorderedElementsAre("a", "b", "c"));
  EXPECT_EQ(running.job.GetIPC().progress->GetProgress(), 0.0);
  running.Finish();
  EXPECT_EQ(running.job.GetIPC().progress->GetProgress(), 1.0);
}

TEST(RunJob, ADependentWaitsForTheRetirement) {
  RunningJob running("<Job>" + GateAt("a") + GateAt("b", "<DependsOn Name=\"a\"/>") +
                     GateAt("c", "<DependsOn Name=\"@ALL\"/>") + "</Job>");
  EXPECT_THAT(gGate.Await(1), testing::ElementsAre("a"));
  EXPECT_EQ(running.job.commands[1]->command->GetState(), CommandState::kCreated);
  gGate.Open();
  EXPECT_THAT(gGate.Await(3), testing::ElementsAre("a", "b", "c"));
}

TEST(RunJob, ProgressIsTheMeanOverTheCommands) {
  RunningJob running(
      "<Job><Command Name=\"done\" ID=\"TestEchoCommand\"><Input Text=\"x\"/></Command>" +
      GateAt("a", "<DependsOn Name=\"done\"/>") + GateAt("b", "<DependsOn Name=\"a\"/>") +
      GateAt("c", "<DependsOn Name=\"b\"/>") + "</Job>");
  gGate.Await(1);
  EXPECT_EQ(running.job.GetIPC().progress->GetProgress(), 0.25);
}

TEST(RunJob, AnAbortEndsWhatHasNotBegun) {
  RunningJob running("<Job>" + GateAt("a") + GateAt("b", "<DependsOn Name=\"a\"/>") +
                     GateAt("c", "<DependsOn Name=\"b\"/>") + "</Job>");
  gGate.Await(1);
  running.job.GetIPC().abort->Set(true);
  running.Finish();
  EXPECT_EQ(ResultOf(running.job, 0), "Success");  // was in the middle of its work
  EXPECT_EQ(ResultOf(running.job, 1), "Aborted");
  EXPECT_EQ(ResultOf(running.job, 2), "Aborted");
  EXPECT_EQ(gGate.Await(1).size(), 1U);
  Map<String, JobResult> results;
  JobResultParser(results).Parse(JobResultWriter(running.job).Write());
  EXPECT_EQ(results.GetCount(), 3U);
}

TEST(RunJob, LiteralsBecomeVariablesInOrder) {
  Job job;
  JobParser(job).Parse(R"(<Job>
    <Command Name="a" ID="TestEchoCommand"><Input Text="abc" Times="$t"/></Command>
    <Command Name="b" ID="TestEchoCommand"><Input Text="abc"/></Command></Job>)");
  RunJob(job);
  EXPECT_EQ(job.commands[0]->inputs.Find("Text").ToUTF8(), "TMP_VAR_00000000");
  EXPECT_EQ(job.commands[0]->inputs.Find("Times").ToUTF8(), "$t");
  EXPECT_EQ(job.commands[1]->inputs.Find("Text").ToUTF8(), "TMP_VAR_00000001");
}

TEST(RunJob, ALongChainOfCommandsEnds) {
  std::string document = "<Job>";
  for (int i = 0; i < 300; ++i) {
    document +=
        "<Command Name=\"c" + std::to_string(i) + "\" ID=\"TestEchoCommand\">" +
        (i == 0 ? "<Input Text=\"x\"/>"
                : "<DependsOn Name=\"c" + std::to_string(i - 1) + "\"/><Input Text=\"$v\"/>") +
        "<Output Text=\"$v\"/></Command>";
  }
  const Map<String, JobResult> results = test::ResultsOf(document + "</Job>");
  EXPECT_EQ(results.GetCount(), 300U);
  EXPECT_EQ(results.Find("c299").returns.Find("Text").ToUTF8(), "x");
}

}  // namespace
}  // namespace lumo
