// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

#include "pelmar/crypto/CertificateImpl.h"
#include "support/Pki.h"

#include <pelmar/crypto/Certificate.h>
#include <pelmar/crypto/CryptoException.h>
#include <pelmar/crypto/Digest.h>

#include <gtest/gtest.h>

#include <functional>
#include <list>
#include <string>
#include <vector>

namespace {

using namespace Pelmar::Crypto;
using namespace TestSupport;
using Pelmar::Ref;

std::string RefusalOf(const std::function<void()>& action) {
  try {
    action();
  } catch (const CryptoException& error) {
    return error.what();
  }
  return "accepted";
}

std::string RefusalOfDer(const std::vector<unsigned char>& der) {
  return RefusalOf([&der] { CreateCertificateFromDer(der); });
}

std::string RefusalOfPem(const std::string& pem) {
  return RefusalOf([&pem] { CreateCertificateFromPem(pem); });
}

Ref<const Certificate> MakeNamed(const std::string& commonName) {
  CertificateSpec spec;
  spec.commonName = commonName;
  spec.keyKind = KeyKind::EC_P256;
  return MakeSelfSigned(spec).certificate;
}

TEST(Certificate, KeepsItsDerByteForByte) {
  const std::vector<unsigned char> der = MakeNamed("Der")->GetDer();
  const Ref<const Certificate> again = CreateCertificateFromDer(der);
  EXPECT_EQ(again->GetDer(), der);
  EXPECT_EQ(again->GetSha256(), ComputeDigest(DIGEST_SHA256, der.data(), der.size()));
}

TEST(Certificate, TellsItsNamesAsRfc4514Text) {
  const Identity ca = MakeCa("Root, of \"trust\"");
  CertificateSpec spec;
  spec.commonName = "Müller+Söhne";
  const Ref<const Certificate> certificate = MakeIssued(ca, spec).certificate;
  EXPECT_EQ(certificate->GetSubject(), "CN=Müller\\+Söhne");
  EXPECT_EQ(certificate->GetIssuer(), "CN=Root\\, of \\\"trust\\\"");
}

// A subject goes into messages and from there into logs; it must not be able to end a line there.
TEST(Certificate, EscapesControlCharactersInNames) {
  EXPECT_EQ(MakeNamed("one\r\ntwo\x7f")->GetSubject(), "CN=one\\0D\\0Atwo\\7F");
}

TEST(Certificate, TellsItsValidityPeriod) {
  constexpr long long kMicroseconds = 1000000;
  CertificateSpec spec;
  spec.notBefore = 0;
  spec.notAfter = 60 * kDay + 5;
  const long long before = Pelmar::System::GetUtcDateTime().GetUtcTime() / kMicroseconds;
  const Ref<const Certificate> certificate = MakeSelfSigned(spec).certificate;
  const long long after = Pelmar::System::GetUtcDateTime().GetUtcTime() / kMicroseconds;

  const long long start = certificate->GetNotBefore().GetUtcTime();
  EXPECT_EQ(start % kMicroseconds, 0);
  EXPECT_GE(start / kMicroseconds, before);
  EXPECT_LE(start / kMicroseconds, after);
  EXPECT_GE(certificate->GetNotAfter().GetUtcTime() - start, (60 * kDay + 5) * kMicroseconds);
  EXPECT_LE(certificate->GetNotAfter().GetUtcTime() / kMicroseconds, after + 60 * kDay + 5);
}

TEST(Certificate, GoesThroughPemUnchanged) {
  const Ref<const Certificate> certificate = MakeNamed("Pem");
  EXPECT_EQ(CreateCertificateFromPem(certificate->ToPem())->GetDer(), certificate->GetDer());
}

TEST(Certificate, FirstOfAPemTextIsTaken) {
  const Ref<const Certificate> first = MakeNamed("First");
  EXPECT_EQ(CreateCertificateFromPem(first->ToPem() + MakeNamed("Second")->ToPem())->GetDer(),
            first->GetDer());
}

TEST(Certificate, IsReadUnderItsOldPemLabelToo) {
  const Ref<const Certificate> certificate = MakeNamed("Old");
  std::string pem = certificate->ToPem();
  for (std::size_t at = 0; (at = pem.find(" CERTIFICATE", at)) != std::string::npos; at += 17) {
    pem.insert(at, " X509");
  }
  EXPECT_EQ(CreateCertificateFromPem(pem)->GetDer(), certificate->GetDer());
}

TEST(Certificate, AllOfAPemTextAreReadInOrderPastOtherObjectsAndText) {
  const Ref<const Certificate> first = MakeNamed("First");
  const Ref<const Certificate> second = MakeNamed("Second");
  const std::string key = KeyPair::Get(KeyKind::EC_P256).ToPem();
  const std::list<Ref<const Certificate>> all = CreateCertificatesFromPem(
      "a comment\n" + key + first->ToPem() + "\nanother\n" + second->ToPem() + key + "the end");
  ASSERT_EQ(all.size(), 2u);
  EXPECT_EQ(all.front()->GetDer(), first->GetDer());
  EXPECT_EQ(all.back()->GetDer(), second->GetDer());
}

TEST(Certificate, RefusesPemWithoutCertificates) {
  for (const std::string& pem :
       {std::string(), std::string("no PEM at all"), KeyPair::Get(KeyKind::EC_P256).ToPem()}) {
    EXPECT_EQ(RefusalOfPem(pem), "The PEM text holds no certificate");
    EXPECT_EQ(RefusalOf([&pem] { CreateCertificatesFromPem(pem); }), "The PEM text holds no certificate");
  }
}

TEST(Certificate, RefusesABrokenPemObject) {
  EXPECT_EQ(RefusalOfPem("-----BEGIN CERTIFICATE-----\n!!!!\n-----END CERTIFICATE-----\n"),
            "The PEM text cannot be read: bad base64 decode");
  const std::string good = MakeNamed("Good")->ToPem();
  EXPECT_EQ(RefusalOf([&good] { CreateCertificatesFromPem(good + "-----BEGIN CERTIFICATE-----\n"); }),
            "The PEM text cannot be read: bad end line");
}

TEST(Certificate, RefusesTrailingBytes) {
  std::vector<unsigned char> der = MakeNamed("Trailing")->GetDer();
  der.push_back(0);
  EXPECT_EQ(RefusalOfDer(der), "The certificate is followed by other data");
}

TEST(Certificate, RefusesEveryTruncation) {
  const std::vector<unsigned char> der = MakeNamed("Truncated")->GetDer();
  for (std::size_t size = 0; size < der.size(); ++size) {
    const std::string refusal = RefusalOfDer(std::vector<unsigned char>(der.data(), der.data() + size));
    EXPECT_EQ(refusal.rfind("The certificate cannot be read", 0), 0u) << size << ": " << refusal;
  }
}

TEST(Certificate, RefusesWhatIsTooLarge) {
  EXPECT_EQ(RefusalOfDer(std::vector<unsigned char>(kMaxCertificateBytes + 1)),
            "The certificate is larger than 65536 bytes");
  EXPECT_EQ(RefusalOfDer(std::vector<unsigned char>(kMaxCertificateBytes)),
            "The certificate cannot be read: wrong tag");
}

TEST(Certificate, RefusesAPemTextThatIsTooLarge) {
  const std::string text(16 * 1024 * 1024 + 1, ' ');
  EXPECT_EQ(RefusalOfPem(text), "The PEM text is larger than 16777216 bytes");
  EXPECT_EQ(RefusalOfPem(text.substr(1)), "The PEM text holds no certificate");
}

TEST(Certificate, RefusesAMalformedValidityPeriod) {
  std::vector<unsigned char> der = MakeNamed("Malformed")->GetDer();
  const std::string bytes(der.begin(), der.end());
  const std::size_t utcTime = bytes.find(std::string("\x17\x0d", 2));
  ASSERT_NE(utcTime, std::string::npos);
  der[utcTime + 4] = '9';  // The month.
  EXPECT_EQ(RefusalOfDer(der), "The certificate's validity period cannot be read");
}

TEST(Certificate, OfAnotherImplementationIsReadAgain) {
  class Foreign final : public Certificate {
   public:
    explicit Foreign(const Ref<const Certificate>& inner) : _inner(inner) {}
    const std::vector<unsigned char>& GetDer() const override { return _inner->GetDer(); }
    const std::vector<unsigned char>& GetSha256() const override { return _inner->GetSha256(); }
    std::string GetSubject() const override { return "someone else"; }
    std::string GetIssuer() const override { return "someone else"; }
    Pelmar::System::DateTime GetNotBefore() const override { return {}; }
    Pelmar::System::DateTime GetNotAfter() const override { return {}; }
    std::string ToPem() const override { return ""; }

   private:
    Ref<const Certificate> _inner;
  };
  const Ref<const Certificate> foreign = Pelmar::MakeRef<Foreign>(MakeNamed("Inner"));
  EXPECT_EQ(ToCertificateImpl(foreign.Get())->GetSubject(), "CN=Inner");
}

}  // namespace
