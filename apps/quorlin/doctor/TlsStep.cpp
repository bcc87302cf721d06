// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

#include "quorlin/CertificateText.h"
#include "quorlin/ConnectionAdvice.h"
#include "quorlin/doctor/Handshake.h"
#include "quorlin/doctor/Steps.h"

#include <algorithm>
#include <utility>

namespace Cli {
namespace Doctor {

namespace {

constexpr const char* kPinAdvice =
    "Ask the service's operator, by another way, whether its key was replaced. Only if it was, and this is the new "
    "one, give that as --pin; otherwise somebody stands between.";

void DescribeChain(const ServerChain& chain, Outcome& outcome) {
  for (std::size_t i = 0; i < chain.certificates.size(); ++i) {
    const Pelmar::Ref<const Pelmar::Crypto::Certificate> certificate = Read(chain.certificates[i]);
    std::string line = std::to_string(i + 1) + ". ";
    line += certificate ? PrintCertificate(*certificate) : "a certificate that cannot be read";
    Json json = certificate ? DescribeCertificate(*certificate) : Json::object();
    if (chain.error != X509_V_OK && i == chain.culprit) {
      const std::string problem = X509_verify_cert_error_string(chain.error);
      line += " <-- " + problem;
      json["problem"] = problem;
    }
    outcome.details.push_back(line);
    outcome.data["certificates"].push_back(json);
  }
}

void CheckPins(const Patient& patient, const std::string& pin, Outcome& outcome) {
  if (patient.pins.empty()) {
    return;
  }
  if (std::find(patient.pins.begin(), patient.pins.end(), pin) != patient.pins.end()) {
    outcome.found += "; its key is pinned";
    return;
  }
  outcome.status = Status::FAILED;
  outcome.exitCode = EXIT_UNREACHABLE;
  outcome.found = "Public key of " + patient.parts.host + " matches none of the pins";
  outcome.advice = kPinAdvice;
  outcome.details.insert(outcome.details.begin(), "the key is " + pin);
}

Outcome DescribeSecured(const Patient& patient, const Handshake& handshake) {
  Outcome outcome = Pass(handshake.protocol + ", " + handshake.cipher);
  outcome.data["protocol"] = handshake.protocol;
  outcome.data["cipher"] = handshake.cipher;
  DescribeChain(handshake.chain, outcome);
  if (!handshake.chain.certificates.empty()) {
    const CertificateHandle& server = handshake.chain.certificates.front();
    const std::vector<std::string> names = ReadNames(server);
    const std::string pin = ComputePin(server);
    outcome.found += "; the certificate is for " + Join(names);
    outcome.data["names"] = names;
    outcome.data["pin"] = pin;
    CheckPins(patient, pin, outcome);
  }
  return outcome;
}

}  // namespace

Outcome CheckTls(const Patient& patient, Findings& findings) {
  // A server that takes one connection at a time must be free for the next step.
  const std::unique_ptr<Descriptor> socket = std::move(findings.socket);
  if (!patient.parts.isHttps) {
    return Skip("the URL is http:, so nothing hides what is sent");
  }
  Handshake handshake;
  MakeHandshake(patient, socket->Get(), handshake);
  if (handshake.isDone) {
    return DescribeSecured(patient, handshake);
  }
  const std::string message =
      handshake.failure.empty() ? DescribeProblem(handshake.chain, patient.parts.host) : handshake.failure;
  Outcome outcome = Fail(EXIT_UNREACHABLE, message, AdviseOnConnection(message));
  DescribeChain(handshake.chain, outcome);
  return outcome;
}

}  // namespace Doctor
}  // namespace Cli
