#include "foundation/text_form.h"

#include <cmath>
#include <limits>

namespace lumo {
namespace {

std::string Utf8(const String& text) {
  return text.GetUTF8() != nullptr ? text.GetUTF8() : "<none>";
}

TEST(TextForm, ReadsTextsInThreeForms) {
  const struct {
    const char* in;
    const char* whole;
    const char* word;
    const char* bracketed;
  } cases[] = {
      {" a  b \r\n\t", "a  b", "a", "<none>"},
      {"x [ kept as it is ] y", "x [ kept as it is ] y", "x", " kept as it is "},
      {"[never closed", "[never closed", "[never", "never closed"},
      {"[]", "[]", "[]", "<none>"},
      {" \t ", "<none>", "<none>", "<none>"},
  };
  for (const auto& c : cases) {
    SCOPED_TRACE(c.in);
    auto whole = MakeTextReader(c.in);
    EXPECT_EQ(Utf8(ReadWholeText(whole)), c.whole);
    auto word = MakeTextReader(c.in);
    EXPECT_EQ(Utf8(ReadWordText(word)), c.word);
    auto bracketed = MakeTextReader(c.in);
    EXPECT_EQ(Utf8(ReadBracketedText(bracketed)), c.bracketed);
  }
}

TEST(TextForm, BracketedTextsFollowOneAnother) {
  auto out = MakeTextWriter();
  WriteBracketedText(out, "first one");
  WriteBracketedText(out, "\xE2\x82\xAC");
  EXPECT_EQ(out.str(), "[first one] [\xE2\x82\xAC] ");
  auto in = MakeTextReader(out.str());
  EXPECT_EQ(Utf8(ReadBracketedText(in)), "first one");
  EXPECT_EQ(Utf8(ReadBracketedText(in)), "\xE2\x82\xAC");
  EXPECT_EQ(Utf8(ReadBracketedText(in)), "<none>");
}

template <typename T>
void ExpectReadsBack(std::initializer_list<T> values) {
  for (const T value : values) {
    auto out = MakeTextWriter();
    WriteNumber(out, value);
    out << ' ';
    WriteNumber(out, T(7));
    auto in = MakeTextReader(out.str());
    T read = T(1);
    T next = T(1);
    ASSERT_TRUE(ReadNumber(in, read)) << out.str();
    ASSERT_TRUE(ReadNumber(in, next)) << out.str();
    if constexpr (std::is_floating_point_v<T>) {
      EXPECT_EQ(std::isnan(read), std::isnan(value)) << out.str();
      if (std::isnan(value)) continue;
      EXPECT_EQ(std::signbit(read), std::signbit(value)) << out.str();
    }
    EXPECT_EQ(read, value) << out.str();
    EXPECT_EQ(next, T(7)) << out.str();
  }
}

TEST(TextForm, NumbersReadBackToTheLastBit) {
  using D = std::numeric_limits<double>;
  using F = std::numeric_limits<float>;
  ExpectReadsBack<double>({0.0, -0.0, 0.1, 1.0 / 3.0, 1e300, D::denorm_min(), D::max(),
                           D::infinity(), -D::infinity(), D::quiet_NaN()});
  ExpectReadsBack<float>({0.1F, 1.0F / 3.0F, F::max(), F::denorm_min(), -F::infinity()});
  ExpectReadsBack<signed char>({-128, 0, 65, 127});
  ExpectReadsBack<unsigned char>({0, 65, 255});
  ExpectReadsBack<std::int64_t>({std::numeric_limits<std::int64_t>::min(), -1});
  ExpectReadsBack<std::uint64_t>({std::numeric_limits<std::uint64_t>::max()});
}

TEST(TextForm, AStreamKeepsANotationOfItsOwn) {
  auto out = MakeTextWriter();
  out.precision(3);
  out << std::scientific;
  WriteNumber(out, 1.0 / 3.0);
  EXPECT_EQ(out.str(), "3.333e-01");
}

TEST(TextForm, WhatIsNoNumberReadsAsZeroAndFails) {
  for (const char* text : {"", "abc", "-", "nano?"}) {
    auto in = MakeTextReader(text);
    int value = 5;
    EXPECT_FALSE(ReadNumber(in, value)) << text;
    EXPECT_EQ(value, 0) << text;
  }
  for (const char* text : {"", "abc", "-", "1e999"}) {
    auto in = MakeTextReader(text);
    double value = 5.0;
    EXPECT_FALSE(ReadNumber(in, value)) << text;
    EXPECT_EQ(value, 0.0) << text;
  }
  auto in = MakeTextReader("256");
  unsigned char byte = 5;
  EXPECT_FALSE(ReadNumber(in, byte));
  EXPECT_EQ(byte, 0);
}

}  // namespace
}  // namespace lumo
