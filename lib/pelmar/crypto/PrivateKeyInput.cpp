// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

// Reads private keys from PEM and DER.

#include <pelmar/crypto/PrivateKey.h>

#include "pelmar/crypto/OpenSslError.h"
#include "pelmar/crypto/OpenSslHandles.h"
#include "pelmar/crypto/PemInput.h"
#include "pelmar/crypto/PrivateKeyImpl.h"

#include <pelmar/crypto/CryptoException.h>

#include <openssl/pem.h>
#include <openssl/pkcs12.h>

#include <algorithm>
#include <cstring>

namespace Pelmar {
namespace Crypto {

namespace {

/// What OpenSSL may know of the pass phrase, and whether it wanted it.
struct PassPhraseQuestion {
  const std::string* passPhrase;  // Null: there is none.
  bool asked;
};

// Always installed: without a callback OpenSSL would ask on the terminal.
int AnswerPassPhrase(char* buffer, int size, int /*writing*/, void* context) {
  auto* const question = static_cast<PassPhraseQuestion*>(context);
  question->asked = true;
  if (question->passPhrase == nullptr || question->passPhrase->size() > static_cast<std::size_t>(size)) {
    return -1;
  }
  std::memcpy(buffer, question->passPhrase->data(), question->passPhrase->size());
  return static_cast<int>(question->passPhrase->size());
}

// OpenSSL tries one form after the other, and its reasons (unsupported, bad decrypt, ...) are accidents of
// the last one, so they are not told.
[[noreturn]] void ThrowUnreadable(const PassPhraseQuestion& question) {
  ClearOpenSslErrors();
  if (!question.asked) {
    throw CryptoException("There is no private key that can be read");
  }
  throw CryptoException(
      question.passPhrase == nullptr
          ? "The private key is encrypted and there is no pass phrase"
          : "The private key cannot be read: the pass phrase is wrong or the key is damaged");
}

Ref<const PrivateKey> ReadPem(const std::string& pem, const std::string* passPhrase) {
  const BioHandle input = OpenPemText(pem);
  PassPhraseQuestion question = {passPhrase, false};
  EVP_PKEY* const key = PEM_read_bio_PrivateKey(input.get(), nullptr, AnswerPassPhrase, &question);
  if (key == nullptr) {
    ThrowUnreadable(question);
  }
  // A successful read may leave the errors of tried forms behind.
  ClearOpenSslErrors();
  return MakeRef<PrivateKeyImpl>(key);
}

void RequireAllRead(const unsigned char* position, const std::vector<unsigned char>& der) {
  if (position != der.data() + der.size()) {
    throw CryptoException("The private key is followed by other data");
  }
}

}  // namespace

Ref<const PrivateKey> CreatePrivateKeyFromPem(const std::string& pem) {
  return ReadPem(pem, nullptr);
}

Ref<const PrivateKey> CreatePrivateKeyFromPem(const std::string& pem, const std::string& passPhrase) {
  return ReadPem(pem, &passPhrase);
}

Ref<const PrivateKey> CreatePrivateKeyFromDer(const std::vector<unsigned char>& der) {
  ClearOpenSslErrors();
  const unsigned char* position = der.data();
  KeyHandle key(d2i_AutoPrivateKey(nullptr, &position, static_cast<long>(der.size())));
  if (!key) {
    ThrowUnreadable(PassPhraseQuestion{nullptr, false});
  }
  ClearOpenSslErrors();
  RequireAllRead(position, der);
  return MakeRef<PrivateKeyImpl>(key.release());
}

Ref<const PrivateKey> CreatePrivateKeyFromDer(const std::vector<unsigned char>& der,
                                              const std::string& passPhrase) {
  ClearOpenSslErrors();
  const unsigned char* position = der.data();
  const EncryptedPkcs8Handle envelope(d2i_X509_SIG(nullptr, &position, static_cast<long>(der.size())));
  if (!envelope) {
    ThrowUnreadable(PassPhraseQuestion{nullptr, false});
  }
  RequireAllRead(position, der);
  const Pkcs8Handle content(
      PKCS8_decrypt(envelope.get(), passPhrase.data(), static_cast<int>(passPhrase.size())));
  if (!content) {
    ThrowUnreadable(PassPhraseQuestion{&passPhrase, true});
  }
  KeyHandle key(EVP_PKCS82PKEY(content.get()));
  if (!key) {
    ThrowUnreadable(PassPhraseQuestion{nullptr, false});
  }
  ClearOpenSslErrors();
  return MakeRef<PrivateKeyImpl>(key.release());
}

}  // namespace Crypto
}  // namespace Pelmar
