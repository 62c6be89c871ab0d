#include "platform/random_bytes.h"

#include <cerrno>
#include <sys/random.h>
#include <system_error>

namespace lumo::platform {

std::string RandomHex(unsigned bytes) {
  constexpr char kDigits[] = "0123456789abcdef";
  std::string text;
  while (text.size() < 2 * std::size_t{bytes}) {
    unsigned char byte = 0;
    const ssize_t got = getrandom(&byte, 1, 0);
    if (got < 0 && errno == EINTR) continue;
    if (got != 1) throw std::system_error(errno, std::generic_category(), "random bytes");
    text += kDigits[byte >> 4];
    text += kDigits[byte & 15];
  }
  return text;
}

}  // namespace lumo::platform
