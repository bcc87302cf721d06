// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

#include "quorlin-provider/TokenKeeper.h"

#include <pelmar/Exception.h>
#include <quorlin/Exceptions.h>

#include <utility>

#include "quorlin-provider/Timing.h"

namespace Quorlin {

namespace {

using Token = boost::shared_ptr<const SamlToken>;

/// For OnFailed: nothing is tried before Invalidate().
constexpr long long kNotBeforeInvalidate = -1;

Failure MakeClosedFailure() {
  return std::make_shared<Pelmar::InvalidStateException>("The token provider was destroyed.");
}

long long GetEnd(const SamlToken& token) {
  return token.GetEndDate().GetUtcTime();
}

/// Where the scheduler takes no work, somebody still has to be told.
void CompleteHere(const TokenProviderScheduler::Work& call) noexcept {
  try {
    call();
  } catch (...) {
    // Nobody is there to hear of it.
  }
}

bool IsRenewable(const SamlToken& token) {
  return token.IsRenewable() && token.GetConfirmationMethod() == SamlToken::CONFIRM_HOLDER_OF_KEY;
}

}  // namespace

TokenKeeper::TokenKeeper(const boost::shared_ptr<const SecurityTokenService>& service,
                         const TokenRequest& request, const TokenProviderOptions& options)
    : _service(service), _request(request), _options(options), _chance(std::random_device()()) {
  GetOutOfMemoryFailure();
}

// ---- Callers ----

TokenKeeper::Token TokenKeeper::Get() {
  if (Token token = _cache.Find(_options.clock->GetUtcTime())) {
    return token;
  }
  // The provider, which owns this object, may be destroyed while this call waits.
  const std::shared_ptr<TokenKeeper> self = shared_from_this();
  Lock lock(_mutex);
  Answer answer = FindAnswer();
  while (!answer.IsGiven()) {
    const std::shared_ptr<Flight> joined = _flight;
    if (joined) {
      Await(lock, *joined);
    }
    const std::shared_ptr<Flight> flight = joined ? joined : Fly(lock);
    // What was asked for before Invalidate() is no answer for anybody.
    answer = flight->isAbandoned || _isClosed ? FindAnswer() : AnswerAfter(*flight);
  }
  lock.unlock();
  if (!answer.token) {
    answer.failure->Throw();
  }
  return answer.token;
}

void TokenKeeper::GetAsync(const TokenCompletion& done) {
  if (done.empty()) {
    throw Pelmar::InvalidArgumentException("TokenCompletion must not be empty");
  }
  Completions completions(1, done);
  Lock lock(_mutex);
  const Answer answer = FindAnswer();
  if (answer.IsGiven()) {
    lock.unlock();
    Complete(completions, answer);
    return;
  }
  // A flight that ends answers everybody who waits; without one somebody has to begin it.
  if (!_flight) {
    RequestRound();
  }
  _completions.splice(_completions.end(), completions);
}

void TokenKeeper::Invalidate() {
  const Lock lock(_mutex);
  Forget();
}

void TokenKeeper::InvalidateToken(const SamlToken& rejected) {
  const Lock lock(_mutex);
  if (_token && _token->GetId() == rejected.GetId()) {
    Forget();
  }
}

void TokenKeeper::Close() {
  Completions completions;
  {
    const Lock lock(_mutex);
    _isClosed = true;
    Disarm();
    completions.swap(_completions);
  }
  _changed.notify_all();
  if (!completions.empty()) {
    Complete(completions, {Token(), MakeClosedFailure()});
  }
}

// ---- What there is to say, without asking ----

TokenKeeper::Answer TokenKeeper::FindAnswer() {
  if (_isClosed) {
    return {Token(), MakeClosedFailure()};
  }
  const long long now = _options.clock->GetUtcTime();
  if (_token && now <= GetFreshThrough(GetEnd(*_token), _options)) {
    return {_token, Failure()};
  }
  if (_failure && IsValid()) {
    // Retries are the timer's affair, not that of a caller who has something to go on with.
    if (!_flight && !_isArmed && !_isStopped) {
      Arm(0);
    }
    return {_token, Failure()};
  }
  if (_failure && !_flight && (_isStopped || now < _retryAt)) {
    return {Token(), _failure};
  }
  return Answer();
}

TokenKeeper::Answer TokenKeeper::AnswerAfter(const Flight& flight) const {
  return !flight.result.token && IsValid() ? Answer{_token, Failure()} : flight.result;
}

bool TokenKeeper::IsValid() const {
  return _token && _options.clock->GetUtcTime() < GetEnd(*_token);
}

void TokenKeeper::Forget() {
  _token.reset();
  _cache.Clear();
  _failure.reset();
  _failures = 0;
  _isStopped = false;
  Disarm();
  if (_flight) {
    _flight->isAbandoned = true;
  }
}

// ---- Flights ----

std::shared_ptr<TokenKeeper::Flight> TokenKeeper::Fly(Lock& lock) {
  const std::shared_ptr<Flight> flight = std::make_shared<Flight>();
  _flight = flight;
  Disarm();
  const Token previous = IsValid() ? _token : Token();
  lock.unlock();
  Ask(previous, *flight);
  lock.lock();
  flight->isDone = true;
  _flight.reset();
  _changed.notify_all();
  if (!flight->isAbandoned && !_isClosed) {
    HandOut(lock, *flight);
  }
  return flight;
}

/// Keeps what the flight brought and tells everybody but those in Await, who look for themselves.
void TokenKeeper::HandOut(Lock& lock, const Flight& flight) {
  const long long retryIn = flight.result.failure ? KeepFailure(flight.result.failure) : 0;
  if (flight.result.token) {
    Keep(flight.result.token);
  }
  Completions completions;
  completions.swap(_completions);
  const Answer answer = AnswerAfter(flight);
  lock.unlock();
  Complete(completions, answer);
  Report(flight, retryIn);
  lock.lock();
}

void TokenKeeper::Await(Lock& lock, const Flight& flight) {
  _changed.wait(lock, [&] { return flight.isDone || _isClosed; });
}

void TokenKeeper::Ask(const Token& previous, Flight& flight) const noexcept {
  try {
    if (!previous || !IsRenewable(*previous) || !TryToRenew(previous, flight)) {
      flight.result.token = RequireFresh(_request(*_service, _options.spec));
    }
  } catch (...) {
    flight.result.failure = KeepCurrentException();
  }
}

bool TokenKeeper::TryToRenew(const Token& previous, Flight& flight) const {
  try {
    flight.result.token = RequireFresh(_service->RenewToken(*previous, _options.spec.tokenLifetimeSec));
    flight.isRenewal = true;
  } catch (const CommunicationException&) {
    throw;  // Who does not answer this request does not answer another.
  } catch (const SsoException&) {
    return false;  // The service answers, but does not renew this token any more.
  } catch (const Pelmar::InvalidStateException&) {
    return false;  // There is no key to renew with: the host's own way to ask uses another service.
  }
  return true;
}

TokenKeeper::Token TokenKeeper::RequireFresh(const Token& token) const {
  if (!token) {
    throw SsoException("The request for a token gave no token");
  }
  if (GetFreshThrough(GetEnd(*token), _options) < _options.clock->GetUtcTime()) {
    throw SsoException("The new token ends at " + token->GetEndDate().ToString() +
                       ", and so holds for less than " + std::to_string(_options.minimumLifeSec) +
                       " seconds");
  }
  return token;
}

void TokenKeeper::Keep(const Token& token) {
  _token = token;
  _failure.reset();
  _failures = 0;
  const long long freshThrough = GetFreshThrough(GetEnd(*token), _options);
  _cache.Store(token, freshThrough);
  Arm(GetRefreshDelay(freshThrough - _options.clock->GetUtcTime(), _options, DrawChance()));
}

/// When the next try is due, as OnFailed tells it.
long long TokenKeeper::KeepFailure(const Failure& failure) {
  _failure = failure;
  if (dynamic_cast<const InvalidCredentialsException*>(failure.get()) != nullptr) {
    _isStopped = true;
    return kNotBeforeInvalidate;
  }
  ++_failures;
  const long long delay = GetRetryDelay(_failures, _options, DrawChance());
  _retryAt = _options.clock->GetUtcTime() + delay;
  Arm(delay);
  return delay;
}

void TokenKeeper::Report(const Flight& flight, long long retryIn) const noexcept {
  if (!_options.observer) {
    return;
  }
  try {
    if (flight.result.failure) {
      _options.observer->OnFailed(*flight.result.failure, retryIn);
    } else {
      _options.observer->OnRefreshed(flight.result.token, flight.isRenewal);
    }
  } catch (...) {
    // An observer's trouble is not the caller's.
  }
}

// ---- Scheduled work ----

void TokenKeeper::Arm(long long delayMicroseconds) {
  const unsigned long long number = ++_armed;
  const std::weak_ptr<TokenKeeper> self = shared_from_this();
  try {
    _timer = _options.scheduler->Schedule(delayMicroseconds, [self, number] {
      if (const std::shared_ptr<TokenKeeper> keeper = self.lock()) {
        keeper->RunTimer(number);
      }
    });
    _isArmed = true;
  } catch (...) {
    // Without a timer the next caller who needs a new token asks for it.
  }
}

void TokenKeeper::Disarm() {
  if (_isArmed) {
    _options.scheduler->Cancel(_timer);
  }
  _isArmed = false;
  ++_armed;  // The timer may be on its way already.
}

void TokenKeeper::RunTimer(unsigned long long number) {
  Lock lock(_mutex);
  if (number == _armed && !_isClosed && !_flight) {
    Fly(lock);
    ServeWaiting(lock);
  }
}

/// Has ServeWaiting called on a thread that may block.
void TokenKeeper::RequestRound() {
  const std::weak_ptr<TokenKeeper> self = shared_from_this();
  _options.scheduler->Schedule(0, [self] {
    if (const std::shared_ptr<TokenKeeper> keeper = self.lock()) {
      Lock lock(keeper->_mutex);
      keeper->ServeWaiting(lock);
    }
  });
}

/// Asks on behalf of those who wait without a thread of their own, until they have an answer or somebody else
/// asks.
void TokenKeeper::ServeWaiting(Lock& lock) {
  while (!_completions.empty() && !_flight) {
    const Answer answer = FindAnswer();
    if (!answer.IsGiven()) {
      Fly(lock);
      continue;
    }
    Completions completions;
    completions.swap(_completions);
    lock.unlock();
    Complete(completions, answer);
    lock.lock();
  }
}

/// Each on a thread of the scheduler: this one may be a caller's own.
void TokenKeeper::Complete(const Completions& completions, const Answer& answer) const noexcept {
  for (const TokenCompletion& done : completions) {
    const auto call = [done, answer] {
      done(answer.token, answer.token ? nullptr : answer.failure.get());
    };
    try {
      _options.scheduler->Schedule(0, call);
    } catch (...) {
      CompleteHere(call);
    }
  }
}

double TokenKeeper::DrawChance() {
  return std::uniform_real_distribution<double>(0, 1)(_chance);
}

}  // namespace Quorlin
