#pragma once

#include <utility>

#include "data/dc_srv.h"

namespace lumo::detail {

/// A call into the connection of a source: a body, which outlives it.
class DcSrvCall final : public DcSrvCmd {
 public:
  template <typename Body>
  DcSrvCall(std::int32_t code, const char* name, Body& body)
      : DcSrvCmd(code, name),
        body_(&body),
        run_([](void* work, DcSrvContext& context) { (*static_cast<Body*>(work))(context); }) {}
  void Execute(DcSrvContext& context) override { run_(body_, context); }

 private:
  void* body_;
  void (*run_)(void* body, DcSrvContext& context);
};

/// Runs `body(context, result)` on the thread of `server` and gives the result; `initial` at once
/// when there is no server, and when the plug-in throws.
template <typename Result, typename Body>
Result CallServer(DcSrv* server, std::int32_t code, const char* name, Result initial, Body&& body) {
  if (server == nullptr) return initial;
  auto run = [&](DcSrvContext& context) { body(context, initial); };
  DcSrvCall call(code, name, run);
  server->Execute(call);
  return initial;
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
