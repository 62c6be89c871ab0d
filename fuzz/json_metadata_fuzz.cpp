// A JSON document with metadata: it is read or refused with a reason, and every text that is read
// comes through a translation without entries.

#include <cstdint>
#include <cstdlib>
#include <string>

#include "foundation/fault.h"
#include "metadata/json_metadata_parser.h"
#include "metadata/metadata_translator.h"

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t* data, std::size_t size) {
  lumo::MetadataContainer source, target;
  const lumo::MdfFormat format;
  lumo::TakeFault();
  lumo::JsonMetadataParser parser(source, format, "fuzz");
  if (!parser.ParseText(std::string(reinterpret_cast<const char*>(data), size))) {
    if (lumo::TakeFault().GetLength() == 0) std::abort();
    return 0;
  }
  lumo::MetadataDefFileTranslator translator;
  const bool translated = translator.TranslateAll({}, &source, &target, &format);
  if (!translated && lumo::TakeFault().GetLength() == 0) std::abort();
  return 0;
}
