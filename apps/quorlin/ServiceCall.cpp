// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

#include "quorlin/ServiceCall.h"

#include "quorlin/Password.h"

namespace Cli {

namespace {

constexpr long long kMicrosecondsPerSecond = 1000000;
constexpr int kMaxTimeoutSec = static_cast<int>(Quorlin::kMaxOperationMicroseconds / kMicrosecondsPerSecond);

Quorlin::ServiceOptions MakeServiceOptions(
    const CallOptions& options, const Pelmar::Ref<Pelmar::System::CancellationHandle>& cancellation) {
  Quorlin::ServiceOptions made;
  made.timeoutMicroseconds = options.timeoutSec * kMicrosecondsPerSecond;
  made.connectTimeoutMicroseconds = options.connectTimeoutSec * kMicrosecondsPerSecond;
  made.maxRetries = options.retries;
  made.cancellation = cancellation;
  made.proxyUrl = options.proxyUrl;
  made.proxyUser = options.proxyUser;
  if (!options.proxyPasswordFile.empty()) {
    made.proxyPassword = ReadSecretFile(options.proxyPasswordFile).Reveal();
  }
  return made;
}

}  // namespace

void AddCallOptions(CLI::App& command, CallOptions& options) {
  command.add_option("--timeout", options.timeoutSec, "How long all may take, in seconds")
      ->type_name("SEC")
      ->check(CLI::Range(1, kMaxTimeoutSec))
      ->capture_default_str();
  command
      .add_option("--connect-timeout", options.connectTimeoutSec,
                  "How long connecting may take, TLS included")
      ->type_name("SEC")
      ->check(CLI::Range(1, kMaxTimeoutSec))
      ->capture_default_str();
  command
      .add_option("--retries", options.retries,
                  "Try again so often when the connection is refused or TLS is broken off")
      ->type_name("N")
      ->check(CLI::Range(0, static_cast<int>(Quorlin::kMaxRetries)))
      ->capture_default_str();
  CLI::Option* const proxy =
      command
          .add_option("--proxy", options.proxyUrl,
                      "Go through this HTTP proxy, http://HOST:PORT; the environment names none")
          ->type_name("URL");
  CLI::Option* const user =
      command.add_option("--proxy-user", options.proxyUser, "Log in to the proxy (Basic) as this user")
          ->needs(proxy)
          ->type_name("NAME");
  command.add_option("--proxy-password-file", options.proxyPasswordFile, "The password of --proxy-user")
      ->needs(user)
      ->type_name("FILE");
}

ServiceCall::ServiceCall(const Quorlin::SecurityTokenServiceConfig& config, const CallOptions& options)
    : _cancellation(Pelmar::System::CreateCancellationHandle()),
      _service(Quorlin::CreateSecurityTokenService(config, MakeServiceOptions(options, _cancellation))) {}

}  // namespace Cli
