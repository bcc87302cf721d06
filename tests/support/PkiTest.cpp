// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

// The openssl program reads what Pki makes, so that tests stand on certificates that are what they say.

#include "support/Pki.h"
#include "support/Process.h"
#include "support/TemporaryDirectory.h"

#include <gtest/gtest.h>

#include <string>

namespace {

using namespace TestSupport;

bool OpensslVerifies(const Identity& root, const Identity& leaf) {
  const TemporaryDirectory directory;
  const std::string ca = directory.WriteFile("ca.pem", root.GetCertificatePem());
  const std::string file = directory.WriteFile("leaf.pem", leaf.GetCertificatePem());
  return RunProcess({"openssl", "verify", "-x509_strict", "-CAfile", ca, file}).exitCode == 0;
}

Identity MakeStrictCa(unsigned keyNumber) {
  CertificateSpec spec;
  spec.commonName = "Strict CA";
  spec.keyNumber = keyNumber;
  spec.ca = true;
  spec.keyIdentifiers = true;
  return MakeSelfSigned(spec);
}

TEST(Pki, IssuesCertificatesThatVerify) {
  const Identity ca = MakeStrictCa(1);
  CertificateSpec spec;
  spec.keyIdentifiers = true;
  const Identity leaf = MakeIssued(ca, spec);
  EXPECT_TRUE(OpensslVerifies(ca, leaf));
  EXPECT_FALSE(OpensslVerifies(MakeStrictCa(2), leaf));
}

TEST(Pki, PutsIntoACertificateWhatIsAskedFor) {
  CertificateSpec spec;
  spec.commonName = "everything";
  spec.keyUsage = "keyEncipherment";
  spec.extendedKeyUsage = "serverAuth";
  spec.subjectAlternativeName = "DNS:localhost,IP:127.0.0.1";
  spec.keyKind = KeyKind::EC_P384;
  const std::string text = RunProcess({"openssl", "x509", "-noout", "-subject", "-ext",
                                       "basicConstraints,keyUsage,extendedKeyUsage,subjectAltName"},
                                      MakeSelfSigned(spec).GetCertificatePem())
                               .standardOutput;
  EXPECT_EQ(text,
            "subject=CN = everything\n"
            "X509v3 Basic Constraints: critical\n    CA:FALSE\n"
            "X509v3 Key Usage: critical\n    Key Encipherment\n"
            "X509v3 Extended Key Usage: \n    TLS Web Server Authentication\n"
            "X509v3 Subject Alternative Name: \n    DNS:localhost, IP Address:127.0.0.1\n");
}

TEST(Pki, GivesTheSameKeyForTheSameNumber) {
  EXPECT_EQ(KeyPair::Get(KeyKind::EC_P256, 3).ToPem(), KeyPair::Get(KeyKind::EC_P256, 3).ToPem());
  EXPECT_NE(KeyPair::Get(KeyKind::EC_P256, 3).ToPem(), KeyPair::Get(KeyKind::EC_P256, 4).ToPem());
}

}  // namespace
