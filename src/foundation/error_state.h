#pragma once

#include <utility>

#include "platform/export.h"

namespace lumo {

/// How bad a stored state is. Only the error bit makes an object invalid.
enum Severity : unsigned { kSeverityNone = 0, kSeverityWarning = 2, kSeverityError = 4 };

/// A severity with the code of the error class that gave it; code 0 when there is none.
struct ErrorStateValue {
  unsigned severity = kSeverityNone;
  unsigned code = 0;
};

/// The absence of an error, and root of the error values: small objects made on the stack, stored
/// by their state and never thrown. They carry an identity (`code`) and no words.
class VEXG_EXPORT ObjectErrorState {
 public:
  explicit ObjectErrorState(unsigned code = 0) : code_(code) {}
  virtual ~ObjectErrorState() = default;

  /// The severity of the class with this object's code.
  virtual ErrorStateValue GetState() const { return {kSeverityNone, code_}; }

 protected:
  const unsigned code_;
};

/// Root of the errors: the object that stores one is not valid any more.
class VEXG_EXPORT ObjectError : public ObjectErrorState {
 public:
  using ObjectErrorState::ObjectErrorState;
  ErrorStateValue GetState() const override { return {kSeverityError, code_}; }
};

/// Root of the warnings: the object stays valid and work goes on.
class VEXG_EXPORT ObjectWarning : public ObjectErrorState {
 public:
  using ObjectErrorState::ObjectErrorState;
  ErrorStateValue GetState() const override { return {kSeverityWarning, code_}; }
};

/// Root of whatever can fail. An operation that fails stores the state of an error value here and
/// then returns false, a null pointer or an empty value; the state stays until it is cleared.
/// Threads: no protection; an object is used by one thread at a time unless its class says more.
///
///     if (!buffer.Flush() && buffer.GetErrorState().code == ObjectErrorIO::Code) …
///
/// A success doesn't clear the state of an earlier failure. The reason in words is not kept here
/// but with the thread, see fault.h.
class VEXG_EXPORT ErrorState {
 public:
  virtual ~ErrorState() = default;

  /// The state that was stored last; severity and code 0 when there is none.
  ErrorStateValue GetErrorState() const { return {severity_, code_}; }

  /// True when the stored severity has the error bit.
  bool HasError() const { return (severity_ & kSeverityError) != 0; }

  /// Stores the state of `error` in place of what was there.
  void SetErrorState(const ObjectErrorState& error) { Store(error.GetState()); }

  /// Takes over the state of another object.
  void SetErrorState(const ErrorState& other) { Store(other.GetErrorState()); }

  /// Trades states with another object.
  void Swap(ErrorState& other) noexcept {
    std::swap(severity_, other.severity_);
    std::swap(code_, other.code_);
  }

  /// Forgets the state: the object is valid again, as far as this goes.
  void ClearErrorState() { SetErrorState(ObjectErrorState()); }

 private:
  void Store(ErrorStateValue state) {
    severity_ = state.severity;
    code_ = state.code;
  }

  unsigned severity_ = kSeverityNone;
  unsigned code_ = 0;
};

}  // namespace lumo
