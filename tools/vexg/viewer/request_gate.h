#pragma once

#include <optional>
#include <string>

#include "http/http_server.h"

namespace lumo::host {

/// Decides which requests are looked at, before anything else happens with them.
///
/// Only GET, HEAD and POST get in, with this server's own address as Host and, where there is one,
/// as Origin; a page that another site has put into the user's browser, and a name that was made to
/// lead here, are refused so. Everything below /api/ takes the key as well, which stands behind the
/// # of the address that the user was given: no other user of the machine knows it, and a browser
/// sends it to nobody.
///
/// Threads: any.
class RequestGate {
 public:
  /// @param key   128 bits in hexadecimal digits.
  /// @param port  of the server.
  RequestGate(std::string key, unsigned port);

  /// The refusal of a request; none for one that may come in.
  std::optional<http::Answer> Judge(const http::Request& request) const;

 private:
  bool MayPass(const http::Request& request) const;

  const std::string key_, host_;
};

}  // namespace lumo::host
