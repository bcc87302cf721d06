// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

#include "quorlin/OperationFrame.h"

#include <pelmar/MessageFormatter.h>
#include <pelmar/service/Logger.h>

#include "quorlin/logging.h"

namespace Quorlin {

namespace {

void LogFrame(const char* format, const std::string& opId, const std::string& operation) {
  Pelmar::Service::LogInternal(getLogger(), kLogLevelInfo, format, Pelmar::StringFormatter(opId),
                               Pelmar::StringFormatter(operation));
}

}  // namespace

OperationFrame::OperationFrame(const std::string& opId, const std::string& operation)
    : _opId(opId), _operation(operation) {
  LogFrame("opId=%1 START operation SecurityTokenServiceImpl::%2", _opId, _operation);
}

OperationFrame::~OperationFrame() {
  try {
    LogFrame("opId=%1 END operation SecurityTokenServiceImpl::%2", _opId, _operation);
  } catch (...) {
    // Only memory can run out here. A lost line is better than a process ended by a throwing destructor.
  }
}

}  // namespace Quorlin
