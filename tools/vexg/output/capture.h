#pragma once

#include <iostream>
#include <sstream>
#include <string>

namespace lumo::host {

/// Keeps what a verb prints while it lives.
class Capture {
 public:
  Capture() : before_(std::cout.rdbuf(text_.rdbuf())) {}
  ~Capture() { std::cout.rdbuf(before_); }
  Capture(const Capture&) = delete;
  Capture& operator=(const Capture&) = delete;
  std::string Text() const { return text_.str(); }

 private:
  std::ostringstream text_;
  std::streambuf* const before_;
};

}  // namespace lumo::host
