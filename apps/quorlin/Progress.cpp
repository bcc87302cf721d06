// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

#include "quorlin/Progress.h"

#include <chrono>
#include <iostream>
#include <string>

#include <unistd.h>

namespace Cli {

namespace {

/// Back to the start of the line, and nothing in it (ECMA-48, EL).
constexpr const char* kWipe = "\r\033[K";

}  // namespace

Progress::Progress() {
  if (isatty(STDERR_FILENO) == 1) {
    _thread = std::thread([this] { Show(); });
  }
}

Progress::~Progress() {
  if (!_thread.joinable()) {
    return;
  }
  {
    const std::lock_guard<std::mutex> lock(_mutex);
    _isOver = true;
  }
  _ended.notify_one();
  _thread.join();
}

void Progress::Show() {
  const auto start = std::chrono::steady_clock::now();
  std::unique_lock<std::mutex> lock(_mutex);
  int seconds = 1;
  while (!_ended.wait_until(lock, start + std::chrono::seconds(seconds), [this] { return _isOver; })) {
    std::cerr << kWipe + ("Waiting for the service ... " + std::to_string(seconds) + " s") << std::flush;
    ++seconds;
  }
  if (seconds > 1) {
    std::cerr << kWipe << std::flush;
  }
}

}  // namespace Cli
