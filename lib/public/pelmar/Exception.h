// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

// The exception root and the exceptions that every layer of the platform may raise.

#ifndef PELMAR_EXCEPTION_H
#define PELMAR_EXCEPTION_H

#include <pelmar/Export.h>

#include <exception>
#include <memory>
#include <string>
#include <vector>

namespace Pelmar {

class Exception;

/// Root of all exceptions of the platform and of the libraries above it.
///
/// A small value: the message and the addresses of the frames that raised it. Copies keep both and cannot
/// fail. It derives from `std::exception`, so a host's outermost handler sees it too. The order of the
/// virtual operations is fixed: destructor, `what`, `GetBacktrace`, `Dump`, `Where`, `Clone`, `Throw`.
class PELMAR_API Throwable : public std::exception {
 public:
  explicit Throwable(const std::string& message);
  Throwable(const Throwable& other) noexcept;
  Throwable& operator=(const Throwable& other) noexcept;
  ~Throwable() noexcept override;

  /// The message, exactly as the raising code composed it.
  const char* what() const noexcept override;
  /// Return addresses of the frames that were active when the exception was made, innermost first.
  virtual const std::vector<void*>& GetBacktrace() const;
  /// Class name, message and backtrace as text of several lines, for a developer's eyes.
  virtual std::string Dump() const;
  /// The innermost frame of the backtrace as one line of text; empty when none was recorded.
  virtual std::string Where() const;
  /// A copy of the same dynamic class, made with `new`; the caller deletes it.
  virtual Exception* Clone() const = 0;
  /// Throws a copy of this object as its own dynamic class.
  [[noreturn]] virtual void Throw() const = 0;

 private:
  struct Record;
  // Shared by all copies and never changed, so that copying cannot fail and copies may cross threads.
  std::shared_ptr<const Record> _record;
};

/// Base of every exception that a caller can meaningfully handle.
class PELMAR_API Exception : public Throwable {
 public:
  explicit Exception(const std::string& message);
  Exception(const Exception& other) noexcept;
  Exception& operator=(const Exception& other) = default;
  ~Exception() noexcept override;
  Exception* Clone() const override;
  [[noreturn]] void Throw() const override;
};

/// A caller's argument cannot be used. The message is "Invalid argument : " followed by the given reason.
class PELMAR_API InvalidArgumentException : public Exception {
 public:
  explicit InvalidArgumentException(const std::string& reason);
  InvalidArgumentException(const InvalidArgumentException& other) noexcept;
  InvalidArgumentException& operator=(const InvalidArgumentException& other) = default;
  ~InvalidArgumentException() noexcept override;
  Exception* Clone() const override;
  [[noreturn]] void Throw() const override;
};

/// An operation was called on an object that is not set up for it.
class PELMAR_API InvalidStateException : public Exception {
 public:
  explicit InvalidStateException(const std::string& message);
  InvalidStateException(const InvalidStateException& other) noexcept;
  InvalidStateException& operator=(const InvalidStateException& other) = default;
  ~InvalidStateException() noexcept override;
  Exception* Clone() const override;
  [[noreturn]] void Throw() const override;
};

/// An object was viewed as a type that it does not have.
class PELMAR_API TypeMismatchException : public Exception {
 public:
  explicit TypeMismatchException(const std::string& message);
  TypeMismatchException(const TypeMismatchException& other) noexcept;
  TypeMismatchException& operator=(const TypeMismatchException& other) = default;
  ~TypeMismatchException() noexcept override;
  Exception* Clone() const override;
  [[noreturn]] void Throw() const override;
};

/// Text that should be base64 (RFC 4648, section 4) is not.
class PELMAR_API Base64FormatException : public Exception {
 public:
  explicit Base64FormatException(const std::string& message);
  Base64FormatException(const Base64FormatException& other) noexcept;
  Base64FormatException& operator=(const Base64FormatException& other) = default;
  ~Base64FormatException() noexcept override;
  Exception* Clone() const override;
  [[noreturn]] void Throw() const override;
};

}  // namespace Pelmar

#endif  // PELMAR_EXCEPTION_H
