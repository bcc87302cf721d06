// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

// One call of a token service, as a person makes it: it takes no longer than wished, and ends at Ctrl-C.

#ifndef QUORLIN_CLI_SERVICECALL_H
#define QUORLIN_CLI_SERVICECALL_H

#include "quorlin/Progress.h"
#include "quorlin/Signals.h"

#include <quorlin/ServiceOptions.h>

#include <CLI/CLI.hpp>

#include <string>
#include <utility>

namespace Cli {

/// How long the call may take, how often it is tried, and by which way it goes.
struct CallOptions {
  int timeoutSec = 240;
  int connectTimeoutSec = 240;
  int retries = 0;
  std::string proxyUrl;
  std::string proxyUser;
  std::string proxyPasswordFile;
};

/// Adds --timeout, --connect-timeout, --retries, --proxy, --proxy-user and --proxy-password-file.
void AddCallOptions(CLI::App& command, CallOptions& options);

class ServiceCall final {
 public:
  /// Makes the service object. Throws what that throws, and UsageException for the password's file.
  ServiceCall(const Quorlin::SecurityTokenServiceConfig& config, const CallOptions& options);

  /// What `call` returns, which is given the service. On a terminal the wait is shown. SIGINT, SIGTERM and
  /// SIGHUP cancel the call; the program then ends by the signal after all is tidied up (see
  /// `EndByInterruption`).
  template <typename F>
  auto Run(const F& call) const -> decltype(call(std::declval<const Quorlin::SecurityTokenService&>())) {
    const Interruption interruption([this] { _cancellation->Cancel(); });
    const Progress progress;
    return call(*_service);
  }

 private:
  const Pelmar::Ref<Pelmar::System::CancellationHandle> _cancellation;
  const boost::shared_ptr<const Quorlin::SecurityTokenService> _service;
};

}  // namespace Cli

#endif  // QUORLIN_CLI_SERVICECALL_H
