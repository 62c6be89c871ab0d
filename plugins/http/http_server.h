#pragma once

#include <functional>
#include <map>
#include <optional>
#include <string>
#include <utility>
#include <vector>

/// The contract of libvexghttp.so, which speaks HTTP on this machine for the viewer. The host loads
/// it when it serves a page: the libraries behind it would cost each start of the program time.
namespace lumo::http {

/// A request of a browser. Names of headers are in lower case.
struct Request {
  std::string method;
  std::string path;  ///< behind the host and before the question mark, escapes resolved
  std::multimap<std::string, std::string> query;
  std::multimap<std::string, std::string> headers;
  std::string body;

  /// The value of a query; empty for none.
  std::string Query(const std::string& name) const {
    const auto at = query.find(name);
    return at == query.end() ? std::string() : at->second;
  }
};

/// The answer to a request.
struct Answer {
  int status = 200;
  std::string type;
  std::string body;
  std::vector<std::pair<std::string, std::string>> headers{};
};

/// The functions that answer. They run on many threads at once, and throw nothing.
struct Handlers {
  /// Refuses a request before its body is read; nothing lets it in.
  std::function<std::optional<Answer>(const Request&)> judge;
  std::function<Answer(const Request&)> answer;
  std::vector<std::pair<std::string, std::string>> headers;  ///< of every answer
};

/// A server of HTTP/1.1 on the loopback address 127.0.0.1, and on no other.
///
/// It has 32 threads, holds a silent connection for 2 seconds at most, and takes bodies of up to
/// 1 MiB. Threads: Stop on any.
class Server {
 public:
  virtual ~Server() = default;
  /// Takes a port, or a free one for 0.
  /// @return the port; 0 when it can't be had.
  virtual unsigned Bind(unsigned port) = 0;
  /// Serves until Stop.
  virtual void Run() = 0;
  virtual void Stop() = 0;
};

/// The type of "VexgMakeHttpServer", which the library exports; the caller owns the server.
using MakeServerFunction = Server*(const Handlers& handlers);

}  // namespace lumo::http
