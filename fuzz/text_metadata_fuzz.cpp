// A header of names and values, in two punctuations: every text that is read is stored, and all of
// them come through a translation without entries.

#include <cstdint>
#include <cstdlib>

#include "metadata/metadata_translator.h"
#include "metadata/text_metadata_parser.h"
#include "platform/unicode.h"

namespace {

/// Texts in a tree.
std::size_t CountTexts(const lumo::MetadataContainer& container) {
  std::size_t count = 0;
  for (const auto& [name, child] : container.GetChildren()) {
    const auto* const inner = dynamic_cast<const lumo::MetadataContainer*>(child.get());
    count += inner != nullptr ? CountTexts(*inner) : 1;
  }
  return count;
}

void Try(const std::u16string& text, const lumo::MdfFormat& format) {
  lumo::MetadataContainer source, target;
  lumo::TextMetadataParser parser(source, format, "fuzz");
  if (!parser.ParseText(text)) return;
  const bool translated =
      lumo::MetadataDefFileTranslator().TranslateAll({}, &source, &target, &format);
  if (translated && CountTexts(source) != CountTexts(target)) std::abort();
}

}  // namespace

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t* data, std::size_t size) {
  const std::u16string text =
      lumo::platform::Utf8ToUtf16({reinterpret_cast<const char*>(data), size});
  lumo::MdfFormat format;
  Try(text, format);
  format.sm = u'(';
  format.em = u')';
  format.eol = u';';
  format.del = u'"';
  format.sectionStarts = {u"BEGIN_GROUP"};
  format.sectionEnds = {u"END_GROUP"};
  Try(text, format);
  return 0;
}
