// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

#include <pelmar/service/LogFields.h>

namespace Pelmar {
namespace Service {

namespace {

// The source of the innermost context of this thread.
thread_local const LogFieldSource* currentSource = nullptr;

}  // namespace

LogContext::LogContext(const LogFieldSource& source) noexcept : _outer(currentSource) {
  currentSource = &source;
}

LogContext::~LogContext() {
  currentSource = _outer;
}

FieldLogSink::~FieldLogSink() = default;

void FieldLogSink::Write(const LogRecord& record) {
  LogFields fields;
  if (currentSource != nullptr) {
    currentSource->AddFields(fields);
  }
  WriteWithFields(record, fields);
}

}  // namespace Service
}  // namespace Pelmar
