#pragma once

#include <condition_variable>
#include <map>
#include <mutex>
#include <vector>

#include "commands/job.h"

namespace lumo {

/// A job that a private server is running.
struct ServedJobInfo {
  unsigned number = 0;      ///< counted from 1 in this process
  int client = 0;           ///< number of the process that sent it
  double seconds = 0.0;     ///< since it began
  double progress = 0.0;    ///< fraction done, 0 to 1
  bool aborted = false;     ///< its abort flag is up
  std::vector<String> ids;  ///< classes of the commands that run now
};

/// The jobs that the private servers of this process are running.
/// Threads: any.
class VEXG_EXPORT ServedJobs {
 public:
  /// The list of the process.
  static ServedJobs& Get();

  /// The jobs in the order in which they began.
  std::vector<ServedJobInfo> List();

  /// Raises the abort flag of one job; false when no such job runs.
  bool Abort(unsigned number);
  /// Raises the abort flags of all jobs that run now.
  void AbortAll();

  /// Aborts every job that comes from now on.
  void AbortFromNowOn();

  /// Blocks until none is running.
  void WaitNone();

 private:
  friend class ServedJob;

  struct Entry {
    const Job* job;
    int client;
    double start;
  };

  unsigned Add(const Job& job, int client);
  void Remove(unsigned number);

  std::mutex mutex_;
  std::condition_variable ended_;
  std::map<unsigned, Entry> running_;
  unsigned last_ = 0;
  bool aborting_ = false;
};

/// Counts a job among the served ones while it lives. The job, once parsed, outlives it.
class ServedJob {
 public:
  ServedJob(const Job& job, int client) : number_(ServedJobs::Get().Add(job, client)) {}
  ~ServedJob() { ServedJobs::Get().Remove(number_); }
  ServedJob(const ServedJob&) = delete;
  ServedJob& operator=(const ServedJob&) = delete;

 private:
  const unsigned number_;
};

}  // namespace lumo
