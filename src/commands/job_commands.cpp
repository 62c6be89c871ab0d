#include <algorithm>
#include <string>

#include "commands/command.h"
#include "commands/served_jobs.h"

namespace lumo {
namespace {

template <typename T, typename Of>
Array<T> Collect(const std::vector<ServedJobInfo>& jobs, const Of& of) {
  Array<T> values{ArrayDims(static_cast<unsigned>(jobs.size()))};
  std::transform(jobs.begin(), jobs.end(), values.begin(), of);
  return values;
}

/// The classes of the commands that a job is at, joined by commas.
String JoinIds(const ServedJobInfo& job) {
  std::string text;
  for (const String& id : job.ids) {
    if (!text.empty()) text += ',';
    text += id.ToUTF8();
  }
  return text.empty() ? "-" : String(text);
}

const CommandDeclaration kList{
    "ListJobsCommand",
    "Server",
    "Lists the jobs that a server is running, this one among them; vexg's own.",
    {},
    {{"Jobs", ValueKind::kIntegerArray, "their numbers, counted from 1; further arrays go along"},
     {"Clients", ValueKind::kIntegerArray, "numbers of the processes that sent them"},
     {"Seconds", ValueKind::kNumberArray, "since each began", "s"},
     {"Progress", ValueKind::kNumberArray, "of each, 0 to 1"},
     {"Aborted", ValueKind::kBooleanArray, "1: its abort flag is up"},
     {"Commands", ValueKind::kTextList,
      "of each, the classes of the commands that run now, joined by commas; - for none"}}};

class ListJobsCommand final : public Command {
  CommandResult Execute() override {
    const std::vector<ServedJobInfo> jobs = ServedJobs::Get().List();
    using Info = const ServedJobInfo&;
    Write("Jobs", Collect<unsigned>(jobs, [](Info job) { return job.number; }));
    Write("Clients",
          Collect<unsigned>(jobs, [](Info job) { return static_cast<unsigned>(job.client); }));
    Write("Seconds", Collect<double>(jobs, [](Info job) { return job.seconds; }));
    Write("Progress", Collect<double>(jobs, [](Info job) { return job.progress; }));
    Write("Aborted", Collect<bool>(jobs, [](Info job) { return job.aborted; }));
    Write("Commands", Collect<String>(jobs, JoinIds));
    return Succeed();
  }
};

const CommandFactoryT<ListJobsCommand> listFactory(kList);

const CommandDeclaration kAbort{
    "AbortJobCommand",
    "Server",
    "Raises the abort flag of a job that the server is running; vexg's own.",
    {{"Job", Presence::kRequired, ValueKind::kInteger, "its number, as ListJobsCommand gives it"}},
    {}};

class AbortJobCommand final : public Command {
  CommandResult Execute() override {
    if (!CheckInputs()) return Fail();
    const auto number = Read<unsigned>("Job");
    if (ServedJobs::Get().Abort(number)) return Succeed();
    return Fail(String("no job " + std::to_string(number) + " is running"));
  }
};

const CommandFactoryT<AbortJobCommand> abortFactory(kAbort);

}  // namespace
}  // namespace lumo
