#include "metadata/metadata_parser.h"

#include "metadata/metadata_parse_log.h"

namespace lumo {

void MetadataParser::Store(const String& path, const String& text) {
  if (collection_.Put(path, std::make_unique<MetadataString>(std::vector<String>{text}))) return;
  MetadataParseLog::Instance().Write(
      MetadataParseLog::kErrors, "Parser: No place for the text at: (%s)\n", path.ToUTF8().c_str());
}

void MetadataParser::LogCollection() const {
  MetadataParseLog& log = MetadataParseLog::Instance();
  if (!log.IsOn(MetadataParseLog::kCollected)) return;
  const std::string rule = std::string(67, '=') + "\n";
  std::ostringstream out;
  out << rule << "     *** Creating string collection from header metadata ***\n" << rule;
  out << collection_.Describe("/").ToUTF8();
  log.Write(MetadataParseLog::kCollected, out);
}

}  // namespace lumo
