#include "commands/xml.h"

#include <sstream>

#include "foundation/errors.h"

namespace lumo {
namespace {

/// Notes the events as one text: "<name a=v|text|>".
class Recorder : public XMLSimpleParser {
 public:
  void StartElement(const String& name, const Map<String, String>& attributes) override {
    seen << '<' << name.ToUTF8();
    for (const auto& [key, value] : attributes)
      seen << ' ' << key.ToUTF8() << '=' << value.ToUTF8();
    seen << '|';
  }
  void EndElement(const String& /*name*/) override { seen << '>'; }
  void Characters(const String& text) override { seen << text.ToUTF8(); }

  std::ostringstream seen;
};

TEST(XMLSimpleParser, HandsOnWhatADocumentHolds) {
  Recorder parser;
  parser.Parse(
      "<?xml version=\"1.0\" encoding=\"ISO-8859-1\"?>"
      "<a x=\"1 &lt; 2\" y='\xC3\xA9'>t&amp;<b/><!-- no --><c>\xE2\x82\xAC</c></a>");
  EXPECT_EQ(parser.seen.str(), "<a x=1 < 2 y=\xC3\xA9|t&<b|><c|\xE2\x82\xAC>>");
  EXPECT_FALSE(parser.HasError());
  EXPECT_EQ(parser.GetFault().GetLength(), 0U);
}

std::string Repeated(const std::string& piece, unsigned times) {
  std::string text;
  for (unsigned i = 0; i < times; ++i) text += piece;
  return text;
}

TEST(XMLSimpleParser, RefusesWhatIsNotWellFormedOrTooMuch) {
  const std::string deep = Repeated("<a>", kMaxXMLDepth + 1) + Repeated("</a>", kMaxXMLDepth + 1);
  std::string wide = "<a";
  for (unsigned i = 0; i <= kMaxXMLAttributes; ++i) wide += " a" + std::to_string(i) + "=\"\"";
  wide += "/>";
  const struct {
    const char* what;
    std::string text;
    const char* seen;
    const char* fault;
  } cases[] = {
      {"empty", "", "", "empty"},
      {"breaks off", "<a><b x=\"1\"/><c", "<a|<b x=1|>", "line 1, column"},
      {"crossed tags", "<a>\n<b></a>", "<a|\n<b|", "line 2, column"},
      {"an attribute twice", "<a x=\"1\" x=\"2\"/>", "", "line 1"},
      {"a document type", "<!DOCTYPE a><a/>", "", "DOCTYPE"},
      {"entities that grow",
       "<!DOCTYPE a [<!ENTITY b \"1234567890\"><!ENTITY c \"&b;&b;&b;\">]><a>&c;</a>", "",
       "DOCTYPE"},
      {"a file from outside", "<!DOCTYPE a SYSTEM \"file:///etc/passwd\"><a/>", "", "DOCTYPE"},
      {"an entity nobody declared", "<a>&b;</a>", "<a|", "line 1"},
      {"too many attributes", wide, "", "attributes"},
  };
  for (const auto& c : cases) {
    SCOPED_TRACE(c.what);
    Recorder parser;
    parser.Parse(String(c.text));
    EXPECT_EQ(parser.GetErrorState().code, ObjectErrorIO::Code);
    EXPECT_EQ(parser.seen.str(), c.seen);
    EXPECT_THAT(parser.GetFault().ToUTF8(), testing::HasSubstr(c.fault));
  }
  Recorder parser;
  parser.Parse(String(deep));
  EXPECT_THAT(parser.GetFault().ToUTF8(), testing::HasSubstr("deep"));
  parser.Parse("<a/>");
  EXPECT_FALSE(parser.HasError());  // a parser may be used again
}

TEST(XMLSimpleWriter, WritesWhatTheParserReads) {
  XMLDocumentRoot root;
  root.name = "root";
  const XMLElementPtr child(new XMLElement("child"));
  child->attributes["x"] = "\"<&>'\t\n \xF0\x9F\x8C\x8D";
  child->text = "a<b&c>]]>";
  child->AddChild("leaf")->attributes["empty"] = String();
  root.children.PushBack(child);
  const String text = XMLSimpleWriter().Write(root);
  EXPECT_EQ(text.ToUTF8().find('\n'), std::string::npos);
  Recorder parser;
  parser.Parse(text);
  EXPECT_FALSE(parser.HasError()) << text.ToUTF8();
  EXPECT_EQ(parser.seen.str(),
            "<root|<child x=\"<&>'\t\n \xF0\x9F\x8C\x8D|a<b&c>]]><leaf empty=|>>>");
}

TEST(XMLSimpleWriter, NeverWritesWhatCouldNotBeRead) {
  XMLDocumentRoot root;
  root.name = "root";
  const XMLElementPtr child(new XMLElement("child"));
  const char16_t broken[] = {u'a', 1, 0xD800, u'b', 0xFFFE, 0};
  child->attributes["x"] = broken;
  root.children.PushBack(child);
  Recorder parser;
  parser.Parse(XMLSimpleWriter().Write(root));
  EXPECT_EQ(parser.seen.str(),
            "<root|<child x=a\xEF\xBF\xBD\xEF\xBF\xBD"
            "b\xEF\xBF\xBD|>>");

  for (const char* name : {"", "1a", "a b", "a<"}) {
    SCOPED_TRACE(name);
    XMLDocumentRoot bad;
    bad.name = name;
    XMLSimpleWriter writer;
    EXPECT_EQ(writer.Write(bad).GetLength(), 0U);
    EXPECT_EQ(writer.GetErrorState().code, ObjectErrorIO::Code);
  }
}

}  // namespace
}  // namespace lumo
