// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

// Keeps what the library reports to the host's metrics.

#ifndef QUORLIN_TESTS_SUPPORT_RECORDINGMETRICS_H
#define QUORLIN_TESTS_SUPPORT_RECORDINGMETRICS_H

#include <quorlin/OperationMetrics.h>

#include <boost/make_shared.hpp>
#include <boost/shared_ptr.hpp>

#include <mutex>
#include <string>
#include <vector>

namespace TestSupport {

class RecordingMetrics final : public Quorlin::OperationMetrics {
 public:
  void OperationEnded(const Quorlin::OperationReport& report) override {
    const std::lock_guard<std::mutex> lock(_mutex);
    _reports.push_back(report);
  }

  std::vector<Quorlin::OperationReport> GetReports() const {
    const std::lock_guard<std::mutex> lock(_mutex);
    return _reports;
  }

  /// Each report as "<operation> <outcome> <attempts>".
  std::vector<std::string> GetLines() const {
    std::vector<std::string> lines;
    for (const Quorlin::OperationReport& report : GetReports()) {
      lines.push_back(std::string(report.operation) + " " + Quorlin::GetOutcomeName(report.outcome) + " " +
                      std::to_string(report.attempts));
    }
    return lines;
  }

 private:
  mutable std::mutex _mutex;
  std::vector<Quorlin::OperationReport> _reports;
};

/// Metrics of its own are installed as long as it lives; then there are none.
class MetricsRecording {
 public:
  MetricsRecording() : metrics(boost::make_shared<RecordingMetrics>()) {
    Quorlin::InstallOperationMetrics(metrics);
  }
  ~MetricsRecording() { Quorlin::InstallOperationMetrics(boost::shared_ptr<RecordingMetrics>()); }
  MetricsRecording(const MetricsRecording&) = delete;
  MetricsRecording& operator=(const MetricsRecording&) = delete;

  const boost::shared_ptr<RecordingMetrics> metrics;
};

}  // namespace TestSupport

#endif  // QUORLIN_TESTS_SUPPORT_RECORDINGMETRICS_H
