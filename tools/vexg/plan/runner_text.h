#pragma once

#include <string>
#include <vector>

#include "plan/manifest.h"

namespace lumo::host {

/// The engines that `vexg plan` knows to say a plan to.
std::vector<std::string> RunnerNames();

/// Says a plan to an engine, in the form that it reads:
///
/// - make: a Makefile, for `make -f - -j 4`, whose targets are results and outputs;
/// - slurm: a script of the shell that submits an array of jobs for each set of documents that may
///   run at once, and has the next set depend on it;
/// - dask: the command line of `vexg.dask`, which runs the documents on workers of Dask;
/// - snakemake: a Snakefile with a rule for each document.
///
/// @param folder  of the plan, absolute. Throws HostError for one that an engine can't name.
std::string RunnerText(const std::string& runner, const Manifest& manifest,
                       const std::string& folder);

}  // namespace lumo::host
