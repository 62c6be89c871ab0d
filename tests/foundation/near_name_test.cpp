#include "foundation/near_name.h"

namespace lumo {
namespace {

TEST(NearName, FindsWhatAPersonMeant) {
  const std::vector<std::string> known{"Samples", "Lines", "Bands", "SubRect", "URI", "Linear"};
  const struct {
    const char* typed;
    const char* meant;
  } cases[] = {{"Sampels", "Samples"},
               {"samples", "Samples"},
               {"SubRec", "SubRect"},
               {"URl", "URI"},
               {"bilinear", "Linear"},
               {"Lnies", "Lines"},
               {"Gamma", ""},
               {"x", ""},
               {"", ""},
               {"Band", "Bands"},
               {"Completely", ""}};
  for (const auto& c : cases) EXPECT_EQ(NearestName(c.typed, known), c.meant) << c.typed;
  EXPECT_EQ(DidYouMean("Line", known), "; did you mean Lines?");
  EXPECT_EQ(DidYouMean("quite another", known), "");
}

TEST(NearName, PrintableKeepsTextAndEscapesTheRest) {
  EXPECT_EQ(Printable("Stra\u00dfe \u6771\u4eac/a b.tif"), "Stra\u00dfe \u6771\u4eac/a b.tif");
  EXPECT_EQ(Printable("a\nb\tc\x1b[31m\x7f"), "a\\nb\\tc\\x1B[31m\\x7F");
  // A control character of the second set, a line separator, a turn of direction, broken UTF-8.
  EXPECT_EQ(Printable("\u009b"), "\\xC2\\x9B");
  EXPECT_EQ(Printable("\u2028\u202e"), "\\xE2\\x80\\xA8\\xE2\\x80\\xAE");
  EXPECT_EQ(Printable("\xff\xc3"), "\\xFF\\xC3");
  EXPECT_EQ(Printable("0123456789abcdef", 8), "0123...cdef");
  EXPECT_EQ(Printable(Printable("a\nb")), Printable("a\nb"));
}

}  // namespace
}  // namespace lumo
