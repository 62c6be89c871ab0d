#pragma once

#include <memory>
#include <string>

#include "jobs/document.h"
#include "jobs/progress_view.h"
#include "options/option.h"
#include "output/json_number.h"
#include "output/output_file.h"

namespace lumo::host {

/// Where a text goes: standard output, or a file that is whole once it is there.
class Output {
 public:
  /// @param file   "-" or "" for standard output. Throws HostError when the file can't be made, so
  ///               that nothing is run in vain.
  /// @param input  a file that it may not be; "-" or "" for none.
  explicit Output(const std::string& file, const std::string& input = "");

  /// Writes all of it. Throws HostError.
  void Write(const std::string& text);

  bool IsStandardOutput() const { return file_ == nullptr; }

 private:
  std::unique_ptr<OutputFile> file_;  // null for standard output
};

/// The options of a verb that runs a job, and what it does before and after.
struct JobOptions {
  std::string file;
  std::string output = "-";
  std::string progress = "auto";
  bool json = false;
  bool quiet = false;
  bool isDurable = false;

  void AddTo(OptionSet& line);
};

/// Reads the job document of the options. Throws HostError when it isn't well formed. One without
/// any Command is answered with a bare result; see ExitCodeOf.
Document ReadJob(const JobOptions& options, String& text);

/// True when the commands of a job are to be checked strictly: the job says nothing of its checks,
/// and the user has not asked for lenient ones.
bool AsksForStrictChecks(const Document& job);

/// The result document as JSON:
/// {"commands": [{"name", "result", "wall", "cpu", "usage", "reason", "return": {name: value}}],
/// "faults": [text]}; "reason" and "faults" only where there are some, "wall" and "cpu" in seconds,
/// and values as ValueAsJson gives them for what their commands declare. The values of a command
/// that is unknown here are texts.
/// @param job  whose result it is.
Json ResultAsJson(const Document& job, const String& resultDocument);

/// Writes the result document, or the same as JSON.
void WriteResult(const Document& job, const String& resultDocument, bool json, Output& output);

/// Says what is wrong with the document, why commands failed, and which of them left no trace in
/// the result, as their IDs are unknown to a server that doesn't say so.
/// @return how the program ends: success, a failed or unknown command, or a job without any.
int ExitCodeOf(const Document& job, const String& resultDocument);

/// How a job ended that has this result. One that was aborted may look like a success, as a command
/// that was in its middle does.
Outcome OutcomeOf(const String& resultDocument, bool aborted);

/// Says of an aborted job that its result is not whole, and gives the exit code for it; else gives
/// `code`.
int ExitCodeAfter(Outcome outcome, int code);

}  // namespace lumo::host
