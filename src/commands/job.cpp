#include "commands/job.h"

#include "foundation/near_name.h"

namespace lumo {

Job::~Job() {
  if (!ipc.IsNull()) ipc->progress->Update(1.0);
}

String UnknownCommand::GetReason(bool withHint) const {
  if (id.GetLength() == 0) return "it has no ID";
  std::vector<std::string> known;
  if (withHint) {
    for (const auto& entry : GetCommandRegistry()) known.push_back(entry.first.ToUTF8());
  }
  const std::string text = id.ToUTF8();
  return String("the ID \"" + Printable(text, 80) + "\" is unknown" + DidYouMean(text, known));
}

void Job::Clear() {
  commands.Clear();
  commandIndex.Clear();
  unknown.Clear();
  faults.Clear();
  checks = JobChecks::kTold;
  tellsReasons = false;
}

}  // namespace lumo
