// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

// The library's exceptions.
//
// Every failure is reported by throwing; there are no error codes. Errors in a caller's arguments are the
// platform's Pelmar::InvalidArgumentException and Pelmar::InvalidStateException. All of them derive from
// Pelmar::Exception.

#ifndef QUORLIN_EXCEPTIONS_H
#define QUORLIN_EXCEPTIONS_H

#include <pelmar/Exception.h>
#include <quorlin/Export.h>

#include <string>

namespace Quorlin {

/// The service's answer is unusable, or a token it returned does not parse or validate. Base of all
/// exceptions of this library.
class QUORLIN_API SsoException : public Pelmar::Exception {
 public:
  explicit SsoException(const std::string& message);
  SsoException(const SsoException& other) noexcept;
  ~SsoException() noexcept override;
  /// A copy of the same dynamic class; the caller deletes it.
  Pelmar::Exception* Clone() const override;
  /// Throws a copy of this object as its own dynamic class.
  [[noreturn]] void Throw() const override;
};

/// Common base of all reasons to reject a token. Never thrown itself.
class QUORLIN_API InvalidTokenException : public SsoException {
 public:
  explicit InvalidTokenException(const std::string& message);
  InvalidTokenException(const InvalidTokenException& other) noexcept;
  ~InvalidTokenException() noexcept override;
  /// A copy of the same dynamic class; the caller deletes it.
  Pelmar::Exception* Clone() const override;
  /// Throws a copy of this object as its own dynamic class.
  [[noreturn]] void Throw() const override;
};

/// A token's XML signature does not verify against the trusted certificates.
class QUORLIN_API InvalidSignatureException : public InvalidTokenException {
 public:
  explicit InvalidSignatureException(const std::string& message);
  InvalidSignatureException(const InvalidSignatureException& other) noexcept;
  ~InvalidSignatureException() noexcept override;
  /// A copy of the same dynamic class; the caller deletes it.
  Pelmar::Exception* Clone() const override;
  /// Throws a copy of this object as its own dynamic class.
  [[noreturn]] void Throw() const override;
};

/// A token's XML is outside the accepted subset of SAML 2.0, or one of its conditions does not hold (expired,
/// not yet valid, inconsistent delegation).
class QUORLIN_API ParseException : public InvalidTokenException {
 public:
  explicit ParseException(const std::string& message);
  ParseException(const ParseException& other) noexcept;
  ~ParseException() noexcept override;
  /// A copy of the same dynamic class; the caller deletes it.
  Pelmar::Exception* Clone() const override;
  /// Throws a copy of this object as its own dynamic class.
  [[noreturn]] void Throw() const override;
};

/// The service could not be reached, the exchange failed, or the server answered with an error status.
class QUORLIN_API CommunicationException : public SsoException {
 public:
  explicit CommunicationException(const std::string& message);
  CommunicationException(const CommunicationException& other) noexcept;
  ~CommunicationException() noexcept override;
  /// A copy of the same dynamic class; the caller deletes it.
  Pelmar::Exception* Clone() const override;
  /// Throws a copy of this object as its own dynamic class.
  [[noreturn]] void Throw() const override;
};

/// The service rejected the credentials.
class QUORLIN_API InvalidCredentialsException : public SsoException {
 public:
  explicit InvalidCredentialsException(const std::string& message);
  InvalidCredentialsException(const InvalidCredentialsException& other) noexcept;
  ~InvalidCredentialsException() noexcept override;
  /// A copy of the same dynamic class; the caller deletes it.
  Pelmar::Exception* Clone() const override;
  /// Throws a copy of this object as its own dynamic class.
  [[noreturn]] void Throw() const override;
};

}  // namespace Quorlin

#endif  // QUORLIN_EXCEPTIONS_H
