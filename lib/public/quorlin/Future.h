// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

// The asynchronous operations as functions that return a std::future. Header only, built from the forms of
// SecurityTokenService that take a completion.

#ifndef QUORLIN_FUTURE_H
#define QUORLIN_FUTURE_H

#include <pelmar/Exception.h>
#include <quorlin/SamlToken.h>
#include <quorlin/SecurityTokenService.h>
#include <quorlin/TokenSpec.h>

#include <boost/optional.hpp>
#include <boost/shared_ptr.hpp>

#include <exception>
#include <future>
#include <memory>
#include <string>

namespace Quorlin {

/// Each function starts the operation of the same name and returns at once; the service and the arguments may
/// be released right away, but for what is held by a shared pointer, which the operation keeps.
///
/// The future becomes ready on a pool thread. Its `get` gives the result, or throws the operation's exception
/// as its own class, as the blocking operation would have. Is the operation given up without a result (the
/// process ends; an exception that is no Pelmar::Exception escapes from it), `get` throws std::future_error
/// with std::future_errc::broken_promise. A future that is destroyed does not wait, and does not end the
/// operation.
///
/// Threads: as the service, any. Each function throws std::bad_alloc, and Pelmar::Exception if no thread can
/// be started.
namespace Future {

typedef boost::shared_ptr<const SamlToken> Token;

/// What the functions below are made of: no interface.
namespace Detail {

/// `error` as an exception of its own class, which outlives the call that it was given to.
inline std::exception_ptr Keep(const Pelmar::Exception& error) {
  std::exception_ptr kept;
  try {
    error.Throw();
  } catch (...) {
    kept = std::current_exception();
  }
  return kept;
}

inline const boost::shared_ptr<const SamlToken>& GetResult(const boost::shared_ptr<const SamlToken>& token) {
  return token;
}

inline bool GetResult(const boost::optional<bool>& isValid) {
  return isValid.value();
}

/// Keeps the promise when it is called. The copies of it alone own the promise: should they be dropped
/// without a call, the promise breaks and whoever waits is told.
template <typename Result>
class Completion {
 public:
  Completion() : _promise(std::make_shared<std::promise<Result>>()) {}

  std::future<Result> GetFuture() const { return _promise->get_future(); }

  template <typename Value>
  void operator()(const Value& value, const Pelmar::Exception* error) const {
    if (error != nullptr) {
      _promise->set_exception(Keep(*error));
    } else {
      _promise->set_value(GetResult(value));
    }
  }

 private:
  std::shared_ptr<std::promise<Result>> _promise;
};

/// Calls `start` with a completion, and returns its future.
template <typename Result, typename Start>
std::future<Result> Begin(const Start& start) {
  const Completion<Result> done;
  std::future<Result> future = done.GetFuture();
  start(done);
  return future;
}

}  // namespace Detail

/// As SecurityTokenService::AcquireToken.
inline std::future<Token> AcquireToken(const SecurityTokenService& service, const std::string& userName,
                                       const std::string& password, const TokenSpec& spec) {
  return Detail::Begin<Token>(
      [&](const TokenCompletion& done) { service.AcquireTokenAsync(userName, password, spec, done); });
}

/// As SecurityTokenService::AcquireTokenByGSS; `handler` is called on the pool thread.
inline std::future<Token> AcquireTokenByGSS(const SecurityTokenService& service, const TokenSpec& spec,
                                            const boost::shared_ptr<NegotiationHandler>& handler) {
  return Detail::Begin<Token>(
      [&](const TokenCompletion& done) { service.AcquireTokenByGssAsync(spec, handler, done); });
}

/// As SecurityTokenService::AcquireTokenByCertificate.
inline std::future<Token> AcquireTokenByCertificate(const SecurityTokenService& service,
                                                    const TokenSpec& spec) {
  return Detail::Begin<Token>(
      [&](const TokenCompletion& done) { service.AcquireTokenByCertificateAsync(spec, done); });
}

/// As SecurityTokenService::AcquireTokenByToken.
inline std::future<Token> AcquireTokenByToken(const SecurityTokenService& service, const Token& token,
                                              const TokenSpec& spec) {
  return Detail::Begin<Token>(
      [&](const TokenCompletion& done) { service.AcquireTokenByTokenAsync(token, spec, done); });
}

/// As SecurityTokenService::ValidateSubject.
inline std::future<bool> ValidateSubject(const SecurityTokenService& service, const Token& token) {
  return Detail::Begin<bool>(
      [&](const ValidationCompletion& done) { service.ValidateSubjectAsync(token, done); });
}

/// As SecurityTokenService::RenewToken.
inline std::future<Token> RenewToken(const SecurityTokenService& service, const Token& token,
                                     long long lifetimeSec) {
  return Detail::Begin<Token>(
      [&](const TokenCompletion& done) { service.RenewTokenAsync(token, lifetimeSec, done); });
}

}  // namespace Future
}  // namespace Quorlin

#endif  // QUORLIN_FUTURE_H
