#include "foundation/string.h"

#include <thread>

#include "foundation/containers.h"

namespace lumo {
namespace {

std::string Text(const String& text) {
  return text.GetUTF8() != nullptr ? text.GetUTF8() : "<none>";
}

TEST(String, NoTextAndTheEmptyTextDiffer) {
  const String none;
  const String empty("");
  EXPECT_EQ(none.GetData(), nullptr);
  ASSERT_NE(empty.GetData(), nullptr);
  EXPECT_EQ(none.GetLength(), 0U);
  EXPECT_EQ(empty.GetLength(), 0U);
  EXPECT_FALSE(none == empty);
  EXPECT_TRUE(none < empty);
  EXPECT_FALSE(empty < none);
  EXPECT_TRUE(none == String(static_cast<const char*>(nullptr)));
  EXPECT_TRUE(none == String(std::string()));

  Map<String, int> map;
  map[none] = 1;
  map[empty] = 2;
  EXPECT_EQ(map.GetCount(), 2U);
}

TEST(String, ComparesByUnits) {
  EXPECT_TRUE(String("a") < String("b"));
  EXPECT_TRUE(String("a") < String("aa"));
  EXPECT_TRUE(String("Z") < String("a"));
  EXPECT_TRUE(String("z") < String("\xC3\xA9"));
  EXPECT_EQ(String("Wgs 84").CompareNoCase("WGS 84"), 0);
  EXPECT_LT(String("wgs 72").CompareNoCase("WGS 84"), 0);
  EXPECT_LT(String().CompareNoCase(""), 0);
}

TEST(String, NarrowCopiesFollowTheText) {
  String text("caf\xC3\xA9");
  EXPECT_EQ(text.GetLength(), 4U);
  const char* const first = text.GetUTF8();
  EXPECT_EQ(first, text.GetUTF8());  // kept, not made anew
  EXPECT_STREQ(text.GetANSI(), first);
  text += " noir";
  EXPECT_STREQ(text.GetUTF8(), "caf\xC3\xA9 noir");
  text += String();
  EXPECT_STREQ(text.GetUTF8(), "caf\xC3\xA9 noir");
  text.SetANSI("other");
  EXPECT_STREQ(text.GetUTF8(), "other");
  String taken(std::move(text));
  EXPECT_STREQ(taken.GetUTF8(), "other");
}

TEST(String, FindsAndCuts) {
  const String text("one two one");
  EXPECT_EQ(text.Find("two"), 4U);
  EXPECT_EQ(text.Find("three"), 0xFFFFFFFFU);
  EXPECT_EQ(text.Find(String()), 0xFFFFFFFFU);
  EXPECT_EQ(Text(text.Left(3)), "one");
  EXPECT_EQ(Text(String("abc").Left(0)), "abc");
  EXPECT_EQ(Text(String("abc").Left(4)), "abc");
  EXPECT_EQ(Text(text.Mid(4)), "two one");
  EXPECT_EQ(Text(text.Mid(99)), "");
}

TEST(String, FormatsOneInteger) {
  const struct {
    String got;
    const char* want;
  } cases[] = {
      {String::Format("TMP_VAR_%08x", 26U), "TMP_VAR_0000001a"},
      {String::Format(nullptr, -5), "-5"},
      {String::Format("", 5000000000UL), "5000000000"},
      {String::Format("%x", -1), "ffffffff"},
      {String::Format("100%% of %hhd", 300), "100% of 300"},
      {String::Format("%d", 0xFFFFFFFFU), "4294967295"},
      {String::Format("%99d", 1), "                   "},  // cut to the format's length and 15
      {String::Format("%s", 1), "<none>"},
      {String::Format("%n", 1), "<none>"},
      {String::Format("%d %d", 1), "<none>"},
      {String::Format("%*d", 1), "<none>"},
      {String::Format("%", 1), "<none>"},
      {String::Format("none", 1), "<none>"},
  };
  for (const auto& c : cases) EXPECT_EQ(Text(c.got), c.want);
}

TEST(String, ManyThreadsMayAskForTheNarrowCopies) {
  const String text("shared by all");
  std::vector<std::thread> threads;
  for (int i = 0; i < 4; ++i) {
    threads.emplace_back([&] {
      EXPECT_STREQ(text.GetUTF8(), "shared by all");
      EXPECT_STREQ(text.GetANSI(), "shared by all");
    });
  }
  for (std::thread& thread : threads) thread.join();
}

}  // namespace
}  // namespace lumo
