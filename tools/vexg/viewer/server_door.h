#pragma once

#include <memory>
#include <vector>

#include "viewer/job_door.h"

namespace lumo::host {

/// The library in a running server: jobs go through its pipe, on a few connections of their own,
/// and pixels come in named memory.
///
/// Once the server has gone away everything fails at once with the same line.
class ServerDoor final : public JobDoor {
 public:
  /// Calls the server. Throws HostError when none answers.
  explicit ServerDoor(const ServerOptions& server);
  ~ServerDoor() override;

  JobResults Run(const JobDraft& draft, std::uint8_t* abort, double* progress) override;
  JobResults RunOpening(const JobDraft& draft) override;
  Json Describe(const JobDraft& raster) override;
  NamedBlock Read(const JobDraft& raster, const SubRect& rect,
                  const std::vector<std::uint32_t>& bands, unsigned code) override;
  void Check() override;

  /// Lists the URIs of the rasters that any client has open, each once.
  std::vector<String> ListRasters();
  /// Has the user told by a line of its own once the server goes away; until then who called tells.
  void SetServing();
  /// True once the server has gone away.
  bool IsGone() const;

 private:
  struct Impl;
  std::unique_ptr<Impl> impl_;
};

}  // namespace lumo::host
