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

std::string DescribeException() {
  try {
    throw;
  } catch (const std::bad_alloc&) {
    return NoteShortage();
  } catch (const std::system_error& thrown) {
    return thrown.code() == std::errc::not_enough_memory ? NoteShortage() : thrown.what();
  } catch (const std::exception& thrown) {
    return thrown.what();
  } catch (...) {
    return "it gave up without a reason";
  }
}

}  // namespace lumo
