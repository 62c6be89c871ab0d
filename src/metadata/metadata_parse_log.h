#pragma once

#include <cstdio>
#include <mutex>
#include <sstream>
#include <string>

#include "platform/export.h"

namespace lumo {

/// The log of values that are read into metadata stores, one for the process. Three environment
/// variables switch it on, all of which have to be set: metadata_parse_log_dir names the directory
/// of the file metadata_parse_log.log, metadata_parse_log_level how much is written, and
/// metadata_parse_log_console whether lines go to standard error too, when it isn't 0. The two
/// numbers are decimal, or octal behind 0, or hexadecimal behind 0x.
///
/// Threads: any operation from any thread.
/// Failure: a file that can't be made means no log, and nothing else.
class VEXG_EXPORT MetadataParseLog {
 public:
  static constexpr unsigned kErrors = 1;      ///< level of failures
  static constexpr unsigned kTranslated = 2;  ///< level of the values as they are stored
  static constexpr unsigned kCollected = 3;   ///< level of the texts as they were found

  /// Reads the variables and opens the file.
  MetadataParseLog();
  ~MetadataParseLog();
  MetadataParseLog(const MetadataParseLog&) = delete;
  MetadataParseLog& operator=(const MetadataParseLog&) = delete;

  /// The log of the process, made at the first call and never destroyed.
  static MetadataParseLog& Instance();

  /// True when lines of `level` are written.
  bool IsOn(unsigned level) const { return level <= level_; }

  /// Writes when the log is set to `level` or above.
  /// @param format  printf text, UTF-8; the result is cut to 4095 bytes.
  void Write(unsigned level, const char* format, ...) __attribute__((format(printf, 3, 4)));

  /// The same of all that was written to a stream.
  void Write(unsigned level, const std::ostringstream& text);

 private:
  void WriteText(const std::string& text);

  unsigned level_ = 0;  // 0: off
  bool toConsole_ = false;
  std::FILE* file_ = nullptr;
  std::mutex mutex_;
};

/// The log of the process; null until it is first asked for.
VEXG_EXPORT extern MetadataParseLog* gpMetadataParseLogInstance;

}  // namespace lumo
