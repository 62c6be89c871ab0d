#pragma once

#include "commands/job.h"
#include "commands/xml.h"

namespace lumo {

/// Fills a Job from a job document. Elements that it doesn't know are passed over, and their
/// children are looked at in their place. A Command whose ID the registry doesn't know is dropped
/// with its children, and noted in the job's list of unknown commands. An element Reasons asks the
/// result document to say why commands failed.
///
/// A document that breaks off leaves what it had named so far in the job.
class VEXG_EXPORT JobParser : public XMLSimpleParser {
 public:
  explicit JobParser(Job& job) : job_(job) {}

  void StartElement(const String& name, const Map<String, String>& attributes) override;
  void EndElement(const String& name) override;

 private:
  void StartCommand(const Map<String, String>& attributes);
  void EndCommand();
  void AddDependency(const String& name);
  void EndChannel();

  Job& job_;
  CommandDescriptorPtr current_;
  IPCPtr channel_;
};

}  // namespace lumo
