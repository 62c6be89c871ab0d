#include "commands/job_schedule.h"

#include <algorithm>
#include <functional>
#include <map>
#include <utility>

namespace lumo {

JobSchedule::JobSchedule(Job& job) : steps_(job.commands.GetCount()) {
  std::vector<unsigned> room;
  room.reserve(steps_.size());  // a command retires where memory is short too
  ready_ = decltype(ready_)(std::greater<>(), std::move(room));
  std::map<const Command*, unsigned> positions;
  for (unsigned i = 0; i < steps_.size(); ++i) {
    steps_[i].descriptor = job.commands[i].Get();
    steps_[i].descriptor->position = i;
    positions[steps_[i].descriptor->command.Get()] = i;
  }
  for (unsigned i = 0; i < steps_.size(); ++i) {
    Step& step = steps_[i];
    for (const CommandPtr& dependency : step.descriptor->dependsOn) {
      const auto at = positions.find(dependency.Get());
      if (at == positions.end()) continue;  // of no command of the job
      steps_[at->second].holdsUp.push_back(i);
      ++step.waitsFor;
    }
    const unsigned first = std::min(step.descriptor->dependsOnFirst, i);
    if (first != 0) {
      steps_[first - 1].holdsUpAll.push_back(i);
      ++step.waitsFor;
    }
    if (step.waitsFor == 0) ready_.push(i);
  }
}

CommandDescriptor* JobSchedule::TakeReady() {
  if (ready_.empty()) return nullptr;
  CommandDescriptor* const descriptor = steps_[ready_.top()].descriptor;
  ready_.pop();
  ++started_;
  descriptor->command->SetState(CommandState::kStarted);
  return descriptor;
}

void JobSchedule::Retire(const CommandDescriptor& descriptor) {
  Step& step = steps_[descriptor.position];
  step.isRetired = true;
  ++retired_;
  Release(step.holdsUp);
  for (; front_ < steps_.size() && steps_[front_].isRetired; ++front_) {
    Release(steps_[front_].holdsUpAll);
  }
}

void JobSchedule::Release(const std::vector<unsigned>& positions) {
  for (const unsigned position : positions) {
    if (--steps_[position].waitsFor == 0) ready_.push(position);
  }
}

}  // namespace lumo
