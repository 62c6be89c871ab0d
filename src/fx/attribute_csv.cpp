#include "fx/attribute_csv.h"

#include <charconv>
#include <cmath>
#include <filesystem>

#include "data/access_policy.h"
#include "foundation/fault.h"
#include "platform/file_moves.h"
#include "platform/temporary_file.h"

namespace lumo {
namespace {

constexpr std::size_t kTextBytes = 1 << 20;  // that are gathered before they are written

template <typename T>
void Append(std::string& text, T value) {
  char digits[32];
  text.append(digits, std::to_chars(digits, digits + sizeof digits, value).ptr);
}

}  // namespace

AttributeCsv::~AttributeCsv() {
  file_.reset();
  std::error_code none;
  if (!workPath_.empty()) std::filesystem::remove(workPath_, none);
}

bool AttributeCsv::Begin(const std::string& path, const std::vector<std::string>& names) {
  if (!MayReachFile(path, true)) return false;
  path_ = path;
  std::string why;
  const std::string work = platform::TemporaryPathBeside(path);
  file_ = platform::RandomAccessFile::Create(work, &why);
  if (!file_) {
    SetFault(String(platform::WithoutTemporaryNames(why)));
    return false;
  }
  workPath_ = work;
  for (const std::string& name : names) text_.append(text_.empty() ? "" : ",").append(name);
  text_ += '\n';
  return true;
}

bool AttributeCsv::Write(std::uint32_t label, std::span<const float> values) {
  Append(text_, label);
  for (const float value : values) {
    text_ += ',';
    if (std::isfinite(value)) Append(text_, value);
  }
  text_ += '\n';
  return text_.size() < kTextBytes || Flush();
}

bool AttributeCsv::WriteLine(std::string_view line) {
  text_.append(line) += '\n';
  return text_.size() < kTextBytes || Flush();
}

bool AttributeCsv::Flush() {
  std::string why;
  if (!file_->Write(place_, text_.data(), text_.size(), &why)) {
    SetFault(String(platform::WithoutTemporaryNames(why)));
    return false;
  }
  place_ += text_.size();
  text_.clear();
  return true;
}

bool AttributeCsv::Close() {
  if (!Flush()) return false;
  std::string why;
  if (!file_->Close(&why) || !platform::RenameFile(workPath_, path_, &why)) {
    SetFault(String(platform::WithoutTemporaryNames(why)));
    return false;
  }
  workPath_.clear();
  return true;
}

}  // namespace lumo
