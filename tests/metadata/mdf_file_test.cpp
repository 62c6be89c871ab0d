#include "metadata/mdf_file.h"

#include "foundation/fault.h"
#include "platform/unicode.h"
#include "support/metadata_support.h"
#include "support/source_dir.h"

namespace lumo {
namespace {

bool Read(const std::string& text, MdfFormat& format, std::vector<MdfEntry>& entries) {
  return ReadMdfText(platform::Utf8ToUtf16(text), "test.txt", format, entries);
}

const std::string kWhole = "src = /a/\n dest = /b/\n cnt = 1\n dt = DT_INT\n";

TEST(MdfFile, TellsEachFaultInItsWords) {
  const std::string kMixed = "Invalid mix of mdf and frmt properties.";
  const std::string kManyToOne = "When using the many to one type you must set both mtoi and mton.";
  const std::string kCombination = "Invalid combination of mdf entry types: ";
  const struct {
    std::string entry, message;
  } cases[] = {
      {"frmt.sep = :\n src = /a/", kMixed},
      {"frmt.sep = :\n idx = 1", kMixed},
      {"dest = /b/\n cnt = 1\n dt = DT_INT", "Src value is missing."},
      {"src = /\n dest = /b/\n cnt = 1\n dt = DT_INT", "Invalid src value."},
      {"src = /a/", "Dest value is missing."},
      {"src = /a/\n dest = //\n cnt = 1\n dt = DT_INT", "Invalid dest value."},
      {"src = /a/\n dest = /b/\n dt = DT_INT", "Cnt value is missing."},
      {kWhole + "alias = /", "Invalid dest value."},
      {"src = /a/\n dest = /b/\n cnt = 1", "Data Type value is missing."},
      {kWhole + "mtoi = 0", "Missing mton value. " + kManyToOne},
      {kWhole + "mton = 1", "Missing mtoi value. " + kManyToOne},
      {kWhole + "mtoi = 0\n mton = 1\n cols = 2",
       kCombination + "many to one and 2d array types are mutually exclusive."},
      {"src = /a#/\n dest = /b/\n cnt = 1\n dt = DT_INT\n cols = 2",
       kCombination + "2d array and repeated types are mutually exclusive."},
      {kWhole + "idx = 2",
       "You can not use the idx field if the src string does not contain the repeat char (#)."},
      {kWhole + "mtoi = 1\n mton = 1", "The mtoi and mton values reach beyond cnt."},
      {kWhole + "mtoi = 4294967295\n mton = 4294967295",
       "The mtoi and mton values reach beyond cnt."},
      {"src = /a/\n dest = /b/\n cnt = 4000000000\n dt = DT_INT\n mtoi = 0\n mton = 1",
       "Invalid cnt value."},
      {"src = /a/\n[ dest = /b/",
       "Encountered second start of entry char. Look for missing end of entry char."},
      {"src /a/", "Separator is missing."},
      {"src =  ", "Missing value."},
      {kWhole + "dt = DT_WORD", "Already have a dt. Check for missing end of entry character."},
      {"dt = DT_WORD", "Invalid data type."},
      {"source = /a/", "Unknown mdf property."},
      {"frmt.mark = x", "Unknown mdf property."},
      {"cnt = many", "Invalid number."},
      {"cnt = -1", "Invalid number."},
      {"cnt = 4294967296", "Invalid number."},
  };
  for (const auto& c : cases) {
    SCOPED_TRACE(c.entry);
    test::gParseLog.Take();
    MdfFormat format;
    std::vector<MdfEntry> entries;
    EXPECT_FALSE(Read("[ " + kWhole + "]\n[ " + c.entry + "\n]\n[ broken", format, entries));
    EXPECT_EQ(entries.size(), 1U);  // nothing behind the fault is read
    const std::string log = test::gParseLog.Take();
    EXPECT_THAT(log, testing::HasSubstr("   error msg:         " + c.message + " \n"));
    EXPECT_THAT(TakeFault().ToUTF8(), testing::EndsWith(c.message));
  }
  for (const char* const name :
       {"src", "dest", "alias", "cnt", "dt", "cols", "idx", "mton", "mtoi"}) {
    const std::string value = std::string(name) == "dt" ? "DT_INT" : "7";
    const std::string twice = std::string(name) + " = " + value + "\n" + name + " = " + value;
    MdfFormat format;
    std::vector<MdfEntry> entries;
    EXPECT_FALSE(Read("[ " + twice + " ]", format, entries));
    EXPECT_THAT(test::gParseLog.Take(),
                testing::HasSubstr("Already have a " + std::string(name) +
                                   ". Check for missing end of entry character."));
  }
}

TEST(MdfFile, LogsTheLinesBeforeAFault) {
  test::gParseLog.Take();
  MdfFormat format;
  std::vector<MdfEntry> entries;
  EXPECT_FALSE(Read("[\nsrc=1\ndest=2\n# comment\ncnt=3\n\nalias=4\ndt=DT_INT\nmton=5\n mtoi 6\n",
                    format, entries));
  std::string want = "MDF Parsing Error, Invalid entry:\n   file:              test.txt \n";
  for (const char* const line : {"dest=2", "cnt=3", "alias=4", "dt=DT_INT", "mton=5", "mtoi 6"}) {
    want += std::string("   preceding lines    ") + line + " \n";
  }
  EXPECT_EQ(test::gParseLog.Take(), want + "   error msg:         Separator is missing. \n");
  EXPECT_EQ(TakeFault().ToUTF8(), "test.txt, line 10: Separator is missing.");

  EXPECT_FALSE(ReadMdfFile("/no/such/file.txt", format, entries));
  EXPECT_EQ(test::gParseLog.Take(), "MDF Parser: Failed to open: (/no/such/file.txt)\n");
  EXPECT_FALSE(ReadMdfFile("/dev/zero", format, entries));
  EXPECT_FALSE(ReadMdfFile("/", format, entries));
}

TEST(MdfFile, ReadsEntriesInEveryLayout) {
  const struct {
    const char* text;
    const char* src;
    const char* dest;
    unsigned dt, cnt;
  } cases[] = {
      {"[SRC=a\r\nDest = b/c\rcnt=0x10\ndt=dt_double]", "/a/", "/b/c/", 5, 16},
      {"ignored\n[\n[ in vain", nullptr, nullptr, 0, 0},
      {"# [ src = /x/ ]\n src = /outside/\n[ src = //a//b\n\n  # dest = /no/\n\tdest = /b/\n"
       "cnt = 010\n dt = DT_UCHAR\n ] behind",
       "/a/b/", "/b/", 1, 8},
      {"[ src = /a/\n dest = /b/\n cnt = 0\n dt = DT_STRING", "/a/", "/b/", 7, 0},  // no end
      {"\xEF\xBB\xBF[ src = /\xC3\xA4/\n dest = /b/\n cnt = 1\n dt = DT_ULONG64\n]", "/\xC3\xA4/",
       "/b/", 15, 1},
      {"name [ src = /a/\n]", nullptr, nullptr, 0, 0},
  };
  test::TemporaryDirectory directory;
  const auto path = directory.Path() / "mdf.txt";
  for (const auto& c : cases) {
    SCOPED_TRACE(c.text);
    test::WriteFile(path, c.text);
    MdfFormat format;
    std::vector<MdfEntry> entries;
    ASSERT_EQ(ReadMdfFile(String(path.string()), format, entries), c.src != nullptr);
    if (c.src == nullptr) continue;
    ASSERT_EQ(entries.size(), 1U);
    EXPECT_EQ(entries[0].src.ToUTF8(), c.src);
    EXPECT_EQ(entries[0].dest.ToUTF8(), c.dest);
    EXPECT_EQ(entries[0].dt, c.dt);
    EXPECT_EQ(entries[0].cnt, c.cnt);
  }
}

TEST(MdfFile, TypesHaveTheCodesOfTheirValues) {
  const struct {
    const char* word;
    unsigned code;
  } types[] = {{"DT_UCHAR", 1},  {"DT_SHORT", 2},   {"DT_USHORT", 12},  {"DT_INT", 3},
               {"DT_UINT", 13},  {"DT_LONG64", 14}, {"DT_ULONG64", 15}, {"DT_FLOAT", 4},
               {"DT_DOUBLE", 5}, {"DT_STRING", 7}};
  for (const auto& type : types) {
    MdfFormat format;
    std::vector<MdfEntry> entries;
    ASSERT_TRUE(Read("[src=a\ndest=b\ncnt=1\ndt=" + std::string(type.word) + "]", format, entries));
    EXPECT_EQ(entries[0].dt, type.code);
  }
}

TEST(MdfFile, FormatPropertiesChangeTheFormatAndMakeNoEntry) {
  MdfFormat format;
  std::vector<MdfEntry> entries;
  ASSERT_TRUE(
      Read("[ frmt.sep = : and more\n frmt.start = GROUP ]\n"
           "[ frmt.start = OBJECT\n frmt.end = END\n FRMT.DEL = \"\n frmt.sm = (\n"
           " frmt.em = )\n frmt.eol = ;\n frmt.vsep = | ]",
           format, entries));
  EXPECT_TRUE(entries.empty());
  EXPECT_EQ(format.sep, u':');
  EXPECT_EQ((std::u16string{format.sm, format.em, format.eol, format.del, format.vsep}), u"();\"|");
  EXPECT_EQ(format.sectionStarts, (std::set<std::u16string>{u"GROUP", u"OBJECT"}));
  EXPECT_EQ(format.sectionEnds, (std::set<std::u16string>{u"END"}));
}

TEST(MdfFile, TheDefinitionFilesOfTheLibraryAreWellFormed) {
  unsigned files = 0;
  for (const auto& file :
       std::filesystem::directory_iterator(test::SourceDir() + "/resources/mdf")) {
    MdfFormat format;
    std::vector<MdfEntry> entries;
    EXPECT_TRUE(ReadMdfFile(String(file.path().string()), format, entries)) << TakeFault().ToUTF8();
    EXPECT_FALSE(entries.empty()) << file.path();
    ++files;
  }
  EXPECT_EQ(files, 10U);
}

}  // namespace
}  // namespace lumo
