#include "commands/served_jobs.h"

#include "foundation/library.h"

namespace lumo {

ServedJobs& ServedJobs::Get() {
  static auto& jobs = *new ServedJobs;
  return jobs;
}

std::vector<ServedJobInfo> ServedJobs::List() {
  const std::lock_guard lock(mutex_);
  std::vector<ServedJobInfo> all;
  for (const auto& [number, entry] : running_) {
    ServedJobInfo info;
    info.number = number;
    info.client = entry.client;
    info.seconds = WallSeconds() - entry.start;
    info.progress = entry.job->GetIPC().progress->GetProgress();
    info.aborted = entry.job->GetIPC().abort->IsSet();
    for (const CommandDescriptorPtr& descriptor : entry.job->commands) {
      if (descriptor->command->GetState() == CommandState::kRunning) {
        info.ids.push_back(descriptor->id);
      }
    }
    all.push_back(std::move(info));
  }
  return all;
}

bool ServedJobs::Abort(unsigned number) {
  const std::lock_guard lock(mutex_);
  const auto at = running_.find(number);
  if (at == running_.end()) return false;
  at->second.job->GetIPC().abort->Set(true);
  return true;
}

void ServedJobs::AbortAll() {
  const std::lock_guard lock(mutex_);
  for (const auto& [number, entry] : running_) entry.job->GetIPC().abort->Set(true);
}

void ServedJobs::AbortFromNowOn() {
  {
    const std::lock_guard lock(mutex_);
    aborting_ = true;
  }
  AbortAll();
}

void ServedJobs::WaitNone() {
  std::unique_lock lock(mutex_);
  ended_.wait(lock, [this] { return running_.empty(); });
}

unsigned ServedJobs::Add(const Job& job, int client) {
  const std::lock_guard lock(mutex_);
  if (aborting_) job.GetIPC().abort->Set(true);
  running_.emplace(++last_, Entry{&job, client, WallSeconds()});
  return last_;
}

void ServedJobs::Remove(unsigned number) {
  const std::lock_guard lock(mutex_);
  running_.erase(number);
  ended_.notify_all();
}

}  // namespace lumo
