#pragma once

#include "commands/job.h"
#include "commands/xml.h"

namespace lumo {

/// Holds the results of one command as a result document has them, as text.
struct JobResult {
  String result;                ///< "Success", "Failed", "Aborted" or "None"
  Map<String, String> returns;  ///< return value by name
  String cpu;                   ///< processor time, see FormatDuration
  String wall;                  ///< wall-clock time
  String usage;                 ///< "0"
  String reason;                ///< why it failed; only where the job asked for reasons
};

/// A duration as a whole number with its unit behind it: "850us", "12ms", "3s", "2min", "1hr". The
/// number is cut, not rounded; the next unit begins above 1000 us, 1000 ms, 60 s and 60 min.
/// @param seconds  0 or more; anything else gives "0us".
VEXG_EXPORT String FormatDuration(double seconds);

/// A Command element of a result document in the making.
class VEXG_EXPORT JobResultWriterValue : public XMLElement {
 public:
  JobResultWriterValue() : XMLElement("Command") {}
  /// Adds a return value; the Return element is made with the first.
  void AddReturn(const String& returnName, const String& value);

 private:
  XMLElement* returns_ = nullptr;
};

/// Writes the result document of a job that has run: a Command element for each, in order. Where
/// the job asked for reasons, commands of the document that are unknown here have one too, with the
/// result None, and an element Fault for each thing that the document gets wrong stands before all.
/// Failure: ObjectErrorIO and an empty text.
class VEXG_EXPORT JobResultWriter : public ErrorState {
 public:
  explicit JobResultWriter(Job& job) : job_(job) {}
  /// Writes the document; an empty text on a failure.
  String Write();

 private:
  Job& job_;
};

/// Reads a result document into a map by the Name of the command. Of commands with the same name,
/// or without one, the last stands.
class VEXG_EXPORT JobResultParser : public XMLSimpleParser {
 public:
  /// @param results  is added to, and outlives the parser.
  explicit JobResultParser(Map<String, JobResult>& results) : results_(results) {}

  void StartElement(const String& name, const Map<String, String>& attributes) override;
  void EndElement(const String& name) override;

 private:
  Map<String, JobResult>& results_;
  String key_;
  JobResult current_;
};

}  // namespace lumo
