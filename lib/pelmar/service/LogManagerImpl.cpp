// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

#include "pelmar/service/LogManagerImpl.h"

#include "pelmar/service/StandardErrorSink.h"

#include <exception>

namespace Pelmar {
namespace Service {

namespace {

class LoggerImpl final : public Logger {
 public:
  LoggerImpl(const std::string& name, int levels, const Ref<LogOutput>& output)
      : _name(name), _levels(levels), _output(output) {}

  const std::string& GetName() const override { return _name; }
  bool IsEnabled(int level) const override { return _output->IsEnabled(level & _levels); }

  void Write(int level, const std::string& text) override {
    if (IsEnabled(level)) {
      _output->Write({_name, level, System::GetUtcDateTime(), text});
    }
  }

 private:
  const std::string _name;
  const int _levels;
  const Ref<LogOutput> _output;
};

}  // namespace

LogOutput::LogOutput() : _enabledLevels(kDefaultLogLevels), _sink(MakeRef<StandardErrorSink>()) {}

void LogOutput::SetSink(const Ref<LogSink>& sink) {
  Ref<LogSink> replaced = sink ? sink : Ref<LogSink>(MakeRef<StandardErrorSink>());
  const std::lock_guard<std::mutex> lock(_mutex);
  _sink.Swap(replaced);
  // The old sink goes after the lock: its destructor is the host's code and may log.
}

Ref<LogSink> LogOutput::GetSink() {
  const std::lock_guard<std::mutex> lock(_mutex);
  return _sink;
}

void LogOutput::Write(const LogRecord& record) noexcept {
  try {
    GetSink()->Write(record);
  } catch (...) {
    // Lines are written while other exceptions travel, from destructors too: a failing sink must not end the
    // process, and there is no place left to tell.
  }
}

LogManagerImpl::LogManagerImpl() : _output(MakeRef<LogOutput>()) {}

void LogManagerImpl::GetLogger(const std::string& name, int levels, Ref<Logger>& logger) {
  const std::lock_guard<std::mutex> lock(_mutex);
  Ref<Logger>& known = _loggers[name];
  if (!known) {
    known = MakeRef<LoggerImpl>(name, levels, _output);
  }
  logger = known;
}

void LogManagerImpl::SetEnabledLevels(int levels) {
  _output->SetEnabledLevels(levels);
}

int LogManagerImpl::GetEnabledLevels() const {
  return _output->GetEnabledLevels();
}

void LogManagerImpl::SetSink(const Ref<LogSink>& sink) {
  _output->SetSink(sink);
}

}  // namespace Service
}  // namespace Pelmar
