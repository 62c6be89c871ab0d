#pragma once

#include <functional>
#include <string>
#include <vector>

#include "jobs/raster_job.h"
#include "output/json_number.h"
#include "output/output_file.h"

namespace lumo::host {

/// A piece of a long piece of work, whose outputs appear together when they are whole.
struct Stage {
  std::string name;                  ///< in the names of the steps of its commands
  std::vector<std::string> outputs;  ///< files
  std::vector<std::string> inputs;   ///< files that it reads
  Json settings;                     ///< what else its outputs depend on
  /// Adds its commands. @param files  names of the outputs.
  std::function<void(JobDraft& draft, const std::vector<std::string>& files)> add;
  /// Looks at what came out, and may make outputs that the commands don't; may be empty.
  std::function<void(const JobResults& results, const Outputs& outputs)> finish = nullptr;
};

/// Runs stages one after the other, and leaves out those whose outputs are there already.
///
/// A file beside the outputs holds for each stage its settings, and the size and the time of its
/// inputs and outputs. A stage whose entry still holds true is left out; so a run that broke goes
/// on where it ended, and one with other settings makes anew what depends on them. Without leave to
/// overwrite, only what a stage of the same settings has made is replaced.
class StageRunner {
 public:
  /// How all stages run.
  struct Rules {
    RasterJobOptions job;
    bool overwrite = false;
    bool isDurable = false;
  };

  /// @param record  the file with the entries. Throws HostError where it is there and none.
  StageRunner(Rules rules, std::string record);

  /// Throws HostError, before anything is done, where outputs of a stage that has to run are there
  /// and may not be replaced.
  void Check(const std::vector<Stage>& stages) const;
  /// Runs a stage unless its outputs are there.
  void Run(const Stage& stage);

 private:
  bool IsMade(const Stage& stage) const;
  bool MayReplace(const Stage& stage, const std::string& file) const;
  void Note(const Stage& stage, const Outputs& outputs);

  const Rules rules_;
  const std::string record_;
  Json entries_ = Json::object();
};

/// All stages as one document. Names of outputs are those that they will have.
JobDraft JoinStages(const std::vector<Stage>& stages);

}  // namespace lumo::host
