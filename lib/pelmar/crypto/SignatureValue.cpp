// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

#include "pelmar/crypto/SignatureValue.h"

#include "pelmar/crypto/CertificateImpl.h"
#include "pelmar/crypto/EcdsaValue.h"
#include "pelmar/crypto/KeyContexts.h"
#include "pelmar/crypto/KeyStrength.h"
#include "pelmar/crypto/OpenSslError.h"
#include "pelmar/crypto/OpenSslHandles.h"

#include <utility>

namespace Pelmar {
namespace Crypto {

namespace {

constexpr const char* kOwner = "The certificate";

bool IsSignature(EVP_PKEY_CTX* context, const std::vector<unsigned char>& digest,
                 const std::vector<unsigned char>& value) {
  const int verdict = EVP_PKEY_verify(context, value.data(), value.size(), digest.data(), digest.size());
  // 0 and negative numbers both come for wrong values (of another size, with bad padding); what is not proven
  // is wrong. But a lack of memory shall not be told as a forgery.
  if (verdict != 1) {
    ThrowIfMemoryRanOut("Signature verification failed");
  }
  ClearOpenSslErrors();
  return verdict == 1;
}

}  // namespace

KeyType GetSignatureKeyType(const Certificate* certificate) {
  return RequireAcceptableKey(ToCertificateImpl(certificate)->GetPublicKey(), kOwner);
}

bool VerifySignatureValue(const Certificate* certificate, DigestAlgorithm algorithm,
                          const std::vector<unsigned char>& digest, const std::vector<unsigned char>& value) {
  ClearOpenSslErrors();
  const Ref<const CertificateImpl> signer = ToCertificateImpl(certificate);
  EVP_PKEY* const key = signer->GetPublicKey();
  const KeyType type = RequireAcceptableKey(key, kOwner);
  if (type == KEY_EC && value.size() != GetEcOrderBytes(key) * 2) {
    return false;
  }
  KeyContextHandle context = signer->GetVerificationContexts().Take(algorithm);
  if (!context) {
    context = StartKeyContext(key, type, algorithm, EVP_PKEY_verify_init);
  }
  if (!context) {
    ThrowOpenSslError("Signature verification cannot be started");
  }
  const bool holds = IsSignature(context.get(), digest, type == KEY_EC ? EcdsaValueToDer(value) : value);
  signer->GetVerificationContexts().Give(algorithm, std::move(context));
  return holds;
}

}  // namespace Crypto
}  // namespace Pelmar
