// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

#include "pelmar/crypto/Pkcs11Key.h"

#include "pelmar/crypto/OpenSslError.h"
#include "pelmar/crypto/Pin.h"
#include "pelmar/crypto/Pkcs11Engine.h"
#include "pelmar/crypto/Pkcs11Uri.h"
#include "pelmar/crypto/SignatureValue.h"

#include <pelmar/Exception.h>
#include <pelmar/crypto/CryptoException.h>

#include <openssl/evp.h>

namespace Pelmar {
namespace Crypto {

namespace {

PinFunction ChoosePinFunction(const Pkcs11Uri& uri, const PinFunction& askPin) {
  if (!uri.pinFile.empty()) {
    return ReadPinFrom(uri.pinFile);
  }
  if (!askPin) {
    throw CryptoException(
        "There is no PIN for the PKCS #11 token: the URI has no pin-source, and there is no "
        "function to ask");
  }
  return askPin;
}

}  // namespace

Pkcs11Key::Pkcs11Key(evp_pkey_st* key, const Ref<const CertificateImpl>& certificate,
                     const PinFunction& askPin)
    : PrivateKeyImpl(key), _certificate(certificate), _askPin(askPin) {
  const bool matches = EVP_PKEY_eq(certificate->GetPublicKey(), GetKey()) == 1;
  ClearOpenSslErrors();
  if (!matches) {
    throw CryptoException(
        "The PKCS #11 key does not belong to the certificate, or its public half is not in "
        "the token");
  }
}

Pkcs11Key::~Pkcs11Key() = default;

// A fault of the hardware must not become a message, nor a wrong RSA value that gives its factors away.
std::vector<unsigned char> Pkcs11Key::Sign(DigestAlgorithm digest, const void* data, std::size_t size) const {
  const std::vector<unsigned char> value = SignInToken(digest, data, size);
  if (!VerifySignatureValue(_certificate.Get(), digest, ComputeDigest(digest, data, size), value)) {
    throw CryptoException("The PKCS #11 token gave a value that the certificate's key does not verify");
  }
  return value;
}

std::vector<unsigned char> Pkcs11Key::SignInToken(DigestAlgorithm digest, const void* data,
                                                  std::size_t size) const {
  const PinOnDemand pin(_askPin);
  try {
    return PrivateKeyImpl::Sign(digest, data, size);
  } catch (const CryptoException&) {
    pin.RethrowFailure();
    throw;
  }
}

Ref<const PrivateKey> CreatePrivateKeyFromPkcs11(const std::string& uri,
                                                 const Ref<const Certificate>& certificate,
                                                 const PinFunction& askPin) {
  if (!certificate) {
    throw InvalidArgumentException("a key in a PKCS #11 token needs its certificate");
  }
  const Ref<const CertificateImpl> own = ToCertificateImpl(certificate.Get());
  GetSignatureKeyType(own.Get());
  const Pkcs11Uri parsed = ParsePkcs11Uri(uri);
  const PinFunction pinFunction = ChoosePinFunction(parsed, askPin);
  const Pin pin(pinFunction);
  return MakeRef<Pkcs11Key>(
      LoadPkcs11Key(parsed.objectUri, parsed.modulePath.empty() ? kDefaultPkcs11Module : parsed.modulePath,
                    pin.Get()),
      own, pinFunction);
}

}  // namespace Crypto
}  // namespace Pelmar
