#pragma once

#include <atomic>
#include <chrono>
#include <string>
#include <vector>

#include "http/http_server.h"
#include "viewer/band_histograms.h"
#include "viewer/page_files.h"
#include "viewer/viewed_scene.h"

namespace lumo::host {

/// Answers the requests of the page. Rasters and shapes go by their numbers; no name of a file
/// comes in or goes out, but for the last part of each. docs/viewer.md lists the addresses.
///
/// Threads: any, several at once. Failure: an answer with the status 4xx and {"fault": line}.
class ViewerSite {
 public:
  explicit ViewerSite(ViewedScene& scene);

  http::Answer Answer(const http::Request& request);

  /// Seconds since the page has asked for something.
  double GetSilence() const;

  /// Headers of all answers: nothing is loaded from elsewhere, nor shown inside of another page.
  static std::vector<std::pair<std::string, std::string>> GetHeaders();

 private:
  http::Answer Route(const http::Request& request);
  ViewedTile ReadTile(const std::vector<std::string>& parts, const http::Request& request,
                      std::shared_ptr<const ViewedRaster>& raster);
  http::Answer GiveTile(const std::vector<std::string>& parts, const http::Request& request);
  http::Answer GivePicture(const std::vector<std::string>& parts, const http::Request& request);
  Json GiveRegion(std::size_t number, const std::string& body);
  std::size_t NumberOf(const std::string& text, std::size_t count) const;

  ViewedScene& scene_;
  const PageFiles page_;
  BandEnds ends_;
  std::atomic<std::chrono::steady_clock::time_point> last_;
};

}  // namespace lumo::host
