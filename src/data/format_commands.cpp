#include <string>

#include "commands/command.h"
#include "data/data_connection.h"
#include "foundation/fault.h"
#include "foundation/thrown.h"

namespace lumo {
namespace {

/// Gives the answer of IsAvailable; false, with the fault set, for a plug-in that throws.
bool IsAvailable(DataConnectionFactory& factory) {
  try {
    if (factory.IsAvailable()) return true;
    SetFault("the format can't be used on this machine");
  } catch (...) {
    SetFault("the plug-in failed when it was asked: " + DescribeException());
  }
  return false;
}

/// The fault text as a piece of a text list.
String TakeFaultPiece() {
  std::string text = TakeFault().ToUTF8();
  for (char& c : text) {
    if (c == '|') c = '/';
  }
  return text.empty() ? "-" : String(text);
}

const CommandDeclaration kList{
    "ListFormatsCommand",
    "Formats",
    "Lists the formats, and which of them can be used here.",
    {},
    {{"Formats", ValueKind::kTextList, "keys, in the order in which sources are offered to them"},
     {"Kinds", ValueKind::kIntegerArray, "for each: 1 raster, 2 vector"},
     {"Plugins", ValueKind::kTextList, "for each, the library that serves it"},
     {"Loaded", ValueKind::kBooleanArray, "for each, whether its plug-in loads and serves it"},
     {"Available", ValueKind::kBooleanArray, "for each, whether it can be used on this machine"},
     {"Faults", ValueKind::kTextList, "for each, why not; - where there is nothing to say"}}};

class ListFormatsCommand final : public Command {
  CommandResult Execute() override {
    const ArrayDims dims(FormatCount());
    Array<String> names(dims), plugins(dims), faults(dims);
    Array<std::int32_t> kinds(dims);
    Array<bool> loaded(dims), available(dims);
    for (unsigned row = 0; row < names.GetCount(); ++row) {
      const FormatRecord& format = GetFormat(row);
      TakeFault();
      LoadFormat(row);
      DataConnectionFactory* const factory = GetFactory(format);
      names[row] = format.name;
      kinds[row] = format.kind;
      plugins[row] = LibraryName(format);
      loaded[row] = factory != nullptr;
      available[row] = factory != nullptr && IsAvailable(*factory);
      faults[row] = TakeFaultPiece();
    }
    Write("Formats", names);
    Write("Kinds", kinds);
    Write("Plugins", plugins);
    Write("Loaded", loaded);
    Write("Available", available);
    Write("Faults", faults);
    return Succeed();
  }
};

const CommandFactoryT<ListFormatsCommand> listFormatsFactory(kList);

}  // namespace
}  // namespace lumo
