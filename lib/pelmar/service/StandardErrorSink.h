// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

// The sink that is in place until the host installs its own: one line per record on standard error.

#ifndef PELMAR_SERVICE_STANDARDERRORSINK_H
#define PELMAR_SERVICE_STANDARDERRORSINK_H

#include <pelmar/service/Logger.h>

#include <string>

namespace Pelmar {
namespace Service {

/// "<time> <LEVEL> <logger>: <text>" with a line feed at the end and none before it; logger and text are
/// escaped.
std::string FormatLogLine(const LogRecord& record);

/// Writes `FormatLogLine` to standard error, each line in one piece.
class StandardErrorSink final : public LogSink {
 public:
  void Write(const LogRecord& record) override;
};

}  // namespace Service
}  // namespace Pelmar

#endif  // PELMAR_SERVICE_STANDARDERRORSINK_H
