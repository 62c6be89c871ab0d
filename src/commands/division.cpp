#include "commands/division.h"

#include <map>
#include <string>

#include "foundation/fault.h"

namespace lumo {
namespace {

/// Made on first use, as registrations run at load.
std::map<std::string, DivisionDeclaration>& Registered() {
  static std::map<std::string, DivisionDeclaration> divisions;
  return divisions;
}

}  // namespace

DivisionRegistration::DivisionRegistration(const DivisionDeclaration& division) {
  Registered()[division.command] = division;
}

const DivisionDeclaration* FindDivision(const String& command) {
  const auto at = Registered().find(command.ToUTF8());
  return at != Registered().end() ? &at->second : nullptr;
}

bool ReadShare(const Array<unsigned>& numbers, Share& share) {
  if (numbers.GetCount() == 2 && numbers[0] < numbers[1]) {
    share = {numbers[0], numbers[1]};
    return true;
  }
  SetFault("Share: two numbers tell which share, from 0, and of how many");
  return false;
}

std::vector<InputDeclaration> WithShareInputs(std::vector<InputDeclaration> inputs) {
  inputs.push_back({kShareInput, Presence::kOptional, ValueKind::kIntegerArray,
                    "which share of the work is done, from 0, and of how many; all of it when "
                    "absent, and with ShareFiles"});
  inputs.push_back({kShareFileInput, Presence::kOptional, ValueKind::kText,
                    "the file to make of a share, with Share; nothing else is given or made"});
  inputs.push_back({kShareFilesInput, Presence::kOptional, ValueKind::kTextList,
                    "the files of all shares, in order: the work is taken out of them"});
  return inputs;
}

}  // namespace lumo
