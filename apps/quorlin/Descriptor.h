// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

// Owns a file descriptor.

#ifndef QUORLIN_CLI_DESCRIPTOR_H
#define QUORLIN_CLI_DESCRIPTOR_H

#include <unistd.h>

namespace Cli {

/// Closes its descriptor at the end, unless it is one of the three standard streams, which belong to the
/// process.
class Descriptor final {
 public:
  explicit Descriptor(int number) : _number(number) {}
  Descriptor(const Descriptor&) = delete;
  Descriptor& operator=(const Descriptor&) = delete;
  ~Descriptor() {
    if (_number > STDERR_FILENO) {
      close(_number);
    }
  }
  /// Negative when opening failed.
  int Get() const { return _number; }

 private:
  int _number;
};

}  // namespace Cli

#endif  // QUORLIN_CLI_DESCRIPTOR_H
