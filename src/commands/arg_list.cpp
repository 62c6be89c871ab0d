#include "commands/arg_list.h"

namespace lumo {

ArgList::ArgList(unsigned count) : arguments_(ArrayDims(count)) {
  if (!arguments_.IsValid()) {
    SetErrorState(ArgListError());
    return;
  }
  Clear();
}

void ArgList::Clear() {
  const ObjectPtr empty;
  for (Argument& argument : arguments_) argument.object = empty;
}

bool ArgList::Set(unsigned index, const ObjectPtr& object) {
  if (object.IsNull()) return false;
  if (index >= GetCount()) {
    // Resizing in place would lose the list when memory runs out.
    Array<Argument> longer(arguments_);
    if (index == ArrayDims::kTooMany || !longer.IsValid() || !longer.Resize(ArrayDims(index + 1))) {
      SetErrorState(ArgListError());
      return false;
    }
    arguments_ = std::move(longer);
  }
  arguments_[index].object = object;
  return object->IsA(Object::TypeCode);
}

ObjectPtr ArgList::Get(unsigned index) const {
  if (index >= GetCount()) return {};
  return arguments_[index].object;
}

}  // namespace lumo
