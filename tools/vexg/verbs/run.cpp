#include <memory>

#include "commands/catalog_session.h"
#include "commands/job_parser.h"
#include "commands/job_result.h"
#include "foundation/abandonment.h"
#include "jobs/progress_view.h"
#include "jobs/result_output.h"
#include "plan/once.h"
#include "platform/durability.h"
#include "platform/interrupt.h"
#include "verb.h"

namespace lumo::host {
namespace {

int RunJobFile(const JobOptions& options) {
  String text;
  const Document document = ReadJob(options, text);
  Output output(options.output, options.file);
  platform::SetDurable(options.isDurable);
  Job job;
  JobParser(job).Parse(text);
  job.tellsReasons = true;
  if (AsksForStrictChecks(document)) job.checks = JobChecks::kStrict;
  const AbortFlagPtr abort = job.GetIPC().abort;
  String result;
  auto outcome = Outcome::kDone;
  {
    const platform::InterruptWatch interrupts([&] { abort->Set(true); }, output.IsStandardOutput());
    ProgressView view(job.GetIPC().progress, ChooseProgressStyle(options.progress, options.quiet));
    RunJob(job);
    result = JobResultWriter(job).Write();
    outcome = OutcomeOf(result, abort->IsSet());
    const AbandonScope abandonment(outcome != Outcome::kDone);  // of files that aren't whole
    for (const String& fault : catalog::Empty()) {
      Say(fault.ToUTF8());
      if (outcome == Outcome::kDone) outcome = Outcome::kFailed;
    }
    view.SetOutcome(outcome);
  }
  WriteResult(document, result, options.json, output);
  const int code = ExitCodeAfter(outcome, ExitCodeOf(document, result));
  return outcome == Outcome::kFailed && code == kExitSuccess ? kExitFailed : code;
}

int RunFileOnce(const JobOptions& options) {
  if (options.output != "-" || options.json) {
    throw HostError(kExitUsage, "--once keeps its result beside the document; leave -o and --json");
  }
  return RunOnce({options.file, ChooseProgressStyle(options.progress, options.quiet), options.quiet,
                  options.isDurable});
}

const VerbRegistration runRegistration(
    "run", "Runs a job document in this process and prints its result", [](OptionSet& line) {
      const auto options = std::make_shared<JobOptions>();
      const auto isOnce = std::make_shared<bool>(false);
      line.AddExample("vexg run --json job.xml");
      line.AddExample("vexg run --once plan/part-0003.xml");
      options->AddTo(line);
      line.Add("--once", *isOnce,
               "Do nothing where the result is there, which is kept beside the document; else make "
               "outputs under names of their own first. For documents of vexg plan");
      return VerbRegistration::Work(
          [options, isOnce] { return *isOnce ? RunFileOnce(*options) : RunJobFile(*options); });
    });

}  // namespace
}  // namespace lumo::host
