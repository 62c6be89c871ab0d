#include "metadata/metadata_parse_log.h"

#include <array>
#include <cstdarg>
#include <cstdlib>
#include <filesystem>

#include "metadata/metadata_text.h"
#include "platform/clock.h"
#include "platform/debug_output.h"

namespace lumo {
namespace {

/// The text of an environment variable; empty when it isn't set.
std::string Variable(const char* name) {
  const char* const text = std::getenv(name);
  return text != nullptr ? text : "";
}

unsigned NumberIn(const std::string& text) {
  std::uint64_t number = 0;
  const bool isNumber = ReadUnsigned(DecodeMetadataText(text), number) != 0;
  return isNumber ? static_cast<unsigned>(number) : 0;
}

}  // namespace

MetadataParseLog* gpMetadataParseLogInstance = nullptr;

MetadataParseLog& MetadataParseLog::Instance() {
  static MetadataParseLog& log = *(gpMetadataParseLogInstance = new MetadataParseLog);
  return log;
}

MetadataParseLog::MetadataParseLog() {
  const std::string directory = Variable("metadata_parse_log_dir");
  const std::string console = Variable("metadata_parse_log_console");
  const unsigned level = NumberIn(Variable("metadata_parse_log_level"));
  if (directory.empty() || console.empty() || level == 0) return;
  std::error_code ignored;
  std::filesystem::create_directories(directory, ignored);
  file_ = std::fopen((directory + "/metadata_parse_log.log").c_str(), "w");
  if (file_ == nullptr) return;
  level_ = level;
  toConsole_ = NumberIn(console) != 0;
  std::fprintf(file_, "\n%s  MetadataImpl Parse Log.   Log Level is set to: %u\n\n",
               platform::LocalDateText().c_str(), level_);
  std::fflush(file_);
}

MetadataParseLog::~MetadataParseLog() {
  if (file_ != nullptr) std::fclose(file_);
}

void MetadataParseLog::Write(unsigned level, const char* format, ...) {
  if (!IsOn(level)) return;
  std::array<char, 4096> text{};
  std::va_list values;
  va_start(values, format);
  std::vsnprintf(text.data(), text.size(), format, values);
  va_end(values);
  WriteText(text.data());
}

void MetadataParseLog::Write(unsigned level, const std::ostringstream& text) {
  if (IsOn(level)) WriteText(text.str());
}

void MetadataParseLog::WriteText(const std::string& text) {
  const std::lock_guard lock(mutex_);
  std::fwrite(text.data(), 1, text.size(), file_);
  std::fflush(file_);
  if (toConsole_) platform::DebugOutput(text);
}

}  // namespace lumo
