// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

// What goes around every operation: the pair of log lines, the fields of all lines between them, the report
// to the host's metrics.

#ifndef QUORLIN_OPERATIONFRAME_H
#define QUORLIN_OPERATIONFRAME_H

#include <pelmar/Exception.h>
#include <pelmar/StringUtil.h>
#include <pelmar/service/LogFields.h>
#include <quorlin/Exceptions.h>
#include <quorlin/OperationMetrics.h>

#include <chrono>
#include <string>

namespace Quorlin {

/// Logs that an operation starts, and at the end of the scope, however it is left, that it ends. Both lines
/// carry the operation's id. Then reports the operation to the metrics. Bound to its thread.
class OperationFrame final : private Pelmar::Service::LogFieldSource {
 public:
  /// `operation` is kept as it is: a literal.
  OperationFrame(const std::string& opId, const char* operation);
  ~OperationFrame();

  OperationFrame(const OperationFrame&) = delete;
  OperationFrame& operator=(const OperationFrame&) = delete;

  /// Until it is called the outcome is OTHER.
  void SetOutcome(OperationOutcome outcome) { _outcome = outcome; }
  /// The request of the operation that this thread is in is about to be tried once more. Whoever sends does
  /// not know the operation; so it is found by the thread.
  static void CountRetry();

 private:
  typedef std::chrono::steady_clock Clock;

  void AddFields(Pelmar::Service::LogFields& fields) const override;
  long long GetMicroseconds() const;

  const std::string _opId;
  const char* const _operation;
  const Clock::time_point _start;
  Clock::time_point _end;  // Set when the operation is over.
  bool _isOver = false;
  OperationOutcome _outcome = OperationOutcome::OTHER;
  int _attempt = 1;
  OperationFrame* const _outer;  // The operation, if any, in whose course this one is run.
  // The last field, so that every line of this frame finds the others.
  const Pelmar::Service::LogContext _context;
};

/// The outcome that an exception out of an operation stands for.
OperationOutcome Classify(const Pelmar::Exception& error);

/// What `steps` returns, in a frame.
template <typename Steps>
auto RunOperation(const char* operation, const Steps& steps) {
  OperationFrame frame(Pelmar::StringUtil::GenerateUuid(), operation);
  try {
    auto result = steps();
    frame.SetOutcome(OperationOutcome::SUCCESS);
    return result;
  } catch (const Pelmar::Exception& error) {
    frame.SetOutcome(Classify(error));
    throw;
  } catch (const InvalidTokenException*) {
    // The one kind of token that is refused by pointer, which goes on to the caller.
    frame.SetOutcome(OperationOutcome::INVALID_TOKEN);
    throw;
  }
}

}  // namespace Quorlin

#endif  // QUORLIN_OPERATIONFRAME_H
