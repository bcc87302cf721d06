// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

// Does something the moment the library logs a certain line.

#ifndef QUORLIN_TESTS_SUPPORT_LOGACTION_H
#define QUORLIN_TESTS_SUPPORT_LOGACTION_H

#include <pelmar/Ref.h>
#include <pelmar/service/Logger.h>

#include <functional>
#include <mutex>
#include <string>
#include <vector>

namespace TestSupport {

/// While it lives, each line of the logger "Quorlin" that begins with `start` is kept, and `action` is called
/// on the thread that logs it.
class LogAction final {
 public:
  LogAction(const std::string& start, const std::function<void()>& action);
  LogAction(const LogAction&) = delete;
  LogAction& operator=(const LogAction&) = delete;
  ~LogAction();

  std::vector<std::string> GetLines() const;

 private:
  class Sink;

  const int _levelsBefore;
  const Pelmar::Ref<Sink> _sink;
};

}  // namespace TestSupport

#endif  // QUORLIN_TESTS_SUPPORT_LOGACTION_H
