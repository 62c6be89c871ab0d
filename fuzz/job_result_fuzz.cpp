// A result document from outside, as a client reads it.

#include <cstdint>
#include <string>

#include "commands/job_result.h"

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t* data, std::size_t size) {
  lumo::Map<lumo::String, lumo::JobResult> results;
  lumo::JobResultParser(results).Parse(
      lumo::String(std::string(reinterpret_cast<const char*>(data), size)));
  return 0;
}
