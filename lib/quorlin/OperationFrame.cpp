// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

#include "quorlin/OperationFrame.h"

#include <pelmar/MessageFormatter.h>
#include <pelmar/service/Logger.h>

#include <string_view>

#include "quorlin/cancellation.h"
#include "quorlin/logging.h"
#include "quorlin/operationReports.h"

namespace Quorlin {

namespace {

// The innermost operation of this thread.
thread_local OperationFrame* current = nullptr;

void LogFrame(const char* format, const std::string& opId, const char* operation) {
  Pelmar::Service::LogInternal(getLogger(), kLogLevelInfo, format, Pelmar::StringFormatter(opId),
                               Pelmar::StringFormatter(operation));
}

template <typename Class>
bool Is(const Pelmar::Exception& error) {
  return dynamic_cast<const Class*>(&error) != nullptr;
}

}  // namespace

OperationFrame::OperationFrame(const std::string& opId, const char* operation)
    : _opId(opId), _operation(operation), _start(Clock::now()), _outer(current), _context(*this) {
  LogFrame("opId=%1 START operation SecurityTokenServiceImpl::%2", _opId, _operation);
  // Last: a frame whose line could not be written never comes to be.
  current = this;
}

OperationFrame::~OperationFrame() {
  current = _outer;
  // Taken once: the last line and the report tell the same duration.
  _end = Clock::now();
  _isOver = true;
  try {
    LogFrame("opId=%1 END operation SecurityTokenServiceImpl::%2", _opId, _operation);
  } catch (...) {
    // Only memory can run out here. A lost line is better than a process ended by a throwing destructor.
  }
  ReportOperation({_operation, _outcome, GetMicroseconds(), _attempt});
}

void OperationFrame::CountRetry() {
  if (current != nullptr) {
    ++current->_attempt;
  }
}

void OperationFrame::AddFields(Pelmar::Service::LogFields& fields) const {
  fields.push_back({"operation", _operation});
  fields.push_back({"operation_id", _opId});
  fields.push_back({"attempt", std::to_string(_attempt)});
  fields.push_back({"duration_us", std::to_string(GetMicroseconds())});
  if (_isOver) {
    fields.push_back({"outcome", GetOutcomeName(_outcome)});
  }
}

long long OperationFrame::GetMicroseconds() const {
  const Clock::duration duration = (_isOver ? _end : Clock::now()) - _start;
  return std::chrono::duration_cast<std::chrono::microseconds>(duration).count();
}

OperationOutcome Classify(const Pelmar::Exception& error) {
  if (Is<CommunicationException>(error)) {
    return std::string_view(error.what()) == kCancelledText ? OperationOutcome::CANCELLED
                                                            : OperationOutcome::COMMUNICATION;
  }
  if (Is<InvalidCredentialsException>(error)) {
    return OperationOutcome::INVALID_CREDENTIALS;
  }
  if (Is<InvalidTokenException>(error)) {
    return OperationOutcome::INVALID_TOKEN;
  }
  if (Is<SsoException>(error)) {
    return OperationOutcome::SERVICE_ERROR;
  }
  if (Is<Pelmar::InvalidArgumentException>(error) || Is<Pelmar::InvalidStateException>(error)) {
    return OperationOutcome::INVALID_ARGUMENT;
  }
  return OperationOutcome::OTHER;
}

}  // namespace Quorlin
