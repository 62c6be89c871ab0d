// A metadata definition file: it is read or refused with a reason, and what it says is done to a
// few texts.

#include <cstdint>
#include <cstdlib>

#include "foundation/fault.h"
#include "metadata/mdf_file.h"
#include "metadata/metadata_translator.h"
#include "platform/unicode.h"

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t* data, std::size_t size) {
  const std::u16string text =
      lumo::platform::Utf8ToUtf16({reinterpret_cast<const char*>(data), size});
  lumo::MdfFormat format;
  std::vector<lumo::MdfEntry> entries;
  lumo::TakeFault();
  if (!lumo::ReadMdfText(text, "fuzz", format, entries)) {
    if (lumo::TakeFault().GetLength() == 0) std::abort();
    return 0;
  }
  lumo::MetadataContainer source, target;
  for (const char* const path : {"/a", "/b1", "/b2", "/b3/x"}) {
    source.Put(path,
               std::make_unique<lumo::MetadataString>(std::vector<lumo::String>{"{1, 2.5, 0x3}"}));
  }
  format.blankLists = true;
  lumo::MetadataDefFileTranslator().TranslateAll(entries, &source, &target, &format);
  return 0;
}
