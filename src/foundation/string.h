#pragma once

#include <atomic>
#include <concepts>
#include <cstdint>
#include <string>
#include <string_view>
#include <type_traits>

#include "platform/export.h"

namespace lumo {

/// The library's text: UTF-16 units, with narrow copies in UTF-8 and in the system code page that
/// are made when asked for and kept until the text changes. The system code page is UTF-8 here.
///
/// A String that was never given a value holds no text at all (its accessors give null). It differs
/// from the empty text: the two compare unequal, and "no text" sorts before every text.
///
/// Threads: any number of threads may read one String, also when they ask for narrow copies; a
///          thread that changes it must be alone.
/// Failure: an allocation that fails leaves as std::bad_alloc; the text is then as it was.
///
///     const String name("Ägypten.tif");       // UTF-8 in
///     const unsigned at = name.Find(".tif");  // 7, in units
///     std::puts(name.Left(at).GetUTF8());     // as long as the String lives
class VEXG_EXPORT String {
 public:
  /// The result of Find for a text that isn't there.
  static constexpr unsigned kNotFound = 0xFFFFFFFF;

  String() = default;               ///< no text
  String(const char* utf8);         ///< up to the terminator; null gives no text
  String(const char16_t* units);    ///< up to the terminator; null gives no text
  String(const std::string& utf8);  ///< up to the first NUL; an empty one gives no text
  /// Exactly `count` units, NULs among them; null gives no text.
  String(const char16_t* units, std::size_t count);
  String(const String& other);      ///< the text only; narrow copies are made anew
  String(String&& other) noexcept;  ///< `other` is left without a text
  ~String();

  /// Takes the text over, or that there is none; a narrow copy is made anew when it is asked for.
  String& operator=(const String& other);
  String& operator=(String&& other) noexcept;

  /// Takes bytes in the system code page, as they arrive from outside; null gives no text.
  void SetANSI(const char* bytes);

  /// Appends; a right side without a text changes nothing but drops the narrow copies.
  String& operator+=(const String& other);

  /// The text in the system code page, NUL-terminated; null when there is no text. The pointer
  /// holds until the String is changed or destroyed.
  const char* GetANSI() const { return Narrow(ansi_); }

  /// The text in UTF-8, NUL-terminated; null when there is no text. As long-lived as GetANSI.
  const char* GetUTF8() const { return Narrow(utf8_); }

  /// The UTF-16 units, NUL-terminated; null when there is no text.
  const char16_t* GetData() const { return data_; }

  /// Number of 16-bit units, the terminator not counted.
  unsigned GetLength() const { return length_; }

  /// The UTF-8 form as a standard string; empty when there is no text.
  std::string ToUTF8() const;

  /// Index of the first occurrence of `text`, in units; kNotFound when it is absent or when either
  /// side holds no text.
  unsigned Find(const String& text) const;

  /// The first `count` units. A `count` of 0, or over the length, gives the whole text.
  String Left(unsigned count) const;

  /// The units from `start` to the end; the empty text when `start` is not before the end.
  String Mid(unsigned start) const;

  /// Orders as operator< does, with each unit folded to lower case: negative, 0 or positive.
  int CompareNoCase(const String& other) const;

  /// Makes a number into text.
  /// @param format  printf text with exactly one conversion, of the kinds d i u o x X, whose length
  ///                modifier is ignored; null or empty stands for the plain decimal number. What is
  ///                printed is cut to the format's length plus 15 bytes.
  /// @return no text when `format` has any other conversion, or more than one.
  template <std::integral T>
  static String Format(const char* format, T value) {
    using Unsigned = std::make_unsigned_t<T>;
    return FormatNumber(format, std::is_signed_v<T>, static_cast<std::int64_t>(value),
                        static_cast<Unsigned>(value));
  }

  /// Equal unit by unit; no text equals no text alone.
  friend VEXG_EXPORT bool operator==(const String& a, const String& b);
  /// By unsigned 16-bit units, without a locale.
  friend VEXG_EXPORT bool operator<(const String& a, const String& b);

 private:
  std::u16string_view View() const { return {data_, length_}; }
  void Adopt(std::u16string_view units);
  void DropNarrow();
  const char* Narrow(std::atomic<char*>& copy) const;
  static String FormatNumber(const char* format, bool isSigned, std::int64_t signedValue,
                             std::uint64_t unsignedValue);

  char16_t* data_ = nullptr;
  mutable std::atomic<char*> ansi_{nullptr};
  mutable std::atomic<char*> utf8_{nullptr};
  unsigned length_ = 0;
};

/// The two texts in a row; no text when neither side has one.
VEXG_EXPORT String operator+(const String& a, const String& b);

/// An opaque identifier, the key of an object in the catalog. It is compared unit by unit and never
/// parsed or normalised; what it looks like is up to whoever makes it.
class VEXG_EXPORT URI : public String {
 public:
  URI() = default;
  explicit URI(const String& text) : String(text) {}
};

}  // namespace lumo
