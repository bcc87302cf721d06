// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

#include "bench/load/ProcessFigures.h"

#include <filesystem>
#include <fstream>
#include <iterator>
#include <stdexcept>
#include <string>

#include <sys/resource.h>

namespace Bench {

namespace {

/// A number of /proc/self/status: "VmRSS:      1234 kB".
std::size_t ReadStatus(const std::string& name) {
  std::ifstream status("/proc/self/status");
  for (std::string line; std::getline(status, line);) {
    if (line.compare(0, name.size() + 1, name + ":") == 0) {
      return std::stoul(line.substr(name.size() + 1));
    }
  }
  throw std::runtime_error("/proc/self/status has no " + name);
}

std::size_t CountEntries(const char* directory) {
  const std::filesystem::directory_iterator begin(directory);
  return static_cast<std::size_t>(std::distance(begin, std::filesystem::directory_iterator()));
}

}  // namespace

std::size_t GetResidentKib() {
  return ReadStatus("VmRSS");
}

std::size_t GetPeakResidentKib() {
  return ReadStatus("VmHWM");
}

void ForgetPeak() {
  std::ofstream("/proc/self/clear_refs") << "5";
}

double GetProcessorSeconds() {
  rusage usage = {};
  getrusage(RUSAGE_SELF, &usage);
  const auto toSeconds = [](const timeval& time) {
    return static_cast<double>(time.tv_sec) + static_cast<double>(time.tv_usec) / 1e6;
  };
  return toSeconds(usage.ru_utime) + toSeconds(usage.ru_stime);
}

std::size_t CountDescriptors() {
  return CountEntries("/proc/self/fd");
}

std::size_t CountThreads() {
  return CountEntries("/proc/self/task");
}

}  // namespace Bench
