// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

// Certificates come from strangers, in a signature's KeyInfo. Whatever the bytes: a CryptoException, or a
// certificate that keeps them and can be asked everything.

#include "pelmar/crypto/CertificateChain.h"
#include "pelmar/crypto/CertificateImpl.h"
#include "pelmar/crypto/SignatureValue.h"

#include <pelmar/StringUtil.h>
#include <pelmar/crypto/Certificate.h>
#include <pelmar/crypto/CryptoException.h>

#include <cstddef>
#include <cstdint>
#include <cstdlib>
#include <iostream>
#include <string>
#include <vector>

namespace {

using namespace Pelmar::Crypto;
using Pelmar::Ref;

[[noreturn]] void Fail(const char* promise) {
  std::cerr << "broken: " << promise << std::endl;
  std::abort();
}

template <typename Action>
void Try(Action action) {
  try {
    action();
  } catch (const CryptoException&) {
  }
}

void RequirePrintable(const std::string& name) {
  for (const char letter : name) {
    if (static_cast<unsigned char>(letter) < 0x20 || letter == 0x7F) {
      Fail("a name has no control characters");
    }
  }
}

void Ask(const Certificate& certificate) {
  Try([&certificate] { RequirePrintable(certificate.GetSubject()); });
  Try([&certificate] { RequirePrintable(certificate.GetIssuer()); });
  certificate.GetNotBefore().ToString();
  certificate.GetNotAfter().ToString();
  Try([&certificate] { GetSignatureKeyType(&certificate); });
  Try([&certificate] {
    VerifySignatureValue(&certificate, DIGEST_SHA256, std::vector<unsigned char>(32),
                         std::vector<unsigned char>(64));
  });
  const Ref<const CertificateImpl> own = ToCertificateImpl(&certificate);
  Try([&own] { RequireSigningKeyUsage(*own); });
  LooksLikeIssuer(*own, *own);
  Try([&own] { TrustStore({own}).Verify(*own, {own}, own->GetNotBefore()); });
  Try([&own] { TrustStore({}).Verify(*own, {own}, own->GetNotBefore()); });
}

void CheckDer(const std::vector<unsigned char>& der) {
  const Ref<const Certificate> certificate = CreateCertificateFromDer(der);
  if (certificate->GetDer() != der) {
    Fail("the DER encoding is kept");
  }
  Ask(*certificate);
}

void CheckPem(const std::string& pem) {
  for (const Ref<const Certificate>& certificate : CreateCertificatesFromPem(pem)) {
    Ask(*certificate);
  }
}

}  // namespace

extern "C" int LLVMFuzzerTestOneInput(const uint8_t* data, size_t size) {
  Try([=] { CheckDer(std::vector<unsigned char>(data, data + size)); });
  Try([=] { CheckPem(std::string(reinterpret_cast<const char*>(data), size)); });
  return 0;
}
