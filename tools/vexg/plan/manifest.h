#pragma once

#include <cstdint>
#include <string>
#include <vector>

#include "output/json_number.h"

namespace lumo::host {

/// A file that a document reads, as it was when the plan was made.
struct PlannedInput {
  std::string file;
  std::uint64_t size = 0;  ///< bytes
  std::int64_t time = 0;   ///< of the last change, in ns since 1970
};

/// A document of a plan.
struct PlannedDocument {
  std::string document;                ///< its file, in the folder of the plan
  std::vector<std::string> dependsOn;  ///< documents that have to be done before
  std::vector<PlannedInput> inputs;    ///< those that no document of the plan makes
  std::vector<std::string> outputs;
  unsigned threads = 1;
  std::uint64_t memory = 0;  ///< bytes that a worker should have
  std::string hash;          ///< of the text, the inputs, and the hashes of what it depends on

  /// The file that says that the document is done, in the folder of the plan.
  std::string GetResultName() const;
};

/// The documents that `vexg plan` has made, in an order in which they may run.
struct Manifest {
  std::string folder;  ///< in which the documents run
  std::vector<PlannedDocument> documents;
  std::vector<std::string> notes;  ///< of what is not divided

  const PlannedDocument* Find(const std::string& document) const;
  std::string Write() const;
};

inline constexpr const char* kManifestName = "manifest.json";

/// Reads the manifest of a plan. Throws HostError for one that isn't there, or can't be read.
/// @param folder  of the plan.
Manifest ReadManifest(const std::string& folder);

/// The input as it is now. Throws HostError when it isn't there.
PlannedInput LookAt(const std::string& file);

/// The hash of a document.
/// @param before  hashes of the documents that it depends on.
std::string HashOf(const std::string& text, const std::vector<PlannedInput>& inputs,
                   const std::vector<std::string>& before);

}  // namespace lumo::host
