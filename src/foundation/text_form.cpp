#include "foundation/text_form.h"

#include <charconv>
#include <istream>
#include <iterator>
#include <limits>
#include <locale>
#include <ostream>
#include <string>
#include <string_view>

namespace lumo {

std::string_view Trimmed(std::string_view text) {
  constexpr std::string_view kBlanks = " \r\n\t";
  const std::size_t first = text.find_first_not_of(kBlanks);
  if (first == text.npos) return {};
  return text.substr(first, text.find_last_not_of(kBlanks) - first + 1);
}

String ReadWholeText(std::istream& in) {
  const std::string text{std::istreambuf_iterator<char>(in), std::istreambuf_iterator<char>()};
  return String(std::string(Trimmed(text)));
}

String ReadWordText(std::istream& in) {
  std::string word;
  in >> word;
  return String(std::string(Trimmed(word)));
}

String ReadBracketedText(std::istream& in) {
  std::string text;
  SkipPast(in, '[');
  if (in.good()) std::getline(in, text, ']');
  return String(text);
}

void WriteBracketedText(std::ostream& out, const String& text) {
  out << '[' << text.ToUTF8() << "] ";
}

void SkipPast(std::istream& in, char mark) {
  in.ignore(std::numeric_limits<std::streamsize>::max(), mark);
}

std::istringstream MakeTextReader(const String& text) {
  std::istringstream in(text.ToUTF8());
  in.imbue(std::locale::classic());
  return in;
}

std::ostringstream MakeTextWriter() {
  std::ostringstream out;
  out.imbue(std::locale::classic());
  return out;
}

// The stream writes "nan" and "inf" but can't read them, so these words are taken by hand.
template <typename T>
bool detail::ReadFloating(std::istream& in, T& value) {
  value = T();
  in >> std::ws;
  const auto start = in.tellg();
  if (in >> value) return true;
  value = T();
  if (start == std::istream::pos_type(-1)) return false;
  in.clear();
  in.seekg(start);
  const bool negative = in.peek() == '-';
  if (negative) in.get();
  char word[4] = {};
  in.read(word, 3);
  const std::string text(word);
  if (text == "nan") {
    value = std::numeric_limits<T>::quiet_NaN();
  } else if (text == "inf") {
    value = std::numeric_limits<T>::infinity();
  } else {
    in.setstate(std::ios::failbit);
    return false;
  }
  if (negative) value = -value;
  return true;
}

template <typename T>
void detail::WriteFloating(std::ostream& out, T value) {
  constexpr std::streamsize kDefaultPrecision = 6;
  if (out.precision() != kDefaultPrecision || (out.flags() & std::ios::floatfield) != 0) {
    out << value;
    return;
  }
  char digits[32];
  const auto end =
      std::to_chars(std::begin(digits), std::end(digits), value, std::chars_format::general).ptr;
  out << std::string_view(digits, static_cast<std::size_t>(end - digits));
}

template VEXG_EXPORT bool detail::ReadFloating(std::istream&, float&);
template VEXG_EXPORT void detail::WriteFloating(std::ostream&, float);
template VEXG_EXPORT void detail::WriteFloating(std::ostream&, double);
template VEXG_EXPORT bool detail::ReadFloating(std::istream&, double&);

}  // namespace lumo
