// A library of commands: build it as a shared library against vexg, and load it with
// `vexg --load libvexg_example_commands.so`. Each command is one class with its declaration and its
// factory beside it; nothing else lists it.

#include <algorithm>
#include <chrono>
#include <thread>

#include "commands/command.h"

namespace {

using lumo::Array;
using lumo::Command;
using lumo::CommandDeclaration;
using lumo::CommandFactoryT;
using lumo::CommandResult;
using lumo::Presence;
using lumo::String;
using lumo::ValueKind;

const CommandDeclaration kSum{
    "ExampleSumCommand",
    "Examples",
    "Adds numbers.",
    {{"Values", Presence::kRequired, ValueKind::kNumberArray, "what to add"},
     {"Scale", Presence::kOptional, ValueKind::kNumber, "factor on the sum; 1 when absent"}},
    {{"Sum", ValueKind::kNumber, "the scaled sum"},
     {"Count", ValueKind::kInteger, "how many numbers there were"}}};

class ExampleSumCommand final : public Command {
  CommandResult Execute() override {
    if (!CheckInputs()) return Fail();
    const auto values = Read<Array<double>>("Values");
    if (!values.IsValid()) return Fail("Values is not a number array, like \"1:3 [1 2 3] \"");
    double sum = 0.0;
    for (const double value : values) sum += value;
    Write("Sum", HasInput("Scale") ? sum * Read<double>("Scale") : sum);
    Write("Count", values.GetCount());
    return Succeed();
  }
};

const CommandDeclaration kWait{
    "ExampleWaitCommand",
    "Examples",
    "Lets time pass, with progress, until it is over or the job is aborted.",
    {{"Seconds", Presence::kRequired, ValueKind::kNumber, "how long, 0 to 3600", "s"}},
    {{"Waited", ValueKind::kNumber, "how long it was", "s"}}};

class ExampleWaitCommand final : public Command {
  CommandResult Execute() override {
    if (!CheckInputs()) return Fail();
    const auto seconds = Read<double>("Seconds");
    if (!(seconds >= 0.0 && seconds <= 3600.0)) return Fail("Seconds is outside 0 to 3600");
    using Clock = std::chrono::steady_clock;
    const auto start = Clock::now();
    const auto elapsed = [&] {
      return std::chrono::duration<double>(Clock::now() - start).count();
    };
    while (elapsed() < seconds && !GetIPC().abort->IsSet()) {
      GetIPC().progress->Update(elapsed() / seconds);
      std::this_thread::sleep_for(std::chrono::milliseconds(10));
    }
    Write("Waited", std::min(elapsed(), seconds));
    return Succeed();
  }
};

const CommandFactoryT<ExampleSumCommand> sumFactory(kSum);
const CommandFactoryT<ExampleWaitCommand> waitFactory(kWait);

}  // namespace
