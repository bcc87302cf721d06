// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

// What the doctor knows: what it was asked to look at, and what the steps have found so far.

#ifndef QUORLIN_CLI_DOCTOR_EXAMINATION_H
#define QUORLIN_CLI_DOCTOR_EXAMINATION_H

#include "quorlin/Descriptor.h"
#include "quorlin/ExitCode.h"
#include "quorlin/TokenOutput.h"

#include <pelmar/Ref.h>
#include <pelmar/crypto/Certificate.h>
#include <pelmar/http/Client.h>
#include <pelmar/http/Url.h>
#include <quorlin/SecurityTokenServiceConfig.h>

#include <sys/socket.h>

#include <chrono>
#include <list>
#include <memory>
#include <optional>
#include <string>
#include <vector>

namespace Cli {
namespace Doctor {

/// How long a step may take unless told otherwise, and at most.
constexpr int kDefaultTimeoutSec = 10;
constexpr int kMaxTimeoutSec = 300;

/// What is looked at. Everything that can be wrong with the arguments was found before there is one of these.
struct Patient {
  std::string url;
  Pelmar::Http::HttpURL parts;
  std::chrono::seconds timeout{kDefaultTimeoutSec};
  /// Empty: what the operating system trusts.
  std::list<Pelmar::Ref<const Pelmar::Crypto::Certificate>> authorities;
  /// Each "sha256//<base64>".
  std::vector<std::string> pins;
  /// How the library itself connects.
  Pelmar::Ref<Pelmar::Http::ConnectionSpec> connection;
  /// Absent: no certificate was given.
  boost::optional<Quorlin::HolderOfKeyConfig> holderOfKey;
  /// SERVICE@HOST; absent: Kerberos was not asked for.
  std::optional<std::string> kerberosService;
};

/// An address to connect to.
struct Address {
  sockaddr_storage bytes;
  socklen_t size;
  std::string text;  ///< "127.0.0.1:443", "[::1]:443".
};

/// What a step leaves to the steps after it.
struct Findings {
  std::vector<Address> addresses;
  std::unique_ptr<Descriptor> socket;
  Pelmar::Ref<Pelmar::Http::ClientResponse> response;
  std::string body;
  /// Between these the service has answered; microseconds since 1970-01-01T00:00:00Z.
  long long askedAt = 0;
  long long answeredAt = 0;
  /// The instant of the Timestamp in the answer's security header; absent: there is none.
  std::optional<long long> answerCreated;
};

enum class Status { PASSED, WARNING, FAILED, SKIPPED, NOT_REACHED };

/// What a step has found.
struct Outcome {
  Status status = Status::PASSED;
  std::string found;                 ///< One line. May hold anything that a server sends.
  std::vector<std::string> details;  ///< Lines below it.
  std::string advice;                ///< What to do; empty when there is nothing to do.
  ExitCode exitCode = EXIT_DONE;     ///< Of the program, if the step has failed.
  Json data = Json::object();        ///< What was found, for programs.
};

Outcome Pass(const std::string& found);
/// The step does not apply, for the reason `found`.
Outcome Skip(const std::string& found);
Outcome Warn(const std::string& found, const std::string& advice);
Outcome Fail(ExitCode exitCode, const std::string& found, const std::string& advice);

/// Whether the host is an IP address and no name.
bool IsAddress(const std::string& host);

/// "HOST:PORT" of the URL, as the library names it in its messages.
std::string GetEndpoint(const Patient& patient);

/// "10 s"
std::string DescribeTimeout(const Patient& patient);

}  // namespace Doctor
}  // namespace Cli

#endif  // QUORLIN_CLI_DOCTOR_EXAMINATION_H
