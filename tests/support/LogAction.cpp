// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

#include "support/LogAction.h"

namespace TestSupport {

namespace {

Pelmar::Service::LogManager* GetManager() {
  return Pelmar::Service::GetApp()->GetLogManager();
}

}  // namespace

class LogAction::Sink final : public Pelmar::Service::LogSink {
 public:
  Sink(const std::string& start, const std::function<void()>& action) : _start(start), _action(action) {}

  void Write(const Pelmar::Service::LogRecord& record) override {
    if (record.logger != "Quorlin" || record.text.compare(0, _start.size(), _start) != 0) {
      return;
    }
    {
      const std::lock_guard<std::mutex> lock(_mutex);
      _lines.push_back(std::to_string(record.level) + " " + record.text);
    }
    _action();
  }

  std::vector<std::string> GetLines() const {
    const std::lock_guard<std::mutex> lock(_mutex);
    return _lines;
  }

 private:
  const std::string _start;
  const std::function<void()> _action;
  mutable std::mutex _mutex;
  std::vector<std::string> _lines;
};

LogAction::LogAction(const std::string& start, const std::function<void()>& action)
    : _levelsBefore(GetManager()->GetEnabledLevels()), _sink(Pelmar::MakeRef<Sink>(start, action)) {
  GetManager()->SetSink(_sink);
  GetManager()->SetEnabledLevels(Pelmar::Service::kAllLogLevels);
}

LogAction::~LogAction() {
  GetManager()->SetEnabledLevels(_levelsBefore);
  GetManager()->SetSink(nullptr);
}

std::vector<std::string> LogAction::GetLines() const {
  return _sink->GetLines();
}

}  // namespace TestSupport
