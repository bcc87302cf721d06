// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

#include "support/RecordingLogSink.h"

#include <algorithm>
#include <regex>

namespace TestSupport {

namespace {

Pelmar::Service::LogManager* Manager() {
  return Pelmar::Service::GetApp()->GetLogManager();
}

// 1 for the first.
std::size_t NumberOf(const std::string& uuid, std::vector<std::string>& known) {
  const auto place = std::find(known.begin(), known.end(), uuid);
  const std::size_t index = static_cast<std::size_t>(place - known.begin());
  if (place == known.end()) {
    known.push_back(uuid);
  }
  return index + 1;
}

}  // namespace

RecordingLogSink::RecordingLogSink(const std::string& logger) : _logger(logger) {}

void RecordingLogSink::Write(const Pelmar::Service::LogRecord& record) {
  if (record.logger != _logger) {
    return;
  }
  const std::lock_guard<std::mutex> lock(_mutex);
  _records.push_back(record);
}

std::vector<Pelmar::Service::LogRecord> RecordingLogSink::GetRecords() const {
  const std::lock_guard<std::mutex> lock(_mutex);
  return _records;
}

LogRecording::LogRecording(int enabledLevels)
    : _levelsBefore(Manager()->GetEnabledLevels()), _sink(Pelmar::MakeRef<RecordingLogSink>("Quorlin")) {
  Manager()->SetSink(_sink);
  Manager()->SetEnabledLevels(enabledLevels);
}

LogRecording::~LogRecording() {
  Manager()->SetEnabledLevels(_levelsBefore);
  Manager()->SetSink(nullptr);
}

std::vector<std::string> LogRecording::GetLines() const {
  std::vector<std::string> lines;
  std::vector<std::string> known;
  for (const Pelmar::Service::LogRecord& record : _sink->GetRecords()) {
    lines.push_back(std::to_string(record.level) + " " + MaskUuids(record.text, known));
  }
  return lines;
}

std::string LogRecording::GetEverything() const {
  std::string everything;
  for (const Pelmar::Service::LogRecord& record : _sink->GetRecords()) {
    everything += record.text + "\n";
  }
  return everything;
}

std::string MaskUuids(const std::string& text, std::vector<std::string>& known) {
  static const std::regex uuid("[0-9a-f]{8}-[0-9a-f]{4}-4[0-9a-f]{3}-[89ab][0-9a-f]{3}-[0-9a-f]{12}");
  std::string masked;
  std::string::const_iterator rest = text.begin();
  for (std::sregex_iterator it(text.begin(), text.end(), uuid), end; it != end; ++it) {
    masked.append(rest, (*it)[0].first);
    masked += "<id " + std::to_string(NumberOf(it->str(), known)) + ">";
    rest = (*it)[0].second;
  }
  return masked.append(rest, text.end());
}

}  // namespace TestSupport
