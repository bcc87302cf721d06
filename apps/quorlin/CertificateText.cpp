// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

#include "quorlin/CertificateText.h"

#include <pelmar/crypto/Digest.h>

namespace Cli {

Json DescribeCertificate(const Pelmar::Crypto::Certificate& certificate) {
  return {{"subject", certificate.GetSubject()},
          {"issuer", certificate.GetIssuer()},
          {"notBefore", certificate.GetNotBefore().ToString()},
          {"notAfter", certificate.GetNotAfter().ToString()},
          {"sha256", Pelmar::Crypto::ToHex(certificate.GetSha256())}};
}

std::string PrintCertificate(const Pelmar::Crypto::Certificate& certificate) {
  const bool namesItself = certificate.GetSubject() == certificate.GetIssuer();
  return certificate.GetSubject() +
         (namesItself ? ", its own issuer" : ", issued by " + certificate.GetIssuer()) + ", valid from " +
         certificate.GetNotBefore().ToString() + " until " + certificate.GetNotAfter().ToString();
}

}  // namespace Cli
