#include "progress_view.h"

#include <algorithm>
#include <chrono>

#include <nlohmann/json.hpp>

#include "platform/debug_output.h"
#include "platform/process.h"

namespace lumo::host {
namespace {

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

}  // namespace

ProgressStyle ChooseProgressStyle(const std::string& word, bool quiet) {
  if (quiet || word == "none") return ProgressStyle::kNone;
  if (word == "json") return ProgressStyle::kJson;
  const bool bar = word == "bar" || platform::ErrorOutputIsTerminal();
  return bar ? ProgressStyle::kBar : ProgressStyle::kNone;
}

ProgressView::ProgressView(const ProgressReportPtr& report, ProgressStyle style)
    : report_(report), style_(style) {
  if (style_ != ProgressStyle::kNone) thread_ = std::thread([this] { Watch(); });
}

ProgressView::~ProgressView() {
  if (!thread_.joinable()) return;
  {
    const std::lock_guard lock(mutex_);
    ended_ = true;
  }
  wake_.notify_one();
  thread_.join();
  Show(true);
}

void ProgressView::Watch() {
  constexpr auto kInterval = std::chrono::milliseconds(50);
  std::unique_lock lock(mutex_);
  do {
    Show(false);
  } while (!wake_.wait_for(lock, kInterval, [this] { return ended_; }));
}

void ProgressView::Show(bool last) {
  const double progress = std::clamp(report_->GetProgress(), 0.0, 1.0);
  const int percent = static_cast<int>(progress * 100.0);
  const bool changed = percent != shownPercent_;
  shownPercent_ = percent;
  if (style_ == ProgressStyle::kBar) {
    if (changed || last) platform::DebugOutput(Bar(progress) + (last ? "\n" : ""));
  } else if (changed) {
    platform::DebugOutput(nlohmann::json{{"progress", progress}}.dump() + "\n");
  }
}

}  // namespace lumo::host
