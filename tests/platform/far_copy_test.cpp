#include "platform/far_copy.h"

#include <algorithm>
#include <numeric>
#include <vector>

namespace lumo::platform {
namespace {

TEST(CopyFar, CopiesEveryByteAndNoneBesides) {
  constexpr std::size_t kRoom = 64;  // on both sides
  for (std::size_t bytes : {0, 1, 63, 64, 65, 127, 128, 1000, 4096}) {
    for (std::size_t shift = 0; shift < 64; shift += 7) {
      std::vector<unsigned char> from(bytes + kRoom), to(bytes + 2 * kRoom, 0xEE);
      std::iota(from.begin(), from.end(), static_cast<unsigned char>(bytes));
      std::vector<unsigned char> want = to;
      std::copy_n(&from[shift % 16], bytes, &want[kRoom + shift]);
      CopyFar(&to[kRoom + shift], &from[shift % 16], bytes);
      ASSERT_EQ(to, want) << bytes << " bytes at " << shift;
    }
  }
}

}  // namespace
}  // namespace lumo::platform
