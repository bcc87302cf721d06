// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

#include <pelmar/service/Logger.h>

#include <pelmar/Verify.h>

#include "pelmar/service/LogManagerImpl.h"

namespace Pelmar {
namespace Service {

namespace {

constexpr const char* kSource = "lib/pelmar/service/Logger";

class ApplicationImpl final : public Application {
 public:
  LogManager* GetLogManager() override { return &_logManager; }

 private:
  LogManagerImpl _logManager;
};

bool IsEnabled(const Logger* logger, int level) {
  Verify(logger != nullptr, "logger != nullptr", kSource);
  return logger->IsEnabled(level);
}

}  // namespace

LogSink::~LogSink() = default;

Logger::~Logger() = default;

Application* GetApp() {
  static ApplicationImpl* const application = new ApplicationImpl;
  return application;
}

void LogInternal(Logger* logger, int level, const char* format) {
  if (IsEnabled(logger, level)) {
    logger->Write(level, MessageFormatter(format).ToString());
  }
}

void LogInternal(Logger* logger, int level, const char* format, const PrintFormatter& first) {
  if (IsEnabled(logger, level)) {
    logger->Write(level, MessageFormatter(format).Add(first).ToString());
  }
}

void LogInternal(Logger* logger, int level, const char* format, const PrintFormatter& first,
                 const PrintFormatter& second) {
  if (IsEnabled(logger, level)) {
    logger->Write(level, MessageFormatter(format).Add(first).Add(second).ToString());
  }
}

}  // namespace Service
}  // namespace Pelmar
