#pragma once

#include <vector>

#include "commands/command.h"

namespace lumo {

/// The ways in which a job looks at the inputs and outputs that its commands are given.
///
/// Told: a text that holds no value reads as 0 or nothing, an unknown word as the value that its
/// enumeration has for it, and unknown names are passed over. Strict: such a command fails before
/// it runs, with a reason that names the nearest known name.
enum class JobChecks { kTold, kStrict };

/// "Told", "Strict".
VEXG_EXPORT std::span<const EnumWord<JobChecks>> WordsOf(JobChecks);

/// The first fault in the names and values of a command's inputs and the names of its outputs, in
/// one line; no text when all of them can be read as they are declared. An input that holds no text
/// is left to the command.
/// @param outputs  output name to variable, as in a job.
VEXG_EXPORT String FindMisfit(const CommandDeclaration& declaration, const ParameterMap& inputs,
                              const Map<String, String>& outputs);

}  // namespace lumo
