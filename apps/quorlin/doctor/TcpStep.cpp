// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

#include "quorlin/ConnectionAdvice.h"
#include "quorlin/doctor/Deadline.h"
#include "quorlin/doctor/Steps.h"

#include <cerrno>
#include <system_error>

namespace Cli {
namespace Doctor {

namespace {

/// How connecting to one address went.
struct Attempt {
  std::unique_ptr<Descriptor> socket;  ///< Null unless connected.
  int error = 0;
};

/// The result of a connect that could not be made at once.
int AwaitConnection(int socket, const Deadline& deadline) {
  if (!deadline.Await(socket, POLLOUT)) {
    return ETIMEDOUT;
  }
  int error = 0;
  socklen_t size = sizeof error;
  return getsockopt(socket, SOL_SOCKET, SO_ERROR, &error, &size) == 0 ? error : errno;
}

Attempt Connect(const Address& address, const Deadline& deadline) {
  Attempt attempt;
  auto opened = std::make_unique<Descriptor>(
      socket(address.bytes.ss_family, SOCK_STREAM | SOCK_CLOEXEC | SOCK_NONBLOCK, 0));
  if (opened->Get() < 0) {
    attempt.error = errno;
    return attempt;
  }
  if (connect(opened->Get(), reinterpret_cast<const sockaddr*>(&address.bytes), address.size) != 0) {
    attempt.error = errno == EINPROGRESS ? AwaitConnection(opened->Get(), deadline) : errno;
  }
  if (attempt.error == 0) {
    attempt.socket = std::move(opened);
  }
  return attempt;
}

std::string DescribeError(int error) {
  return std::generic_category().message(error);
}

/// In the words of the library, which says the same when it fails at this.
std::string DescribeFailure(const Patient& patient, int error) {
  if (error == ECONNREFUSED) {
    return "Connection refused by " + GetEndpoint(patient);
  }
  return "No connection to " + GetEndpoint(patient) +
         (error == ETIMEDOUT ? " within " + DescribeTimeout(patient) : ": " + DescribeError(error));
}

}  // namespace

Outcome CheckTcp(const Patient& patient, Findings& findings) {
  const Deadline deadline(patient.timeout);
  std::vector<std::string> refused;
  int lastError = 0;
  std::size_t left = findings.addresses.size();
  for (const Address& address : findings.addresses) {
    // The first address must not use up the time of the others.
    Attempt attempt = Connect(address, Deadline(deadline.GetRest() / left--));
    if (attempt.socket) {
      findings.socket = std::move(attempt.socket);
      Outcome outcome = Pass("connected to " + address.text);
      outcome.details = refused;
      outcome.data["address"] = address.text;
      return outcome;
    }
    lastError = attempt.error;
    refused.push_back("not to " + address.text + ": " + DescribeError(attempt.error));
  }
  const std::string message = DescribeFailure(patient, lastError);
  Outcome outcome = Fail(EXIT_UNREACHABLE, message, AdviseOnConnection(message));
  if (refused.size() > 1) {
    outcome.details = refused;
  }
  return outcome;
}

}  // namespace Doctor
}  // namespace Cli
