// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

// Tells a person that the program is still at work.

#ifndef QUORLIN_CLI_PROGRESS_H
#define QUORLIN_CLI_PROGRESS_H

#include <condition_variable>
#include <mutex>
#include <thread>

namespace Cli {

/// While it lives, work that takes longer than a second shows its seconds on standard error, and takes them
/// away in the end. Only on a terminal: nothing of it ever gets into a file or another program.
class Progress final {
 public:
  Progress();
  Progress(const Progress&) = delete;
  Progress& operator=(const Progress&) = delete;
  ~Progress();

 private:
  void Show();

  std::mutex _mutex;
  std::condition_variable _ended;
  bool _isOver = false;  // Guarded by the mutex.
  std::thread _thread;
};

}  // namespace Cli

#endif  // QUORLIN_CLI_PROGRESS_H
