#include "commands/value_text.h"

#include <algorithm>
#include <string>
#include <vector>

namespace lumo {

std::span<const EnumWord<Form>> WordsOf(Form) {
  static constexpr EnumWord<Form> kWords[] = {{"Told", Form::kTold}, {"Exact", Form::kExact}};
  return kWords;
}

const String* FindText(const ObjectPtr& object) {
  return FindScalarValue<String>(object);
}

ObjectPtr MakeText(const String& text) {
  return ObjectPtr(new Scalar<String>(text));
}

Array<String> detail::SplitAtBars(const String& text) {
  const std::string all = text.ToUTF8();
  std::vector<std::string> pieces;
  for (std::size_t start = 0; start <= all.size();) {
    const std::size_t bar = std::min(all.find('|', start), all.size());
    if (bar > start) pieces.push_back(all.substr(start, bar - start));
    start = bar + 1;
  }
  Array<String> result{ArrayDims(static_cast<unsigned>(pieces.size()))};
  for (unsigned i = 0; i < result.GetCount(); ++i) result[i] = String(pieces[i]);
  return result;
}

String detail::JoinWithBars(const Array<String>& pieces) {
  String joined("");
  for (unsigned i = 0; i < pieces.GetCount(); ++i) {
    if (i != 0) joined += "|";
    joined += pieces[i];
  }
  return joined;
}

}  // namespace lumo
