// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

// The development token service in a process of its own, so that what is measured here is the client alone.

#ifndef QUORLIN_BENCH_LOAD_SERVICEPROCESS_H
#define QUORLIN_BENCH_LOAD_SERVICEPROCESS_H

#include "devsts/Identity.h"

#include <quorlin/SecurityTokenServiceConfig.h>

#include <cstdint>
#include <string>

#include <sys/types.h>

namespace Bench {

/// A service that can be killed and started anew, with the same keys on the same port. Its processes are the
/// children of a helper that is forked off by the constructor, when this process has only one thread yet:
/// with more, what a lock in a forked child guards could be half done.
class ServiceProcess final {
 public:
  /// Make it before anything that starts threads. Throws std::exception of some kind.
  ServiceProcess();
  ServiceProcess(const ServiceProcess&) = delete;
  ServiceProcess& operator=(const ServiceProcess&) = delete;
  ~ServiceProcess();

  /// Returns when the service accepts connections. The first time it takes any free port, later the same one.
  void Start(unsigned delayMs);
  /// Ends it as if the machine had lost power.
  void Kill();

  /// How a client reaches it, over HTTPS.
  Quorlin::SecurityTokenServiceConfig MakeClientConfig() const;

 private:
  DevSts::CertificateAuthority _authority;
  DevSts::Identity _server;
  DevSts::Identity _signer;
  std::uint16_t _port = 0;
  int _channel = -1;
  pid_t _helper = -1;
};

}  // namespace Bench

#endif  // QUORLIN_BENCH_LOAD_SERVICEPROCESS_H
