#include "metadata/json_metadata_parser.h"

#include <nlohmann/json.hpp>

#include "foundation/fault.h"
#include "metadata/metadata_parse_log.h"
#include "metadata/metadata_text.h"

namespace lumo {
namespace {

using Json = nlohmann::ordered_json;

constexpr unsigned kMaxNesting = 64;

/// Calls `visit(path, text)` for every value. False where values are nested too deep.
template <typename Visit>
bool VisitValues(const Json& json, const String& path, unsigned depth, const Visit& visit) {
  if (!json.is_structured()) {
    if (!json.is_null()) visit(path, json.is_string() ? json.get<std::string>() : json.dump());
    return true;
  }
  if (depth == kMaxNesting) return false;
  unsigned number = 0;
  for (const auto& [name, value] : json.items()) {
    ++number;
    const String step = json.is_array() ? String::Format("%u", number) : String(name);
    if (!VisitValues(value, path + step + "/", depth + 1, visit)) return false;
  }
  return true;
}

}  // namespace

bool JsonMetadataParser::Parse() {
  std::string bytes, fault;
  if (ReadMetadataFile(path_.ToUTF8(), bytes, fault)) return ParseText(bytes);
  MetadataParseLog::Instance().Write(MetadataParseLog::kErrors,
                                     "Json Parser: Failed to open: (%s)\n", path_.ToUTF8().c_str());
  SetFault(fault);
  return false;
}

bool JsonMetadataParser::ParseText(const std::string& bytes) {
  Store(kParserUri, path_);
  Store(kParserType, String("JsonParser - ") + format_.input);
  std::string fault;
  try {
    const auto store = [&](const String& path, const std::string& text) {
      Store(path, String(text));
    };
    if (!VisitValues(Json::parse(bytes), "/", 0, store)) fault = "values are nested too deep";
  } catch (const Json::exception& error) {
    fault = error.what();
    const std::size_t place = fault.find("] ");  // behind the library's own number
    if (place != fault.npos) fault.erase(0, place + 2);
  }
  if (fault.empty()) {
    LogCollection();
    return true;
  }
  MetadataParseLog::Instance().Write(MetadataParseLog::kErrors, "Json Parser: %s: (%s)\n",
                                     fault.c_str(), path_.ToUTF8().c_str());
  SetFault(path_.ToUTF8().append(": ").append(fault));
  return false;
}

}  // namespace lumo
