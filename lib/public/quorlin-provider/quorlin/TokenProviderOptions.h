// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

// How a token provider is to behave, and what it takes from its host: the time, threads, and an ear for what
// happens.

#ifndef QUORLIN_TOKENPROVIDEROPTIONS_H
#define QUORLIN_TOKENPROVIDEROPTIONS_H

#include <pelmar/Exception.h>
#include <quorlin/Export.h>
#include <quorlin/SamlToken.h>
#include <quorlin/TokenSpec.h>

#include <boost/function.hpp>
#include <boost/shared_ptr.hpp>

namespace Quorlin {

/// Tells a provider the time. A host derives its own to test with. Called from several threads at once, and
/// by each GetToken(): it must be quick and must not throw.
class QUORLIN_API TokenProviderClock {
 public:
  /// Now, in microseconds since 1970-01-01T00:00:00Z.
  virtual long long GetUtcTime() const = 0;

 protected:
  /// Not virtual: clocks are held by shared pointers that were made with the concrete class.
  ~TokenProviderClock() {}
};

/// Runs a provider's work later, on other threads. A host derives its own to run it on an event loop's
/// threads, or step by step in a test. Called from several threads at once.
class QUORLIN_API TokenProviderScheduler {
 public:
  typedef boost::function<void()> Work;

  /// Takes care that a copy of `work` is run once, when `delayMicroseconds` (0: none) have passed. It must
  /// not be run within this call, and this call must not wait for other work to end: the provider holds a
  /// lock meanwhile. Work may block for as long as a request to the token service takes. Returns a number
  /// that Cancel knows it by. What it throws is survived: the provider then asks when the next call needs it
  /// to.
  virtual unsigned long long Schedule(long long delayMicroseconds, const Work& work) = 0;
  /// Forgets the work. Work that has begun, is done or is not known stays as it is, and is not waited for.
  /// Must not throw.
  virtual void Cancel(unsigned long long number) = 0;

 protected:
  /// Not virtual: schedulers are held by shared pointers that were made with the concrete class.
  ~TokenProviderScheduler() {}
};

/// Told what a provider does by itself. Called on the thread that made the request, which may be one that is
/// inside GetToken(), after the result has been handed out, with no lock held. What it throws is lost. One
/// last call may be under way when the provider has just been destroyed: the provider's share of the observer
/// lives until then.
class QUORLIN_API TokenProviderObserver {
 public:
  /// There is a new token; `renewed` tells whether it is the old one's renewal.
  virtual void OnRefreshed(const boost::shared_ptr<const SamlToken>& token, bool renewed) = 0;
  /// Getting a new token failed. `error` is valid during the call. The provider tries again in
  /// `retryInMicroseconds`; a negative number: not before Invalidate().
  virtual void OnFailed(const Pelmar::Exception& error, long long retryInMicroseconds) = 0;

 protected:
  /// Not virtual: observers are held by shared pointers that were made with the concrete class.
  ~TokenProviderObserver() {}
};

/// What CreateTokenProvider needs beside the service and the way to ask. A plain value; only the lifetime in
/// `spec` must be set.
struct QUORLIN_API TokenProviderOptions {
  /// The values said at each member; no observer, the system's clock, the platform's threads.
  TokenProviderOptions();
  ~TokenProviderOptions();
  TokenProviderOptions(const TokenProviderOptions& other);
  TokenProviderOptions& operator=(const TokenProviderOptions& other);

  TokenSpec spec;  ///< What each token is to be. The lifetime must be positive.
  /// How many seconds a token that is handed out shall still hold, at least: 60. Below the lifetime that
  /// `spec` asks for, and at most a year.
  long long minimumLifeSec;
  /// After how much of the time until only `minimumLifeSec` are left the next token is got in the background,
  /// in percent: 80. From 1 to 100.
  int refreshPercent;
  /// By how much of it each waiting time (that until a refresh, those between retries) is cut at most, by
  /// chance, so that many processes do not ask at the same moment; in percent: 10. From 0 to 90.
  int jitterPercent;
  /// Seconds between the first failure and the next try: 1. Doubled with each further failure. At least 1.
  long long firstRetrySec;
  /// Seconds between tries at most: 60. From `firstRetrySec` to a day.
  long long maxRetrySec;
  boost::shared_ptr<TokenProviderObserver> observer;    ///< May be null.
  boost::shared_ptr<const TokenProviderClock> clock;    ///< Null: the system's.
  boost::shared_ptr<TokenProviderScheduler> scheduler;  ///< Null: the platform's thread pool.
};

}  // namespace Quorlin

#endif  // QUORLIN_TOKENPROVIDEROPTIONS_H
