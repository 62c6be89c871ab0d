#include <algorithm>
#include <filesystem>
#include <fstream>
#include <iostream>
#include <memory>
#include <sstream>

#include <nlohmann/json.hpp>

#include "foundation/near_name.h"
#include "foundation/thrown.h"
#include "options/command_line.h"
#include "output/capture.h"
#include "platform/interrupt.h"
#include "platform/memory_shortage.h"
#include "verb.h"

namespace lumo::host {
namespace {

namespace fs = std::filesystem;

struct BatchOptions {
  std::string verb;
  std::string list;
  std::vector<std::string> words;
};

/// Names out of a list: one a line, or each ended by a null, as `find -print0` has them.
std::vector<std::string> SplitNames(const std::string& text) {
  const char end = text.find('\0') != text.npos ? '\0' : '\n';
  std::vector<std::string> names;
  std::istringstream in(text);
  for (std::string name; std::getline(in, name, end);) {
    if (end == '\n' && name.ends_with('\r')) name.pop_back();
    if (!name.empty()) names.push_back(name);
  }
  return names;
}

std::vector<std::string> ReadNames(const std::string& list) {
  std::ostringstream text;
  if (list == "-") {
    text << std::cin.rdbuf();
    return SplitNames(text.str());
  }
  std::error_code fault;
  std::ifstream in(list, std::ios::binary);
  if (!in || fs::is_directory(list, fault)) {
    throw HostError(kExitUsage, list + ": the list of files can't be read");
  }
  if (in.peek() != std::ifstream::traits_type::eof()) text << in.rdbuf();
  if (in.bad()) throw HostError(kExitFailed, list + ": the list of files can't be read");
  return SplitNames(text.str());
}

/// The text with each `mark` replaced.
void Replace(std::string& text, const std::string& mark, const std::string& by) {
  for (std::size_t at = 0; (at = text.find(mark, at)) != text.npos; at += by.size()) {
    text.replace(at, mark.size(), by);
  }
}

/// The arguments of the verb for one file.
std::vector<std::string> ArgumentsFor(const std::string& file,
                                      const std::vector<std::string>& words) {
  const std::string path = file.starts_with('-') ? "./" + file : file;
  std::vector<std::string> arguments = words;
  const bool isPlaced = std::any_of(words.begin(), words.end(), [](const std::string& word) {
    return word.find("{}") != word.npos;
  });
  if (!isPlaced) arguments.insert(arguments.begin(), "{}");
  for (std::string& argument : arguments) {
    Replace(argument, "{stem}", fs::path(file).stem().string());
    Replace(argument, "{name}", fs::path(file).filename().string());
    Replace(argument, "{}", path);
  }
  return arguments;
}

/// JSON on one line; any other text as it is.
std::string OnOneLine(const std::string& text) {
  if (!text.starts_with('{') && !text.starts_with('[')) return text;
  const auto json = nlohmann::ordered_json::parse(text, nullptr, false);
  return json.is_discarded() ? text : json.dump() + "\n";
}

bool TakesAFile(const Verb& verb) {
  return std::any_of(verb.options.Options().begin(), verb.options.Options().end(),
                     [](const OptionSpec& option) {
                       return option.IsByPlace() && option.type == OptionType::kFile;
                     });
}

class Batch {
 public:
  explicit Batch(const BatchOptions& options) : options_(options) {}

  int Run() {
    const Verb* const verb = FindVerb(options_.verb);
    if (verb == nullptr) {
      std::vector<std::string> names;
      for (const Verb& known : GetVerbs()) names.push_back(known.name);
      throw HostError(kExitUsage,
                      "there is no verb " + options_.verb + DidYouMean(options_.verb, names));
    }
    if (!TakesAFile(*verb) || verb->name == "batch") {
      throw HostError(kExitUsage, "batch: " + verb->name + " is no verb that works on a file");
    }
    for (const std::string& file : ReadNames(options_.list)) RunFor(file);
    return code_;
  }

 private:
  void RunFor(const std::string& file) {
    const Verb verb = MakeVerb(options_.verb);
    // A command line that can't be read is wrong for each of the files.
    ReadVerbArguments(verb, ArgumentsFor(file, options_.words));
    std::string text;
    try {
      const Capture capture;
      try {
        code_ = std::max(code_, verb.work());
      } catch (...) {
        text = capture.Text();
        throw;
      }
      text = capture.Text();
    } catch (const HostError& error) {
      if (error.code == kExitNoServer) throw;
      Fail(file, error.what(), error.code);
    } catch (const std::exception&) {
      Fail(file, DescribeException(), kExitFailed);
    }
    Print(OnOneLine(text));
    // The next files would fail too, or aren't wanted any more.
    if (platform::CountMemoryShortages() != 0) {
      throw HostError(kExitFailed, platform::kOutOfMemory);
    }
    if (platform::WasInterrupted()) throw HostError(kExitFailed, "interrupted");
  }

  void Fail(const std::string& file, const std::string& why, int code) {
    Say(why.find(file) != why.npos ? why : file + ": " + why);
    code_ = std::max(code_, code);
  }

  /// Blocks of several lines have an empty one between them.
  void Print(const std::string& text) {
    if (text.empty()) return;
    const bool isBlock = std::count(text.begin(), text.end(), '\n') > 1;
    if (isBlock && hasPrinted_) std::cout << '\n';
    hasPrinted_ = true;
    if (!(std::cout << text << std::flush)) {
      throw HostError(kExitFailed, "standard output can't be written");
    }
  }

  const BatchOptions& options_;
  int code_ = kExitSuccess;
  bool hasPrinted_ = false;
};

const VerbRegistration batchRegistration(
    "batch", "Runs a verb on many files, one after the other, in one process", [](OptionSet& line) {
      const auto options = std::make_shared<BatchOptions>();
      line.AddNote(
          "What stands behind the verb goes to it; {} is the file, {name} its name without "
          "folders, "
          "{stem} that without its ending. Without {} the file is the first argument. JSON comes "
          "on one line for each file. A file that fails is named on standard error, the others go "
          "on, and the exit code is that of the worst.");
      line.AddExample("vexg batch info --files-from scenes.txt --json");
      line.AddExample("find . -name '*.tif' | vexg batch copy --files-from - {} out/{stem}.img");
      line.Add("verb", options->verb, "The verb").Required().Shows("VERB");
      line.Add("words", options->words, "Its arguments").Shows("WORD");
      line.Add("--files-from", options->list, "A list of files, one a line; - is standard input")
          .IsFile("LIST")
          .Required();
      return VerbRegistration::Work([options] { return Batch(*options).Run(); });
    });

}  // namespace
}  // namespace lumo::host
