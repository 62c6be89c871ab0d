#include <random>

#include "commands/job_writer.h"
#include "platform/shared_memory.h"
#include "support/test_commands.h"

namespace lumo {
namespace {

std::set<std::string> DependenciesOf(const Job& job, unsigned index) {
  std::set<std::string> names;
  for (const CommandPtr& dependency : job.commands[index]->dependsOn) {
    for (const CommandDescriptorPtr& other : job.commands) {
      if (other->command == dependency) names.insert(other->name.ToUTF8());
    }
  }
  return names;
}

TEST(JobParser, ReadsCommandsInputsOutputsAndOrder) {
  Job job;
  JobParser parser(job);
  parser.Parse(R"(<Job Ignored="1">
    <DependsOn Name="@ALL"/><Input Lost="1"/>
    <Command Name="a" ID="TestEchoCommand">
      <DependsOn Name="@ALL"/> <DependsOn Name="c"/>
      <Input Text="one" Times="2"/> <Input Text="two"/> <Input More="$v"/>
      <Output Text="$out"/>
    </Command>
    <Wrapper><Command ID="TestEchoCommand"><DependsOn Name="a"/></Command></Wrapper>
    <Command Name="gone" ID="NoSuchCommand"><Input Text="lost"/></Command>
    <Command Name="c" ID="TestEchoCommand"><DependsOn Name="@ALL"/></Command>
    <Command Name="a" ID="TestEchoCommand"><DependsOn Name="UNNAMMED_COMMAND_00000001"/></Command>
    <Command Name="last" ID="TestEchoCommand"><DependsOn Name="a"/></Command>
    </Job>)");
  EXPECT_FALSE(parser.HasError());
  ASSERT_EQ(job.commands.GetCount(), 5U);
  const CommandDescriptor& first = *job.commands[0];
  EXPECT_EQ(first.inputs.Find("Text").ToUTF8(), "two");  // the later value wins
  EXPECT_EQ(first.inputs.Find("Times").ToUTF8(), "2");
  EXPECT_EQ(first.inputs.Find("More").ToUTF8(), "$v");
  EXPECT_EQ(first.inputs.GetCount(), 3U);
  EXPECT_EQ(first.outputs.Find("Text").ToUTF8(), "$out");
  EXPECT_EQ(DependenciesOf(job, 0), (std::set<std::string>{}));  // nothing before, nothing ahead
  EXPECT_EQ(DependenciesOf(job, 1), (std::set<std::string>{"a"}));
  EXPECT_EQ(DependenciesOf(job, 2), (std::set<std::string>{"a", ""}));
  EXPECT_EQ(DependenciesOf(job, 3), (std::set<std::string>{""}));
  // Of two with one name the later is meant.
  ASSERT_EQ(job.commands[4]->dependsOn.GetCount(), 1U);
  EXPECT_TRUE(*job.commands[4]->dependsOn.begin() == job.commands[3]->command);
  ASSERT_EQ(job.unknown.GetCount(), 1U);
  EXPECT_EQ(job.unknown.begin()->name.ToUTF8(), "gone");
  EXPECT_EQ(job.unknown.begin()->id.ToUTF8(), "NoSuchCommand");
}

TEST(JobParser, ADocumentThatBreaksOffKeepsWhatItNamed) {
  Job job;
  JobParser parser(job);
  parser.Parse(
      "<Job><Command Name=\"a\" ID=\"TestEchoCommand\"><Input Text=\"x\"/></Command>"
      "<Command Name=\"b\" ID=\"TestEchoCommand\"><Input Te");
  EXPECT_TRUE(parser.HasError());
  ASSERT_EQ(job.commands.GetCount(), 1U);
  EXPECT_EQ(job.commands[0]->name.ToUTF8(), "a");
}

TEST(JobWriter, WritesWhatTheParserReads) {
  JobWriter writer;
  JobWriterCommand* const first = writer.AddCommand("first", "TestEchoCommand");
  first->AddInput("Text", URI("a b"));
  first->AddInput("Times", 2);
  first->AddOutput("Text", "$t");
  JobWriterCommand* const second = writer.AddCommand("second", "TestEchoCommand");
  second->AddDependsOn("first");
  second->AddVariableInput("Text", "$t");
  const String text = writer.Write();
  EXPECT_FALSE(writer.HasError());
  Map<String, JobResult> results;
  JobResultParser(results).Parse(String(test::RunDocument(text.ToUTF8())));
  EXPECT_EQ(results.Find("second").returns.Find("Text").ToUTF8(), "[a b][a b]");
}

TEST(JobResult, NamesDurationsByTheirUnit) {
  const struct {
    double seconds;
    const char* want;
  } cases[] = {
      {0.0, "0us"},    {0.00085, "850us"},    {0.001, "1000us"}, {0.0010011, "1ms"},
      {0.012, "12ms"}, {1.0, "1000ms"},       {1.5, "1s"},       {60.0, "60s"},
      {90.0, "1min"},  {3600.0, "60min"},     {3661.0, "1hr"},   {360000.0, "100hr"},
      {-1.0, "0us"},   {std::nan(""), "0us"},
  };
  for (const auto& c : cases) EXPECT_EQ(FormatDuration(c.seconds).ToUTF8(), c.want) << c.seconds;
}

TEST(JobResult, CommandsWithoutANameShareOneKey) {
  Map<String, JobResult> results = test::ResultsOf(
      "<Job><Command ID=\"TestEchoCommand\"><Input Text=\"1\"/></Command>"
      "<Command ID=\"TestEchoCommand\"><Input Text=\"2\"/></Command></Job>");
  ASSERT_EQ(results.GetCount(), 1U);
  EXPECT_EQ(results.Find("").returns.Find("Text").ToUTF8(), "2");
  EXPECT_EQ(results.Find("").usage.ToUTF8(), "0");
}

TEST(JobResult, AnEmptyJobHasABareResult) {
  EXPECT_THAT(test::RunDocument("<Job/>"), testing::EndsWith("<JobResult/>"));
  EXPECT_THAT(test::RunDocument("not xml"), testing::EndsWith("<JobResult/>"));
}

/// A block of named memory that a watcher would make, filled with 0x55.
class Channel {
 public:
  explicit Channel(unsigned size)
      : name("vexg-test-" + std::to_string(std::random_device()()) + "-" + std::to_string(size)),
        block(platform::SharedMemoryBlock::Create(name, size)) {
    if (block != nullptr) std::fill_n(block->GetData(), size, static_cast<unsigned char>(0x55));
  }
  float ProgressAt(unsigned offset) const {
    float value = 0.0F;
    std::memcpy(&value, block->GetData() + offset, sizeof value);
    return value;
  }
  /// Bytes outside the two ranges that still hold what was there before.
  bool RestIsUntouched(unsigned progress, unsigned abort) const {
    for (unsigned i = 0; i < block->GetSize(); ++i) {
      const bool used = i == abort || (i >= progress && i < progress + 4);
      if (!used && block->GetData()[i] != 0x55) return false;
    }
    return true;
  }

  std::string name;
  std::unique_ptr<platform::SharedMemoryBlock> block;
};

TEST(JobChannel, CarriesProgressAndAbortAtItsPlaces) {
  const struct {
    unsigned size;
    const char* element;
    unsigned abort, progress;
  } cases[] = {
      {64, "<SHMIPC Name=\"@\" Size=\"64\" AbortOffset=\"3\" ProgressOffset=\"8\"/>", 3, 8},
      {100, "<ORVAIPC Name=\"@\" Size=\"100\"/>", 99, 0},
      {1034, "<TQFProcessIPC Name=\"@\"/>", 1033, 0},
  };
  for (const auto& c : cases) {
    SCOPED_TRACE(c.element);
    Channel channel(c.size);
    ASSERT_NE(channel.block, nullptr);
    std::string element = c.element;
    element.replace(element.find('@'), 1, channel.name);
    {
      Job job;
      JobParser(job).Parse(String("<Job>" + element + "</Job>"));
      ASSERT_FALSE(job.ipc.IsNull());
      EXPECT_EQ(channel.ProgressAt(c.progress), 0.0F);
      job.GetIPC().progress->Update(0.25);
      EXPECT_EQ(channel.ProgressAt(c.progress), 0.25F);
      job.GetIPC().progress->Update(1.5);
      EXPECT_EQ(channel.ProgressAt(c.progress), 1.0F);
      job.GetIPC().progress->Update(-0.5);
      EXPECT_EQ(channel.ProgressAt(c.progress), -0.5F);
      unsigned char& flag = channel.block->GetData()[c.abort];
      for (const unsigned char value : {0, 2, 255}) {
        flag = value;
        EXPECT_FALSE(job.GetIPC().abort->IsSet()) << int{value};
      }
      flag = 1;
      EXPECT_TRUE(job.GetIPC().abort->IsSet());
      job.GetIPC().abort->Set(false);
      EXPECT_EQ(flag, 0);
    }
    EXPECT_EQ(channel.ProgressAt(c.progress), 1.0F);  // told at the end of the job
    EXPECT_TRUE(channel.RestIsUntouched(c.progress, c.abort));
  }
}

TEST(JobChannel, OneThatCannotBeUsedLeavesTheJobItsOwn) {
  Channel channel(64);
  ASSERT_NE(channel.block, nullptr);
  const std::string name = "Name=\"" + channel.name + "\"";
  const std::string elements[] = {
      "<SHMIPC Name=\"no-such-block\" Size=\"64\" AbortOffset=\"0\" ProgressOffset=\"4\"/>",
      "<SHMIPC " + name + " Size=\"65\" AbortOffset=\"0\" ProgressOffset=\"4\"/>",
      "<SHMIPC " + name + " Size=\"64\" AbortOffset=\"64\" ProgressOffset=\"4\"/>",
      "<SHMIPC " + name + " Size=\"64\" AbortOffset=\"0\" ProgressOffset=\"61\"/>",
      "<SHMIPC " + name + " Size=\"64\" AbortOffset=\"0\" ProgressOffset=\"6\"/>",
      "<SHMIPC " + name + " Size=\"64\" AbortOffset=\"5\" ProgressOffset=\"4\"/>",
      "<SHMIPC " + name + "/>",
      "<ORVAIPC " + name + " Size=\"0\"/>",
      "<ORVAIPC " + name + " Size=\"4\"/>",
      "<ORVAIPC Name=\"../" + channel.name + "\" Size=\"64\"/>",
      "<TQFProcessIPC " + name + "/>",
      "<TQFProcessIPC/>",
  };
  for (const std::string& element : elements) {
    SCOPED_TRACE(element);
    {
      Job job;
      JobParser(job).Parse(String("<Job>" + element +
                                  "<Command Name=\"a\" ID=\"TestEchoCommand\">"
                                  "<Input Text=\"x\"/></Command></Job>"));
      EXPECT_TRUE(job.ipc.IsNull());
      RunJob(job);
      EXPECT_EQ(job.commands[0]->command->GetResult(), CommandResult::kSuccess);
    }
    EXPECT_TRUE(channel.RestIsUntouched(64, 64));
  }
}

}  // namespace
}  // namespace lumo
