// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

// Ending when asked to.

#ifndef QUORLIN_CLI_SIGNALS_H
#define QUORLIN_CLI_SIGNALS_H

#include <functional>
#include <thread>

#include <signal.h>

namespace Cli {

/// Holds SIGINT, SIGTERM and SIGHUP back from this thread, and from all that it starts, as long as it lives.
/// Make it before anything that starts threads.
class StopSignals final {
 public:
  StopSignals();
  StopSignals(const StopSignals&) = delete;
  StopSignals& operator=(const StopSignals&) = delete;
  /// Signals that came and were not waited for take their usual effect now.
  ~StopSignals();

  /// Returns when one of the signals came.
  void Wait() const;

  const sigset_t& Get() const { return _signals; }

 private:
  sigset_t _signals;
  sigset_t _before;
};

/// While it lives, one of the held signals ends the program: `cleanUp` is called on a thread of its own, and
/// then the signal takes effect.
class StopWatch final {
 public:
  StopWatch(const StopSignals& signals, const std::function<void()>& cleanUp);
  StopWatch(const StopWatch&) = delete;
  StopWatch& operator=(const StopWatch&) = delete;
  ~StopWatch();

 private:
  void Watch() const;

  int _signals;
  int _end;
  std::function<void()> _cleanUp;
  std::thread _thread;
};

/// While it lives, the first of those signals calls `cancel`, on a thread of its own, and no more; a second
/// one ends the program at once. Make it before anything that starts threads.
class Interruption final {
 public:
  explicit Interruption(const std::function<void()>& cancel);
  Interruption(const Interruption&) = delete;
  Interruption& operator=(const Interruption&) = delete;
  ~Interruption();

 private:
  void Watch() const;

  const StopSignals _held;
  int _signals;
  int _end;
  std::function<void()> _cancel;
  std::thread _thread;
};

/// If a signal came to an Interruption, has it take its effect now, which ends the program. For when all is
/// tidied up and said.
void EndByInterruption();

}  // namespace Cli

#endif  // QUORLIN_CLI_SIGNALS_H
