#include "jobs/job_channel.h"

#include "commands/shared_memory_channel.h"
#include "platform/owned_name.h"

namespace lumo::host {
namespace {

constexpr unsigned kSize = 8;

}  // namespace

JobChannel::JobChannel() : name_(platform::OwnedName("vexg-submit")) {
  block_ = platform::SharedMemoryBlock::Create(name_, kSize);
  if (block_ == nullptr) return;
  XMLElement job("Job");
  AddTo(job);
  const XMLElement& element = *job.children[0];
  watched_ = OpenChannel(element.name, element.attributes);
}

JobChannel::JobChannel(const XMLElement& element)
    : watched_(OpenChannel(element.name, element.attributes)) {}

void JobChannel::AddTo(XMLElement& job) const {
  if (block_ == nullptr) return;
  XMLElement* const element = job.AddChild("ORVAIPC");
  element->attributes["Name"] = String(name_);
  element->attributes["Size"] = String::Format("%u", kSize);
}

void JobChannel::Abort() {
  if (!watched_.IsNull()) watched_->abort->Set(true);
}

ProgressReportPtr JobChannel::GetProgress() const {
  return watched_.IsNull() ? ProgressReportPtr(new StandardProgressReport) : watched_->progress;
}

}  // namespace lumo::host
