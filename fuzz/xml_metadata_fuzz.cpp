// An XML document with metadata: it is read or refused with a reason.

#include <cstdint>
#include <cstdlib>

#include "foundation/fault.h"
#include "metadata/xml_metadata_parser.h"

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t* data, std::size_t size) {
  const lumo::String text(std::string(reinterpret_cast<const char*>(data), size));
  lumo::MdfFormat format;
  format.xmlInputType = "XmlString";
  lumo::MetadataContainer texts;
  lumo::TakeFault();
  if (!lumo::XmlMetadataParser(texts, format, text).Parse() && lumo::TakeFault().GetLength() == 0) {
    std::abort();
  }
  texts.Describe("/");
  return 0;
}
