#include "foundation/fault.h"
#include "metadata/metadata_text.h"
#include "metadata/text_metadata_parser.h"
#include "metadata/xml_metadata_parser.h"
#include "platform/unicode.h"
#include "support/metadata_support.h"

namespace lumo {
namespace {

constexpr const char* kHidden = "/xx vex parser info/";

/// The collected texts, "path value" lines, without what the parser says of itself.
std::string Texts(const MetadataContainer& collection) {
  std::string kept, line;
  std::istringstream lines(test::Values(collection));
  while (std::getline(lines, line)) {
    if (line.starts_with(kHidden)) continue;
    const std::string_view type = " string(1)";
    line.erase(line.find(type), type.size());
    kept.append(line).append("\n");
  }
  return kept;
}

std::string ParseText(const std::string& text, const MdfFormat& format) {
  MetadataContainer collection;
  EXPECT_TRUE(
      TextMetadataParser(collection, format, "test").ParseText(platform::Utf8ToUtf16(text)));
  return Texts(collection);
}

MdfFormat WithMarks() {
  MdfFormat format;
  format.sm = u'(';
  format.em = u')';
  format.eol = u';';
  format.del = u'"';
  format.sectionStarts = {u"BEGIN_GROUP"};
  format.sectionEnds = {u"END_GROUP"};
  return format;
}

TEST(TextMetadataParser, ReadsNamesValuesListsAndSections) {
  const MdfFormat plain, marked = WithMarks();
  const struct {
    const char* text;
    const MdfFormat& format;
    const char* want;
  } cases[] = {
      {"ORVA\n\n a = 1 \r\nb\t=\t2=3\rempty =\n a = last", plain, "/a/ last\n/b/ 2=3\n/empty/ \n"},
      {"list = { 1,  2 ,3 }", plain, "/list/ {1, 2 ,3}\n"},
      {"list = {1,\n 2,\n 3} \nnext = x", plain, "/list/ {1, 2, 3}\n/next/ x\n"},
      {"list = {1,\n 2", plain, "/list/ {1, 2\n"},  // the end of the file ends it
      {"grid = {{1, 2}, {3, 4}}", plain, "/grid/ {1, 2, 3, 4}\n"},
      {"a = \"x;y\";;\n b = \"z\" ; \n", marked, "/a/ x;y\n/b/ z\n"},
      {"BEGIN_GROUP = A\n x = 1;\n begin_group = B\n y = 2;\nEND_GROUP = B\n z = 3;\n"
       "END_GROUP = A\nEND_GROUP = A\nw = 4;\nEND;",
       marked, "/A/B/y/ 2\n/A/x/ 1\n/A/z/ 3\n/w/ 4\n"},
      {"c = (\n\t\t1,\n\t\t+2);\nd = 5;", marked, "/c/ (1,+2)\n/d/ 5\n"},
      {"c = (1,\n2)\n;\nd = 5;", marked, "/c/ (1,2)\n/d/ 5\n"},  // ";" ends it, not ")"
      {"note = \"one ( alone\";\nd = 5;", marked, "/d/ 5\n/note/ one ( alone\n"},
  };
  for (const auto& c : cases) {
    SCOPED_TRACE(c.text);
    EXPECT_EQ(ParseText(c.text, c.format), c.want);
  }
}

TEST(TextMetadataParser, SaysWhatItIsAndWhatItCanNot) {
  MdfFormat format;
  format.input = "WORD";
  MetadataContainer collection;
  test::gParseLog.Take();
  EXPECT_FALSE(TextMetadataParser(collection, format, "/no/file").Parse());
  EXPECT_EQ(test::gParseLog.Take(), "Text Parser: Failed to open: (/no/file)\n");
  test::TemporaryDirectory directory;
  const std::string path = directory.Path() / "file";
  test::WriteFile(path, "a=1\na/b=2\n");
  EXPECT_TRUE(TextMetadataParser(collection, format, String(path), "under").Parse());
  EXPECT_EQ(test::Values(collection), "/under/a/ string(1) 1\n" + std::string(kHidden) +
                                          "type/ string(1) TextNVParser - WORD\n" + kHidden +
                                          "uri/ string(1) " + path + "\n");
  const std::string log = test::gParseLog.Take();
  EXPECT_THAT(log, testing::HasSubstr("Parser: No place for the text at: (/under/a/b/)\n"));
  const std::string rule = std::string(67, '=') + "\n";
  EXPECT_THAT(log, testing::HasSubstr(
                       rule + "     *** Creating string collection from header metadata ***\n" +
                       rule + collection.Describe("/").ToUTF8()));
}

TEST(TextMetadataParser, BoundsWhatItReads) {
  const MdfFormat marked = WithMarks();
  std::string deep;
  for (int i = 0; i < 100000; ++i) deep += "BEGIN_GROUP = x\n";
  MetadataContainer collection;
  EXPECT_FALSE(
      TextMetadataParser(collection, marked, "test").ParseText(platform::Utf8ToUtf16(deep)));
  EXPECT_THAT(TakeFault().ToUTF8(), testing::HasSubstr("nested too deep"));
  std::string slashes;
  for (int i = 0; i < 100000; ++i) slashes += "a/";
  EXPECT_EQ(ParseText(slashes + " = 1\nb = 2;\n", marked), "/b/ 2\n");
  test::TemporaryDirectory directory;
  const std::string path = directory.Path() / "large";
  test::WriteFile(path, "a = 1");
  std::filesystem::resize_file(path, kMaxMetadataBytes + 1);
  EXPECT_FALSE(TextMetadataParser(collection, marked, String(path)).Parse());
  EXPECT_EQ(TakeFault().ToUTF8(), path + ": too large for metadata");
}

bool ParseXml(const std::string& document, MetadataContainer& collection) {
  MdfFormat format;
  format.xmlInputType = "XmlString";
  return XmlMetadataParser(collection, format, String(document)).Parse();
}

TEST(XmlMetadataParser, GivesEveryValueAPath) {
  const struct {
    const char* document;
    const char* want;
  } cases[] = {
      {"<a x=' 1 '><b> text </b>\n\t<c/></a>", "/a/b/__text__/ text\n/a/x/ 1\n"},
      {"<g:a xmlns:g='urn:x' g:y='2'/>", "/g:a/g:y/ 2\n"},
      {"<a><b x='1'/><b x='2'/></a>", "/a/b1/x/ 1\n/a/b2/x/ 2\n"},
      {"<a><b>1</b><b>2</b><b>3</b></a>",
       "/a/b1/__text__/ 1\n/a/b2/__text__/ 2\n/a/b3/__text__/ 3\n"},
      {"<a><l><v>1</v></l><l><v>2</v></l></a>", "/a/l/v1/__text__/ 1\n/a/l/v2/__text__/ 2\n"},
      {"<a><b u='m'>1</b><b u='s'>2</b></a>",
       "/a/b1/__text__/ 1\n/a/b1/u/ m\n/a/b2/__text__/ 2\n/a/b2/u/ s\n"},
      {"<a><b1 x='0'/><b x='1'/><b x='2'/></a>", "/a/b1/x/ 0\n/a/b2/x/ 1\n/a/b3/x/ 2\n"},
      {"<?xml version='1.0' encoding='ISO-8859-1'?><a>\xC3\xA4</a>", "/a/__text__/ \xC3\xA4\n"},
      {"<!DOCTYPE a [<!ENTITY e 'inside'>]><a>&e;</a>", "/a/__text__/ inside\n"},
  };
  for (const auto& c : cases) {
    SCOPED_TRACE(c.document);
    MetadataContainer collection;
    ASSERT_TRUE(ParseXml(c.document, collection)) << TakeFault().ToUTF8();
    EXPECT_EQ(Texts(collection), c.want);
  }
}

TEST(XmlMetadataParser, TakesPiecesOrWholeTexts) {
  const struct {
    const char* document;
    const char* pieces;
    const char* joined;
  } cases[] = {
      {"<a>x &amp; y</a>", "/a1/__text__/ x\n/a2/__text__/ & y\n", "/a/__text__/ x & y\n"},
      {"<a>1<![CDATA[ 2]]><!-- no tag --> 3\n</a>",
       "/a1/__text__/ 1\n/a2/__text__/ 2\n/a3/__text__/ 3\n", "/a/__text__/ 1 2 3\n"},
      {"<a> <b>k&lt;l</b>\n<b>m</b> </a>",
       "/a/b1/__text__/ k\n/a/b2/__text__/ <l\n/a/b3/__text__/ m\n",
       "/a/b1/__text__/ k<l\n/a/b2/__text__/ m\n"},
      {"<a>one<b/>two</a>", "/a1/__text__/ one\n/a2/__text__/ two\n",
       "/a1/__text__/ one\n/a2/__text__/ two\n"},
  };
  for (const auto& c : cases) {
    SCOPED_TRACE(c.document);
    for (const bool joins : {false, true}) {
      MdfFormat format;
      format.xmlInputType = "XmlString";
      format.joinsTexts = joins;
      MetadataContainer collection;
      ASSERT_TRUE(XmlMetadataParser(collection, format, c.document).Parse());
      EXPECT_EQ(Texts(collection), joins ? c.joined : c.pieces);
    }
  }
}

TEST(XmlMetadataParser, NumbersUpToNinetyNine) {
  std::string document = "<a>";
  for (int i = 1; i <= 120; ++i) document += "<b>" + std::to_string(i) + "</b>";
  MetadataContainer collection;
  ASSERT_TRUE(ParseXml(document + "</a>", collection));
  for (const int i : {1, 2, 98, 99}) {
    String text;
    const auto* const found = collection.Find(String("/a/b" + std::to_string(i) + "/__text__"));
    ASSERT_TRUE(found != nullptr && found->Get(text, 0));
    EXPECT_EQ(text.ToUTF8(), std::to_string(i));
  }
  EXPECT_EQ(collection.Find("/a/b100"), nullptr);
  EXPECT_THAT(test::gParseLog.Take(),
              testing::HasSubstr("Xml Parser: No place for a value of: (/a/b/) \n"));
}

TEST(XmlMetadataParser, RefusesWhatIsNoDocumentOrTooMuch) {
  std::string deep, laughs = "<!DOCTYPE a [<!ENTITY l0 'ha'>";
  for (int i = 0; i < 300; ++i) deep += "<a>";
  for (int i = 1; i < 30; ++i) {
    const std::string inner = "&l" + std::to_string(i - 1) + ";";
    laughs.append("<!ENTITY l").append(std::to_string(i)).append(" '");
    laughs.append(inner).append(inner).append("'>");
  }
  const struct {
    std::string document;
    const char* fault;
  } cases[] = {
      {"", ""},
      {"no document", "line 1"},
      {"<a>\n<b></a>", "line 2"},
      {deep, "nested too deep"},
      {laughs + "]><a>&l29;</a>", "line"},
      {laughs + "]><a x='&l29;'/>", "line"},
      {"<!DOCTYPE a [<!ENTITY e '" + std::string(2000, 'x') + "'>]><a>&e;</a>", "entity"},
  };
  for (const auto& c : cases) {
    SCOPED_TRACE(c.document.substr(0, 100));
    MetadataContainer collection;
    EXPECT_FALSE(ParseXml(c.document, collection));
    EXPECT_THAT(TakeFault().ToUTF8(), testing::HasSubstr(c.fault));
  }
}

TEST(XmlMetadataParser, ReadsNothingOutsideTheDocument) {
  test::TemporaryDirectory directory;
  const std::string secret = directory.Path() / "secret";
  test::WriteFile(secret, "secret");
  const std::string system = " SYSTEM 'file://" + secret + "'";
  for (const std::string& document : {"<!DOCTYPE a [<!ENTITY e" + system + ">]><a>x&e;y</a>",
                                      "<!DOCTYPE a [<!ENTITY % e" + system + "> %e;]><a>x</a>",
                                      "<!DOCTYPE a" + system + "><a>x</a>"}) {
    SCOPED_TRACE(document);
    MetadataContainer collection;
    ParseXml(document, collection);
    EXPECT_THAT(test::Values(collection), testing::Not(testing::HasSubstr("secret\n")));
  }
}

TEST(XmlMetadataParser, ReadsFilesAddressesAndTexts) {
  test::TemporaryDirectory directory;
  const std::string path = directory.Path() / "x.xml";
  test::WriteFile(path, "<a>1</a>");
  const std::string said = ",  XmlDriverType - ";
  const struct {
    const char* type;
    std::string input, uri;
    bool reads;
  } cases[] = {{"XmlFile", path, path, true},
               {"XmlUrl", "file://" + path, "xml url input : file://" + path, true},
               {"XmlString", "<a>1</a>", "xml wstring input", true},
               {"XmlFile", path + "x", path + "x", false},
               {"XmlUrl", "no address", "xml url input : no address", false},
               {"", path, " fatal error: xml input type was not set", false}};
  for (const auto& c : cases) {
    SCOPED_TRACE(c.type + (" " + c.input));
    MdfFormat format;
    format.input = "WORD";
    format.xmlInputType = c.type;
    MetadataContainer collection;
    EXPECT_EQ(XmlMetadataParser(collection, format, String(c.input)).Parse(), c.reads);
    const std::string values = test::Values(collection);
    EXPECT_THAT(values, testing::HasSubstr(std::string(kHidden) + "uri/ string(1) " + c.uri));
    if (c.reads) {
      EXPECT_THAT(values, testing::HasSubstr("type/ string(1) XmlParser - WORD" + said + c.type));
      EXPECT_THAT(values, testing::HasSubstr("/a/__text__/ string(1) 1\n"));
    }
  }
}

TEST(XmlMetadataParser, LogsFaultsInTheirWords) {
  test::gParseLog.Take();
  MetadataContainer collection;
  EXPECT_FALSE(ParseXml("<a>\n<b></a>", collection));
  const std::string log = test::gParseLog.Take();
  EXPECT_THAT(log, testing::ContainsRegex("Xml Parser: Fatal Error: .+ at line: \\(2\\) \n"));
  EXPECT_THAT(log, testing::HasSubstr("Xml Parser: Error Count greater than 0: (<a>\n<b></a>) \n"));
}

}  // namespace
}  // namespace lumo
