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

/// How a run ended.
enum class Outcome { kDone, kFailed, kAborted };

/// Shows on standard error how far a run has come, from its making to its end: a bar, or a line of
/// JSON for each whole percent. The last line says where and how it ended: "done", "failed" or
/// "aborted". A run that an exception leaves has failed, or was aborted by the user.
class ProgressView {
 public:
  ProgressView(const ProgressReportPtr& report, ProgressStyle style);
  ~ProgressView();
  ProgressView(const ProgressView&) = delete;
  ProgressView& operator=(const ProgressView&) = delete;

  /// Ends what is on show now, as aborted; for a program that ends in the middle of it.
  static void EndAllShown();

  /// Shows how the run ended, of one that no exception leaves.
  void SetOutcome(Outcome outcome) { outcome_ = outcome; }

 private:
  void End();
  void Watch();
  void Show();
  void ShowEnd();
  void Print(double progress, const char* ended);

  const ProgressReportPtr report_;
  const ProgressStyle style_;
  const int exceptions_;
  Outcome outcome_ = Outcome::kDone;
  int shownPercent_ = -1;
  std::mutex mutex_;
  std::condition_variable wake_;
  bool ended_ = false;
  std::thread thread_;
};

}  // namespace lumo::host
