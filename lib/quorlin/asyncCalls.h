// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

// Turns a blocking call into one that runs on the platform's thread pool and reports to a completion
// function.

#ifndef QUORLIN_ASYNCCALLS_H
#define QUORLIN_ASYNCCALLS_H

#include <pelmar/Exception.h>
#include <pelmar/system/ThreadPool.h>

#include <boost/shared_ptr.hpp>

#include <type_traits>
#include <utility>

namespace Quorlin {

/// Binds an object that is held by a shared pointer to a call that takes it by reference, and keeps it alive
/// as long as the bound call. A null pointer is a programming error, found when the call is made.
template <typename T>
class PassByRefHelper {
 public:
  explicit PassByRefHelper(boost::shared_ptr<T> object) : _object(std::move(object)) {}

  // Implicit, because that is how a bound argument becomes the parameter.
  operator T&() const { return *_object; }

 private:
  boost::shared_ptr<T> _object;
};

/// Runs `call` and reports to `done`: its result and null, or `errorValue` and the Pelmar::Exception that
/// escaped from it, which lives during the call of `done` only. Other exceptions, and those of `done`,
/// escape.
template <typename F, typename R, typename Value>
void SyncCallToResultFunc(const F& call, const R& done, const Value& errorValue) {
  Value result(errorValue);
  try {
    result = call();
  } catch (const Pelmar::Exception& error) {
    done(errorValue, &error);
    return;
  }
  // Outside the handler: what `done` throws about a success is not a failure of `call`.
  done(result, nullptr);
}

/// Queues copies of the three on the platform's thread pool, to run `SyncCallToResultFunc` there, and
/// returns.
template <typename F, typename R, typename Value>
void SyncToAsyncCall(const F& call, const R& done, const Value& errorValue) {
  // A closure and not another bind, which would take a bound `call` for an argument to be evaluated.
  Pelmar::System::GetThreadPool()->Queue(
      [call, done, errorValue] { SyncCallToResultFunc<F, R, Value>(call, done, errorValue); });
}

/// The same with a default-constructed result as the error value.
template <typename F, typename R>
void SyncToAsyncCall(const F& call, const R& done) {
  SyncToAsyncCall(call, done, std::decay_t<decltype(call())>());
}

}  // namespace Quorlin

#endif  // QUORLIN_ASYNCCALLS_H
