#pragma once

#include "foundation/array.h"
#include "foundation/pointer.h"

namespace lumo {

/// One positional argument: any object, or none.
struct Argument {
  ObjectPtr object;  ///< empty for none
};

/// Position in the argument table of a process, from 0.
using ArgID = unsigned;

/// The arguments that tasks hand to one another, by position from 0. They have no names and no
/// element types: a reader casts what it gets.
/// Failure: a list that can't be made or grow stores ArgListError.
class VEXG_EXPORT ArgList : public ErrorState {
 public:
  /// An empty list, which grows as arguments are set.
  ArgList() = default;
  /// `count` empty arguments.
  explicit ArgList(unsigned count);

  /// False for a list that could not be made or grow.
  bool IsValid() const { return !HasError(); }

  /// Puts `object` at `index`; a list that is too short grows to hold it.
  /// @return false, with no change, for a null object; false when the list can't grow.
  bool Set(unsigned index, const ObjectPtr& object);

  /// The object at `index`; empty when there is none, or `index` is behind the end.
  ObjectPtr Get(unsigned index) const;

  /// Lets go of every object; the count stays.
  void Clear();

  unsigned GetCount() const { return arguments_.GetCount(); }

 private:
  Array<Argument> arguments_;
};

}  // namespace lumo
