#include <fstream>

#include "commands/catalog.h"
#include "commands/value_text.h"
#include "support/metadata_support.h"
#include "support/run_command.h"
#include "support/temporary_directory.h"

namespace lumo {
namespace {

using test::CommandOutcome;
using test::RunCommand;
using Inputs = std::map<std::string, std::string>;

/// Metadata in the catalog, and the commands on it.
class MetadataCommands : public testing::Test {
 protected:
  MetadataCommands() {
    const CommandOutcome made = RunCommand("CreateMetadataCommand", {{"ConnStr", "EMPTY"}});
    EXPECT_TRUE(made.Succeeded());
    uri_ = made.outputs.at("URI");
  }
  ~MetadataCommands() override { RunCommand("CloseMetadataCommand", {{"URI", uri_}}); }

  CommandOutcome Run(const char* command, Inputs inputs) {
    inputs["URI"] = uri_;
    return RunCommand(command, inputs);
  }
  CommandOutcome Set(const char* path, const char* type, const char* size, const char* isArray,
                     const char* value) {
    Inputs inputs{{"PATH", path}, {"TYPE", type}, {"SIZE", size}, {"ISARRAY", isArray}};
    if (value != nullptr) inputs["VALUE"] = value;
    return Run("SetMetadataCommand", inputs);
  }
  std::string Properties(const char* path) {
    const auto outputs = Run("GetPropertiesMetadataCommand", {{"PATH", path}}).outputs;
    std::string text;
    for (const char* const name :
         {"GetPropertiesResult", "Type", "Size", "IsArray", "Rows", "Cols"}) {
      const auto at = outputs.find(name);
      text.append(at != outputs.end() ? at->second : "-").append(" ");
    }
    return text;
  }

  std::string uri_;
};

TEST_F(MetadataCommands, StoreAndGiveValuesOfEveryType) {
  const struct {
    const char *type, *size, *isArray, *value, *properties;
  } cases[] = {
      {"1", "1", "0", "255", "1 1 1 0 0 0 "},
      {"2", "1", "0", "-5", "1 2 1 0 0 0 "},
      {"3", "0", "0", "-70000", "1 3 1 0 0 0 "},
      {"4", "1", "0", "0.1", "1 4 1 0 0 0 "},
      {"5", "1", "0", "2.5", "1 5 1 0 0 0 "},
      {"7", "1", "0", "a text", "1 7 1 0 0 0 "},
      {"12", "1", "0", "65535", "1 12 1 0 0 0 "},
      {"13", "1", "0", "4294967295", "1 13 1 0 0 0 "},
      {"14", "1", "0", "-9000000000", "1 14 1 0 0 0 "},
      {"15", "1", "0", "18446744073709551615", "1 15 1 0 0 0 "},
      {"5", "2", "0", "1:2 [0.5 -1] ", "1 5 2 0 0 0 "},
      {"3", "4", "1", "2:2 2 [1 2 3 4] ", "1 3 4 1 2 2 "},
      {"3", "1", "1", "2:1 1 [9] ", "1 3 1 1 1 1 "},
      {"7", "2", "1", "one|two", "1 7 2 0 0 0 "},
  };
  for (const auto& c : cases) {
    SCOPED_TRACE(c.value);
    const CommandOutcome stored = Set("/a/b", c.type, c.size, c.isArray, c.value);
    ASSERT_TRUE(stored.Succeeded()) << stored.reason;
    EXPECT_EQ(stored.outputs.at("SetResult"), "1");
    EXPECT_EQ(Properties("/a/b"), c.properties);
    const CommandOutcome got = Run("GetMetadataCommand", {{"PATH", "/a/b/"}});
    EXPECT_EQ(got.outputs.at("GetResult"), "1");
    EXPECT_EQ(got.outputs.at("Value"), c.value);
    EXPECT_EQ(Run("QueryMetadataCommand", {{"PATH", "/a/b"}}).outputs.at("QueryResult"), "1");
  }
}

TEST_F(MetadataCommands, AnswerInTheirResultsWhatIsNotThere) {
  Set("/a/b", "3", "1", "0", "1");
  ASSERT_TRUE(Set("/a/u", "0", "1", "0", nullptr).Succeeded());
  EXPECT_EQ(Properties("/a/u"), "1 0 1 0 0 0 ");
  EXPECT_EQ(Properties("/a"), "1 20 2 0 0 0 ");
  EXPECT_EQ(Properties("/none"), "0 - - - - - ");
  for (const char* const path : {"/a", "/none", "/a/u"}) {
    const CommandOutcome got = Run("GetMetadataCommand", {{"PATH", path}});
    EXPECT_TRUE(got.Succeeded());
    EXPECT_EQ(got.outputs.at("GetResult"), "0");
    EXPECT_EQ(got.outputs.count("Value"), 0U);
  }
  EXPECT_EQ(Run("QueryMetadataCommand", {{"PATH", "/a"}}).outputs.at("QueryResult"), "0");
  EXPECT_EQ(Set("/a/b/c", "3", "1", "0", "1").outputs.at("SetResult"), "0");  // below a value
  EXPECT_TRUE(Run("RemoveMetadataCommand", {{"PATH", "/none"}}).Succeeded());
  EXPECT_TRUE(Run("RemoveMetadataCommand", {{"PATH", "/a"}}).Succeeded());
  EXPECT_EQ(Properties("/a"), "0 - - - - - ");
}

TEST_F(MetadataCommands, FailOnWhatTheyCanNotUse) {
  const struct {
    const char *type, *size, *isArray, *value;
  } cases[] = {{"6", "1", "0", "1"},     {"-1", "1", "0", "1"},    {"0", "2", "0", nullptr},
               {"0", "1", "1", nullptr}, {"5", "1", "0", nullptr}, {"5", "1", "0", "no number"},
               {"3", "1", "0", "2.5"},   {"1", "1", "0", "256"},   {"3", "2", "0", "1:2 [1]"},
               {"3", "2", "1", "1 2"}};
  for (const auto& c : cases) {
    SCOPED_TRACE(c.type + std::string(" ") + (c.value != nullptr ? c.value : "none"));
    const CommandOutcome stored = Set("/x", c.type, c.size, c.isArray, c.value);
    EXPECT_EQ(stored.result, CommandResult::kFailed);
    EXPECT_FALSE(stored.reason.empty());
    EXPECT_EQ(Properties("/x"), "0 - - - - - ");
  }
  for (const char* const command :
       {"AccessMetadataCommand", "QueryMetadataCommand", "QueryNamesMetadataCommand",
        "GetPropertiesMetadataCommand", "GetMetadataCommand", "RemoveMetadataCommand"}) {
    const CommandOutcome outcome =
        RunCommand(command, {{"URI", "[no such] "}, {"PATH", "/"}, {"DOPRIVATE", "0"}});
    EXPECT_EQ(outcome.reason, "URI: no such metadata is open") << command;
    EXPECT_EQ(RunCommand(command, {}).result, CommandResult::kFailed) << command;
  }
  EXPECT_EQ(RunCommand("CreateMetadataCommand", {{"ConnStr", "NONE|x"}}).reason,
            "\"NONE\" is no metadata format");
}

TEST_F(MetadataCommands, ListPublicOrPrivateNames) {
  for (const char* const path : {"/b/y", "/b/x", "/a", "/private/p"}) Set(path, "3", "1", "0", "1");
  const struct {
    const char *path, *isPrivate, *names, *result;
  } cases[] = {{"", "0", "/a/|/b/x/|/b/y/", "1"},
               {"/b/", "0", "/b/x/|/b/y/", "0"},
               {"/a", "0", "", "1"},
               {"", "1", "/private/p/", "1"}};
  for (const auto& c : cases) {
    const auto listed =
        Run("QueryNamesMetadataCommand", {{"PATH", c.path}, {"DOPRIVATE", c.isPrivate}}).outputs;
    EXPECT_EQ(listed.at("Names"), c.names);
    EXPECT_EQ(listed.at("QueryNamesResult"), c.result);
  }
}

TEST_F(MetadataCommands, CountTheirOpens) {
  const CommandOutcome accessed = Run("AccessMetadataCommand", {});
  EXPECT_EQ(accessed.outputs.at("URI"), uri_);
  const auto isOpen = [&] { return bool(catalog::Find(ParseValue<URI>(String(uri_)))); };
  EXPECT_TRUE(Run("CloseMetadataCommand", {}).Succeeded());
  EXPECT_TRUE(isOpen());
  EXPECT_TRUE(Run("CloseMetadataCommand", {}).Succeeded());
  EXPECT_FALSE(isOpen());
  EXPECT_TRUE(Run("CloseMetadataCommand", {}).Succeeded());  // absent: no failure
}

TEST(MetadataSources, AreKnownByTheirNamesAndBeginnings) {
  const test::TemporaryDirectory folder;
  const auto write = [&](const char* name, const char* text) {
    std::ofstream(folder.Path() / name) << text;
  };
  write("a.xml", "<?xml version='1.0'?><Dimap_Document>");
  write("b.xml", "<LANDSAT_METADATA_FILE>");
  write("c.xml", "<something/>");
  write("pixels.bin", "");
  write("pixels.bin.hdr", "");
  const struct {
    const char *name, *format, *file;
  } cases[] = {{"a.xml", "PLEIADESDIM", "a.xml"},
               {"b.xml", "LANDSAT", "b.xml"},
               {"LC08_MTL.txt", "LANDSAT", "LC08_MTL.txt"},
               {"x.IMD", "DGIMD", "x.IMD"},
               {"GML:c.xml", "GML", "c.xml"},
               {"pixels.bin", "ORVA", "pixels.bin.hdr"},
               {"ORVA:pixels.bin", "ORVA", "pixels.bin.hdr"},
               {"c.xml", nullptr, nullptr},
               {"none.xml", nullptr, nullptr},
               {"NONE:x.IMD", "DGIMD", "NONE:x.IMD"},
               {"", nullptr, nullptr}};
  for (const auto& each : cases) {
    const CommandOutcome found = RunCommand(
        "FindMetadataSourceCommand", {{"Name", each.name}, {"Folder", folder.Path().string()}});
    ASSERT_EQ(found.Succeeded(), each.format != nullptr) << each.name;
    if (each.format == nullptr) {
      EXPECT_NE(found.reason.find("FORMAT:FILE"), std::string::npos) << each.name;
    } else {
      EXPECT_EQ(found.outputs.at("ConnStr"),
                std::string(each.format) + "|" + (folder.Path() / each.file).string());
    }
  }
}

}  // namespace
}  // namespace lumo
