#pragma once

#include <utility>

#include "data/dc_srv.h"

namespace lumo::detail {

/// A call into the connection of a source, and its result, which stays as it was made when there is
/// nothing to call, or when the plug-in throws.
template <typename Result, typename Body>
class DcSrvCall final : public DcSrvCmd {
 public:
  DcSrvCall(std::int32_t code, const char* name, Result initial, Body& body)
      : DcSrvCmd(code, name), result(std::move(initial)), body_(body) {}
  void Execute(DcSrvContext& context) override { body_(context, result); }

  Result result;

 private:
  Body& body_;
};

/// Runs `body(context, result)` on the thread of `server` and gives the result; `initial` at once
/// when there is no server.
template <typename Result, typename Body>
Result CallServer(DcSrv* server, std::int32_t code, const char* name, Result initial, Body&& body) {
  if (server == nullptr) return initial;
  DcSrvCall<Result, std::remove_reference_t<Body>> call(code, name, std::move(initial), body);
  server->Execute(call);
  return std::move(call.result);
}

/// Runs `body(connection)` for the plug-in's connection, when there is one. For example, how many
/// bands a source has:
///
///     const auto bands = detail::CallConnection<unsigned>(
///         server, kBands, "Bands", [](DataConnection& source) { return CountBands(source); });
template <typename Result, typename Body>
Result CallConnection(DcSrv* server, std::int32_t code, const char* name, Body&& body,
                      Result initial = Result()) {
  return CallServer(server, code, name, std::move(initial),
                    [&](DcSrvContext& context, Result& result) {
                      if (context.conn) result = body(*context.conn);
                    });
}

}  // namespace lumo::detail
