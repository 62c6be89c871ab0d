#pragma once

#include <ostream>

namespace lumo {

/// Has a stream write floating-point numbers in scientific notation with 16 digits after the point,
/// while it lives.
class ScientificNotation {
 public:
  explicit ScientificNotation(std::ostream& out)
      : out_(out), flags_(out.flags()), precision_(out.precision(16)) {
    out.setf(std::ios::scientific, std::ios::floatfield);
  }
  ~ScientificNotation() {
    out_.flags(flags_);
    out_.precision(precision_);
  }
  ScientificNotation(const ScientificNotation&) = delete;
  ScientificNotation& operator=(const ScientificNotation&) = delete;

 private:
  std::ostream& out_;
  std::ios::fmtflags flags_;
  std::streamsize precision_;
};

}  // namespace lumo
