#pragma once

#include "commands/job.h"
#include "commands/xml.h"

namespace lumo {

/// Fills a Job from a job document. Elements that it doesn't know are passed over, and their
/// children are looked at in their place. A Command whose ID the registry doesn't know is dropped
/// with its children, and noted in the job's list of unknown commands. An element Reasons asks the
/// result document to say why commands failed. The attribute Checks of Job is a JobChecks.
///
/// Notes what the document gets wrong without being malformed: an element or attribute
/// that is nearly one of those known in the job's faults, and what concerns one command, such as a
/// DependsOn without an earlier command of that name, as the command's complaint.
///
/// A document that breaks off leaves what it had named so far in the job.
class VEXG_EXPORT JobParser : public XMLSimpleParser {
 public:
  /// @param job  gets what the document holds, and outlives the parser.
  explicit JobParser(Job& job) : job_(job) {}

  /// Parses the document; one that can't be parsed to its end is a fault of the job too.
  void Parse(const String& document);

  void StartElement(const String& name, const Map<String, String>& attributes) override;
  void EndElement(const String& name) override;

 private:
  void StartKnownElement(const String& name, const Map<String, String>& attributes);
  void StartJob(const Map<String, String>& attributes);
  void AddInputs(const Map<String, String>& attributes);
  void NoteElement(const String& name);
  void NoteAttributes(const String& element, const Map<String, String>& attributes);
  void Note(const std::string& what);
  void Complain(const std::string& what);
  void StartCommand(const Map<String, String>& attributes);
  void EndCommand();
  void AddDependency(const String& name);
  void EndChannel(const String& name);

  Job& job_;
  bool isInCommand_ = false;  // known or not
  Set<String> unknownNames_;  // of commands without a known ID
  unsigned hints_ = kMostHints;
  CommandDescriptorPtr current_;
  IPCPtr channel_;
};

}  // namespace lumo
