#include "gdal_common/messages.h"

#include <algorithm>
#include <cctype>
#include <cpl_error.h>
#include <initializer_list>
#include <new>
#include <stdexcept>
#include <string_view>

#include "foundation/fault.h"
#include "foundation/text_case.h"
#include "gdal_common/hdf5_files.h"
#include "platform/memory_shortage.h"

namespace lumo::gdal {
namespace {

/// True for a text that holds one of the pieces, whatever the case of its letters.
bool HoldsOneOf(const char* text, std::initializer_list<std::string_view> pieces) {
  const std::string lower = LowerCase(text);
  return std::any_of(pieces.begin(), pieces.end(),
                     [&](std::string_view piece) { return lower.find(piece) != lower.npos; });
}

/// True for a warning by which a codec goes on with made-up pixels: libjpeg's of data that end too
/// early or have bad codes (jerror.h, JWRN_...), libtiff's of PackBits and fax data
/// (tif_packbits.c, tif_fax3.c), OpenJPEG's of streams and segments that are cut. Bytes between
/// markers that nothing needs, unknown revisions and text pieces with bad check sums are harmless.
bool TellsOfDamage(const char* text) {
  return HoldsOneOf(text, {"corrupt", "premature", "truncat", "lack of data", "not enough data",
                           "too short", "too long", "unexpected end", "bad code", "discarding",
                           "line length mismatch", "inconsistent progression", "buffer overrun"}) &&
         !HoldsOneOf(text, {"extraneous bytes"});
}

/// True for a failed allocation: of GDAL's own, or in the words of the libraries that it uses.
bool IsOfMemory(CPLErrorNum number, const char* text) {
  return number == CPLE_OutOfMemory ||
         HoldsOneOf(text, {"out of memory", "bad_alloc", "cannot allocate", "insufficient memory"});
}

/// True for a warning that stands for a failure.
bool IsOfFailure(const char* text, Messages::Damage damage) {
  return HoldsOneOf(text, {"unable to save auxiliary information"}) ||
         (damage == Messages::Damage::kIsError && TellsOfDamage(text));
}

}  // namespace

struct Messages::Handler {
  /// A fault that is fatal to GDAL, as a small allocation that fails, would end the process when
  /// this returns. It leaves as an exception instead, as that of a container of GDAL's own would.
  static void CPL_STDCALL Take(CPLErr severity, CPLErrorNum number, const char* text) {
    auto* const messages = static_cast<Messages*>(CPLGetErrorHandlerUserData());
    if (IsOfMemory(number, text)) {
      platform::NoteMemoryShortage();
      if (severity == CE_Fatal) throw std::bad_alloc();
      severity = CE_Failure;
      text = platform::kOutOfMemory;
    }
    if (severity == CE_Fatal) throw std::runtime_error(text);
    if (severity != CE_Warning && severity != CE_Failure && severity != CE_Fatal) return;
    const bool isWarning = severity == CE_Warning && !IsOfFailure(text, messages->damage_);
    std::string& line = isWarning ? messages->warning_ : messages->error_;
    line = text;
    // A hint at settings that no user of ours has.
    const std::size_t hint = line.find(" (this warning can be turned");
    if (hint != line.npos) line.erase(hint);
    std::replace(line.begin(), line.end(), '\n', ' ');
  }
};

Messages::Messages(Damage damage) : damage_(damage) {
  SilenceHdf5();
  CPLPushErrorHandlerEx(Handler::Take, this);
}

Messages::~Messages() {
  CPLPopErrorHandler();
  CPLErrorReset();
}

std::string Messages::Text() const {
  if (memory_.WasShort()) return platform::kOutOfMemory;
  if (const FileFault* const fault = faults_.First()) return fault->path + ": " + fault->Text();
  return error_.empty() ? warning_ : error_;
}

namespace {

/// True when the name that ends at `end` goes on there, as that of a side file does.
bool GoesOn(const std::string& text, std::size_t end) {
  const auto isPart = [&](std::size_t at) {
    return at < text.size() && (std::isalnum(static_cast<unsigned char>(text[at])) != 0 ||
                                text[at] == '_' || text[at] == '-' || text[at] == '/');
  };
  return isPart(end) || (end < text.size() && text[end] == '.' && isPart(end + 1));
}

/// `text` without the file's own name, which stands in front of it anyway.
std::string WithoutName(std::string text, const std::string& name) {
  std::size_t at = text.find(name);
  if (name.empty() || at == std::string::npos || GoesOn(text, at + name.size())) return text;
  // "name: what", "name, band 1: what", "HDF5:"name"://place, band 1: what"
  const std::size_t comma = text.find_first_of(",: ", at + name.size());
  const bool leads = at == 0 || text.substr(0, at).find(' ') == std::string::npos;
  if (leads && comma != std::string::npos) {
    const std::size_t end = text[comma] == ' ' ? comma : text.find(' ', comma);
    if (end != std::string::npos && end + 1 < text.size()) return text.substr(end + 1);
  }
  std::size_t length = name.size();
  const auto isQuote = [](char c) { return c == '\'' || c == '`' || c == '"'; };
  if (at != 0 && isQuote(text[at - 1])) --at, ++length;
  if (at + length < text.size() && isQuote(text[at + length])) ++length;
  return text.replace(at, length, "it");
}

}  // namespace

bool Messages::Fail(const std::string& name, const char* otherwise) const {
  const std::string text = Text();  // into some of which GDAL itself puts the name
  const FileFault* const fault = faults_.First();
  if (fault != nullptr && fault->path.starts_with(name + ".")) {  // a file beside it
    SetFault(text);
    return false;
  }
  return FailWith(name, text.empty() ? otherwise : WithoutName(text, name));
}

void Messages::Clear() {
  faults_.Clear();
  memory_ = platform::MemoryWatch();
  error_.clear();
  warning_.clear();
}

bool FailWith(const std::string& name, const std::string& what) {
  SetFault(what.starts_with(name + ": ") ? what : name + ": " + what);
  return false;
}

}  // namespace lumo::gdal
