// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

// The pair of log lines around every operation.

#ifndef QUORLIN_OPERATIONFRAME_H
#define QUORLIN_OPERATIONFRAME_H

#include <string>

namespace Quorlin {

/// Logs that an operation starts, and at the end of the scope, however it is left, that it ends. Both lines
/// carry the operation's id.
class OperationFrame {
 public:
  OperationFrame(const std::string& opId, const std::string& operation);
  ~OperationFrame();

  OperationFrame(const OperationFrame&) = delete;
  OperationFrame& operator=(const OperationFrame&) = delete;

 private:
  const std::string _opId;
  const std::string _operation;
};

}  // namespace Quorlin

#endif  // QUORLIN_OPERATIONFRAME_H
