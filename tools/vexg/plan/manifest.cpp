#include "plan/manifest.h"

#include <algorithm>
#include <filesystem>
#include <fstream>
#include <iterator>

#include <fmt/format.h>

#include "foundation/packing.h"
#include "platform/file_identity.h"
#include "verb.h"

namespace lumo::host {
namespace {

namespace fs = std::filesystem;

constexpr unsigned kVersion = 1;

Json AsJson(const PlannedDocument& document) {
  Json inputs = Json::array();
  for (const PlannedInput& input : document.inputs) {
    inputs.push_back({{"file", input.file}, {"size", input.size}, {"time", input.time}});
  }
  return {{"document", document.document},
          {"dependsOn", document.dependsOn},
          {"inputs", inputs},
          {"outputs", document.outputs},
          {"threads", document.threads},
          {"memory", document.memory},
          {"hash", document.hash}};
}

PlannedDocument DocumentOf(const Json& json) {
  PlannedDocument document{json.at("document").get<std::string>(),
                           json.at("dependsOn").get<std::vector<std::string>>(),
                           {},
                           json.at("outputs").get<std::vector<std::string>>(),
                           json.at("threads").get<unsigned>(),
                           json.at("memory").get<std::uint64_t>(),
                           json.at("hash").get<std::string>()};
  for (const Json& input : json.at("inputs")) {
    document.inputs.push_back({input.at("file").get<std::string>(),
                               input.at("size").get<std::uint64_t>(),
                               input.at("time").get<std::int64_t>()});
  }
  return document;
}

}  // namespace

std::string PlannedDocument::GetResultName() const {
  return fs::path(document).stem().string() + ".result.json";
}

const PlannedDocument* Manifest::Find(const std::string& document) const {
  const auto at =
      std::find_if(documents.begin(), documents.end(),
                   [&](const PlannedDocument& other) { return other.document == document; });
  return at != documents.end() ? &*at : nullptr;
}

std::string Manifest::Write() const {
  Json list = Json::array();
  for (const PlannedDocument& document : documents) list.push_back(AsJson(document));
  const Json all{{"version", kVersion}, {"folder", folder}, {"notes", notes}, {"documents", list}};
  return all.dump(1) + "\n";
}

Manifest ReadManifest(const std::string& folder) {
  const std::string path = (fs::path(folder) / kManifestName).string();
  const auto refuse = [&](const std::string& why) {
    throw HostError(kExitUsage, path + ": " + why + "; vexg plan makes one");
  };
  std::ifstream in(path, std::ios::binary);
  if (!in) refuse("there is no plan here");
  const std::string text{std::istreambuf_iterator<char>(in), {}};
  Manifest manifest;
  try {
    const Json all = Json::parse(text);
    if (all.at("version").get<unsigned>() != kVersion) refuse("is of another version");
    manifest.folder = all.at("folder").get<std::string>();
    manifest.notes = all.at("notes").get<std::vector<std::string>>();
    for (const Json& document : all.at("documents")) {
      manifest.documents.push_back(DocumentOf(document));
    }
  } catch (const Json::exception&) {
    refuse("is no whole manifest");
  }
  return manifest;
}

PlannedInput LookAt(const std::string& file) {
  const platform::FileIdentity found = platform::IdentifyFile(file);
  if (!found.exists) throw HostError(kExitUsage, file + ": is not there any more; nothing was run");
  return {file, found.size, found.time};
}

std::string HashOf(const std::string& text, const std::vector<PlannedInput>& inputs,
                   const std::vector<std::string>& before) {
  // Each part ends with a null, which none of them holds.
  std::string all = text + '\0';
  for (const PlannedInput& input : inputs) {
    all += fmt::format("{}{}{} {}{}", input.file, '\0', input.size, input.time, '\0');
  }
  for (const std::string& hash : before) all += hash + '\0';
  return fmt::format("{:016x}", Checksum(all.data(), all.size()));
}

}  // namespace lumo::host
