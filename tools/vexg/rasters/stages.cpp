#include "rasters/stages.h"

#include <algorithm>
#include <filesystem>
#include <set>

#include <fmt/format.h>

#include "platform/durability.h"
#include "platform/random_access_file.h"
#include "rasters/json_file.h"
#include "rasters/raster_source.h"
#include "verb.h"

namespace lumo::host {
namespace {

namespace fs = std::filesystem;

/// The size and the time of a file; null for none.
Json StampOf(const std::string& file) {
  std::error_code none;
  const auto bytes = fs::file_size(file, none);
  if (none) return {};
  const auto time = fs::last_write_time(file, none);
  return {{"file", fs::path(file).filename().string()},
          {"bytes", bytes},
          {"time", time.time_since_epoch().count()}};
}

Json StampsOf(const std::vector<std::string>& files) {
  Json stamps = Json::array();
  for (const std::string& file : files) stamps.push_back(StampOf(file));
  return stamps;
}

bool IsThere(const std::string& file) {
  std::error_code none;
  return fs::exists(file, none);
}

}  // namespace

StageRunner::StageRunner(Rules rules, std::string record)
    : rules_(std::move(rules)), record_(std::move(record)) {
  if (!IsThere(record_)) return;
  const JsonField root = JsonFile(record_).GetRoot();
  root.Members();
  entries_ = root.GetJson();
}

/// Whether the outputs of a stage are those that it would make.
bool StageRunner::IsMade(const Stage& stage) const {
  const auto entry = entries_.find(stage.name);
  if (entry == entries_.end()) return false;
  const Json wanted{{"settings", stage.settings},
                    {"inputs", StampsOf(stage.inputs)},
                    {"outputs", StampsOf(stage.outputs)}};
  return *entry == wanted;
}

/// Whether a file is one that a stage of the same settings has made, or isn't there.
bool StageRunner::MayReplace(const Stage& stage, const std::string& file) const {
  if (rules_.overwrite || !IsThere(file)) return true;
  const auto entry = entries_.find(stage.name);
  if (entry == entries_.end() || entry->value("settings", Json()) != stage.settings) return false;
  const Json made = entry->value("outputs", Json::array());
  return std::find(made.begin(), made.end(), StampOf(file)) != made.end();
}

void StageRunner::Check(const std::vector<Stage>& stages) const {
  std::set<std::string> renewed;  // files that will be others
  for (const Stage& stage : stages) {
    const bool isBehind = std::any_of(stage.inputs.begin(), stage.inputs.end(),
                                      [&](const auto& file) { return renewed.count(file) != 0; });
    if (!isBehind && IsMade(stage)) continue;
    renewed.insert(stage.outputs.begin(), stage.outputs.end());
    for (const std::string& file : stage.outputs) {
      if (MayReplace(stage, file)) continue;
      throw HostError(kExitFailed,
                      file +
                          ": was not made from these files by these settings; give --overwrite "
                          "to replace it");
    }
  }
}

void StageRunner::Run(const Stage& stage) {
  if (IsMade(stage)) {
    if (!rules_.job.quiet) Say(fmt::format("{}: is there already", stage.outputs.front()));
    return;
  }
  JobSession session(rules_.job);
  platform::SetDurable(rules_.isDurable);
  const bool mayReplace =
      std::all_of(stage.outputs.begin(), stage.outputs.end(),
                  [&](const std::string& file) { return MayReplace(stage, file); });
  Outputs outputs(session.GetInterruption(),
                  {mayReplace, rules_.isDurable || !rules_.job.server.name.empty()}, stage.inputs);
  for (const std::string& file : stage.outputs) outputs.Add(file);
  outputs.Begin(std::vector<std::uint64_t>(stage.outputs.size()));
  try {
    std::vector<std::string> files;
    for (std::size_t i = 0; i < stage.outputs.size(); ++i) {
      files.push_back(AbsoluteName(outputs.Get(i).GetWorkName()));
    }
    JobDraft draft;
    stage.add(draft, files);
    JobResults results;
    {
      if (!rules_.job.quiet) Say(stage.outputs.front());
      const ProgressView view(session.GetProgress(), rules_.job.GetProgressStyle());
      results = session.Run(draft);
    }
    if (stage.finish) stage.finish(results, outputs);
  } catch (const HostError& error) {
    throw HostError(error.code, outputs.InUsersWords(error.what()));
  }
  Note(stage, outputs);
  outputs.Commit([&] { session.CheckInterrupt(); });
  if (session.IsInterrupted()) throw HostError(kExitFailed, "interrupted; a next run goes on");
}

/// Writes the entry of a stage, whose outputs are about to take their places as they are.
void StageRunner::Note(const Stage& stage, const Outputs& outputs) {
  Json stamps = Json::array();
  for (std::size_t i = 0; i < stage.outputs.size(); ++i) {
    stamps.push_back(StampOf(outputs.Get(i).GetWorkName()));
  }
  entries_[stage.name] = {
      {"settings", stage.settings}, {"inputs", StampsOf(stage.inputs)}, {"outputs", stamps}};
  std::string why;
  if (!platform::ReplaceFile(record_, entries_.dump(1) + "\n", &why)) {
    throw HostError(kExitFailed, record_ + ": can't be written: " + why);
  }
}

JobDraft JoinStages(const std::vector<Stage>& stages) {
  JobDraft draft;
  for (const Stage& stage : stages) {
    draft.SetStage(stage.name);
    std::vector<std::string> files;
    for (const std::string& file : stage.outputs) files.push_back(AbsoluteName(file));
    stage.add(draft, files);
  }
  return draft;
}

}  // namespace lumo::host
