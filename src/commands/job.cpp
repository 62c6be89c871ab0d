#include "commands/job.h"

namespace lumo {

Job::~Job() {
  if (!ipc.IsNull()) ipc->progress->Update(1.0);
}

void Job::Clear() {
  commands.Clear();
  commandIndex.Clear();
  unknown.Clear();
  tellsReasons = false;
}

}  // namespace lumo
