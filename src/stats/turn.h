#pragma once

#include "commands/value_text.h"
#include "raster/raster_command.h"

namespace lumo {

/// Says whether a command waits for computations that go on over its raster. Told: a computation of
/// another command makes it fail, or leaves what it sets without effect. Always: it waits its turn,
/// and finds the results of those before it at hand.
enum class Waiting { kTold, kAlways };

/// "Told", "Always".
VEXG_EXPORT std::span<const EnumWord<Waiting>> WordsOf(Waiting);

/// The input Wait of the commands on statistics and histograms.
InputDeclaration WaitInput();

/// The turn of a command on the statistics and histograms of a raster: of the commands that wait,
/// one at a time has it, until it lets go.
/// Threads: any.
///
///     const Turn turn(raster, waiting, ipc);  // blocks while another command has it
///     const String fault = RunHistogram(*raster, request, turn, ipc);
class Turn {
 public:
  /// Blocks until the turn has come and no computation goes on, or the abort flag is up. A command
  /// that doesn't wait has its turn at once.
  Turn(const BasicRasterPtr& raster, Waiting waiting, const IPC& ipc);
  ~Turn();
  Turn(const Turn&) = delete;
  Turn& operator=(const Turn&) = delete;

  /// Blocks until no computation goes on over the raster: one may have been started by a command
  /// that doesn't wait. False when the command doesn't wait, or the abort flag is up.
  bool AwaitRuns() const;

 private:
  const BasicRasterPtr raster_;
  const bool waits_;
  const IPC ipc_;
  bool has_ = false;
};

}  // namespace lumo
