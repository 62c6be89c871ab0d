#include "http/http_server.h"

#include <algorithm>
#include <cctype>
#include <httplib.h>
#include <memory>

#include "foundation/own_plugin.h"
#include "platform/socket_reuse.h"

namespace lumo::http {
namespace {

constexpr std::size_t kThreads = 32;
constexpr time_t kPatience = 2;  // s
constexpr std::size_t kMostBody = 1U << 20;
constexpr std::size_t kMostRequests = 1000;  // of a connection

Request RequestOf(const httplib::Request& from) {
  Request request{from.method, from.path, {}, {}, from.body};
  for (const auto& [name, value] : from.params) request.query.emplace(name, value);
  for (const auto& [name, value] : from.headers) {
    std::string lower = name;
    std::transform(lower.begin(), lower.end(), lower.begin(),
                   [](unsigned char c) { return static_cast<char>(std::tolower(c)); });
    request.headers.emplace(lower, value);
  }
  return request;
}

void Give(const Answer& answer, httplib::Response& response) {
  response.status = answer.status;
  for (const auto& [name, value] : answer.headers) response.set_header(name, value);
  if (answer.body.empty()) return;
  // Not as one text: that would be packed, which takes far longer than sending it on this machine.
  const auto body = std::make_shared<const std::string>(answer.body);
  response.set_content_provider(
      body->size(), answer.type,
      [body](std::size_t offset, std::size_t length, httplib::DataSink& sink) {
        return sink.write(body->data() + offset, length);
      });
}

class LibraryServer final : public Server {
 public:
  explicit LibraryServer(const Handlers& handlers) : handlers_(handlers) {
    server_.new_task_queue = [] { return new httplib::ThreadPool(kThreads); };
    server_.set_keep_alive_timeout(kPatience);
    server_.set_keep_alive_max_count(kMostRequests);
    server_.set_read_timeout(kPatience);
    server_.set_write_timeout(kPatience);
    server_.set_payload_max_length(kMostBody);
    server_.set_tcp_nodelay(true);
    // In place of those of the library, which share the port with other programs.
    server_.set_socket_options([](socket_t socket) { platform::AllowPortSoon(socket); });
    httplib::Headers headers;
    for (const auto& [name, value] : handlers_.headers) headers.emplace(name, value);
    server_.set_default_headers(headers);
    server_.set_pre_routing_handler(
        [this](const httplib::Request& request, httplib::Response& response) {
          const std::optional<Answer> refusal = handlers_.judge(RequestOf(request));
          if (!refusal) return httplib::Server::HandlerResponse::Unhandled;
          Give(*refusal, response);
          return httplib::Server::HandlerResponse::Handled;
        });
    const auto answer = [this](const httplib::Request& request, httplib::Response& response) {
      Give(handlers_.answer(RequestOf(request)), response);
    };
    server_.Get(".*", answer);
    server_.Post(".*", answer);
    server_.set_exception_handler([](const httplib::Request&, httplib::Response& response,
                                     std::exception_ptr) { response.status = 500; });
  }

  unsigned Bind(unsigned port) override {
    constexpr const char* kLoopback = "127.0.0.1";
    if (port != 0) return server_.bind_to_port(kLoopback, static_cast<int>(port)) ? port : 0;
    const int taken = server_.bind_to_any_port(kLoopback);
    return taken > 0 ? static_cast<unsigned>(taken) : 0;
  }
  void Run() override { server_.listen_after_bind(); }
  void Stop() override { server_.stop(); }

 private:
  const Handlers handlers_;
  httplib::Server server_;
};

}  // namespace

extern "C" __attribute__((visibility("default"))) Server* VexgMakeHttpServer(
    const Handlers& handlers) {
  return new LibraryServer(handlers);
}

}  // namespace lumo::http
