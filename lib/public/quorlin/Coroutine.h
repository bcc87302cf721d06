// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

// The asynchronous operations for co_await. Header only, built from the forms of SecurityTokenService that
// take a completion. The one header that is C++20.

#ifndef QUORLIN_COROUTINE_H
#define QUORLIN_COROUTINE_H

#if __cplusplus < 202002L
#error "quorlin/Coroutine.h needs C++20"
#endif

#include <pelmar/Exception.h>
#include <quorlin/Exceptions.h>
#include <quorlin/SamlToken.h>
#include <quorlin/SecurityTokenService.h>
#include <quorlin/TokenSpec.h>

#include <boost/optional.hpp>
#include <boost/shared_ptr.hpp>

#include <atomic>
#include <coroutine>
#include <functional>
#include <future>
#include <memory>
#include <optional>
#include <stop_token>
#include <string>
#include <utility>

namespace Quorlin {

/// Each function makes an Operation, to be awaited at once, in any coroutine:
///
///     const auto token = co_await Quorlin::Coroutine::AcquireToken(service, user, password, spec);
///
/// What is awaited starts when it is awaited. The expression has the operation's result, or throws its
/// exception as its own class, as the blocking operation would have. Is the operation given up without a
/// result (the process ends; an exception that is no Pelmar::Exception escapes from it), it throws
/// std::future_error with std::future_errc::broken_promise. If the operation cannot be started it throws
/// std::bad_alloc, or Pelmar::Exception if there is no thread for it.
///
/// Cancelling: once a stop is requested of the given token, the coroutine goes on with CommunicationException
/// "The operation was cancelled.", unless the operation has ended before. It goes on exactly once, whichever
/// comes first. The operation itself runs to its end on its pool thread, and what it brings is dropped; to
/// end that too, cancel it by the handle of the service (ServiceOptions). Nothing is sent when the stop was
/// requested before.
///
/// Where the coroutine goes on: on the pool thread that the operation ran on, when that has ended; on the
/// thread that requests the stop, inside request_stop, when that has ended the wait; and without having been
/// suspended where either came about before. No lock is held, of ours or of the platform; so request no stop
/// while you hold one that the coroutine takes. Until the coroutine is suspended again it holds the thread
/// that it goes on on.
///
/// Destroying a coroutine that waits here is allowed: nothing of it is touched any more, and what the
/// operation brings is dropped. As with every coroutine, whoever destroys it sees to it that it is suspended
/// and is not going on on another thread at that moment; if in doubt, request a stop and let it end.
///
/// The service and the token are shared, for a coroutine may be gone before the call that it has started.
namespace Coroutine {

typedef boost::shared_ptr<const SamlToken> Token;
typedef boost::shared_ptr<const SecurityTokenService> Service;

/// What an Operation is made of: no interface.
namespace Detail {

/// How the wait ended. With none of the three the operation was given up.
template <typename Result>
struct Ending {
  std::optional<Result> result;
  std::unique_ptr<const Pelmar::Exception> error;
  bool isCancelled = false;
};

/// Where those that may end the wait meet the coroutine that waits. Owned by all of them; so it is there when
/// the coroutine is not any more. Two atomic steps and no lock: the first to claim the ending writes it;
/// then, the coroutine goes on by whichever comes second, the ending or the suspension.
template <typename Result>
class Meeting {
 public:
  /// Ends the wait, and resumes the coroutine if it is suspended. Does nothing if it has ended or was left.
  void End(Ending<Result> ending) {
    if (_isClaimed.exchange(true, std::memory_order_acq_rel)) {
      return;
    }
    _ending = std::move(ending);
    if (_phase.exchange(Phase::ENDED, std::memory_order_acq_rel) == Phase::SUSPENDED) {
      _coroutine.resume();
    }
  }

  /// The coroutine is gone, or will not wait: from now on nobody resumes it.
  void Leave() { _isClaimed.store(true, std::memory_order_release); }

  bool IsEnded() const { return _phase.load(std::memory_order_acquire) == Phase::ENDED; }

  /// False if the wait has ended before: the coroutine goes on at once. After true the coroutine may be
  /// running, or gone.
  bool Suspend(std::coroutine_handle<> coroutine) {
    _coroutine = coroutine;
    Phase expected = Phase::RUNNING;
    return _phase.compare_exchange_strong(expected, Phase::SUSPENDED, std::memory_order_acq_rel);
  }

  Ending<Result> TakeEnding() { return std::move(_ending); }

 private:
  enum class Phase { RUNNING, SUSPENDED, ENDED };

  std::atomic<bool> _isClaimed{false};
  std::atomic<Phase> _phase{Phase::RUNNING};
  std::coroutine_handle<> _coroutine;  // Written before SUSPENDED.
  Ending<Result> _ending;              // Written before ENDED.
};

/// The completion. When the last copy is dropped and none was called, the operation was given up.
template <typename Result>
class Completion {
 public:
  explicit Completion(const std::shared_ptr<Meeting<Result>>& meeting)
      : _lastCopy(std::make_shared<const LastCopy>(meeting)) {}

  template <typename Value>
  void operator()(const Value& value, const Pelmar::Exception* error) const {
    Ending<Result> ending;
    if (error != nullptr) {
      ending.error.reset(error->Clone());
    } else {
      ending.result = GetResult(value);
    }
    _lastCopy->meeting->End(std::move(ending));
  }

 private:
  struct LastCopy {
    explicit LastCopy(const std::shared_ptr<Meeting<Result>>& ended) : meeting(ended) {}
    LastCopy(const LastCopy&) = delete;
    LastCopy& operator=(const LastCopy&) = delete;
    ~LastCopy() { meeting->End(Ending<Result>()); }
    const std::shared_ptr<Meeting<Result>> meeting;
  };

  static const Token& GetResult(const Token& token) { return token; }
  static bool GetResult(const boost::optional<bool>& isValid) { return isValid.value(); }

  std::shared_ptr<const LastCopy> _lastCopy;
};

/// What a requested stop calls. Makes no exception yet: nothing may be thrown here, and memory may be out.
template <typename Result>
class Stop {
 public:
  explicit Stop(const std::shared_ptr<Meeting<Result>>& meeting) : _meeting(meeting) {}

  void operator()() const {
    // A copy: the coroutine that goes on destroys this object.
    const std::shared_ptr<Meeting<Result>> meeting = _meeting;
    Ending<Result> ending;
    ending.isCancelled = true;
    meeting->End(std::move(ending));
  }

 private:
  std::shared_ptr<Meeting<Result>> _meeting;
};

}  // namespace Detail

/// One operation, to be awaited once. Made by the functions below.
template <typename Result>
class [[nodiscard]] Operation final {
 public:
  typedef std::function<void(const Detail::Completion<Result>&)> Start;

  /// `start` is given the completion.
  Operation(Start start, std::stop_token stop)
      : _start(std::move(start)),
        _stop(std::move(stop)),
        _meeting(std::make_shared<Detail::Meeting<Result>>()) {}
  ~Operation() { _meeting->Leave(); }

  Operation(const Operation&) = delete;
  Operation& operator=(const Operation&) = delete;

  bool await_ready() const noexcept { return false; }

  // Never inlined into the coroutine, and without a local variable: the coroutine may be gone before this
  // function returns, and compilers have put such variables into its frame.
  [[gnu::noinline]] bool await_suspend(std::coroutine_handle<> coroutine) {
    Begin();
    return _meeting->Suspend(coroutine);
  }

  Result await_resume() {
    _onStop.reset();
    Detail::Ending<Result> ending = _meeting->TakeEnding();
    if (ending.isCancelled) {
      throw CommunicationException("The operation was cancelled.");
    }
    if (ending.error) {
      ending.error->Throw();
    }
    if (!ending.result) {
      throw std::future_error(std::future_errc::broken_promise);
    }
    return *std::move(ending.result);
  }

 private:
  // The coroutine is not suspended before this has returned, whatever ends meanwhile; so what the operation
  // is given stays alive during the call that starts it. The arguments, a password perhaps, go with that
  // call.
  void Begin() {
    const Start start = std::exchange(_start, nullptr);
    _onStop.emplace(_stop, Detail::Stop<Result>(_meeting));
    if (!_meeting->IsEnded()) {
      start(Detail::Completion<Result>(_meeting));
    }
  }

  Start _start;
  std::stop_token _stop;
  std::shared_ptr<Detail::Meeting<Result>> _meeting;
  std::optional<std::stop_callback<Detail::Stop<Result>>> _onStop;
};

/// As SecurityTokenService::AcquireToken.
inline Operation<Token> AcquireToken(Service service, std::string userName, std::string password,
                                     TokenSpec spec, std::stop_token stop = {}) {
  return {[service = std::move(service), userName = std::move(userName), password = std::move(password),
           spec = std::move(spec)](const TokenCompletion& done) {
            service->AcquireTokenAsync(userName, password, spec, done);
          },
          std::move(stop)};
}

/// As SecurityTokenService::AcquireTokenByGSS; `handler` is called on the pool thread.
inline Operation<Token> AcquireTokenByGSS(Service service, TokenSpec spec,
                                          boost::shared_ptr<NegotiationHandler> handler,
                                          std::stop_token stop = {}) {
  return {[service = std::move(service), spec = std::move(spec), handler = std::move(handler)](
              const TokenCompletion& done) { service->AcquireTokenByGssAsync(spec, handler, done); },
          std::move(stop)};
}

/// As SecurityTokenService::AcquireTokenByCertificate.
inline Operation<Token> AcquireTokenByCertificate(Service service, TokenSpec spec,
                                                  std::stop_token stop = {}) {
  return {[service = std::move(service), spec = std::move(spec)](const TokenCompletion& done) {
            service->AcquireTokenByCertificateAsync(spec, done);
          },
          std::move(stop)};
}

/// As SecurityTokenService::AcquireTokenByToken.
inline Operation<Token> AcquireTokenByToken(Service service, Token token, TokenSpec spec,
                                            std::stop_token stop = {}) {
  return {[service = std::move(service), token = std::move(token), spec = std::move(spec)](
              const TokenCompletion& done) { service->AcquireTokenByTokenAsync(token, spec, done); },
          std::move(stop)};
}

/// As SecurityTokenService::ValidateSubject.
inline Operation<bool> ValidateSubject(Service service, Token token, std::stop_token stop = {}) {
  return {[service = std::move(service), token = std::move(token)](const ValidationCompletion& done) {
            service->ValidateSubjectAsync(token, done);
          },
          std::move(stop)};
}

/// As SecurityTokenService::RenewToken.
inline Operation<Token> RenewToken(Service service, Token token, long long lifetimeSec,
                                   std::stop_token stop = {}) {
  return {[service = std::move(service), token = std::move(token), lifetimeSec](const TokenCompletion& done) {
            service->RenewTokenAsync(token, lifetimeSec, done);
          },
          std::move(stop)};
}

}  // namespace Coroutine
}  // namespace Quorlin

#endif  // QUORLIN_COROUTINE_H
