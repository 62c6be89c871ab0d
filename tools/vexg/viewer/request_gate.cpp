#include "viewer/request_gate.h"

#include <fmt/format.h>

namespace lumo::host {
namespace {

/// The value of a header that is there once; none otherwise.
std::optional<std::string> OnlyValue(const http::Request& request, const char* name) {
  const auto [first, last] = request.headers.equal_range(name);
  if (first == last || std::next(first) != last) return {};
  return first->second;
}

/// Compares keys in a time that does not tell how much of them is equal.
bool AreEqual(const std::string& a, const std::string& b) {
  if (a.size() != b.size()) return false;
  unsigned difference = 0;
  for (std::size_t i = 0; i < a.size(); ++i) {
    difference |= static_cast<unsigned>(static_cast<unsigned char>(a[i])) ^
                  static_cast<unsigned>(static_cast<unsigned char>(b[i]));
  }
  return difference == 0;
}

}  // namespace

RequestGate::RequestGate(std::string key, unsigned port)
    : key_(std::move(key)), host_(fmt::format("127.0.0.1:{}", port)) {}

bool RequestGate::MayPass(const http::Request& request) const {
  const bool reads = request.method == "GET" || request.method == "HEAD";
  if (!reads && request.method != "POST") return false;
  if (OnlyValue(request, "host") != host_) return false;
  if (request.headers.count("origin") != 0 &&
      OnlyValue(request, "origin") != fmt::format("http://{}", host_)) {
    return false;
  }
  if (request.headers.count("transfer-encoding") != 0) return false;  // its size is not known
  if (!request.path.starts_with("/api/")) return reads;
  const std::optional<std::string> key = OnlyValue(request, "x-vexg-key");
  return key && AreEqual(*key, key_);
}

std::optional<http::Answer> RequestGate::Judge(const http::Request& request) const {
  if (MayPass(request)) return {};
  return http::Answer{403, "text/plain", "refused\n"};
}

}  // namespace lumo::host
