#include "plan/runner_text.h"

#include <algorithm>
#include <filesystem>
#include <map>

#include <fmt/format.h>

#include "verb.h"

namespace lumo::host {
namespace {

/// Engines count whole megabytes.
std::uint64_t MegabytesOf(const PlannedDocument& document) {
  return (document.memory + (1 << 20) - 1) >> 20;
}

std::string ForShell(const std::string& text) {
  std::string quoted = "'";
  for (const char c : text) quoted += c == '\'' ? std::string("'\\''") : std::string(1, c);
  return quoted + "'";
}

std::string ForPython(const std::string& text) {
  return Json(text).dump();  // a text of JSON is one of Python
}

/// False for a name that can be no target of make, whatever stands in front of its characters.
bool IsForMake(const std::string& name) {
  return name.find_first_of("\n%=;&|<>'\"`*?[]~\\") == name.npos;
}

std::string ForMake(const std::string& name) {
  std::string escaped;
  for (const char c : name) {
    if (c == ' ' || c == '#' || c == ':') escaped += '\\';
    escaped += c == '$' ? std::string("$$") : std::string(1, c);
  }
  return escaped;
}

/// Results are named by their files in the folder of the plan; outputs there likewise.
std::string InFolder(const std::string& file, const std::string& folder) {
  const std::filesystem::path path(file);
  return path.parent_path() == folder ? path.filename().string() : file;
}

std::string MakeText(const Manifest& manifest, const std::string& folder) {
  std::string all, rules;
  for (const PlannedDocument& document : manifest.documents) {
    const std::string result = document.GetResultName();
    std::string needs = document.document;
    for (const PlannedInput& input : document.inputs) {
      if (IsForMake(input.file)) needs.append(" ").append(ForMake(input.file));
    }
    for (const std::string& other : document.dependsOn) {
      needs.append(" ").append(manifest.Find(other)->GetResultName());
    }
    const std::string recipe = fmt::format("\t@LUMO_THREADS_HINT={} $(VEXG) run --once -q {}\n",
                                           document.threads, document.document);
    all.append(" ").append(result);
    rules += fmt::format("\n{}: {}\n{}", result, needs, recipe);
    // An output that has gone is made again, by its document alone.
    for (const std::string& output : document.outputs) {
      const std::string name = InFolder(output, folder);
      if (!IsForMake(name)) continue;
      all.append(" ").append(ForMake(name));
      rules += fmt::format("{}: | {}\n{}", ForMake(name), result, recipe);
    }
  }
  return fmt::format(
      "# make -f FILE -j N: N workers. VEXG is the program.\n"
      "VEXG ?= vexg\nMAKEFLAGS += --no-builtin-rules\n.PHONY: all\nall:{}\n{}",
      all, rules);
}

/// The documents by how many stand before them: those of one number may run at once.
std::vector<std::vector<const PlannedDocument*>> StagesOf(const Manifest& manifest) {
  std::map<std::string, std::size_t> stages;
  std::vector<std::vector<const PlannedDocument*>> documents;
  for (const PlannedDocument& document : manifest.documents) {
    std::size_t stage = 0;
    for (const std::string& other : document.dependsOn) {
      stage = std::max(stage, stages[other] + 1);
    }
    stages[document.document] = stage;
    if (documents.size() <= stage) documents.resize(stage + 1);
    documents[stage].push_back(&document);
  }
  return documents;
}

std::string SlurmText(const Manifest& manifest, const std::string& folder) {
  std::string text = fmt::format(
      "#!/bin/sh\n# Submits the plan: an array of jobs for each set of documents that may run at\n"
      "# once. More options of sbatch may stand in SBATCH_OPTIONS.\nset -e\ncd {}\n: "
      "\"${{VEXG:=vexg}}\"\nafter=\n",
      ForShell(folder));
  for (const auto& stage : StagesOf(manifest)) {
    std::string names;
    std::uint64_t memory = 0;
    unsigned threads = 1;
    for (const PlannedDocument* const document : stage) {
      names.append(" ").append(document->document);
      memory = std::max(memory, MegabytesOf(*document));
      threads = std::max(threads, document->threads);
    }
    text += fmt::format(
        "\njob=$(sbatch --parsable $SBATCH_OPTIONS $after --array=1-{} --cpus-per-task={} "
        "--mem={}M \\\n  --requeue --job-name=vexg <<END\n#!/bin/sh\n"
        "set -- {}\nshift \\$((SLURM_ARRAY_TASK_ID - 1))\n"
        "# A program that a signal has ended is started again, some times.\ntry=1\n"
        "until LUMO_THREADS_HINT={} \"$VEXG\" run --once -q \"\\$1\"; do\n  code=\\$?\n"
        "  [ \\$code -gt 128 ] && [ \\$try -lt 25 ] || exit \\$code\n  try=\\$((try + "
        "1))\ndone\nEND\n)\n"
        "after=\"--dependency=afterok:${{job%%;*}}\"\n",
        stage.size(), threads, memory, names.substr(1), threads);
  }
  return text + "\necho \"${job%%;*}\"\n";
}

std::string SnakemakeText(const Manifest& manifest, const std::string& folder) {
  std::string text = fmt::format(
      "# snakemake -s FILE --cores N: N threads in all. --config vexg=... is the program.\n"
      "workdir: {}\nvexg = config.get(\"vexg\", \"vexg\")\n\nrule all:\n    input:\n",
      ForPython(folder));
  for (const PlannedDocument& document : manifest.documents) {
    text += fmt::format("        {},\n", ForPython(document.GetResultName()));
  }
  for (const PlannedDocument& document : manifest.documents) {
    const std::string stem = std::filesystem::path(document.document).stem().string();
    std::string name = stem;
    std::replace(name.begin(), name.end(), '-', '_');
    // Braces stand for wildcards, so that names come as values.
    text +=
        fmt::format("\nrule {}:\n    input:\n        {},\n", name, ForPython(document.document));
    for (const PlannedInput& input : document.inputs) {
      if (input.file.find_first_of("{}") != input.file.npos) continue;
      text += fmt::format("        {},\n", ForPython(input.file));
    }
    for (const std::string& other : document.dependsOn) {
      text += fmt::format("        {},\n", ForPython(manifest.Find(other)->GetResultName()));
    }
    text += fmt::format(
        "    output:\n        touch({})\n    threads: {}\n    resources:\n        mem_mb={}\n"
        "    shell:\n        \"LUMO_THREADS_HINT={{threads}} {{vexg}} run --once -q {}\"\n",
        ForPython(document.GetResultName()), document.threads, MegabytesOf(document),
        document.document);
  }
  return text;
}

std::string DaskText(const Manifest& /*manifest*/, const std::string& folder) {
  return "python3 -m vexg.dask " + ForShell(folder) + "\n";
}

}  // namespace

std::vector<std::string> RunnerNames() {
  return {"make", "slurm", "dask", "snakemake"};
}

std::string RunnerText(const std::string& runner, const Manifest& manifest,
                       const std::string& folder) {
  if (folder.find('\n') != folder.npos) {
    throw HostError(kExitUsage, folder + ": no engine takes a name of two lines");
  }
  if (runner == "make") return MakeText(manifest, folder);
  if (runner == "slurm") return SlurmText(manifest, folder);
  return runner == "dask" ? DaskText(manifest, folder) : SnakemakeText(manifest, folder);
}

}  // namespace lumo::host
