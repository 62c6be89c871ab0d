#include "commands/command.h"

#include "commands/arg_list.h"
#include "commands/command_errors.h"
#include "support/test_commands.h"

namespace lumo {
namespace {

const test::RegisterTestCommands gRegistered;

ParameterMap Inputs(std::initializer_list<std::pair<const char*, ObjectPtr>> values) {
  ParameterMap inputs;
  for (const auto& [name, value] : values) inputs[name].object = value;
  return inputs;
}

/// Runs a command that was handed out, as the job engine does.
ParameterMap& RunStarted(const CommandPtr& command, const ParameterMap& inputs,
                         const IPC& ipc = {}) {
  command->SetState(CommandState::kStarted);
  return command->Run(inputs, ipc);
}

TEST(Command, RunsOnceAndGivesItsOutputs) {
  const CommandPtr command = CreateCommand("TestEchoCommand");
  ASSERT_FALSE(command.IsNull());
  EXPECT_EQ(command->GetState(), CommandState::kCreated);
  const IPC ipc;
  ParameterMap& results = RunStarted(command, Inputs({{"Text", MakeText("a b")}}), ipc);
  EXPECT_EQ(command->GetResult(), CommandResult::kSuccess);
  EXPECT_EQ(command->GetState(), CommandState::kFinished);
  EXPECT_EQ(ReadValue<String>(results.Find("Text").object).ToUTF8(), "a b");
  EXPECT_EQ(ipc.progress->GetProgress(), 1.0);
  EXPECT_LE(command->GetStartTimes().wall, command->GetEndTimes().wall);
  EXPECT_LE(command->GetStartTimes().cpu, command->GetEndTimes().cpu);

  Map<String, String> returns;
  command->GetReturns(returns);
  EXPECT_EQ(returns.GetCount(), 1U);  // what isn't declared as returned stays out
  EXPECT_EQ(returns.Find("Text").ToUTF8(), "a b");

  command->Run(Inputs({{"Text", MakeText("again")}}), ipc);
  EXPECT_EQ(command->GetResult(), CommandResult::kFailed);
  EXPECT_EQ(command->GetErrorState().code, CommandErrorFail::Code);
}

TEST(Command, ChecksItsInputsInTheOrderOfTheirDeclaration) {
  const ObjectPtr number(new Scalar<double>(2.5));
  const ObjectPtr noScalar(new Object);
  const struct {
    const char* what;
    ParameterMap inputs;
    CommandResult want;
    const char* reason;
  } cases[] = {
      {"nothing", Inputs({}), CommandResult::kFailed, "input Text is missing"},
      {"an empty pointer", Inputs({{"Text", ObjectPtr()}}), CommandResult::kFailed,
       "input Text holds no value"},
      {"no scalar", Inputs({{"Text", noScalar}}), CommandResult::kFailed,
       "input Text holds no value"},
      {"optional that is no scalar", Inputs({{"Text", MakeText("x")}, {"Times", noScalar}}),
       CommandResult::kFailed, "input Times holds no value"},
      {"a scalar of another type passes", Inputs({{"Text", number}}), CommandResult::kSuccess, ""},
      {"optional left out", Inputs({{"Text", MakeText("x")}}), CommandResult::kSuccess, ""},
  };
  for (const auto& c : cases) {
    SCOPED_TRACE(c.what);
    const CommandPtr command = CreateCommand("TestEchoCommand");
    RunStarted(command, c.inputs);
    EXPECT_EQ(command->GetResult(), c.want);
    EXPECT_EQ(command->GetReason().ToUTF8(), c.reason);
  }
}

TEST(Command, AnAbortBeforeTheRunSkipsTheWork) {
  const CommandPtr command = CreateCommand("TestEchoCommand");
  const IPC ipc;
  ipc.abort->Set(true);
  const ParameterMap& results = RunStarted(command, Inputs({{"Text", MakeText("x")}}), ipc);
  EXPECT_EQ(command->GetResult(), CommandResult::kAborted);
  EXPECT_EQ(command->GetState(), CommandState::kFinished);
  EXPECT_EQ(results.GetCount(), 0U);
  EXPECT_EQ(ipc.progress->GetProgress(), 1.0);
  EXPECT_GT(command->GetEndTimes().wall, 0.0);
}

TEST(Command, AnExceptionEndsInsideIt) {
  const CommandPtr command = CreateCommand("TestThrowCommand");
  RunStarted(command, {});
  EXPECT_EQ(command->GetResult(), CommandResult::kFailed);
  EXPECT_EQ(command->GetReason().ToUTF8(), "thrown on purpose");
}

TEST(Command, AFactoryStandsInTheRegistryAsLongAsItLives) {
  const CommandDeclaration passing{"TestPassingCommand", "Tests", "Comes and goes.", {}, {}};
  EXPECT_TRUE(CreateCommand("TestPassingCommand").IsNull());
  {
    const CommandFactoryT<Command> factory(passing);
    const CommandPtr command = CreateCommand("TestPassingCommand");
    ASSERT_FALSE(command.IsNull());
    RunStarted(command, {});
    EXPECT_EQ(command->GetResult(), CommandResult::kSuccess);  // the base does nothing, well
  }
  EXPECT_TRUE(CreateCommand("TestPassingCommand").IsNull());
}

enum class Shade { kNone, kLight, kDark };
std::span<const EnumWord<Shade>> WordsOf(Shade) {
  static constexpr EnumWord<Shade> kWords[] = {{"Light", Shade::kLight}, {"Dark", Shade::kDark}};
  return kWords;
}

template <typename T>
T Parse(const char* text) {
  return ParseValue<T>(String(text));
}

TEST(ValueText, ReadsEachKindAndGivesZeroForWhatItIsNot) {
  EXPECT_EQ(Parse<bool>("1"), true);
  EXPECT_EQ(Parse<bool>("2"), false);
  EXPECT_EQ(Parse<int>(" -12 rest"), -12);
  EXPECT_EQ(Parse<unsigned char>("200"), 200);  // a number, not a character
  EXPECT_EQ(Parse<unsigned>("-"), 0U);
  EXPECT_EQ(Parse<double>("1.5e3"), 1500.0);
  EXPECT_EQ(Parse<double>("none"), 0.0);
  EXPECT_EQ(Parse<Shade>("Dark"), Shade::kDark);
  EXPECT_EQ(Parse<Shade>("dark"), Shade::kNone);
  EXPECT_EQ(Parse<URI>("[D:\\data\\scene one.dat] ").ToUTF8(), "D:\\data\\scene one.dat");
  EXPECT_EQ(Parse<URI>("no bracket").GetLength(), 0U);
  EXPECT_EQ(ReadValue<int>(ObjectPtr(new Scalar<double>(3.0))), 0);
}

TEST(ValueText, SplitsTextListsAtBars) {
  const struct {
    const char* text;
    std::vector<std::string> want;
  } cases[] = {
      {"a|b|c", {"a", "b", "c"}},  {"a||b", {"a", "b"}}, {"|||", {}},          {"", {}},
      {" a | b ", {" a ", " b "}}, {"|a|", {"a"}},       {"alone", {"alone"}},
  };
  for (const auto& c : cases) {
    SCOPED_TRACE(c.text);
    std::vector<std::string> got;
    for (const String& piece : Parse<Array<String>>(c.text)) got.push_back(piece.ToUTF8());
    EXPECT_EQ(got, c.want);
  }
}

template <typename T>
void ExpectReadsBack(const T& value, const char* text) {
  EXPECT_EQ(FormatValue(value).ToUTF8(), text);
  EXPECT_EQ(FormatValue(ParseValue<T>(FormatValue(value))).ToUTF8(), text);
}

TEST(ValueText, WhatIsWrittenReadsBack) {
  ExpectReadsBack(URI("a b"), "[a b] ");
  ExpectReadsBack(true, "1");
  ExpectReadsBack(-7, "-7");
  ExpectReadsBack(0.1, "0.1");
  ExpectReadsBack(100000.0, "100000");
  ExpectReadsBack(1.0 / 3.0, "0.3333333333333333");
  ExpectReadsBack(Shade::kLight, "Light");
  Array<double> numbers{ArrayDims(2)};
  numbers[0] = 0.25;
  numbers[1] = -3.0;
  ExpectReadsBack(numbers, "1:2 [0.25 -3] ");
}

TEST(ArgList, GrowsToTheIndexAndRefusesNothing) {
  ArgList list;
  EXPECT_TRUE(list.Set(5, MakeText("last")));
  EXPECT_EQ(list.GetCount(), 6U);
  for (unsigned i = 0; i < 5; ++i) EXPECT_TRUE(list.Get(i).IsNull());
  EXPECT_EQ(ReadValue<String>(list.Get(5)).ToUTF8(), "last");
  EXPECT_FALSE(list.Set(9, ObjectPtr()));
  EXPECT_EQ(list.GetCount(), 6U);
  EXPECT_TRUE(list.IsValid());
  EXPECT_TRUE(list.Get(99).IsNull());
  EXPECT_EQ(ArgList(3).GetCount(), 3U);
}

TEST(ArgList, KeepsWhatItHoldsWhenItCannotGrow) {
  ArgList list;
  ASSERT_TRUE(list.Set(0, MakeText("kept")));
  EXPECT_FALSE(list.Set(0xFFFFFFFF, MakeText("too far")));
  EXPECT_EQ(list.GetErrorState().code, ArgListError::Code);
  EXPECT_EQ(ReadValue<String>(list.Get(0)).ToUTF8(), "kept");
}

}  // namespace
}  // namespace lumo
