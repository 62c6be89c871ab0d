#pragma once

#include <cstdint>
#include <memory>
#include <span>
#include <string>
#include <string_view>
#include <vector>

#include "platform/random_access_file.h"

namespace lumo {

/// Writes a table of numbers as text: a line of names, then a line for each region, with commas
/// between. Numbers have the fewest digits that tell them from all other floats; one that isn't
/// finite is left empty. The file has another name until Close, and goes away without it.
///
///     AttributeCsv table;
///     if (!table.Begin(path, {"label", "area"})) return false;
///     table.Write(7, areas);
///     if (!table.Close()) return false;
///
/// Failure: false, with the fault set. Threads: one at a time.
class AttributeCsv {
 public:
  AttributeCsv() = default;
  ~AttributeCsv();
  AttributeCsv(const AttributeCsv&) = delete;
  AttributeCsv& operator=(const AttributeCsv&) = delete;

  /// @param names  of the columns, the label's first.
  bool Begin(const std::string& path, const std::vector<std::string>& names);
  /// Adds a line. @param values  of the columns behind the label.
  bool Write(std::uint32_t label, std::span<const float> values);
  /// Adds a line as it is.
  bool WriteLine(std::string_view line);
  bool Close();

 private:
  bool Flush();

  std::string path_;
  std::string workPath_;  // empty: none is to be removed
  std::unique_ptr<platform::RandomAccessFile> file_;
  std::string text_;
  std::uint64_t place_ = 0;
};

}  // namespace lumo
