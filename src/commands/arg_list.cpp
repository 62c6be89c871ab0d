#include "commands/arg_list.h"

#include "commands/command_errors.h"
#include "foundation/grow_array.h"

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
  if (!GrowToHold(arguments_, index)) {
    SetErrorState(ArgListError());
    return false;
  }
  arguments_[index].object = object;
  return object->IsA(Object::TypeCode);
}

ObjectPtr ArgList::Get(unsigned index) const {
  if (index >= GetCount()) return {};
  return arguments_[index].object;
}

}  // namespace lumo
