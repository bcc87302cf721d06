// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

// What a host's monitoring is told of the token service operations: which, how it ended, how long it took.

#ifndef QUORLIN_OPERATIONMETRICS_H
#define QUORLIN_OPERATIONMETRICS_H

#include <quorlin/Export.h>

#include <boost/shared_ptr.hpp>

namespace Quorlin {

/// How an operation ended: a closed list, so that it can be a label.
enum class OperationOutcome {
  SUCCESS,              ///< It returned. A subject that is not valid any more is an answer, too.
  INVALID_ARGUMENT,     ///< Pelmar::InvalidArgumentException or InvalidStateException: the caller's fault.
  COMMUNICATION,        ///< CommunicationException: no answer, or an HTTP error status.
  CANCELLED,            ///< The CommunicationException "The operation was cancelled.": the host wanted it so.
  INVALID_CREDENTIALS,  ///< InvalidCredentialsException: the service rejected the credentials.
  INVALID_TOKEN,        ///< InvalidTokenException: the returned token's signature does not verify.
  SERVICE_ERROR,        ///< Any other SsoException: another fault, or an unusable answer or token.
  OTHER                 ///< Any other exception.
};

/// The name for logs and labels: "success", "invalid_argument", "communication", "cancelled",
/// "invalid_credentials", "invalid_token", "service_error", "other". Lives as long as the process.
QUORLIN_API const char* GetOutcomeName(OperationOutcome outcome);

/// One operation that has ended. Holds nothing of the user, the request or the token.
struct OperationReport {
  /// The blocking operation's name, as "AcquireTokenByCertificate": one of six. An asynchronous operation has
  /// the name of the blocking one that it runs. Lives as long as the process.
  const char* operation;
  OperationOutcome outcome;
  /// From START to END, by a clock that nobody sets. Waiting for a thread of the pool is not part of it.
  long long durationMicroseconds;
  /// How often the request was tried: 1, and one more for each retry.
  int attempts;
};

/// Told of each operation that ends. A host derives its own, which counts.
class QUORLIN_API OperationMetrics {
 public:
  /// Called once per operation of every service object, on the thread that runs it, by several threads at
  /// once, after the operation's END line and before its caller, or its completion, gets the result. It
  /// delays them: count, and return. What it throws is lost.
  virtual void OperationEnded(const OperationReport& report) = 0;

 protected:
  /// Not virtual: the shared pointer was made with the concrete class.
  ~OperationMetrics() {}
};

/// From now on `metrics` is told of the operations of the whole process, in place of what was installed
/// before; a null pointer: nobody is. May be called on any thread; operations that are ending on other
/// threads may still report to the one before. For that reason, and because the library takes no lock,
/// whatever was installed is kept until the process ends: install once, at the start. Throws std::bad_alloc.
QUORLIN_API void InstallOperationMetrics(const boost::shared_ptr<OperationMetrics>& metrics);

}  // namespace Quorlin

#endif  // QUORLIN_OPERATIONMETRICS_H
