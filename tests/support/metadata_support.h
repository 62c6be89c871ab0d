#pragma once

#include <cstdlib>
#include <filesystem>
#include <fstream>
#include <initializer_list>
#include <iterator>
#include <string>

#include "foundation/environment.h"
#include "metadata/metadata.h"
#include "metadata/metadata_parse_log.h"
#include "support/source_dir.h"
#include "support/temporary_directory.h"

namespace lumo::test {

/// The parse log of this process, with all that is written.
class ParseLogOfTest {
 public:
  ParseLogOfTest() {
    setenv("metadata_parse_log_dir", (directory_.Path() / "log").c_str(), 1);
    setenv("metadata_parse_log_level", "0x3", 1);
    setenv("metadata_parse_log_console", "0", 1);
    setenv("TZ", "UTC", 1);
    MetadataParseLog::Instance();
  }

  /// The lines that were written since the last call.
  std::string Take() {
    std::ifstream file(directory_.Path() / "log" / "metadata_parse_log.log", std::ios::binary);
    file.seekg(static_cast<std::streamoff>(taken_));
    std::string text{std::istreambuf_iterator<char>(file), std::istreambuf_iterator<char>()};
    taken_ += text.size();
    return text;
  }

 private:
  TemporaryDirectory directory_;
  std::size_t taken_ = 0;
};

/// Made at load, before anything asks for the log.
inline ParseLogOfTest gParseLog;

/// Has the library read the definition files of the source tree.
inline void UseDefinitionFiles() {
  GetGlobalEnvironmentImpl()[Environment::kMdfDirectory].text =
      String(SourceDir() + "/resources/mdf");
}

inline Array<String> Strings(std::initializer_list<String> pieces) {
  Array<String> strings{ArrayDims(static_cast<unsigned>(pieces.size()))};
  std::copy(pieces.begin(), pieces.end(), strings.begin());
  return strings;
}

inline void WriteFile(const std::filesystem::path& path, const std::string& text) {
  std::ofstream(path, std::ios::binary) << text;
}

/// The values as "path word(count or rows,columns) value" lines, in order.
inline std::string Values(const MetadataContainer& container, const std::string& path = "/") {
  std::string lines;
  for (const auto& [name, child] : container.GetChildren()) {
    const std::string childPath = path + name.ToUTF8() + "/";
    if (const auto* const inner = dynamic_cast<const MetadataContainer*>(child.get())) {
      lines += Values(*inner, childPath);
      continue;
    }
    unsigned rows = 0, columns = 0;
    const bool is2D = child->Dims(rows, columns);
    std::string shape = std::to_string(child->Count());
    if (is2D) shape = std::to_string(rows).append(",").append(std::to_string(columns));
    lines.append(childPath).append(" ").append(child->TypeName()).append("(").append(shape);
    lines.append(") ").append(child->ValueString().ToUTF8()).append("\n");
  }
  return lines;
}

/// The value of type T at `path`; T() with a failure when there is none.
template <typename T>
T ValueAt(const Metadata& metadata, const char* path) {
  T value{};
  EXPECT_TRUE(metadata.Get(path, value)) << path;
  return value;
}

template <typename T>
std::vector<T> ListAt(const Metadata& metadata, const char* path) {
  Array<T> values;
  EXPECT_TRUE(metadata.GetArray(path, values)) << path;
  return {values.begin(), values.end()};
}

}  // namespace lumo::test
