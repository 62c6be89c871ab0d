#include "rasters/band_table.h"

#include <cmath>

#include <fmt/format.h>

#include "verb.h"

namespace lumo::host {
namespace {

template <typename T>
Cell CellOf(T value) {
  if constexpr (std::is_floating_point_v<T>) {
    return {NumberAsJson(value), fmt::format("{:.10g}", static_cast<double>(value))};
  } else {
    return {NumberAsJson(value), std::to_string(value)};
  }
}

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

Json AsJson(const Column& row) {
  Json list = Json::array();
  for (const Cell& value : row) list.push_back(value.json);
  return list;
}

}  // namespace

BandTable ReadTable(const Map<String, String>& returns, const std::string& file, bool isExtended,
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
    throw HostError(kExitFailed, file + ": there are no statistics of all bands");
  }
  if (isExtended) {
    table.sumXY = ReadRows(returns, "SumXY", table.bands.size());
    table.cov = ReadRows(returns, "Cov", table.bands.size());
    if (table.sumXY.size() != table.bands.size() || table.cov.size() != table.bands.size()) {
      throw HostError(kExitFailed, file + ": there are no statistics between bands");
    }
  }
  MarkUnknown(table);
  return table;
}

void AddPercentiles(const String& values, const std::vector<std::string>& names, BandTable& table) {
  const auto percentiles = ParseValue<Array<double>>(values);
  for (std::size_t i = 0; i < names.size(); ++i) {
    Column column;
    for (std::size_t band = 0; band < table.bands.size(); ++band) {
      const double value = percentiles[band * names.size() + i];
      column.push_back(std::isnan(value) ? Cell{Json(), "-"} : CellOf(value));
    }
    table.columns.emplace_back(names[i], std::move(column));
  }
}

Json AsJson(const BandTable& table) {
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
  return bands;
}

}  // namespace lumo::host
