#pragma once

#include <string>
#include <string_view>
#include <vector>

namespace lumo::orva {

/// The lines of an ORVA header, without a meaning. docs/file-formats.md describes the form.
///
/// Lines that aren't touched are written again as they were read, comments and unknown names too.
class HeaderText {
 public:
  /// A line `name = value`, or several where the value is a list.
  struct Entry {
    std::string name;   ///< in lower case; of a comment or an empty line no text
    std::string raw;    ///< the value as it stands in the file; of a comment all of it
    unsigned line = 0;  ///< on which it begins, from 1; 0 for one that was not read
  };

  HeaderText() = default;

  /// Reads a whole header.
  /// @param fault  [out] "line N: what".
  bool Parse(std::string_view text, std::string& fault);

  std::string Format() const;

  /// The entry of that name, in lower case; null when there is none.
  const Entry* Find(std::string_view name) const;

  /// Sets the value of a name, at its place or at the end.
  void SetText(std::string_view name, std::string_view text);
  void SetList(std::string_view name, const std::vector<std::string>& items);
  /// Sets a text with commas in it in braces, so that nobody takes it for a list.
  void SetBracedText(std::string_view name, std::string_view text);
  void Remove(std::string_view name);

  /// Number of the last line that was read.
  unsigned LineCount() const { return lineCount_; }

 private:
  void SetRaw(std::string_view name, std::string raw);

  std::vector<Entry> entries_;
  unsigned lineCount_ = 0;
};

/// The text of a value, in braces or not.
std::string TextOf(const HeaderText::Entry& entry);

/// The items of a list; a value without braces is a list of one.
std::vector<std::string> ItemsOf(const HeaderText::Entry& entry);

}  // namespace lumo::orva
