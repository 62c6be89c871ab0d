#include "platform/unicode.h"

namespace lumo::platform {
namespace {

TEST(Unicode, ConvertsBothWays) {
  const struct {
    const char* utf8;
    const char16_t* utf16;
  } cases[] = {
      {"", u""},
      {"plain", u"plain"},
      {"\xC3\xA9\xE2\x82\xAC", u"\u00e9\u20ac"},
      {"\xF0\x9F\x9B\xB0", u"\U0001F6F0"},  // outside the base plane: a surrogate pair
      {"\xEF\xBF\xBF\xF4\x8F\xBF\xBF", u"\uffff\U0010ffff"},
  };
  for (const auto& c : cases) {
    EXPECT_EQ(Utf8ToUtf16(c.utf8), c.utf16);
    EXPECT_EQ(Utf16ToUtf8(c.utf16), c.utf8);
  }
}

TEST(Unicode, ReplacesWhatIsNotWellFormed) {
  const struct {
    const char* name;
    std::string_view bytes;
    std::u16string want;
  } cases[] = {
      {"stray continuation", "a\x80z", u"a\ufffdz"},
      {"breaks off at the end", "a\xE2\x82", u"a\ufffd\ufffd"},
      {"breaks off before text", "\xE2\x82z", u"\ufffd\ufffdz"},
      {"overlong slash", "\xC0\xAF", u"\ufffd\ufffd"},
      {"surrogate in UTF-8", "\xED\xA0\x80", u"\ufffd\ufffd\ufffd"},
      {"over the last code point", "\xF4\x90\x80\x80", u"\ufffd\ufffd\ufffd\ufffd"},
      {"byte that never occurs", "\xFF", u"\ufffd"},
  };
  for (const auto& c : cases) EXPECT_EQ(Utf8ToUtf16(c.bytes), c.want) << c.name;

  const char16_t lone[] = {u'a', 0xD83D, u'b', 0xDC00, 0xD800};
  EXPECT_EQ(Utf16ToUtf8({lone, 5}),
            "a\xEF\xBF\xBD"
            "b\xEF\xBF\xBD\xEF\xBF\xBD");
}

// The conversions never read behind the view: the byte there would complete the sequence.
TEST(Unicode, StopsAtTheEndOfTheView) {
  EXPECT_EQ(Utf8ToUtf16(std::string_view("\xC3\xA9", 1)), u"\ufffd");
  EXPECT_EQ(Utf16ToUtf8(std::u16string_view(u"\U0001F6F0", 1)), "\xEF\xBF\xBD");
}

}  // namespace
}  // namespace lumo::platform
