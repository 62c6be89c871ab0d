#include "commands/strict_checks.h"

#include <chrono>

#include "commands/variable_text.h"
#include "raster/raster_enums.h"
#include "support/test_commands.h"

namespace lumo {
namespace {

std::string MisfitOf(ValueKind kind, const char* text) {
  const CommandDeclaration declaration{"TestCommand",
                                       "Tests",
                                       "",
                                       {{"In", Presence::kOptional, kind, "", "",
                                         kind == ValueKind::kWord ? &WordsIn<StatsMode> : nullptr}},
                                       {}};
  ParameterMap inputs;
  inputs["In"].object = MakeText(text);
  return FindMisfit(declaration, inputs, {}).ToUTF8();
}

TEST(StrictChecks, TakeWhatTheReadersReadAndNothingElse) {
  const struct {
    ValueKind kind;
    std::vector<const char*> good, bad;
  } cases[] = {
      {ValueKind::kInteger,
       {"0", "+7", " 42 ", "4294967295"},
       {"", "ten", "1.5", "-1", "4294967296", "1 2", "0x10", "7a"}},
      {ValueKind::kNumber,
       {"0", "-1.5", "1e3", "nan", "-inf", " 2 "},
       {"", "one", "1,5", "1.5m", "1e999", "1 2", "--1", "+-1"}},
      {ValueKind::kBoolean, {"0", "1"}, {"", "true", "2", "yes"}},
      {ValueKind::kWord, {"DoBasic", "DoExtended"}, {"", "dobasic", "Basic"}},
      {ValueKind::kURI, {"[a.tif] ", "[]", "[a b]"}, {"", "a.tif", "[a", "[a]b"}},
      {ValueKind::kRectangle,
       {"0 0 9 9", " 1  2\t3 4 "},
       {"0,0,9,9", "0 0 9", "0 0 9 9 9", "a b c d"}},
      {ValueKind::kIntegerArray,
       {"1:3 [1 2 3] ", "2:2 1 [4 5]", "1:0 []"},
       {"", "1 2 3", "1:2 [1 2 3]", "2:2 [1 2]", "1:1 [x]", "1:1 [1"}},
      {ValueKind::kNumberArray, {"1:2 [0.5 -1e3] "}, {"0.5", "1:2 [0.5]", "1:1 [a]"}},
      {ValueKind::kBooleanArray, {"1:2 [0 1] "}, {"1:1 [2]"}},
      {ValueKind::kURIArray,
       {"1:2 [[a] [b c] ] ", "1:1 [[a]]"},
       {"1:2 [[a] ]", "[a] [b]", "1:1 [a]"}},
      {ValueKind::kTiles, {"256 256 0 0 0 0 0 Variable"}, {"256 256", "256 256 0 0 0 0 0 Never"}},
      {ValueKind::kPalette,
       {"0 [] ", "1 [(red 255 0 0 255 0) ] ", "2 [(a 1 2 3 4 0)(b 0 0 0 0 1)]"},
       {"", "1 []", "1 [(red x 0 0 255 0) ] ", "1 [(red 256 0 0 255 0) ] ", "1 [(red 1 2 3) ] ",
        "1 [((( ] ", "2 [(red 255 0 0 255 0) ] ", "1 [(dark red 255 0 0 255 0) ] "}},
      {ValueKind::kText, {"", "anything"}, {}},
  };
  for (const auto& c : cases) {
    for (const char* text : c.good) EXPECT_EQ(MisfitOf(c.kind, text), "") << text;
    for (const char* text : c.bad) EXPECT_NE(MisfitOf(c.kind, text), "") << text;
  }
  EXPECT_THAT(MisfitOf(ValueKind::kWord, "DoBasik"),
              testing::HasSubstr("is none of DoBasic, DoExtended; did you mean DoBasic?"));
  EXPECT_EQ(MisfitOf(ValueKind::kInteger, "a\nb").find('\n'), std::string::npos);
}

std::string ReasonOf(const std::string& document, const char* name) {
  return test::ResultsOf(document).Find(name).reason.ToUTF8();
}

TEST(StrictChecks, NameTheMistakeAndRunNothing) {
  const auto job = [](const std::string& head, const std::string& inner) {
    return "<Job " + head + "><Reasons/><Command Name=\"a\" ID=\"TestEchoCommand\">" + inner +
           "</Command></Job>";
  };
  const std::string strict = "Checks=\"Strict\"";
  const struct {
    const char *inner, *strict, *told;
  } cases[] = {
      {"<Input Text=\"x\" Times=\"two\"/>", "input Times: \"two\" is no integer", ""},
      {"<Input Text=\"x\" Tims=\"2\"/>", "there is no input Tims; did you mean Times?", ""},
      {"<Input Text=\"x\"/><Output Text=\"v\"/>", "output Text: \"v\" is no variable", ""},
      {"<Input Text=\"x\" Expand=\"1\"/>", "means nothing; did you mean expand?", ""},
      {"<DependsOn name=\"b\"/><Input Text=\"x\"/>",
       "the attribute name of DependsOn means nothing; did you mean Name?", ""},
      {"<Input Text=\"x\"/><Output Txt=\"$v\"/>", "there is no output Txt; did you mean Text?", ""},
      {"<Input Text=\"x\"/><DependsOn Name=\"b\"/>", "no command before this one is called \"b\"",
       ""},
      {"<Inptu Text=\"x\"/>", "the element Inptu means nothing; did you mean Input?",
       "input Text is missing"},
      {"<Input Text=\"$v\"/>", "nothing has written $v", "nothing has written $v"},
      {"<Input Text=\"x\" Times=\"2\"/>", "", ""},
  };
  for (const auto& c : cases) {
    EXPECT_THAT(ReasonOf(job(strict, c.inner), "a"), testing::HasSubstr(c.strict)) << c.inner;
    EXPECT_EQ(ReasonOf(job(strict, c.inner), "a").empty(), *c.strict == 0) << c.inner;
    EXPECT_THAT(ReasonOf(job("", c.inner), "a"), testing::HasSubstr(c.told)) << c.inner;
    EXPECT_EQ(ReasonOf(job("", c.inner), "a").empty(), *c.told == 0) << c.inner;
  }
}

TEST(JobReasons, FollowAChainToItsFirstFailure) {
  const Map<String, JobResult> results = test::ResultsOf(R"(<Job><Reasons/>
    <Command Name="open" ID="TestEchoCommand"><Output Text="$scene"/></Command>
    <Command Name="view" ID="TestEchoCommand"><DependsOn Name="open"/><Input Text="$scene"/>
      <Output Text="$view"/></Command>
    <Command Name="stats" ID="TestEchoCommand"><DependsOn Name="view"/><Input Text="$view"/></Command>
    <Command Name="typo" ID="TestEchoCommand"><DependsOn Name="view"/><Input Text="$scenne"/></Command>
    <Command Name="other" ID="TestEchoComand"/>
    </Job>)");
  EXPECT_EQ(results.Find("open").reason.ToUTF8(), "input Text is missing");
  EXPECT_EQ(results.Find("view").reason.ToUTF8(), "skipped, as \"open\" failed");
  EXPECT_EQ(results.Find("stats").reason.ToUTF8(), "skipped, as \"open\" failed");
  EXPECT_EQ(results.Find("typo").reason.ToUTF8(),
            "nothing has written $scenne; did you mean $scene?");
  EXPECT_EQ(results.Find("other").result.ToUTF8(), "None");
  EXPECT_EQ(results.Find("other").reason.ToUTF8(),
            "the ID \"TestEchoComand\" is unknown; did you mean TestEchoCommand?");
}

TEST(JobReasons, SayWhatIsWrongWithTheDocument) {
  const struct {
    const char *document, *fault;
  } cases[] = {
      {"<Job><Reasons/><Command", "not well formed"},
      {"<!DOCTYPE Job><Job><Reasons/></Job>", "a DOCTYPE is not allowed"},
      {"<Job><Reasons/><SHMIPC Name=\"no-such-block\" Size=\"8\"/></Job>", "the channel"},
      {"<Job><Reasons/><Comand ID=\"TestEchoCommand\"/></Job>", "did you mean Command?"},
      {"<Job Checks=\"Strct\"><Reasons/></Job>", "did you mean Strict?"},
  };
  for (const auto& c : cases) {
    const std::string answer = test::RunDocument(c.document);
    EXPECT_THAT(answer, testing::HasSubstr("<Fault Reason=")) << c.document;
    EXPECT_THAT(answer, testing::HasSubstr(c.fault)) << c.document;
  }
  // Without Reasons the answer is what it has always been; other elements are nobody's mistake.
  for (const char* document : {"<Job><Comand/></Job>", "<Job><Reasons/><Group/></Job>"}) {
    EXPECT_EQ(test::RunDocument(document).find("Fault"), std::string::npos) << document;
  }
}

TEST(VariableText, PutsValuesInTheirPlaces) {
  const auto read = [](const String& variable, String& text) {
    if (variable == "$red") text = "[red.tif] ";
    if (variable == "$nir") text = "[a b.tif] ";
    if (variable == "$n") text = "3";
    if (variable == "$odd name") text = "odd";
    return text.GetLength() != 0;
  };
  const struct {
    const char* text;
    ValueKind kind;
    const char* want;  // null: can't be
  } cases[] = {
      {"$red $nir", ValueKind::kURIArray, "1:2 [[red.tif] [a b.tif] ] "},
      {"1:2 [$red $nir] ", ValueKind::kURIArray, "1:2 [[red.tif]  [a b.tif] ] "},
      {"$n 4 $n", ValueKind::kIntegerArray, "1:3 [3 4 3 ] "},
      {"0 0 $n $n", ValueKind::kRectangle, "0 0 3 3"},
      {"a|${odd name}|$$n", ValueKind::kTextList, "a|odd|$n"},
      {"100$", ValueKind::kText, "100$"},
      {"$missing", ValueKind::kText, nullptr},
  };
  for (const auto& c : cases) {
    String expanded;
    EXPECT_EQ(ExpandVariables(c.text, c.kind, read, expanded), c.want != nullptr) << c.text;
    EXPECT_EQ(expanded.ToUTF8(), c.want != nullptr ? c.want : "") << c.text;
  }
}

TEST(VariableText, ExpandsInAJob) {
  const Map<String, JobResult> results = test::ResultsOf(R"(<Job Checks="Strict"><Reasons/>
    <Command Name="a" ID="TestEchoCommand"><Input Text="x"/><Output Text="$v"/></Command>
    <Command Name="b" ID="TestEchoCommand"><DependsOn Name="a"/>
      <Input expand="1" Text="$v-$v"/></Command>
    <Command Name="c" ID="TestEchoCommand"><DependsOn Name="a"/>
      <Input expand="1" Text="$v $w"/></Command>
    </Job>)");
  EXPECT_EQ(results.Find("b").returns.Find("Text").ToUTF8(), "x-x");
  EXPECT_THAT(results.Find("c").reason.ToUTF8(), testing::HasSubstr("nothing has written $w"));
}

TEST(RunJob, IsLinearInTheJob) {
  constexpr int kCommands = 20000;
  const auto command = [](int i, const std::string& more) {
    return "<Command Name=\"c" + std::to_string(i) + "\" ID=\"TestEchoCommand\">" + more +
           "<Input Text=\"x\"/></Command>";
  };
  const struct {
    const char* name;
    std::function<std::string(int)> depends;
  } shapes[] = {
      {"all", [](int) { return std::string("<DependsOn Name=\"@ALL\"/>"); }},
      {"chain", [](int i) { return "<DependsOn Name=\"c" + std::to_string(i - 1) + "\"/>"; }},
      {"tree", [](int i) { return "<DependsOn Name=\"c" + std::to_string(i / 2) + "\"/>"; }},
  };
  for (const auto& shape : shapes) {
    SCOPED_TRACE(shape.name);
    std::string document = "<Job>";
    for (int i = 0; i < kCommands; ++i) document += command(i, i == 0 ? "" : shape.depends(i));
    Job job;
    JobParser(job).Parse(String(document + "</Job>"));
    const auto start = std::chrono::steady_clock::now();
    RunJob(job);
    const std::chrono::duration<double> took = std::chrono::steady_clock::now() - start;
    for (const CommandDescriptorPtr& descriptor : job.commands) {
      ASSERT_EQ(descriptor->command->GetResult(), CommandResult::kSuccess);
    }
    EXPECT_EQ(job.GetIPC().progress->GetProgress(), 1.0);
    RecordProperty(shape.name, std::to_string(took.count()));
    // A second on an idle machine; what is quadratic takes minutes.
    EXPECT_LT(took.count(), 10.0);
  }
}

}  // namespace
}  // namespace lumo
