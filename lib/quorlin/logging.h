// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

// The library's one logger, and the levels it is used with.

#ifndef QUORLIN_LOGGING_H
#define QUORLIN_LOGGING_H

#include <pelmar/service/Logger.h>

namespace Quorlin {

/// Ordinary lines: operations, requests, results.
constexpr int kLogLevelInfo = Pelmar::Service::LOG_INFO;
/// A contract of the library was stretched by its caller.
constexpr int kLogLevelWarning = Pelmar::Service::LOG_WARNING;

/// The platform logger "Quorlin", which every log line of the library goes through. Never null; lives as long
/// as the process. May be called from any thread, and takes no lock once the logger is known.
Pelmar::Service::Logger* getLogger();

}  // namespace Quorlin

#endif  // QUORLIN_LOGGING_H
