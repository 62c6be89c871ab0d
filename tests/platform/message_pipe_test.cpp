#include "platform/message_pipe.h"

#include <fcntl.h>
#include <latch>
#include <sys/resource.h>
#include <sys/socket.h>
#include <sys/stat.h>
#include <sys/un.h>
#include <sys/wait.h>
#include <thread>
#include <unistd.h>

#include "platform/pipe_listener.h"
#include "support/temporary_directory.h"

namespace lumo::platform {
namespace {

namespace fs = std::filesystem;

class MessagePipe : public testing::Test {
 protected:
  std::unique_ptr<PipeListener> Open(const std::string& name) {
    return PipeListener::Open(name, fault);
  }

  test::PipeDirectoryOfTest directory;
  PipeFault fault{};
};

/// A raw client, for what PipeConnection would never do.
class RawClient {
 public:
  explicit RawClient(const std::string& name) : socket_(::socket(AF_UNIX, SOCK_STREAM, 0)) {
    sockaddr_un address{};
    address.sun_family = AF_UNIX;
    PipePath(name).copy(address.sun_path, sizeof address.sun_path - 1);
    connected = connect(socket_, reinterpret_cast<sockaddr*>(&address), sizeof address) == 0;
  }
  ~RawClient() { close(socket_); }
  void Send(const std::string& bytes) { send(socket_, bytes.data(), bytes.size(), MSG_NOSIGNAL); }
  /// True when the server has closed without another byte.
  bool IsClosed() {
    char byte = 0;
    return recv(socket_, &byte, 1, 0) <= 0;
  }

  bool connected = false;

 private:
  int socket_;
};

TEST_F(MessagePipe, KeepsTheBoundariesOfMessages) {
  const auto listener = Open("a");
  ASSERT_NE(listener, nullptr);
  std::string large(3 << 20, 'x');
  large[12345] = '\0';
  std::thread server([&] {
    std::string message;
    while (listener->Wait(message) && message != "end") listener->Reply(message + "!");
  });
  for (const std::string& text : {std::string("one"), std::string(1, '\0'), large}) {
    const auto client = PipeConnection::Connect("a", 0.0);
    ASSERT_NE(client, nullptr);
    ASSERT_TRUE(client->Write(text));
    std::string reply;
    ASSERT_TRUE(client->Read(reply));
    EXPECT_EQ(reply, text + "!");
    EXPECT_FALSE(client->Read(reply));  // one exchange to a connection
  }
  PipeConnection::Connect("a", 0.0)->Write("end");
  server.join();
}

TEST_F(MessagePipe, ManyClientsAtOnceAreAllServed) {
  const auto listener = Open("many");
  ASSERT_NE(listener, nullptr);
  constexpr int kClients = 200;
  std::vector<std::unique_ptr<PipeConnection>> clients;
  for (int i = 0; i < kClients; ++i) clients.push_back(PipeConnection::Connect("many", 5.0));
  std::thread server([&] {
    std::string message;
    for (int i = 0; i < kClients && listener->Wait(message); ++i) listener->Reply(message);
    listener->Wait(message);  // sends what is left of the last answer, until it is stopped
  });
  for (int i = kClients; i-- > 0;) ASSERT_TRUE(clients[i]->Write(std::to_string(i)));
  for (int i = 0; i < kClients; ++i) {
    std::string reply;
    ASSERT_TRUE(clients[i]->Read(reply));
    EXPECT_EQ(reply, std::to_string(i));
  }
  listener->Stop();
  server.join();
}

TEST_F(MessagePipe, NoClientKeepsTheOthersWaiting) {
  const auto listener = Open("a");
  ASSERT_NE(listener, nullptr);
  std::thread server([&] {
    std::string message;
    while (listener->Wait(message)) listener->Reply(std::string(8 << 20, 'r'));
  });
  RawClient silent("a");
  RawClient slow("a");
  slow.Send(std::string("\x05\x00\x00", 3));
  RawClient partial("a");
  partial.Send(std::string("\x05\x00\x00\x00mes", 7));
  { RawClient gone("a"); }
  {
    RawClient goneHalfWay("a");
    goneHalfWay.Send(std::string("\x05\x00\x00\x00m", 5));
  }
  const auto deaf = PipeConnection::Connect("a", 0.0);  // asks, and never reads the answer
  ASSERT_TRUE(deaf->Write("x"));
  for (int i = 0; i < 3; ++i) {
    const auto client = PipeConnection::Connect("a", 0.0);
    ASSERT_NE(client, nullptr);
    ASSERT_TRUE(client->Write("q"));
    std::string reply;
    ASSERT_TRUE(client->Read(reply));
    EXPECT_EQ(reply.size(), std::size_t{8} << 20);
  }
  listener->Stop();
  server.join();
}

TEST_F(MessagePipe, RefusesMessagesThatAreTooLongOrEmpty) {
  const auto listener = Open("a");
  ASSERT_NE(listener, nullptr);
  std::thread server([&] {
    std::string message;
    while (listener->Wait(message)) listener->Reply(message);
  });
  RawClient tooLong("a");
  tooLong.Send(std::string("\x01\x00\x00\x10", 4));  // 256 MiB and one byte
  EXPECT_TRUE(tooLong.IsClosed());
  RawClient empty("a");
  empty.Send(std::string(4, '\0'));
  EXPECT_TRUE(empty.IsClosed());
  const auto client = PipeConnection::Connect("a", 0.0);
  EXPECT_FALSE(client->Write(std::string(kMaxMessageBytes + 1, 'x')));
  ASSERT_TRUE(client->Write("still there"));
  std::string reply;
  EXPECT_TRUE(client->Read(reply));
  listener->Stop();
  server.join();
}

TEST_F(MessagePipe, ClosesThoseWhoStaySilent) {
  ListenerLimits limits;
  limits.idleSeconds = 0.3;
  const auto listener = PipeListener::Open("a", fault, limits);
  ASSERT_NE(listener, nullptr);
  std::thread server([&] {
    std::string message;
    while (listener->Wait(message)) {
      std::this_thread::sleep_for(std::chrono::milliseconds(500));  // nobody listens meanwhile
      listener->Reply(message);
    }
  });
  RawClient silent("a"), halfway("a"), slow("a");
  halfway.Send(std::string("\x05\x00\x00\x00m", 5));
  const auto ask = [](PipeConnection& client) {
    std::string reply;
    return client.Write("x") && client.Read(reply);
  };
  EXPECT_TRUE(ask(*PipeConnection::Connect("a", 0.0)));
  RawClient steady("a");
  const std::string frame("\x05\x00\x00\x00steady", 10);
  for (const char byte : frame.substr(0, 8)) {
    steady.Send(std::string(1, byte));
    std::this_thread::sleep_for(std::chrono::milliseconds(100));
  }
  steady.Send("d");
  EXPECT_FALSE(steady.IsClosed());  // an answer is what has come
  EXPECT_TRUE(silent.IsClosed());
  EXPECT_TRUE(halfway.IsClosed());
  listener->Stop();
  server.join();
}

TEST_F(MessagePipe, BoundsClientsAndWhatTheySendTogether) {
  ListenerLimits limits;
  limits.clients = 3;
  limits.incomingBytes = 1 << 20;
  const auto listener = PipeListener::Open("a", fault, limits);
  const auto second = PipeListener::Open("b", fault, limits);
  ASSERT_TRUE(listener && second);
  std::vector<std::thread> servers;
  for (PipeListener* const one : {listener.get(), second.get()}) {
    servers.emplace_back([one] {
      std::string message;
      while (one->Wait(message)) one->Reply("r");
    });
  }
  const auto ask = [](const char* name, const std::string& message) {
    const auto client = PipeConnection::Connect(name, 5.0);
    std::string reply;
    return client != nullptr && client->Write(message) && client->Read(reply);
  };
  {
    // Most of a large message waits at one listener: another one doesn't fit at the other.
    RawClient large("a");
    large.Send(std::string("\x00\x00\x0f\x00", 4) + std::string(900 << 10, 'x'));
    std::this_thread::sleep_for(std::chrono::milliseconds(100));
    EXPECT_FALSE(ask("b", std::string(300 << 10, 'y')));
    EXPECT_TRUE(ask("b", "a word"));
  }
  std::this_thread::sleep_for(std::chrono::milliseconds(100));
  EXPECT_TRUE(ask("b", std::string(300 << 10, 'y')));

  std::vector<std::unique_ptr<RawClient>> silent;
  for (int i = 0; i < 3; ++i) silent.push_back(std::make_unique<RawClient>("a"));
  EXPECT_TRUE(ask("a", "x"));  // in place of the one that has been silent for longest
  EXPECT_TRUE(silent[0]->IsClosed());
  listener->Stop();
  second->Stop();
  for (std::thread& server : servers) server.join();
}

TEST_F(MessagePipe, ChecksNamesAndTheDirectory) {
  for (const char* name : {"", "a/b", "..", "a..b", ".hidden", "../x"}) {
    EXPECT_EQ(Open(name), nullptr) << name;
    EXPECT_EQ(fault, PipeFault::kBadName) << name;
    EXPECT_EQ(PipeConnection::Connect(name, 0.0), nullptr) << name;
  }
  EXPECT_EQ(Open(std::string("a\0b", 3)), nullptr);
  EXPECT_EQ(Open(std::string(200, 'n')), nullptr);
  EXPECT_EQ(fault, PipeFault::kBadName);

  ASSERT_NE(Open("a"), nullptr);
  struct stat status {};
  ASSERT_EQ(stat(directory.Path().c_str(), &status), 0);
  EXPECT_EQ(status.st_mode & 0777U, 0700U);

  chmod(directory.Path().c_str(), 0755);
  EXPECT_EQ(Open("a"), nullptr);
  EXPECT_EQ(fault, PipeFault::kBadDirectory);
  fs::remove_all(directory.Path());
  fs::create_directory(directory.Path().parent_path() / "elsewhere");
  fs::create_directory_symlink(directory.Path().parent_path() / "elsewhere", directory.Path());
  EXPECT_EQ(Open("a"), nullptr);
  EXPECT_EQ(fault, PipeFault::kBadDirectory);
}

TEST_F(MessagePipe, ANameBelongsToOneLivingServer) {
  auto first = Open("a");
  ASSERT_NE(first, nullptr);
  struct stat status {};
  ASSERT_EQ(stat(PipePath("a").c_str(), &status), 0);
  EXPECT_EQ(status.st_mode & 0777U, 0600U);
  EXPECT_EQ(Open("a"), nullptr);
  EXPECT_EQ(fault, PipeFault::kTaken);
  first.reset();
  EXPECT_FALSE(fs::exists(PipePath("a")));

  // A server that dies leaves its socket behind.
  const pid_t child = fork();
  if (child == 0) {
    PipeFault ignored{};
    const auto* const kept = PipeListener::Open("a", ignored).release();
    _exit(kept != nullptr ? 0 : 1);
  }
  int ended = 1;
  waitpid(child, &ended, 0);
  ASSERT_EQ(ended, 0);
  ASSERT_TRUE(fs::exists(PipePath("a")));
  EXPECT_EQ(PipeConnection::Connect("a", 0.0), nullptr);
  first = Open("a");
  ASSERT_NE(first, nullptr);
  EXPECT_NE(PipeConnection::Connect("a", 0.0), nullptr);

  // One that was stopped loses its name, and does not take it from the next when it goes.
  first->Stop();
  const auto second = Open("a");
  ASSERT_NE(second, nullptr);
  first.reset();
  EXPECT_TRUE(fs::exists(PipePath("a")));
  RemoveOwnPipes();
  EXPECT_FALSE(fs::exists(PipePath("a")));
}

TEST_F(MessagePipe, AClientWaitsForAServerToCome) {
  EXPECT_EQ(PipeConnection::Connect("late", 0.0), nullptr);
  EXPECT_EQ(PipeConnection::Connect("late", 0.05), nullptr);
  std::unique_ptr<PipeListener> listener;
  std::thread server([&] {
    std::this_thread::sleep_for(std::chrono::milliseconds(100));
    listener = Open("late");
  });
  EXPECT_NE(PipeConnection::Connect("late", 30.0), nullptr);
  server.join();
}

TEST_F(MessagePipe, EndsWithTheProcessThatItWatches) {
  const auto listener = Open("a");
  ASSERT_NE(listener, nullptr);
  int start[2];
  ASSERT_EQ(pipe(start), 0);
  const pid_t child = fork();
  if (child == 0) {
    char byte = 0;
    _exit(static_cast<int>(read(start[0], &byte, 1)) - 1);
  }
  ASSERT_TRUE(listener->EndWithProcess(child));
  std::thread ender([&] {
    std::this_thread::sleep_for(std::chrono::milliseconds(50));
    ASSERT_EQ(write(start[1], "x", 1), 1);
  });
  std::string message;
  EXPECT_FALSE(listener->Wait(message));
  ender.join();
  waitpid(child, nullptr, 0);
  EXPECT_FALSE(listener->EndWithProcess(child));
  close(start[0]);
  close(start[1]);
}

TEST_F(MessagePipe, SurvivesRunningOutOfDescriptors) {
  const auto listener = Open("a");
  ASSERT_NE(listener, nullptr);
  std::vector<std::unique_ptr<RawClient>> waiting;
  for (int i = 0; i < 3; ++i) waiting.push_back(std::make_unique<RawClient>("a"));
  std::string message;
  bool ended = false;
  std::latch limited(1);  // a thread can't be started without descriptors under every sanitizer
  std::thread server([&] {
    limited.wait();
    ended = !listener->Wait(message);
  });
  rlimit before{};
  ASSERT_EQ(getrlimit(RLIMIT_NOFILE, &before), 0);
  const int next = dup(0);
  close(next);
  rlimit none = before;
  none.rlim_cur = static_cast<rlim_t>(next);
  ASSERT_EQ(setrlimit(RLIMIT_NOFILE, &none), 0);
  limited.count_down();
  for (const auto& client : waiting) EXPECT_TRUE(client->IsClosed());
  ASSERT_EQ(setrlimit(RLIMIT_NOFILE, &before), 0);
  const auto client = PipeConnection::Connect("a", 0.0);
  ASSERT_NE(client, nullptr);
  EXPECT_TRUE(client->Write("after"));
  server.join();
  EXPECT_FALSE(ended);
  EXPECT_EQ(message, "after");
}

}  // namespace
}  // namespace lumo::platform
