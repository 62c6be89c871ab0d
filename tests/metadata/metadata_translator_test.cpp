#include "metadata/metadata_translator.h"

#include "foundation/fault.h"
#include "metadata/mdf_file.h"
#include "platform/unicode.h"
#include "support/metadata_support.h"

namespace lumo {
namespace {

using Texts = std::vector<std::pair<const char*, const char*>>;

void Fill(MetadataContainer& source, const Texts& texts) {
  for (const auto& [path, text] : texts) {
    source.Put(path, std::make_unique<MetadataString>(std::vector<String>{text}));
  }
}

bool TranslateInto(MetadataContainer& target, const std::string& definitions, const Texts& texts,
                   bool blankLists = false) {
  MdfFormat format;
  std::vector<MdfEntry> entries;
  EXPECT_TRUE(ReadMdfText(platform::Utf8ToUtf16(definitions), "test.txt", format, entries))
      << TakeFault().ToUTF8();
  format.blankLists = blankLists;
  MetadataContainer source;
  Fill(source, texts);
  return MetadataDefFileTranslator().TranslateAll(entries, &source, &target, &format);
}

std::string Entry(const std::string& src, const std::string& dest, const std::string& dt,
                  const std::string& more) {
  return "[src=" + src + "\ndest=" + dest + "\ndt=DT_" + dt + "\n" + more + "]\n";
}

TEST(MetadataTranslator, MakesValuesOfTheTypesThatEntriesName) {
  const struct {
    const char* type;
    const char* count;
    const char* text;
    const char* want;
  } cases[] = {
      {"UCHAR", "1", "0xfF", "uchar(1) 255"},
      {"UCHAR", "1", "300", "uchar(1) 44"},  // narrowed
      {"SHORT", "1", "-3 m", "short(1) -3"},
      {"USHORT", "1", "65535", "ushort(1) 65535"},
      {"INT", "1", "010", "int(1) 8"},  // octal
      {"INT", "1", "08", "int(1) 0"},
      {"UINT", "1", "4294967295", "uint(1) 4294967295"},
      {"LONG64", "1", "-9223372036854775808", "long64(1) -9223372036854775808"},
      {"ULONG64", "1", "18446744073709551615", "ulong64(1) 18446744073709551615"},
      {"FLOAT", "1", "+0.1", "float(1) 0.1"},
      {"DOUBLE", "1", " -1.5e3 W", "double(1) -1500"},
      {"DOUBLE", "1", "1e999", "double(1) inf"},
      {"DOUBLE", "1", "-1e-999", "double(1) -0"},
      {"STRING", "1", "one, two", "string(1) one, two"},
      {"STRING", "1", "{one}", "string(1) one}"},  // as one text, only the start mark goes
      {"STRING", "0", "{one, , two }", "string(3) one, , two"},
      {"INT", "3", "{1, 2 ,3}", "int(3) 1, 2, 3"},
      {"INT", "3", "{1, 2, 3,}", "int(3) 1, 2, 3"},
      {"STRING", "0", "{one, }", "string(2) one, "},
      {"STRING", "0", "one, two", "string(2) one, two"},
      {"DOUBLE", "2", "7", "double(1) 7"},
      // A text that holds no such value stays as it was.
      {"DOUBLE", "1", "N/A", "string(1) N/A"},
      {"INT", "0", "{1, two, 3}", "string(1) {1, two, 3}"},
      {"INT", "0", "{1, , 3}", "string(1) {1, , 3}"},
      {"INT", "0", "{}", "string(1) {}"},
      {"ULONG64", "1", "18446744073709551616", "string(1) 18446744073709551616"},
  };
  for (const auto& c : cases) {
    SCOPED_TRACE(c.text);
    MetadataContainer target;
    ASSERT_TRUE(TranslateInto(target, Entry("/s", "/d", c.type, std::string("cnt=") + c.count),
                              {{"/s", c.text}}));
    const bool stays = std::string(c.want).ends_with(c.text) && std::string(c.type) != "STRING" &&
                       std::string(c.want).starts_with("string");
    EXPECT_EQ(test::Values(target), (stays ? "/s/ " : "/d/ ") + std::string(c.want) + "\n");
  }
}

TEST(MetadataTranslator, HandlesArraysRowsRepeatsAndSharedTargets) {
  const struct {
    const char* name;
    std::string definitions;
    Texts texts;
    const char* want;
  } cases[] = {
      {"rows",
       Entry("/s", "/d", "INT", "cnt=0\ncols=2"),
       {{"/s", "{1,2,3,4}"}},
       "/d/ int(2,2) 1, 2, 3, 4\n"},
      {"one row is no array of rows",
       Entry("/s", "/d", "INT", "cnt=0\ncols=4"),
       {{"/s", "{1,2,3,4}"}},
       "/d/ int(4) 1, 2, 3, 4\n"},
      {"rows that do not come out",
       Entry("/s", "/d", "INT", "cnt=0\ncols=3"),
       {{"/s", "{1,2,3,4}"}},
       "/s/ string(1) {1,2,3,4}\n"},
      {"repeats up to the first gap",
       Entry("/b#/g", "/d", "INT", "cnt=0\nidx=3"),
       {{"/b3/g", "3"}, {"/b4/g", "4"}, {"/b6/g", "6"}},
       "/b6/g/ string(1) 6\n/d/ int(2) 3, 4\n"},
      {"repeats without a text",
       Entry("/b#", "/d", "STRING", "cnt=0"),
       {{"/b1", ""}, {"/b2", "x"}, {"/b3", ""}},
       "/d/ string(3) , x, \n"},
      {"no repeat at all",
       Entry("/b#/g", "/d", "INT", "cnt=0"),
       {{"/b2/g", "2"}},
       "/b2/g/ string(1) 2\n"},
      {"repeats that are no numbers",
       Entry("/b#", "/d", "INT", "cnt=0"),
       {{"/b1", "1"}, {"/b2", "x"}},
       "/b1/ string(1) 1\n/b2/ string(1) x\n"},
      {"many to one",
       Entry("/x", "/d", "DOUBLE", "cnt=4\nmtoi=0\nmton=1") +
           Entry("/y", "/d", "DOUBLE", "cnt=4\nmtoi=2\nmton=2"),
       {{"/x", "5"}, {"/y", "{6, 7, 8}"}},
       "/d/ double(4) 5, 0, 6, 7\n"},
      {"many to one of texts",
       Entry("/x", "/d", "STRING", "cnt=2\nmtoi=1\nmton=1"),
       {{"/x", "a"}},
       "/d/ string(2) , a\n"},
      {"the rest under its own path",
       Entry("/x", "/x/y", "INT", "cnt=1"),
       {{"/z/w", "{a, b}"}, {"/xx vex parser info/uri", "file"}},
       "/private/xx vex parser info/uri/ string(1) file\n/z/w/ string(1) {a, b}\n"},
      {"a translated value is not replaced by the rest",
       Entry("/x", "/y", "INT", "cnt=1"),
       {{"/x", "1"}, {"/y", "raw"}},
       "/private/y/ string(1) raw\n/y/ int(1) 1\n"},
      {"nor is it a container",
       Entry("/x", "/y", "INT", "cnt=1"),
       {{"/x", "1"}, {"/y/z", "raw"}},
       "/private/y/z/ string(1) raw\n/y/ int(1) 1\n"},
  };
  for (const auto& c : cases) {
    SCOPED_TRACE(c.name);
    MetadataContainer target;
    ASSERT_TRUE(TranslateInto(target, c.definitions, c.texts)) << TakeFault().ToUTF8();
    EXPECT_EQ(test::Values(target), c.want);
  }
}

TEST(MetadataTranslator, MakesListsOfWhatBlanksSeparate) {
  const std::string two = Entry("/s", "/d", "DOUBLE", "cnt=2");
  const std::string one = Entry("/s", "/d", "STRING", "cnt=1");
  const struct {
    std::string definitions;
    const char* text;
    const char* want;
  } cases[] = {{two, " 1.5 \n 2", "/d/ double(2) 1.5, 2\n"},
               {two, "1.5", "/d/ double(1) 1.5\n"},
               {one, "a b", "/d/ string(1) a b\n"}};
  for (const auto& c : cases) {
    MetadataContainer target;
    ASSERT_TRUE(TranslateInto(target, c.definitions, {{"/s", c.text}}, true));
    EXPECT_EQ(test::Values(target), c.want);
  }
}

TEST(MetadataTranslator, FailsWhereAValueHasNoPlace) {
  const std::string first = Entry("/a", "/d", "INT", "cnt=1");
  const struct {
    const char* name;
    std::string definitions;
    const char* line;
  } cases[] = {
      {"through a value", first + Entry("/b", "/d/x", "INT", "cnt=1"), "/b/"},
      {"another type", first + Entry("/b", "/d", "DOUBLE", "cnt=2\nmtoi=0\nmton=1"), "/b/"},
      {"too short", first + Entry("/b", "/d", "INT", "cnt=2\nmtoi=1\nmton=1"), "/b/"}};
  for (const auto& c : cases) {
    SCOPED_TRACE(c.name);
    test::gParseLog.Take();
    MetadataContainer target;
    EXPECT_FALSE(TranslateInto(target, c.definitions, {{"/a", "1"}, {"/b", "2"}}));
    EXPECT_EQ(test::Values(target), "/d/ int(1) 1\n");  // what came before stays
    EXPECT_EQ(
        test::gParseLog.Take(),
        std::string("Mdf Translate - Error: (Failed to translate.) Line: (") + c.line + ") \n");
  }
  MetadataContainer target;
  const MdfFormat format;
  EXPECT_FALSE(MetadataDefFileTranslator().TranslateAll({}, nullptr, &target, &format));
  EXPECT_FALSE(MetadataDefFileTranslator().TranslateAll({}, &target, nullptr, &format));
  EXPECT_FALSE(MetadataDefFileTranslator().TranslateAll({}, &target, &target, nullptr));
}

TEST(MetadataTranslator, LogsIntegersThatTheirZeroCutsShort) {
  for (const auto& [text, want] : {std::pair("090", "int(1) 0"),
                                   {"-0128", "int(1) -10"},
                                   {"010", "int(1) 8"},
                                   {"0x9", "int(1) 9"},
                                   {"0", "int(1) 0"},
                                   {"90", "int(1) 90"}}) {
    SCOPED_TRACE(text);
    test::gParseLog.Take();
    MetadataContainer target;
    ASSERT_TRUE(TranslateInto(target, Entry("/a/", "/v/", "INT", "cnt=1\n"), {{"/a/", text}}));
    EXPECT_THAT(test::Values(target), testing::HasSubstr(want));
    const bool isCut = std::string(text).find_first_of("89") != std::string::npos &&
                       text[0] != '9' && text[1] != 'x';
    EXPECT_EQ(test::gParseLog.Take().find(std::string("Warning: (") + text) != std::string::npos,
              isCut);
  }
}

TEST(MetadataTranslator, LogsWhatItMade) {
  test::gParseLog.Take();
  MetadataContainer target;
  ASSERT_TRUE(TranslateInto(target, Entry("/s", "/d", "INT", "cnt=1"), {{"/s", "5"}}));
  std::string rule(84, '=');
  rule += '\n';
  EXPECT_EQ(test::gParseLog.Take(),
            rule +
                "*** Translating string collection, using the mdf file, into data "
                "type collection ***\n" +
                rule + target.Describe("/").ToUTF8());
}

TEST(MetadataParseLog, NeedsAllThreeVariables) {
  test::TemporaryDirectory directory;
  const std::string inside = directory.Path() / "new" / "folder";
  const std::filesystem::path file = inside + "/metadata_parse_log.log";
  const struct {
    std::string folder;
    const char* level;
    const char* console;
    unsigned on;  // the highest level that is written
  } cases[] = {{"", "3", "0", 0},      {inside, "", "0", 0},         {inside, "0", "0", 0},
               {inside, "3", "", 0},   {"/dev/null/x", "3", "0", 0}, {inside, "2", "0", 2},
               {inside, "0x1", "0", 1}};
  for (const auto& c : cases) {
    setenv("metadata_parse_log_dir", c.folder.c_str(), 1);
    setenv("metadata_parse_log_level", c.level, 1);
    setenv("metadata_parse_log_console", c.console, 1);
    MetadataParseLog log;
    for (unsigned level = 1; level <= 3; ++level) EXPECT_EQ(log.IsOn(level), level <= c.on);
    log.Write(1, "%s", "one");
    log.Write(2, "%s", "two");
    if (c.on == 0) {
      EXPECT_FALSE(std::filesystem::exists(file));
      continue;
    }
    std::ifstream in(file);
    const std::string text{std::istreambuf_iterator<char>(in), std::istreambuf_iterator<char>()};
    EXPECT_THAT(text, testing::MatchesRegex(
                          "\n[A-Z].. ... .. ..:..:.. ....  MetadataImpl Parse Log.   Log Level is "
                          "set to: .\n\none" +
                          std::string(c.on > 1 ? "two" : "")));
    EXPECT_THAT(text, testing::HasSubstr("set to: " + std::to_string(c.on)));
    std::filesystem::remove(file);
  }
}

}  // namespace
}  // namespace lumo
