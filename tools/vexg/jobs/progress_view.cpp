#include "jobs/progress_view.h"

#include <algorithm>
#include <chrono>
#include <exception>
#include <set>

#include <nlohmann/json.hpp>

#include "platform/debug_output.h"
#include "platform/interrupt.h"
#include "platform/process.h"

namespace lumo::host {
namespace {

const char* WordOf(Outcome outcome) {
  switch (outcome) {
    case Outcome::kFailed:
      return "failed";
    case Outcome::kAborted:
      return "aborted";
    default:
      return "done";
  }
}

std::string Bar(double progress) {
  constexpr unsigned kAround = 9;  // brackets, blanks and the percentage
  constexpr unsigned kWidest = 60;
  const unsigned columns = std::max(platform::TerminalColumns(), kAround + 10);
  const unsigned width = std::min(columns - kAround, kWidest);
  const auto done = static_cast<unsigned>(progress * width);
  const std::string percent = std::to_string(static_cast<int>(progress * 100.0));
  return "\r[" + std::string(done, '=') + std::string(width - done, ' ') + "] " +
         std::string(3 - std::min<std::size_t>(percent.size(), 3), ' ') + percent + " %";
}

/// The views that are on show.
struct Shown {
  std::mutex mutex;
  std::set<ProgressView*> views;

  static Shown& Get() {
    static auto* const shown = new Shown;  // for threads that outlast static objects
    return *shown;
  }
};

}  // namespace

ProgressStyle ChooseProgressStyle(const std::string& word, bool quiet) {
  if (quiet || word == "none") return ProgressStyle::kNone;
  if (word == "json") return ProgressStyle::kJson;
  const bool bar = word == "bar" || platform::ErrorOutputIsTerminal();
  return bar ? ProgressStyle::kBar : ProgressStyle::kNone;
}

ProgressView::ProgressView(const ProgressReportPtr& report, ProgressStyle style)
    : report_(report), style_(style), exceptions_(std::uncaught_exceptions()) {
  if (style_ == ProgressStyle::kNone) return;
  Shown& shown = Shown::Get();
  const std::lock_guard lock(shown.mutex);
  shown.views.insert(this);
  thread_ = std::thread([this] { Watch(); });
}

ProgressView::~ProgressView() {
  if (!thread_.joinable()) return;
  Shown& shown = Shown::Get();
  {
    const std::lock_guard lock(shown.mutex);
    shown.views.erase(this);
  }
  End();
}

void ProgressView::End() {
  {
    const std::lock_guard lock(mutex_);
    ended_ = true;
  }
  wake_.notify_one();
  thread_.join();
  ShowEnd();
}

void ProgressView::EndAllShown() {
  Shown& shown = Shown::Get();
  shown.mutex.lock();  // for good: nothing is shown any more
  for (ProgressView* const view : shown.views) {
    view->outcome_ = Outcome::kAborted;
    view->End();
  }
}

void ProgressView::Watch() {
  constexpr auto kInterval = std::chrono::milliseconds(50);
  std::unique_lock lock(mutex_);
  do {
    Show();
  } while (!wake_.wait_for(lock, kInterval, [this] { return ended_; }));
}

void ProgressView::Show() {
  const double progress = std::clamp(report_->GetProgress(), 0.0, 1.0);
  const int percent = static_cast<int>(progress * 100.0);
  if (percent == shownPercent_ || percent == 100) return;  // the end shows all of it
  shownPercent_ = percent;
  Print(progress, nullptr);
}

void ProgressView::ShowEnd() {
  if (std::uncaught_exceptions() > exceptions_) {
    outcome_ = platform::WasInterrupted() ? Outcome::kAborted : Outcome::kFailed;
  }
  Print(std::clamp(report_->GetProgress(), 0.0, 1.0), WordOf(outcome_));
}

/// @param ended  how the run ended; null while it goes on.
void ProgressView::Print(double progress, const char* ended) {
  if (style_ == ProgressStyle::kBar) {
    std::string line = Bar(progress);
    if (ended != nullptr && outcome_ != Outcome::kDone) line += std::string(", ") + ended;
    platform::DebugOutput(line + (ended != nullptr ? "\n" : ""));
  } else {
    nlohmann::ordered_json line{{"progress", progress}};
    if (ended != nullptr) line["ended"] = ended;
    platform::DebugOutput(line.dump() + "\n");
  }
}

}  // namespace lumo::host
