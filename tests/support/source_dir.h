#pragma once

#include <string>

namespace lumo::test {

/// The source tree that the tests were built from. A function, so that no other object depends on
/// where the tree lies and checkouts can share a compiler cache.
std::string SourceDir();

}  // namespace lumo::test
