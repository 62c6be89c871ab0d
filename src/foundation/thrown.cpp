#include "foundation/thrown.h"

#include <exception>
#include <new>
#include <system_error>

#include "platform/memory_shortage.h"

namespace lumo {
namespace {

std::string NoteShortage() {
  platform::NoteMemoryShortage();
  return platform::kOutOfMemory;
}

}  // namespace

void NoteException() noexcept {
  try {
    DescribeException();
  } catch (...) {
    NoteShortage();  // of the text's own
  }
}

std::string DescribeException() {
  try {
    throw;
  } catch (const std::bad_alloc&) {
    return NoteShortage();
  } catch (const std::system_error& thrown) {
    // The second is that of a thread that can't be made.
    const bool isOfMemory = thrown.code() == std::errc::not_enough_memory ||
                            thrown.code() == std::errc::resource_unavailable_try_again;
    return isOfMemory ? NoteShortage() : thrown.what();
  } catch (const std::exception& thrown) {
    return thrown.what();
  } catch (...) {
    return "it gave up without a reason";
  }
}

}  // namespace lumo
