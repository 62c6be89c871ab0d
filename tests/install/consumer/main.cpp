#include <commands/job_parser.h>
#include <commands/job_result.h>
#include <cstdio>
#include <foundation/library.h>

namespace {

const lumo::CommandDeclaration kDeclaration{"OutsideCommand", "Outside", "Does nothing.", {}, {}};
class OutsideCommand final : public lumo::Command {};
const lumo::CommandFactoryT<OutsideCommand> factory(kDeclaration);

}  // namespace

int main() {
  lumo::VEXInit();
  lumo::Job job;
  lumo::JobParser(job).Parse("<Job><Command Name=\"a\" ID=\"OutsideCommand\"/></Job>");
  lumo::RunJob(job);
  lumo::Map<lumo::String, lumo::JobResult> results;
  lumo::JobResultParser(results).Parse(lumo::JobResultWriter(job).Write());
  std::printf("%s\n", results.Find("a").result.GetUTF8());
}
