#include <random>
#include <string>
#include <vector>

#include <gtest/gtest.h>

#include "commands/xml.h"
#include "foundation/plugin_library.h"

// Documents that the library reads and writes itself have to be as the XML library makes them. That
// is asked through its plug-in.

#include "commands/xml_engine.h"

namespace lumo {
namespace {

XmlEngine* Engine() {
  std::string fault;
  const platform::Module module = LoadPlugin(platform::ModuleFileName("vexxml"), fault);
  auto* const create = module.Find<CreateXmlEngineFunction>("CreateXmlEngine");
  return create != nullptr ? create() : nullptr;
}

// The XML library throws at many of the documents, through frames that ThreadSanitizer doesn't
// know: it keeps each of them for good, gigabytes in the end.
#if defined(__SANITIZE_THREAD__)
constexpr int kDocuments = 1000;
#else
constexpr int kDocuments = 20000;
#endif

/// Writes down what a document holds; texts that follow one another in one piece.
class Recorder final : public XMLSimpleParser, public XmlListener {
 public:
  std::string record;

  void StartElement(const String& name, const Map<String, String>& attributes) override {
    End();
    record += "<" + name.ToUTF8();
    for (const auto& [key, value] : attributes) {
      record += " " + key.ToUTF8() + "=[" + value.ToUTF8() + "]";
    }
  }
  void EndElement(const String& name) override {
    End();
    record += "</" + name.ToUTF8();
  }
  void Characters(const String& text) override { text_ += text.ToUTF8(); }
  void EndDocument() override { End(); }

  void OnEnd() override { EndDocument(); }
  bool OnElement(const char16_t* name, const Attribute* attributes, std::size_t count) override {
    Map<String, String> values;
    for (std::size_t i = 0; i < count; ++i) values[attributes[i].name] = attributes[i].value;
    StartElement(name, values);
    return true;
  }
  void OnElementEnd(const char16_t* name) override { EndElement(name); }
  void OnText(const char16_t* units, std::size_t count) override {
    Characters(String(units, count));
  }
  void OnMessage(Weight, std::uint64_t, std::uint64_t, const char16_t*) override {}

 private:
  void End() {
    if (!text_.empty()) record += "{" + text_ + "}";
    text_.clear();
  }

  std::string text_;
};

std::string Random(std::mt19937& random, const std::vector<std::string>& pieces, unsigned most) {
  std::string text;
  for (unsigned count = random() % (most + 1); count != 0; --count) {
    text += pieces[random() % pieces.size()];
  }
  return text;
}

TEST(PlainXml, ReadsWhatTheXmlLibraryReads) {
  XmlEngine* const engine = Engine();
  ASSERT_NE(engine, nullptr);
  std::mt19937 random(7);
  const std::vector<std::string> pieces = {"<a>",
                                           "</a>",
                                           "<b/>",
                                           "<b x=\"1\">",
                                           "</b>",
                                           "<a y='&lt;2&quot;' z=\"\">",
                                           "text",
                                           " ",
                                           "&amp;",
                                           "&#233;",
                                           "&#x20AC;",
                                           "\xC3\xA9",
                                           "\xF0\x9F\x8C\x8D",
                                           "]]>",
                                           "&bad;",
                                           "<!-- c -->",
                                           "\n",
                                           "\t",
                                           "<![CDATA[<]]>",
                                           "'",
                                           "\"",
                                           ">",
                                           "&#13;",
                                           "\xFF",
                                           "\xED\xA0\x80",
                                           "<c  p = 'q' >",
                                           "</c >",
                                           "\r",
                                           "<?pi?>",
                                           "&#1;",
                                           "\x7F",
                                           "\xC2\x85",
                                           "<a x=\"1\" x=\"2\">",
                                           "<x:y>",
                                           "<"};
  unsigned good = 0;
  for (int i = 0; i < kDocuments; ++i) {
    const std::string head[] = {"", "<?xml version=\"1.0\"?>",
                                "<?xml version=\"1.0\" encoding=\"UTF-8\" standalone=\"no\" ?>"};
    const std::string document =
        head[random() % 3] + (random() % 4 != 0 ? "<a>" + Random(random, pieces, 6) + "</a>"
                                                : Random(random, pieces, 5));
    Recorder ours, theirs;
    ours.Parse(String(document));
    // The text as the parser hands it on: bytes that are no UTF-8 are replaced before.
    const std::string utf8 = String(document).ToUTF8();
    const XmlOutcome outcome = engine->ReadPlain(utf8.data(), utf8.size(), theirs);
    const bool isGood = outcome.kind == XmlOutcome::Kind::kDone && !document.empty();
    ASSERT_EQ(!ours.HasError(), isGood) << document;
    if (!isGood) continue;
    ++good;
    EXPECT_EQ(ours.record, theirs.record) << document;
  }
  EXPECT_GT(good, kDocuments / 20U);
}

TEST(PlainXml, WritesWhatTheXmlLibraryWrites) {
  XmlEngine* const engine = Engine();
  ASSERT_NE(engine, nullptr);
  std::mt19937 random(8);
  const std::vector<std::string> pieces = {"a",
                                           "<",
                                           ">",
                                           "&",
                                           "\"",
                                           "'",
                                           " ",
                                           "\n",
                                           "\t",
                                           "\r",
                                           "é",
                                           "€",
                                           "\xF0\x9F\x8C\x8D",
                                           "\x7F",
                                           "\xC2\x85",
                                           "]]>",
                                           "\x01",
                                           "\xEF\xBF\xBF",
                                           "\xE2\x80\xA8",
                                           "-"};
  const std::vector<std::string> names = {"a", "B_1", "c.d", "e-f", "é", "1a", ""};
  for (int i = 0; i < 5000; ++i) {
    XMLDocumentRoot root;
    const auto name = [&] { return String(names[random() % (random() % 50 == 0 ? 7 : 4)]); };
    root.name = name();
    if (random() % 2 == 0) root.attributes[name()] = String(Random(random, pieces, 4));
    for (unsigned count = random() % 4; count != 0; --count) {
      const XMLElementPtr child(new XMLElement(name()));
      child->text = String(Random(random, pieces, 4));
      if (random() % 2 == 0) child->attributes[name()] = String(Random(random, pieces, 4));
      if (random() % 3 == 0) child->AddChild(name())->text = String(Random(random, pieces, 3));
      root.children.PushBack(child);
    }
    XMLSimpleWriter writer;
    String theirs;
    const String ours = writer.Write(root);
    const bool isWritten = engine->Write(root, theirs);
    ASSERT_EQ(!writer.HasError(), isWritten);
    if (isWritten) {
      EXPECT_EQ(ours.ToUTF8(), theirs.ToUTF8());
    }
  }
}

}  // namespace
}  // namespace lumo
