#pragma once

#include <string>

namespace lumo {

/// The file beside another one, with ".lock" behind its name, that names the process which changes
/// that. One whose process is gone is taken over. It goes away with the object.
class OwnerFile {
 public:
  /// @param path  of the file that is to be changed.
  explicit OwnerFile(const std::string& path) : path_(path + ".lock") {}
  ~OwnerFile();
  OwnerFile(const OwnerFile&) = delete;
  OwnerFile& operator=(const OwnerFile&) = delete;

  /// Waits until nobody else changes the file, up to half a minute. False, with the fault, where
  /// somebody still does, or where no file can be made.
  bool Take(std::string& fault);

 private:
  bool TryTake(std::string& owner, std::string& fault);

  const std::string path_;
  bool isOurs_ = false;
};

}  // namespace lumo
