// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

// The log manager and its loggers.

#ifndef PELMAR_SERVICE_LOGMANAGERIMPL_H
#define PELMAR_SERVICE_LOGMANAGERIMPL_H

#include <pelmar/service/Logger.h>

#include <atomic>
#include <map>
#include <mutex>
#include <string>

namespace Pelmar {
namespace Service {

/// What the loggers of one manager share. It outlives none of them: the manager and each logger own it
/// together.
class LogOutput final : public Object {
 public:
  LogOutput();

  bool IsEnabled(int level) const noexcept { return (level & GetEnabledLevels()) != 0; }
  void SetEnabledLevels(int levels) noexcept { _enabledLevels.store(levels, std::memory_order_relaxed); }
  int GetEnabledLevels() const noexcept { return _enabledLevels.load(std::memory_order_relaxed); }
  void SetSink(const Ref<LogSink>& sink);
  /// Hands the record to the present sink. A sink that throws loses the line and nothing else.
  void Write(const LogRecord& record) noexcept;

 private:
  Ref<LogSink> GetSink();

  std::atomic<int> _enabledLevels;
  std::mutex _mutex;
  Ref<LogSink> _sink;
};

class LogManagerImpl final : public LogManager {
 public:
  LogManagerImpl();

  void GetLogger(const std::string& name, int levels, Ref<Logger>& logger) override;
  void SetEnabledLevels(int levels) override;
  int GetEnabledLevels() const override;
  void SetSink(const Ref<LogSink>& sink) override;

 private:
  const Ref<LogOutput> _output;
  std::mutex _mutex;
  std::map<std::string, Ref<Logger>> _loggers;
};

}  // namespace Service
}  // namespace Pelmar

#endif  // PELMAR_SERVICE_LOGMANAGERIMPL_H
