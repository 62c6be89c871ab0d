#pragma once

#include <string>

namespace lumo::gdal {

/// Gathers what GDAL has to say on this thread while it lives, in place of the standard error
/// stream. They nest; each hears what is said while it is the innermost.
class Messages {
 public:
  Messages();
  ~Messages();
  Messages(const Messages&) = delete;
  Messages& operator=(const Messages&) = delete;

  bool HasError() const { return !error_.empty(); }
  bool HasWarning() const { return !warning_.empty(); }

  /// The last error, else the last warning, in one line; empty when there was none.
  const std::string& Text() const { return HasError() ? error_ : warning_; }

  /// Tells the fault "name: what GDAL said". False, to be returned.
  /// @param otherwise  what is told when GDAL said nothing.
  bool Fail(const std::string& name, const char* otherwise = "GDAL gave no reason") const;

  /// Forgets what was said so far.
  void Clear();

 private:
  struct Handler;

  std::string error_;
  std::string warning_;
};

/// Tells the fault "name: what". False, to be returned.
bool FailWith(const std::string& name, const std::string& what);

}  // namespace lumo::gdal
