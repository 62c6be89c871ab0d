#include "views/band_names.h"

#include <algorithm>
#include <charconv>

#include "foundation/fault.h"
#include "foundation/text_case.h"

namespace lumo {
namespace {

bool IsLetter(char c) {
  return (c >= 'a' && c <= 'z') || (c >= 'A' && c <= 'Z') || c == '_';
}
bool IsDigit(char c) {
  return c >= '0' && c <= '9';
}

/// The name of a band as it stands behind that of its raster.
std::string NameOf(const BandNames::Source& source, unsigned band) {
  return (source.name.empty() ? "b" : source.name + "_b") + std::to_string(band);
}

}  // namespace

bool BandNames::IsName(const std::string& text) {
  return !text.empty() && IsLetter(text[0]) &&
         std::all_of(text.begin(), text.end(), [](char c) { return IsLetter(c) || IsDigit(c); });
}

BandNames::BandNames(const std::vector<Source>& sources) : sources_(sources) {
  for (Source& source : sources_) source.name = LowerCase(source.name);
}

bool BandNames::AddRole(const std::string& role, const std::string& band) {
  if (!IsName(role)) {
    SetFault("\"" + role + "\" is no name: it takes letters, digits and underscores");
    return false;
  }
  if (Find(role)) {
    SetFault("\"" + role + "\" names a band already");
    return false;
  }
  const std::optional<Band> found = Find(band);
  if (!found) {
    SetFault(role + ": there is no band \"" + band + "\"; there are " + Describe());
    return false;
  }
  roles_[LowerCase(role)] = *found;
  return true;
}

std::optional<BandNames::Band> BandNames::Find(const std::string& name) const {
  const std::string lower = LowerCase(name);
  const auto role = roles_.find(lower);
  if (role != roles_.end()) return role->second;
  // "b12" or "a_b12": one of the first raster has nothing in front.
  const std::size_t digits = lower.find_last_not_of("0123456789") + 1;
  if (digits == 0 || digits == lower.size() || lower[digits - 1] != 'b') return std::nullopt;
  const std::string before = lower.substr(0, digits - 1);
  const auto source = std::find_if(sources_.begin(), sources_.end(), [&](const Source& candidate) {
    return before == (candidate.name.empty() ? "" : candidate.name + "_");
  });
  unsigned band = 0;
  const char* const end = lower.data() + lower.size();
  const auto [at, fault] = std::from_chars(lower.data() + digits, end, band);
  // A number has one way of being written: b1, not b01.
  if (source == sources_.end() || fault != std::errc() || at != end || band >= source->bands ||
      lower != NameOf(*source, band)) {
    return std::nullopt;
  }
  return Band{static_cast<unsigned>(source - sources_.begin()), band};
}

std::string BandNames::Describe() const {
  std::string text;
  for (const Source& source : sources_) {
    if (source.bands == 0) continue;
    text += (text.empty() ? "" : ", ") + NameOf(source, 0);
    if (source.bands > 1) text += " to " + NameOf(source, source.bands - 1);
  }
  for (const auto& [role, band] : roles_) text += ", " + role;
  return text;
}

}  // namespace lumo
