// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

#include "pelmar/crypto/SignatureValue.h"

#include "pelmar/crypto/CertificateImpl.h"
#include "pelmar/crypto/DigestWriter.h"
#include "pelmar/crypto/EcdsaValue.h"
#include "pelmar/crypto/KeyStrength.h"
#include "pelmar/crypto/OpenSslError.h"
#include "pelmar/crypto/OpenSslHandles.h"

#include <openssl/rsa.h>

#include <utility>

namespace Pelmar {
namespace Crypto {

namespace {

constexpr const char* kOwner = "The certificate";

KeyContextHandle StartVerification(EVP_PKEY* key, KeyType type, DigestAlgorithm algorithm) {
  KeyContextHandle context(EVP_PKEY_CTX_new(key, nullptr));
  if (!context || EVP_PKEY_verify_init(context.get()) != 1 ||
      (type == KEY_RSA && EVP_PKEY_CTX_set_rsa_padding(context.get(), RSA_PKCS1_PADDING) != 1) ||
      EVP_PKEY_CTX_set_signature_md(context.get(), GetDigestImplementation(algorithm)) != 1) {
    ThrowOpenSslError("Signature verification cannot be started");
  }
  return context;
}

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
    context = StartVerification(key, type, algorithm);
  }
  const bool holds = IsSignature(context.get(), digest, type == KEY_EC ? EcdsaValueToDer(value) : value);
  signer->GetVerificationContexts().Give(algorithm, std::move(context));
  return holds;
}

}  // namespace Crypto
}  // namespace Pelmar
