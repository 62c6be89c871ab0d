// A job document from outside: it is parsed, run and answered, and the answer must read back.

#include <cstdint>
#include <cstdlib>
#include <string>

#include "commands/job_parser.h"
#include "commands/job_result.h"

namespace {

const lumo::CommandDeclaration kDeclaration{
    "FuzzCommand",
    "Fuzz",
    "Reads its inputs.",
    {{"A", lumo::Presence::kOptional, lumo::ValueKind::kNumberArray, "numbers"},
     {"B", lumo::Presence::kOptional, lumo::ValueKind::kTextList, "texts"}},
    {{"Out", lumo::ValueKind::kTextList, "the texts"}}};

class FuzzCommand final : public lumo::Command {
  lumo::CommandResult Execute() override {
    if (!CheckInputs()) return Fail();
    if (!Read<lumo::Array<double>>("A").IsValid()) return Fail();
    Write("Out", Read<lumo::Array<lumo::String>>("B"));
    return Succeed();
  }
};

const lumo::CommandFactoryT<FuzzCommand> factory(kDeclaration);

}  // namespace

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t* data, std::size_t size) {
  const lumo::String text(std::string(reinterpret_cast<const char*>(data), size));
  lumo::Job job;
  lumo::JobParser(job).Parse(text);
  constexpr unsigned kThreads = 16;  // more take long without finding more
  if (job.commands.GetCount() > kThreads) return 0;
  lumo::RunJob(job);
  const lumo::String result = lumo::JobResultWriter(job).Write();
  lumo::Map<lumo::String, lumo::JobResult> results;
  lumo::JobResultParser parser(results);
  parser.Parse(result);
  if (parser.HasError() || results.GetCount() > job.commands.GetCount()) std::abort();
  return 0;
}
