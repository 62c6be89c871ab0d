#pragma once

#include <atomic>
#include <initializer_list>

#include "commands/declaration.h"
#include "commands/value_text.h"
#include "foundation/containers.h"
#include "foundation/run_controls.h"

namespace lumo {

/// A named value of a command: any object, or none. Inputs that come from a job document are
/// Scalar<String>s.
struct Parameter {
  ObjectPtr object;
};

/// Named values; an absent name reads as an empty ObjectPtr.
using ParameterMap = Map<String, Parameter>;

/// The ways in which a run of a command ends.
enum class CommandResult : unsigned { kNone = 0, kSuccess = 1, kFailed = 2, kAborted = 3 };

/// "None", "Success", "Failed", "Aborted"; "Unknown" for any other value.
VEXG_EXPORT const char* GetResultWord(CommandResult result);

/// The steps of a command, from its making to the end; it only goes forward.
enum class CommandState : unsigned {
  kCreated = 0,   ///< made
  kStarted = 1,   ///< handed out to be run
  kRunning = 2,   ///< in Execute
  kFinished = 3,  ///< done, failed or aborted
  kRetired = 4,   ///< its outputs are in place
};

/// One named operation of a job. It takes named inputs, does its work once and leaves named outputs
/// and a small map of return values for the result document.
///
/// A concrete command declares its inputs and outputs, overrides Execute, and registers a
/// CommandFactoryT of itself. Execute checks the inputs, reads the values, finds its objects, does
/// the work, stores the outputs and gives Succeed() or Fail():
///
///     class DoubleCommand final : public Command {
///       CommandResult Execute() override {
///         if (!CheckInputs()) return Fail();
///         Write("Doubled", 2 * Read<double>("Value"));
///         return Succeed();
///       }
///     };
///
///     const CommandDeclaration declaration{
///         "DoubleCommand", "Examples", "Doubles a number.",
///         {{"Value", Presence::kRequired, ValueKind::kNumber, "the number"}},
///         {{"Doubled", ValueKind::kNumber, "twice the number"}}};
///     const CommandFactoryT<DoubleCommand> factory(declaration);
///
/// Threads: used by one thread at a time; only the state may be asked for on any thread.
/// Failure: CommandErrorFail in the error state, kFailed as the result, and a line that says why.
///          An exception out of Execute ends there and fails the command.
class VEXG_EXPORT Command : public ErrorState {
 public:
  /// Wall and processor seconds at one moment.
  struct Times {
    double wall = 0.0;  ///< since the library was loaded
    double cpu = 0.0;   ///< used by the process
  };

  /// False once the command has failed.
  bool IsValid() const { return !HasError(); }

  /// Runs the command, which must be in state kStarted; in any other state, or with an error
  /// stored, it fails. Aborts without running Execute when the abort flag is set. Reports progress
  /// 0, and 1 at the end.
  /// @param inputs  borrowed for the length of the run.
  /// @return the outputs, which the command keeps.
  ParameterMap& Run(const ParameterMap& inputs, const IPC& ipc);

  /// Where the command stands; any thread may ask.
  CommandState GetState() const { return state_; }
  void SetState(CommandState state) { state_ = state; }
  /// How the run ended; kNone before its end.
  CommandResult GetResult() const { return result_; }
  /// The moment at which Run began.
  Times GetStartTimes() const { return startTimes_; }
  /// The moment at which Run ended; zeros before.
  Times GetEndTimes() const { return endTimes_; }

  /// Why the command failed, in one line; empty when it did not, or did not say.
  const String& GetReason() const { return reason_; }

  /// The values for the result document, as BuildReturn leaves them.
  void GetReturns(Map<String, String>& returns);

  /// Ends a command that could not be run at all as failed.
  void FailUnstarted(const String& reason);

  /// The command's declaration; null for one that was not made by a factory.
  const CommandDeclaration* GetDeclaration() const { return declaration_; }

 protected:
  /// Does the work, and returns the result of Succeed() or Fail().
  virtual CommandResult Execute();

  /// Fills the returns, which the result document holds. The base takes every output that is
  /// declared as returned and was stored, in its whole-text form.
  virtual void BuildReturn();

  /// True when the job gives the input, whatever it holds.
  bool HasInput(const char* name) const { return inputs_ != nullptr && inputs_->HasKey(name); }
  /// The input, or an empty ObjectPtr.
  ObjectPtr GetInput(const char* name) const;
  /// The output, made empty when it isn't there yet.
  ObjectPtr& Result(const char* name) { return results_[name].object; }
  /// The return value, made empty when it isn't there yet.
  String& Return(const char* name) { return returns_[name]; }

  /// True when the input is there and is a Scalar.
  bool CheckRequired(const char* name);
  /// True when the input is absent, or is a Scalar.
  bool CheckOptional(const char* name);
  /// Checks the declared inputs in their order; false at the first that does not fit.
  bool CheckInputs();

  /// The value of an input; T() when it is absent or not a text. See ParseValue.
  template <typename T>
  T Read(const char* name) const {
    return ReadValue<T>(GetInput(name));
  }

  /// Stores an output as text. See FormatValue.
  template <typename T>
  void Write(const char* name, const T& value) {
    Result(name) = MakeText(FormatValue(value));
  }

  /// Adds an object to the catalog, see catalog::Add.
  static void CatalogAdd(const ObjectPtr& object);
  /// The object of the catalog, or empty.
  static ObjectPtr CatalogFind(const URI& uri);

  /// Ends the work: state kFinished, result kSuccess.
  CommandResult Succeed();
  /// Gives up: stores CommandErrorFail, state kFinished, result kFailed. The first reason stays; a
  /// call without one takes the fault text of the thread.
  CommandResult Fail(const String& reason = {});

  /// The abort flag and progress report of the run in progress.
  const IPC& GetIPC() const { return ipc_; }

 private:
  friend class CommandFactory;

  CommandResult ExecuteGuarded();

  std::atomic<CommandState> state_{CommandState::kCreated};
  CommandResult result_ = CommandResult::kNone;
  const ParameterMap* inputs_ = nullptr;
  ParameterMap results_;
  Map<String, String> returns_;
  Times startTimes_;
  Times endTimes_;
  IPC ipc_;
  String reason_;
  const CommandDeclaration* declaration_ = nullptr;
};

using CommandPtr = Pointer<Command>;

class CommandFactory;

/// The factories of all commands by class name. Written at load, or while a library of commands is
/// being loaded and no job runs, and read without a lock after that.
VEXG_EXPORT Map<String, CommandFactory*>& GetCommandRegistry();

/// Makes a command by the name of its class; empty when the registry doesn't know the name.
VEXG_EXPORT CommandPtr CreateCommand(const String& name);

/// Makes the commands of one class. It stands in the registry as long as it lives.
class VEXG_EXPORT CommandFactory {
 public:
  /// @param declaration  outlives the factory; its name is the key.
  explicit CommandFactory(const CommandDeclaration& declaration);
  virtual ~CommandFactory();
  CommandFactory(const CommandFactory&) = delete;
  CommandFactory& operator=(const CommandFactory&) = delete;

  /// Makes a command; an allocation that fails comes out as std::bad_alloc.
  virtual CommandPtr Create() const = 0;

  /// The declaration of the commands that it makes.
  const CommandDeclaration& GetDeclaration() const { return declaration_; }

 protected:
  /// Takes over a new command and gives it the declaration.
  CommandPtr Adopt(Command* command) const;

 private:
  Map<String, CommandFactory*>& registry_;
  String name_;
  const CommandDeclaration& declaration_;
};

/// The factory of the commands of class T: one static object beside the class.
template <typename T>
class CommandFactoryT final : public CommandFactory {
 public:
  using CommandFactory::CommandFactory;
  CommandPtr Create() const override { return Adopt(new T); }
};

}  // namespace lumo
