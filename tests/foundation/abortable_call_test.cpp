#include "foundation/abortable_call.h"

#include <gtest/gtest.h>

namespace lumo {
namespace {

/// Counts its copies; it has no move of its own, as pointers of this library.
struct Counted {
  Counted() = default;
  explicit Counted(int value) : held(std::make_shared<int>(value)) {}
  Counted(const Counted&) = default;
  Counted& operator=(const Counted&) = default;

  std::shared_ptr<int> held;
};

/// The thread of a call must not close what it has opened, perhaps at the end of the program.
TEST(AbortableCall, LeavesItsResultToTheCallerAlone) {
  const StandardAbortFlag abort;
  for (int i = 0; i < 200; ++i) {
    Counted result;
    ASSERT_TRUE(RunAbortable<Counted>(
        abort, [i] { return Counted(i); }, result));
    ASSERT_EQ(*result.held, i);
    ASSERT_EQ(result.held.use_count(), 1);
  }
}

}  // namespace
}  // namespace lumo
