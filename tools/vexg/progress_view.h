#pragma once

#include <condition_variable>
#include <mutex>
#include <string>
#include <thread>

#include "foundation/run_controls.h"

namespace lumo::host {

enum class ProgressStyle { kNone, kBar, kJson };

/// The style that the words "auto", "bar", "json" and "none" ask for; "auto" is a bar on a terminal
/// and nothing elsewhere. `quiet` asks for nothing.
ProgressStyle ChooseProgressStyle(const std::string& word, bool quiet);

/// Shows on standard error how far a run has come, from its making to its end: a bar, or a line of
/// JSON for each whole percent, the last one for where it ended.
class ProgressView {
 public:
  ProgressView(const ProgressReportPtr& report, ProgressStyle style);
  ~ProgressView();
  ProgressView(const ProgressView&) = delete;
  ProgressView& operator=(const ProgressView&) = delete;

 private:
  void Watch();
  void Show(bool last);

  const ProgressReportPtr report_;
  const ProgressStyle style_;
  int shownPercent_ = -1;
  std::mutex mutex_;
  std::condition_variable wake_;
  bool ended_ = false;
  std::thread thread_;
};

}  // namespace lumo::host
