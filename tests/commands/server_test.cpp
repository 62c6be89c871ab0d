#include "commands/server.h"

#include <thread>

#include "commands/client.h"
#include "foundation/thread_roll.h"
#include "platform/clock.h"
#include "platform/message_pipe.h"
#include "platform/process.h"
#include "support/temporary_directory.h"
#include "support/test_commands.h"

namespace lumo {
namespace {

constexpr const char* kEchoJob =
    "<Job><Command Name=\"a\" ID=\"TestEchoCommand\"><Input Text=\"hello\"/></Command></Job>";

/// A dispatcher on a thread of its own.
class Server : public testing::Test {
 protected:
  Server() : dispatch_(new PipeServerDispatch("test")) {
    EXPECT_TRUE(dispatch_->Open());
    EXPECT_TRUE(StartThread(dispatch_));
  }
  ~Server() override {
    dispatch_->EndNow();
    dispatch_->WaitEnded();
  }

  std::string PipeNames() const {
    std::set<std::string> names;
    for (const auto& entry : std::filesystem::directory_iterator(directory_.Path())) {
      names.insert(entry.path().filename().string());
    }
    std::string text;
    for (const std::string& name : names) text += name + " ";
    return text;
  }

  test::PipeDirectoryOfTest directory_;
  Pointer<PipeServerDispatch> dispatch_;
};

TEST_F(Server, RunsTheJobsOfItsClients) {
  PipeClient client("test");
  EXPECT_EQ(client.GetName().ToUTF8(), "test::NULL");
  String reply("left over");
  EXPECT_FALSE(client.Send(kEchoJob, reply));
  EXPECT_EQ(reply.GetLength(), 0U);
  ASSERT_TRUE(client.Connect());
  EXPECT_TRUE(client.Connect());
  EXPECT_EQ(client.GetName().ToUTF8(), "test::test_SERVER_00000000");
  for (int i = 0; i < 3; ++i) {
    const Map<String, JobResult> results = client.Submit(kEchoJob);
    EXPECT_EQ(results.Find("a").returns.Find("Text").ToUTF8(), "hello");
  }
  PipeClient second("test");
  ASSERT_TRUE(second.Connect());
  EXPECT_EQ(second.GetName().ToUTF8(), "test::test_SERVER_00000001");
  EXPECT_TRUE(second.Send("", reply));
  EXPECT_EQ(reply.ToUTF8(), "@ERROR");
  EXPECT_TRUE(second.Send("@quit", reply));  // not the word that ends it, and no job either
  EXPECT_THAT(reply.ToUTF8(), testing::EndsWith("<JobResult/>"));
  EXPECT_TRUE(second.Send("<Job><Command Name=\"a\" ID=\"TestEchoCommand\"/><", reply));
  EXPECT_THAT(reply.ToUTF8(), testing::HasSubstr("Name=\"a\" Result=\"Failed\""));
  client.Disconnect();
  EXPECT_FALSE(client.IsConnected());
  EXPECT_EQ(client.Submit(kEchoJob).GetCount(), 0U);
}

TEST_F(Server, CarriesLargeDocumentsBothWays) {
  PipeClient client("test");
  ASSERT_TRUE(client.Connect());
  const std::string text(1 << 20, 't');
  const Map<String, JobResult> results = client.Submit(
      String("<Job><Command Name=\"a\" ID=\"TestEchoCommand\"><Input Times=\"4\" Text=\"" + text +
             "\"/></Command></Job>"));
  EXPECT_EQ(results.Find("a").returns.Find("Text").GetLength(), 4U << 20);
}

TEST_F(Server, ABusyClientDoesNotHoldUpAnother) {
  test::gGate.Close();
  PipeClient busy("test");
  ASSERT_TRUE(busy.Connect());
  std::thread waiting([&] {
    const auto results = busy.Submit(
        "<Job><Command Name=\"g\" ID=\"TestGateCommand\"><Input Who=\"g\"/></Command></Job>");
    EXPECT_EQ(results.Find("g").result.ToUTF8(), "Success");
  });
  test::gGate.Await(1);
  PipeClient other("test");
  ASSERT_TRUE(other.Connect());
  EXPECT_EQ(other.Submit(kEchoJob).GetCount(), 1U);
  test::gGate.Open();
  waiting.join();
}

TEST_F(Server, TheQuitWordEndsThreadsAndFreesNames) {
  auto client = std::make_unique<PipeClient>("test");
  ASSERT_TRUE(client->Connect());
  EXPECT_EQ(PipeNames(), "test test_SERVER_00000000 ");
  NamedPipe pipe("test");
  ASSERT_TRUE(pipe.Connect());
  EXPECT_NE(pipe.Write("something else"), 0U);
  String reply;
  EXPECT_EQ(pipe.Read(reply), 0U);  // no answer to it
  dispatch_->Stop();
  dispatch_->WaitEnded();
  EXPECT_EQ(client->Submit(kEchoJob).GetCount(), 1U);  // a private server outlives the dispatcher
  client.reset();
  // Its thread ends by itself; the name is free once it has.
  for (int i = 0; i < 1000 && PipeNames() != "test "; ++i) {
    std::this_thread::sleep_for(std::chrono::milliseconds(5));
  }
  EXPECT_EQ(PipeNames(), "test ");
  dispatch_.Reset(new PipeServerDispatch("other"));
  EXPECT_EQ(PipeNames(), "");
  EXPECT_TRUE(dispatch_->Open());
  EXPECT_TRUE(StartThread(dispatch_));
}

TEST_F(Server, AStoppedHostCanAbortWhatItServes) {
  test::gGate.Close();
  PipeClient client("test");
  ASSERT_TRUE(client.Connect());
  std::thread waiting([&] {
    const auto results = client.Submit(
        "<Job><Command Name=\"g\" ID=\"TestGateCommand\"><Input Who=\"g\"/></Command>"
        "<Command Name=\"late\" ID=\"TestEchoCommand\"><DependsOn Name=\"g\"/></Command></Job>");
    EXPECT_EQ(results.Find("late").result.ToUTF8(), "Aborted");
  });
  test::gGate.Await(1);
  AbortServedJobs();
  test::gGate.Open();
  WaitServedJobs();
  waiting.join();
}

TEST_F(Server, EndsItsPrivateServersOnceTheirJobsHaveEnded) {
  test::gGate.Close();
  PipeClient busy("test", 0.0), idle("test", 0.0);
  ASSERT_TRUE(busy.Connect());
  ASSERT_TRUE(idle.Connect());
  std::thread waiting([&] {
    const auto results = busy.Submit(
        "<Job><Command Name=\"g\" ID=\"TestGateCommand\"><Input Who=\"g\"/></Command></Job>");
    EXPECT_EQ(results.Find("g").result.ToUTF8(), "Success");  // the answer still comes
  });
  test::gGate.Await(1);
  dispatch_->EndNow();
  dispatch_->WaitEnded();
  std::thread ending([] { EndServers(); });
  std::thread opening([] {
    std::this_thread::sleep_for(std::chrono::milliseconds(50));
    test::gGate.Open();
  });
  ending.join();
  waiting.join();
  opening.join();
  EXPECT_TRUE(JoinThreads(10.0));
  EXPECT_EQ(idle.Submit(kEchoJob).GetCount(), 0U);
  EXPECT_EQ(PipeNames(), "test ");
  dispatch_.Reset(new PipeServerDispatch("other"));
  EXPECT_TRUE(dispatch_->Open());
  EXPECT_TRUE(StartThread(dispatch_));
}

TEST_F(Server, TellsItsJobsAndAbortsOneByItsNumber) {
  test::gGate.Close();
  PipeClient busy("test"), other("test");
  ASSERT_TRUE(busy.Connect());
  ASSERT_TRUE(other.Connect());
  std::thread waiting([&] {
    const auto results = busy.Submit(
        "<Job><Command Name=\"g\" ID=\"TestGateCommand\"><Input Who=\"g\"/></Command>"
        "<Command Name=\"late\" ID=\"TestEchoCommand\"><DependsOn Name=\"g\"/></Command></Job>");
    EXPECT_EQ(results.Find("late").result.ToUTF8(), "Aborted");
  });
  test::gGate.Await(1);
  const auto ask = [&](const std::string& command) {
    return other
        .Submit(String("<Job><Reasons/><Command Name=\"a\" " + command + "</Command></Job>"))
        .Find("a");
  };
  const Map<String, String> list = ask("ID=\"ListJobsCommand\">").returns;
  const auto numbers = ParseValue<Array<unsigned>>(list.Find("Jobs"));
  ASSERT_EQ(numbers.GetCount(), 2U);
  EXPECT_EQ(list.Find("Commands").ToUTF8(), "TestGateCommand|ListJobsCommand");
  EXPECT_EQ(list.Find("Aborted").ToUTF8(), "1:2 [0 0]");
  const std::string first = std::to_string(numbers[0]);
  EXPECT_EQ(ask("ID=\"AbortJobCommand\"><Input Job=\"" + first + "\"/>").result, "Success");
  const JobResult none = ask("ID=\"AbortJobCommand\"><Input Job=\"4000000\"/>");
  EXPECT_EQ(none.reason.ToUTF8(), "no job 4000000 is running");
  test::gGate.Open();
  waiting.join();
}

TEST(PipeServer, AnswersAResultThatIsTooLongByAShortOne) {
  const test::PipeDirectoryOfTest directory;
  const PipeServerPtr server(new PipeServer("long", platform::ProcessNumber()));
  server->SetMaxAnswer(1000);
  ASSERT_TRUE(server->Open());
  ASSERT_TRUE(StartThread(server));
  const auto submit = [](const std::string& job) {
    NamedPipe pipe("long");
    EXPECT_TRUE(pipe.ConnectWithin(5.0));
    pipe.Write(String(job));
    String answer;
    pipe.Read(answer);
    EXPECT_LE(answer.GetLength(), 1000U);
    Map<String, JobResult> results;
    JobResultParser(results).Parse(answer);
    return results;
  };
  const std::string text(2000, 't');
  const std::string echo = "ID=\"TestEchoCommand\"><Input Text=\"" + text + "\"/></Command>";
  const auto results = submit("<Job><Command Name=\"a\" " + echo +
                              "<Command Name=\"b\" ID=\"TestEchoCommand\"/></Job>");
  EXPECT_EQ(results.Find("a").result.ToUTF8(), "Failed");
  EXPECT_THAT(results.Find("a").reason.ToUTF8(), testing::HasSubstr("return values are left out"));
  EXPECT_EQ(results.GetCount(), 2U);
  std::string many = "<Job>";
  for (int i = 0; i < 100; ++i) many += "<Command Name=\"x\" " + echo;
  const auto whole = submit(many + "</Job>");
  EXPECT_EQ(whole.GetCount(), 1U);
  EXPECT_THAT(whole.Find("").reason.ToUTF8(), testing::HasSubstr("so are the commands"));
  server->EndNow();
  server->WaitEnded();
}

TEST(PipeClient, DoesNotWaitAgainForAPrivateServerThatIsGone) {
  const test::PipeDirectoryOfTest directory;
  const auto dispatch = Pointer<PipeServerDispatch>(new PipeServerDispatch("test"));
  ASSERT_TRUE(dispatch->Open());
  ASSERT_TRUE(StartThread(dispatch));
  constexpr double kPatience = 0.4;
  const double start = platform::MonotonicSeconds();
  {
    PipeClient client("test", kPatience);
    ASSERT_TRUE(client.Connect());
    dispatch->EndNow();
    dispatch->WaitEnded();
    EndServers();
    String reply;
    EXPECT_FALSE(client.Send(kEchoJob, reply));
    EXPECT_FALSE(client.Send(kEchoJob, reply));
  }
  const double took = platform::MonotonicSeconds() - start;
  EXPECT_GE(took, kPatience);
  EXPECT_LT(took, 2 * kPatience);
}

TEST(ServerDispatch, IsOneForTheProcess) {
  ServerDispatch& first = GetServerDispatch("a");
  EXPECT_EQ(&first, &GetServerDispatch("b"));
  EXPECT_EQ(dynamic_cast<PipeServerDispatch&>(first).GetName().ToUTF8(), "a");
}

TEST(ServerDispatch, RefusesANameThatIsAFormat) {
  const test::PipeDirectoryOfTest directory;
  PipeServerDispatch dispatch("100%x");
  EXPECT_FALSE(dispatch.Open());
  dispatch.Run();  // returns at once
}

}  // namespace
}  // namespace lumo
