#pragma once

#include <cstdlib>
#include <filesystem>
#include <stdexcept>
#include <string>

namespace lumo::test {

/// A directory that goes with its contents.
class TemporaryDirectory {
 public:
  TemporaryDirectory() {
    std::string pattern = (std::filesystem::temp_directory_path() / "vexg-test-").string();
    pattern.append(6, 'X');  // in whose place mkdtemp puts a name of its own
    if (mkdtemp(pattern.data()) == nullptr) throw std::runtime_error("no temporary directory");
    path_ = pattern;
  }
  ~TemporaryDirectory() {
    std::error_code ignored;
    std::filesystem::remove_all(path_, ignored);
  }
  TemporaryDirectory(const TemporaryDirectory&) = delete;
  TemporaryDirectory& operator=(const TemporaryDirectory&) = delete;

  const std::filesystem::path& Path() const { return path_; }

 private:
  std::filesystem::path path_;
};

/// Gives the pipes of a test a directory of their own, for as long as it lives.
class PipeDirectoryOfTest {
 public:
  PipeDirectoryOfTest() {
    const char* const before = std::getenv("XDG_RUNTIME_DIR");
    if (before != nullptr) before_ = before;
    setenv("XDG_RUNTIME_DIR", directory_.Path().c_str(), 1);
  }
  ~PipeDirectoryOfTest() {
    if (before_.empty()) {
      unsetenv("XDG_RUNTIME_DIR");
    } else {
      setenv("XDG_RUNTIME_DIR", before_.c_str(), 1);
    }
  }

  std::filesystem::path Path() const { return directory_.Path() / "vexg"; }

 private:
  TemporaryDirectory directory_;
  std::string before_;
};

}  // namespace lumo::test
