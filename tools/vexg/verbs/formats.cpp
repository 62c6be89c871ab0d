#include <filesystem>
#include <iostream>
#include <memory>

#include <fmt/format.h>
#include <nlohmann/json.hpp>

#include "data/format_table.h"
#include "jobs/raster_job.h"
#include "platform/process.h"
#include "raster/pixel_types.h"
#include "verb.h"

namespace lumo::host {
namespace {

namespace fs = std::filesystem;

struct FormatsOptions {
  RasterJobOptions job;
  bool json = false;
};

/// A row of the table of formats, as far as it can be used.
struct Format {
  std::string key;
  std::string kind;
  std::string plugin;
  bool loads = false;
  bool reads = false;
  bool writes = false;
  std::string fault;
};

/// A folder for trials, which goes away with what is in it.
class TrialFolder {
 public:
  TrialFolder()
      : path_(fs::temp_directory_path() /
              ("vexg-formats-" + std::to_string(platform::ProcessNumber()))) {
    std::error_code fault;
    if (!fs::create_directory(path_, fault)) {
      throw HostError(kExitFailed,
                      path_.string() + ": can't be made for trials: " + fault.message());
    }
  }
  ~TrialFolder() {
    std::error_code ignored;
    fs::remove_all(path_, ignored);
  }
  TrialFolder(const TrialFolder&) = delete;
  TrialFolder& operator=(const TrialFolder&) = delete;

  fs::path Of(const Format& format) const { return path_ / format.key; }

 private:
  fs::path path_;
};

JobDraft ListDraft() {
  JobDraft draft;
  draft.Step("formats", "ListFormatsCommand");
  return draft;
}

std::vector<Format> ReadFormats(const JobResults& results) {
  const Map<String, String>& listed = results.Find("formats").returns;
  const auto keys = ParseValue<Array<String>>(listed.Find("Formats"));
  const auto plugins = ParseValue<Array<String>>(listed.Find("Plugins"));
  const auto faults = ParseValue<Array<String>>(listed.Find("Faults"));
  const auto kinds = ParseValue<Array<int>>(listed.Find("Kinds"));
  const auto loaded = ParseValue<Array<bool>>(listed.Find("Loaded"));
  const auto available = ParseValue<Array<bool>>(listed.Find("Available"));
  const unsigned count = keys.GetCount();
  if (plugins.GetCount() != count || faults.GetCount() != count || kinds.GetCount() != count ||
      loaded.GetCount() != count || available.GetCount() != count) {
    throw HostError(kExitFailed, "the list of formats can't be read");
  }
  std::vector<Format> formats(count);
  for (unsigned i = 0; i < count; ++i) {
    Format& format = formats[i];
    format.key = keys[i].ToUTF8();
    format.kind = kinds[i] == static_cast<int>(DataSourceKind::kVector) ? "vector" : "raster";
    format.plugin = plugins[i].ToUTF8();
    format.loads = loaded[i];
    format.reads = available[i];
    if (faults[i] != "-") format.fault = faults[i].ToUTF8();
  }
  return formats;
}

/// Has a raster of a few pixels made in the format and gives whether a file came of it. A format
/// gives no other account of what it can make.
bool TryToMake(JobSession& session, const Format& format, const fs::path& folder) {
  fs::create_directory(folder);
  JobDraft draft;
  JobWriterCommand& create = draft.Open("made", "CreateRasterCommand");
  create.AddInput("ConnStr", ConnStrings({String((folder / "trial").string())}));
  create.AddInput("Format", String(format.key));
  create.AddInput("Samples", 16U);
  create.AddInput("Lines", 16U);
  create.AddInput("Bands", 1U);
  create.AddInput("DataType", DataTypeName(kDataTypeOf<std::uint8_t>));
  draft.Close("close", "$made");
  try {
    session.Run(draft);
  } catch (const HostError& error) {
    if (error.code == kExitNoServer) throw;
    session.CheckInterrupt();
    return false;
  }
  return !fs::is_empty(folder);
}

nlohmann::ordered_json AsJson(const std::vector<Format>& formats) {
  nlohmann::ordered_json list = nlohmann::ordered_json::array();
  for (const Format& format : formats) {
    list.push_back({{"format", format.key},
                    {"kind", format.kind},
                    {"plugin", format.plugin},
                    {"loads", format.loads},
                    {"reads", format.reads},
                    {"writes", format.writes},
                    {"fault", format.fault}});
  }
  return list;
}

std::string AsText(const std::vector<Format>& formats) {
  std::string text = fmt::format("{:<22} {:<7} {:<22} {:<6} {:<6}\n", "format", "kind", "plug-in",
                                 "reads", "writes");
  for (const Format& format : formats) {
    text += fmt::format("{:<22} {:<7} {:<22} {:<6} {:<6}", format.key, format.kind, format.plugin,
                        format.reads ? "yes" : "no", format.writes ? "yes" : "no");
    if (!format.loads) text += " (does not load)";
    text += '\n';
  }
  return text;
}

int ListFormats(const FormatsOptions& options) {
  if (options.job.printJob) {
    std::cout << ListDraft().Write().ToUTF8() << '\n';
    return kExitSuccess;
  }
  std::vector<Format> formats = ReadFormats(JobSession(options.job).Run(ListDraft()));
  // A server may be kept from the folder of the trials.
  const TrialFolder folder;
  JobSession session{RasterJobOptions()};
  for (Format& format : formats) {
    if (format.reads && format.kind == "raster") {
      format.writes = TryToMake(session, format, folder.Of(format));
    }
  }
  std::cout << (options.json ? AsJson(formats).dump(2) + "\n" : AsText(formats));
  return kExitSuccess;
}

const VerbRegistration formatsRegistration(
    "formats", "Lists the formats of files, and which of them can be read and written here",
    [](OptionSet& line) {
      const auto options = std::make_shared<FormatsOptions>();
      line.AddNote(
          "Whether a format can be written is tried, in this process, with a raster of a few "
          "pixels.");
      line.AddExample("vexg formats --json");
      line.Add("--json", options->json, "As JSON");
      options->job.AddTo(line);
      return VerbRegistration::Work([options] { return ListFormats(*options); });
    });

}  // namespace
}  // namespace lumo::host
