#include <iostream>
#include <memory>

#include <CLI/CLI.hpp>
#include <fmt/format.h>

#include "foundation/near_name.h"
#include "json_number.h"
#include "raster_target.h"
#include "stats/turn.h"
#include "verb.h"

namespace lumo::host {
namespace {

struct Options {
  SourceOptions source;
  RasterJobOptions job;
  std::string bands;
  bool extended = false;
  bool save = false;
  bool json = false;
};

constexpr const char* kStatsStep = "stats";

/// The whole of the work as one document.
JobDraft MakeDraft(const Options& options, const Array<unsigned>& bands) {
  JobDraft draft;
  AddOpenWithPyramid(draft, "raster", options.source);
  if (!options.bands.empty()) AddBandView(draft, "bands", "$raster", bands);
  const String shown = options.bands.empty() ? "$raster" : "$bands";
  JobWriterCommand& stats =
      draft.Step(kStatsStep,
                 options.extended ? "GetExtendedRasterStatsCommand" : "GetBasicRasterStatsCommand");
  stats.AddVariableInput("URI", shown);
  stats.AddInput("Wait", Waiting::kAlways);
  if (options.save) {
    JobWriterCommand& save = draft.Step("save", "SaveRasterStatsCommand");
    save.AddVariableInput("URI", "$raster");
    save.AddInput("Wait", Waiting::kAlways);
  }
  if (!options.bands.empty()) draft.Close("close.bands", "$bands");
  draft.Close("close.raster", "$raster");
  return draft;
}

/// A value in both forms of output.
struct Cell {
  Json json;  ///< null for what there is none of, and for what no number of JSON can be
  std::string text;
};

template <typename T>
Cell CellOf(T value) {
  if constexpr (std::is_floating_point_v<T>) {
    return {NumberAsJson(value), fmt::format("{:.10g}", static_cast<double>(value))};
  } else {
    return {NumberAsJson(value), std::to_string(value)};
  }
}

using Column = std::vector<Cell>;

/// Statistics of bands.
struct BandTable {
  std::vector<unsigned> bands;
  std::vector<std::pair<const char*, Column>> columns;
  std::vector<Column> sumXY, cov;  ///< a row for each band; none unless asked for
};

template <typename T>
Column ReadColumn(const Map<String, String>& returns, const char* name) {
  Column column;
  for (const T& value : ParseValue<Array<T>>(returns.Find(name))) column.push_back(CellOf(value));
  return column;
}

/// The rows of a matrix of `bands` by `bands`.
std::vector<Column> ReadRows(const Map<String, String>& returns, const char* name,
                             std::size_t bands) {
  std::vector<Column> rows;
  for (const Cell& value : ReadColumn<double>(returns, name)) {
    if (rows.empty() || rows.back().size() == bands) rows.emplace_back();
    rows.back().push_back(value);
  }
  return rows;
}

/// Takes away what isn't known: all but the count of a band without a valid pixel, and a count that
/// was stored without.
void MarkUnknown(BandTable& table) {
  Column& counts = table.columns.front().second;
  for (std::size_t i = 0; i < counts.size(); ++i) {
    if (counts[i].json != 0) continue;
    bool isEmpty = true;
    for (const auto& [name, column] : table.columns) isEmpty = isEmpty && column[i].json == 0;
    if (!isEmpty) {
      counts[i] = {Json(), "unknown"};
      continue;
    }
    const Cell none{Json(), "-"};
    for (auto& [name, column] : table.columns) {
      if (&column != &counts) column[i] = none;
    }
    for (std::vector<Column>* const rows : {&table.sumXY, &table.cov}) {
      for (std::size_t j = 0; j < rows->size(); ++j) (*rows)[i][j] = (*rows)[j][i] = none;
    }
  }
}

BandTable ReadTable(const Map<String, String>& returns, const Options& options,
                    const Array<unsigned>& bands, unsigned dataType) {
  BandTable table;
  table.bands.assign(bands.begin(), bands.end());
  Column min, max;
  DispatchType(TenTypes{}, dataType, [&]<typename T>() {
    min = ReadColumn<T>(returns, "Min");
    max = ReadColumn<T>(returns, "Max");
    return true;
  });
  table.columns = {{"count", ReadColumn<unsigned long long>(returns, "Count")},
                   {"min", min},
                   {"max", max},
                   {"mean", ReadColumn<double>(returns, "Mean")},
                   {"std", ReadColumn<double>(returns, "Std")},
                   {"sum", ReadColumn<double>(returns, "Sum")},
                   {"sum2", ReadColumn<double>(returns, "Sum2")},
                   {"rms", ReadColumn<double>(returns, "RMS")}};
  for (const auto& [name, column] : table.columns) {
    if (column.size() == table.bands.size()) continue;
    throw HostError(kExitFailed, options.source.file + ": there are no statistics of all bands");
  }
  if (options.extended) {
    table.sumXY = ReadRows(returns, "SumXY", table.bands.size());
    table.cov = ReadRows(returns, "Cov", table.bands.size());
    if (table.sumXY.size() != table.bands.size() || table.cov.size() != table.bands.size()) {
      throw HostError(kExitFailed, options.source.file + ": there are no statistics between bands");
    }
  }
  MarkUnknown(table);
  return table;
}

Json AsJson(const Column& row) {
  Json list = Json::array();
  for (const Cell& value : row) list.push_back(value.json);
  return list;
}

Json AsJson(const std::string& file, const BandTable& table) {
  Json bands = Json::array();
  for (std::size_t i = 0; i < table.bands.size(); ++i) {
    Json band{{"band", table.bands[i]}};
    for (const auto& [name, column] : table.columns) band[name] = column[i].json;
    if (!table.cov.empty()) {
      band["sumXY"] = AsJson(table.sumXY[i]);
      band["cov"] = AsJson(table.cov[i]);
    }
    bands.push_back(band);
  }
  return {{"file", file}, {"bands", bands}};
}

void AppendMatrix(std::string& text, const char* title, const BandTable& table,
                  const std::vector<Column>& rows) {
  text += fmt::format("\n{}\n{:>4}", title, "");
  for (const unsigned band : table.bands) text += fmt::format(" {:>16}", band);
  text += '\n';
  for (std::size_t i = 0; i < rows.size(); ++i) {
    text += fmt::format("{:>4}", table.bands[i]);
    for (const Cell& value : rows[i]) text += fmt::format(" {:>16}", value.text);
    text += '\n';
  }
}

std::string AsText(const std::string& file, const BandTable& table) {
  std::string text = fmt::format("{}\nband", Printable(file));
  for (const auto& [name, column] : table.columns) text += fmt::format(" {:>16}", name);
  text += '\n';
  for (std::size_t i = 0; i < table.bands.size(); ++i) {
    text += fmt::format("{:>4}", table.bands[i]);
    for (const auto& [name, column] : table.columns) {
      text += fmt::format(" {:>16}", column[i].text);
    }
    text += '\n';
  }
  if (table.cov.empty()) return text;
  AppendMatrix(text, "covariances", table, table.cov);
  AppendMatrix(text, "sums of products", table, table.sumXY);
  return text;
}

int Stats(const Options& options) {
  if (options.save && !options.bands.empty()) {
    throw HostError(kExitUsage,
                    "--save: the statistics of all bands are saved together; leave "
                    "--bands out");
  }
  JobSession session(options.job);
  JobDraft opening;
  AddOpenWithPyramid(opening, "raster", options.source);
  AddQuery(opening, "raster", "$raster");
  opening.Close("close.raster", "$raster");
  const RasterInfo info = ReadInfo(session.Run(opening), "raster");
  const Array<unsigned> bands = ParseBands(options.bands, info);
  const JobDraft draft = MakeDraft(options, bands);
  if (options.job.printJob) {
    std::cout << draft.Write().ToUTF8() << '\n';
    return kExitSuccess;
  }
  JobResults results;
  {
    const ProgressView view(ProgressOfStep(session, draft, kStatsStep),
                            options.job.GetProgressStyle());
    results = session.Run(draft);
  }
  const BandTable table =
      ReadTable(results.Find(kStatsStep).returns, options, bands, info.dataType);
  std::cout << (options.json ? AsJson(options.source.file, table).dump(2) + "\n"
                             : AsText(options.source.file, table));
  if (options.save) {
    CheckReturn(results, "save", options.source.file + ": the statistics could not be saved");
  }
  return kExitSuccess;
}

const VerbRegistration registration(
    "stats", "Tells the statistics of a raster's bands", [](CLI::App& app) {
      const auto options = std::make_shared<Options>();
      app.footer(
          "Pixels without data, masked ones, NaN and infinities do not count. The deviation is "
          "that "
          "of a sample, divided by n - 1. With --json: \"file\" and \"bands\", a list of objects "
          "with \"band\" (from 0), \"count\", \"min\", \"max\", \"mean\", \"std\", \"sum\", "
          "\"sum2\", \"rms\", and with --extended \"sumXY\" and \"cov\", one value for each band. "
          "Of a "
          "band without a valid pixel all but the count is null, and a dash in the table; a count "
          "that isn't known is null, and NaN and infinities are.\n"
          "Example: vexg stats scene.tif --bands 3,2,1 --extended\n");
      options->source.AddTo(app);
      app.add_option("--bands", options->bands, "Bands, from 0; all by default")->type_name("B,B…");
      app.add_flag("--extended", options->extended, "With covariances and sums of products");
      app.add_flag("--save", options->save,
                   "Store them with the raster, so that they are known from now on");
      app.add_flag("--json", options->json, "As JSON");
      options->job.AddTo(app);
      options->job.AddProgressTo(app);
      return VerbRegistration::Work([options] { return Stats(*options); });
    });

}  // namespace
}  // namespace lumo::host
