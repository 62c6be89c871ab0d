#pragma once

#include <cstdint>
#include <deque>
#include <functional>
#include <optional>
#include <string>
#include <vector>

namespace lumo::host {

/// The kind of an option's value.
enum class OptionType : unsigned char {
  kFlag,    ///< there or not; no value
  kText,    ///< any text
  kWord,    ///< one of the choices
  kWhole,   ///< a whole number, 0 or above
  kNumber,  ///< a number
  kFile,    ///< a file or folder
};

/// The words of a type in `vexg help --json`.
const char* NameOf(OptionType type);

/// How the text of a value is read.
struct ValueRule {
  /// Brings a text into the form that the verb expects. Gives a description of the fault; empty for
  /// a text that is fine.
  std::function<std::string(std::string& text)> read;
  std::vector<std::string> choices;  ///< the words that are taken; empty where others are
  std::string unit;                  ///< of a number; empty for none
};

/// One option of a verb, or one argument by its place, as data. The parser, the help, the
/// completion, the manual pages and `vexg help --json` are all made from it.
struct OptionSpec {
  std::vector<std::string>
      names;  ///< "--output", "-o"; an argument by place has one without dashes
  OptionType type = OptionType::kText;
  std::string shown;                 ///< stands for the value in the help: FILE
  std::string unit;                  ///< of a number; empty for none
  std::string defaultText;           ///< empty where there is none to show
  std::vector<std::string> choices;  ///< of a word
  std::string help;
  std::string example;  ///< a value that a user may type; empty for none
  bool isRequired = false;
  bool isRepeatable = false;           ///< may come again; as an argument, takes all that follow
  bool isList = false;                 ///< the value is a list with commas
  std::optional<std::uint64_t> least;  ///< of a whole number
  std::optional<std::uint64_t> most;

  /// Takes the values of a command line, or sets a flag that got none. Gives a description of the
  /// fault; empty when they are fine.
  std::function<std::string(const std::vector<std::string>& values)> take;

  bool IsByPlace() const { return names.front().front() != '-'; }
  /// The name that stands in messages: the long one.
  const std::string& Name() const { return names.front(); }
};

/// Adds to what is said of an option; every function gives the same object.
class Option {
 public:
  /// @param defaultText  the value of the variable as it is now.
  Option(OptionSpec& spec, std::string defaultText)
      : spec_(spec), default_(std::move(defaultText)) {}

  Option Required();
  /// @param shown  stands for the value in the help, as FILE. With a comma in it the value is a
  ///               list, whose elements may also be typed with blanks between them.
  Option Shows(const char* shown);
  /// Shows FILE, and lets a shell complete names of files.
  Option IsFile(const char* shown = "FILE");
  /// Refuses whole numbers outside of both bounds, which count.
  Option Within(std::uint64_t least, std::uint64_t most);
  /// Gives a value that a user may type.
  Option Example(const char* value);
  /// Reads each value by a rule first.
  Option Takes(ValueRule rule);
  /// Shows the value that the variable has now.
  Option ShowsDefault();

 private:
  OptionSpec& spec_;
  std::string default_;
};

/// The options of one verb, and what its help says beside them.
class OptionSet {
 public:
  /// Adds an option whose value goes to a variable, which outlives the set. Exists for bool (a
  /// flag), std::string, unsigned, std::uint64_t, double, optionals of numbers,
  /// std::vector<std::string> and std::vector<double>. An option of a vector may come again; an
  /// argument of one takes all that follow.
  /// @param names  "--output", or "--output,-o", or "file" for an argument by its place.
  template <typename T>
  Option Add(const char* names, T& to, const std::string& help);

  /// Says more of the verb, behind its options in the help.
  void AddNote(const std::string& note) { notes_.push_back(note); }
  /// Adds a command line that a user may type.
  void AddExample(const std::string& line) { examples_.push_back(line); }
  /// Lets a command line have one of these options at most. They are flags.
  void AllowOneOf(std::vector<std::string> names) { exclusive_.push_back(std::move(names)); }

  const std::deque<OptionSpec>& Options() const { return options_; }
  const std::vector<std::string>& Notes() const { return notes_; }
  const std::vector<std::string>& Examples() const { return examples_; }
  const std::vector<std::vector<std::string>>& Exclusive() const { return exclusive_; }

  /// The option of a name, "--output" or "-o"; null for none.
  const OptionSpec* Find(const std::string& name) const;

 private:
  std::deque<OptionSpec> options_;
  std::vector<std::string> notes_;
  std::vector<std::string> examples_;
  std::vector<std::vector<std::string>> exclusive_;
};

}  // namespace lumo::host
