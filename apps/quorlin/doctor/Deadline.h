// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

// Waiting for sockets, but not for ever.

#ifndef QUORLIN_CLI_DOCTOR_DEADLINE_H
#define QUORLIN_CLI_DOCTOR_DEADLINE_H

#include <poll.h>

#include <cerrno>
#include <chrono>

namespace Cli {
namespace Doctor {

/// A point in time until which a step may wait.
class Deadline final {
 public:
  explicit Deadline(std::chrono::milliseconds span) : _end(std::chrono::steady_clock::now() + span) {}

  /// Never negative.
  std::chrono::milliseconds GetRest() const {
    const auto rest = std::chrono::ceil<std::chrono::milliseconds>(_end - std::chrono::steady_clock::now());
    return rest.count() > 0 ? rest : std::chrono::milliseconds(0);
  }

  /// Waits until the socket is ready for `events` (poll(2)), which includes that it is broken. False when the
  /// time is up.
  bool Await(int socket, short events) const {
    for (;;) {
      pollfd entry = {socket, events, 0};
      const int count = poll(&entry, 1, static_cast<int>(GetRest().count()));
      if (count > 0 || (count < 0 && errno != EINTR)) {
        return true;
      }
      if (count == 0 && GetRest().count() == 0) {
        return false;
      }
    }
  }

 private:
  std::chrono::steady_clock::time_point _end;
};

}  // namespace Doctor
}  // namespace Cli

#endif  // QUORLIN_CLI_DOCTOR_DEADLINE_H
