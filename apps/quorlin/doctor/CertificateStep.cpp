// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

#include "quorlin/CertificateText.h"
#include "quorlin/Terminal.h"
#include "quorlin/doctor/Steps.h"

#include <pelmar/crypto/CryptoException.h>
#include <pelmar/ssl/SSLContext.h>

namespace Cli {
namespace Doctor {

namespace {

/// Time enough to get a new one.
constexpr long long kMinRestMicroseconds = 7LL * 24 * 60 * 60 * 1000000;

bool BelongTogether(const Quorlin::HolderOfKeyConfig& identity) {
  Pelmar::Ssl::SSLContextOptions options;
  options.clientKey = identity.privateKey;
  options.clientCertificate = identity.certificate;
  try {
    Pelmar::Ssl::CreateSSLContext(options);
    return true;
  } catch (const Pelmar::Crypto::CryptoException&) {
    return false;
  }
}

Outcome Judge(const Quorlin::HolderOfKeyConfig& identity) {
  const Pelmar::Crypto::Certificate& certificate = *identity.certificate;
  const long long now = Pelmar::System::GetUtcDateTime().GetUtcTime();
  const long long rest = certificate.GetNotAfter().GetUtcTime() - now;
  if (!BelongTogether(identity)) {
    return Fail(EXIT_REFUSED, "the key of --key does not belong to the certificate of --cert",
                "Give the certificate and the key of one and the same pair.");
  }
  if (rest <= 0) {
    return Fail(EXIT_REFUSED, "your certificate expired at " + certificate.GetNotAfter().ToString(),
                "Get a new certificate for your key.");
  }
  if (now < certificate.GetNotBefore().GetUtcTime()) {
    return Fail(EXIT_REFUSED, "your certificate is not valid before " + certificate.GetNotBefore().ToString(),
                "Wait until then, or have this machine's clock set.");
  }
  if (rest < kMinRestMicroseconds) {
    return Warn("your certificate belongs to the key, but expires in " + DescribeSpan(rest),
                "Get a new certificate in time.");
  }
  return Pass("your certificate is valid now and belongs to the key");
}

}  // namespace

Outcome CheckCertificate(const Patient& patient, Findings&) {
  if (!patient.holderOfKey) {
    return Skip("--cert and --key were not given");
  }
  Outcome outcome = Judge(*patient.holderOfKey);
  outcome.details.push_back(PrintCertificate(*patient.holderOfKey->certificate));
  outcome.data["certificate"] = DescribeCertificate(*patient.holderOfKey->certificate);
  return outcome;
}

}  // namespace Doctor
}  // namespace Cli
