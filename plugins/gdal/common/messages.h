#pragma once

#include <string>

namespace lumo::gdal {

/// Gathers what GDAL has to say on this thread while it lives, in place of the standard error
/// stream. They nest; each hears what is said while it is the innermost.
class Messages {
 public:
  /// What is made of warnings by which codecs tell that pixels are damaged.
  enum class Damage { kIsWarned, kIsError };

  explicit Messages(Damage damage = Damage::kIsWarned);
  ~Messages();
  Messages(const Messages&) = delete;
  Messages& operator=(const Messages&) = delete;

  /// True also when a file beside the raster could not be saved, which GDAL only warns of.
  bool HasError() const { return !error_.empty(); }

  /// The last error, else the last warning, in one line; empty when there was none.
  const std::string& Text() const { return HasError() ? error_ : warning_; }

  /// Tells the fault "name: what GDAL said". False, to be returned.
  /// @param otherwise  what is told when GDAL said nothing.
  bool Fail(const std::string& name, const char* otherwise = "GDAL gave no reason") const;

  /// Forgets what was said so far.
  void Clear();

 private:
  struct Handler;

  const Damage damage_;
  std::string error_;
  std::string warning_;
};

/// Tells the fault "name: what". False, to be returned.
bool FailWith(const std::string& name, const std::string& what);

}  // namespace lumo::gdal
