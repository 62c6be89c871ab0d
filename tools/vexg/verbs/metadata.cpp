#include <iostream>
#include <memory>

#include <fmt/format.h>

#include "foundation/near_name.h"
#include "jobs/raster_job.h"
#include "metadata/metadata_types.h"
#include "output/json_number.h"
#include "rasters/metadata_source.h"
#include "verb.h"

namespace lumo::host {
namespace {

struct MetadataOptions {
  std::string source;
  std::vector<std::string> paths{"/"};
  RasterJobOptions job;
  bool withPrivate = false;
  bool json = false;
};

/// One value, as the commands describe it.
struct Value {
  std::string path;
  unsigned type = 0;
  unsigned size = 0;
  unsigned rows = 0;
  unsigned columns = 0;
  String text;
};

/// Asks for the names below the path of this position.
void AddNames(JobDraft& draft, const std::string& path, std::size_t position, bool isPrivate) {
  const std::string name = (isPrivate ? "private" : "names") + std::to_string(position);
  JobWriterCommand& command = draft.Step(name, "QueryNamesMetadataCommand");
  command.AddInput("URI", String("$metadata"));
  command.AddInput("PATH", String(path));
  command.AddInput("DOPRIVATE", isPrivate ? 1 : 0);
}

JobDraft MakeDraft(const MetadataOptions& options, const MetadataSource& source) {
  JobDraft draft;
  draft.Open("metadata", "CreateMetadataCommand").AddInput("ConnStr", ConnStringsOf(source));
  for (std::size_t i = 0; i < options.paths.size(); ++i) {
    AddNames(draft, options.paths[i], i, false);
    if (options.withPrivate) AddNames(draft, options.paths[i], i, true);
  }
  return draft;
}

/// The paths of the values to show, in order. Throws HostError for a path below which there is
/// none.
std::vector<std::string> ReadPaths(const MetadataOptions& options, const JobResults& results) {
  std::vector<std::string> paths;
  for (std::size_t i = 0; i < options.paths.size(); ++i) {
    const std::size_t before = paths.size();
    for (const char* const kind : {"names", "private"}) {
      const String step(kind + std::to_string(i));
      if (!results.HasKey(step)) continue;
      const Map<String, String>& returns = results.Find(step).returns;
      for (const String& name : ParseValue<Array<String>>(returns.Find("Names"))) {
        if (name.GetLength() != 0) paths.push_back(name.ToUTF8());
      }
      const bool isValue = ParseValue<bool>(returns.Find("QueryNamesResult"));
      if (isValue && paths.size() == before) paths.push_back(options.paths[i]);
    }
    if (paths.size() == before) {
      throw HostError(kExitFailed, options.source + ": there is nothing at " + options.paths[i]);
    }
  }
  return paths;
}

std::vector<Value> ReadValues(JobSession& session, const String& uri,
                              const std::vector<std::string>& paths) {
  JobDraft draft;
  for (std::size_t i = 0; i < paths.size(); ++i) {
    for (const char* const id : {"GetPropertiesMetadataCommand", "GetMetadataCommand"}) {
      JobWriterCommand& command = draft.Step(id + std::to_string(i), id);
      command.AddInput("URI", uri);
      command.AddInput("PATH", String(paths[i]));
    }
  }
  const JobResults results = session.Run(draft);
  std::vector<Value> values;
  for (std::size_t i = 0; i < paths.size(); ++i) {
    const std::string number = std::to_string(i);
    const auto& properties = results.Find(String("GetPropertiesMetadataCommand" + number)).returns;
    if (!ParseValue<bool>(properties.Find("GetPropertiesResult"))) {
      Say(paths[i] + ": a path holds |, so its value can't be asked for");
      continue;
    }
    const auto number_of = [&](const char* name) {
      return ParseValue<unsigned>(properties.Find(name));
    };
    values.push_back({paths[i], number_of("Type"), number_of("Size"), number_of("Rows"),
                      number_of("Cols"),
                      results.Find(String("GetMetadataCommand" + number)).returns.Find("Value")});
  }
  return values;
}

/// @param isJson  what no number of JSON can be becomes null; otherwise its word.
template <typename T>
Json ElementAsJson(const T& element, bool isJson) {
  if constexpr (std::is_same_v<T, String>) {
    return element.ToUTF8();
  } else if constexpr (std::is_floating_point_v<T>) {
    if (!std::isfinite(element)) return isJson ? Json() : Json(FormatValue(element).ToUTF8());
    // The digits that identify a float, not those of the double nearest to it.
    return std::is_same_v<T, float> ? Json::parse(FormatValue(element).ToUTF8())
                                    : NumberAsJson(element);
  } else {
    return NumberAsJson(element);
  }
}

/// Elements as a list, of rows as a list of lists.
template <typename T>
Json ArrayAsJson(const Value& value, bool isJson) {
  const auto elements = ParseValue<Array<T>>(value.text);
  if (elements.GetCount() != value.size) {
    Say(value.path + ": a text holds |, so the texts of this list can't be told apart");
    return value.text.ToUTF8();
  }
  Json list = Json::array();
  for (const T& element : elements) {
    const bool startsRow =
        value.columns != 0 && (list.empty() || list.back().size() == value.columns);
    if (startsRow) list.push_back(Json::array());
    (value.columns != 0 ? list.back() : list).push_back(ElementAsJson(element, isJson));
  }
  return list;
}

Json AsJson(const Value& value, bool isJson) {
  Json json = value.text.ToUTF8();
  DispatchMetadataType(value.type, [&]<typename T>() {
    const bool isSingle = value.size == 1 && value.columns == 0;
    json =
        isSingle ? ElementAsJson(ParseValue<T>(value.text), isJson) : ArrayAsJson<T>(value, isJson);
    return true;
  });
  return json;
}

/// Elements separated by commas, rows by semicolons.
std::string AsText(const Json& json) {
  if (json.is_string()) return json.get<std::string>();
  if (!json.is_array()) return json.dump();
  std::string text;
  for (const Json& element : json) {
    text.append(text.empty() ? "" : element.is_array() ? "; " : ", ").append(AsText(element));
  }
  return text;
}

int PrintMetadata(const MetadataOptions& options) {
  const MetadataSource source = ParseMetadataSource(options.source);
  JobDraft draft = MakeDraft(options, source);
  if (options.job.printJob) {
    draft.Close("close", "$metadata");
    std::cout << draft.Write().ToUTF8() << '\n';
    return kExitSuccess;
  }
  JobSession session(options.job);
  const JobResults results = session.Run(draft);
  const String uri = results.Find("metadata").returns.Find("URI");
  Json values = Json::object();
  constexpr std::size_t kWidest = 48;  // longer paths push their values to the right
  std::size_t width = 0;
  for (const Value& value : ReadValues(session, uri, ReadPaths(options, results))) {
    values[value.path] = AsJson(value, options.json);
    width = std::max(width, std::min(value.path.size(), kWidest));
  }
  if (options.json) {
    const Json all = {{"file", source.file}, {"format", source.format}, {"values", values}};
    std::cout << all.dump(2) << '\n';
    return kExitSuccess;
  }
  for (const auto& [path, value] : values.items()) {
    std::cout << fmt::format("{:<{}}  {}\n", Printable(path), width, Printable(AsText(value)));
  }
  return kExitSuccess;
}

const VerbRegistration metadataRegistration(
    "metadata", "Tells what a scene's header or side file says of it", [](OptionSet& line) {
      const auto options = std::make_shared<MetadataOptions>();
      line.AddNote(
          "The paths, and what they mean, stand in docs/metadata.md. What is not known there comes "
          "under the name that it has in the file.");
      line.AddExample("vexg metadata --path /Acquisition/ --json scene.IMD");
      line.Add("source", options->source, "The file, or the word of its format, : and the file")
          .Shows("FILE|FORMAT:FILE")
          .Required();
      line.Add("--path", options->paths,
               "Show only what stands at or below this path; may come again")
          .Shows("PATH")
          .ShowsDefault();
      line.Add("--private", options->withPrivate, "Show also what the parser says of itself");
      line.Add("--json", options->json, "As JSON");
      options->job.AddTo(line);
      return VerbRegistration::Work([options] { return PrintMetadata(*options); });
    });

}  // namespace
}  // namespace lumo::host
