// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

// Catches the library's log lines.

#ifndef QUORLIN_TESTS_SUPPORT_RECORDINGLOGSINK_H
#define QUORLIN_TESTS_SUPPORT_RECORDINGLOGSINK_H

#include <pelmar/Ref.h>
#include <pelmar/service/Logger.h>

#include <mutex>
#include <string>
#include <vector>

namespace TestSupport {

/// Keeps the lines of one logger.
class RecordingLogSink final : public Pelmar::Service::LogSink {
 public:
  explicit RecordingLogSink(const std::string& logger);

  void Write(const Pelmar::Service::LogRecord& record) override;

  std::vector<Pelmar::Service::LogRecord> GetRecords() const;

 private:
  const std::string _logger;
  mutable std::mutex _mutex;
  std::vector<Pelmar::Service::LogRecord> _records;
};

/// Records the lines of the logger "Quorlin" as long as it lives; then the default sink and levels are back.
class LogRecording {
 public:
  explicit LogRecording(int enabledLevels = Pelmar::Service::kAllLogLevels);
  ~LogRecording();
  LogRecording(const LogRecording&) = delete;
  LogRecording& operator=(const LogRecording&) = delete;

  /// Each line as "<level> <text>", with "<id 1>" for the first UUID that occurs, "<id 2>" for the second,
  /// and so on.
  std::vector<std::string> GetLines() const;
  /// All texts as they were written.
  std::string GetEverything() const;

 private:
  const int _levelsBefore;
  const Pelmar::Ref<RecordingLogSink> _sink;
};

/// `text` with its UUIDs replaced; `known` holds those that have a number already and grows.
std::string MaskUuids(const std::string& text, std::vector<std::string>& known);

}  // namespace TestSupport

#endif  // QUORLIN_TESTS_SUPPORT_RECORDINGLOGSINK_H
