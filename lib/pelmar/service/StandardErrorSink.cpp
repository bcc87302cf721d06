// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

#include "pelmar/service/StandardErrorSink.h"

#include "pelmar/service/LogEscape.h"

#include <cstdio>

namespace Pelmar {
namespace Service {

namespace {

std::string GetLevelName(int level) {
  switch (level) {
    case LOG_PANIC:
      return "PANIC";
    case LOG_CRITICAL:
      return "CRITICAL";
    case LOG_ERROR:
      return "ERROR";
    case LOG_WARNING:
      return "WARNING";
    case LOG_NOTICE:
      return "NOTICE";
    case LOG_STATUS:
      return "STATUS";
    case LOG_INFO:
      return "INFO";
    default:
      return "LEVEL" + std::to_string(level);
  }
}

}  // namespace

std::string FormatLogLine(const LogRecord& record) {
  return record.time.ToString() + " " + GetLevelName(record.level) + " " + EscapeForLog(record.logger) +
         ": " + EscapeForLog(record.text) + "\n";
}

void StandardErrorSink::Write(const LogRecord& record) {
  const std::string line = FormatLogLine(record);
  std::fwrite(line.data(), 1, line.size(), stderr);
}

}  // namespace Service
}  // namespace Pelmar
