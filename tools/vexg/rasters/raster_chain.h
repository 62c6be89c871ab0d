#pragma once

#include <string>
#include <vector>

#include "jobs/raster_job.h"

namespace lumo::host {

/// Rasters of a job that stand on one another, from the source upwards.
class RasterChain {
 public:
  explicit RasterChain(JobDraft& draft) : draft_(draft) {}
  /// @param base  URI of an open raster at the bottom, which stays open.
  RasterChain(JobDraft& draft, String base) : draft_(draft), base_(std::move(base)) {}

  /// The variable of the uppermost raster, or the URI of the base.
  const String& GetTop() const { return opened_.empty() ? base_ : opened_.back(); }

  /// Adds the command that stands a view on the uppermost raster. Further inputs are the caller's.
  /// @param name  of the variable, without "$".
  JobWriterCommand& AddView(const std::string& name, const char* command);

  /// Takes a raster in that other commands of the draft have opened, as the uppermost.
  void Take(const std::string& name) { opened_.emplace_back("$" + name); }

  JobDraft& GetDraft() { return draft_; }

  /// Adds the commands that close all but the base, the uppermost first.
  void Close();

 private:
  JobDraft& draft_;
  String base_;
  std::vector<String> opened_;
};

/// The URI of the raster in a variable, from the results of the job that opened it.
String URIOf(const JobResults& opened, const String& variable);

}  // namespace lumo::host
