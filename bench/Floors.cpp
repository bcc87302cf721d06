// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

#include "bench/Floors.h"

#include "pelmar/crypto/DigestWriter.h"
#include "pelmar/crypto/OpenSslHandles.h"
#include "pelmar/xml/ExpatHandle.h"

#include <openssl/evp.h>
#include <openssl/rsa.h>

#include <array>
#include <memory>
#include <stdexcept>

namespace Bench {

namespace {

using Bytes = std::vector<unsigned char>;

constexpr std::size_t kDigestBytes = 32;

const EVP_MD* Sha256() {
  return Pelmar::Crypto::GetDigestImplementation(Pelmar::Crypto::DIGEST_SHA256);
}

// A floor that fails early would be a lower one.
void Check(bool succeeded) {
  if (!succeeded) {
    throw std::runtime_error("the work to compare with failed");
  }
}

using KeyContext = std::shared_ptr<EVP_PKEY_CTX>;

KeyContext PrepareContext(const TestSupport::KeyPair& key, int (*init)(EVP_PKEY_CTX*)) {
  const KeyContext context(EVP_PKEY_CTX_new(key.GetHandle(), nullptr), EVP_PKEY_CTX_free);
  Check(context && init(context.get()) == 1 &&
        EVP_PKEY_CTX_set_rsa_padding(context.get(), RSA_PKCS1_PADDING) == 1 &&
        EVP_PKEY_CTX_set_signature_md(context.get(), Sha256()) == 1);
  return context;
}

void Sign(EVP_PKEY_CTX* context, const Bytes& digest, Bytes& value) {
  std::size_t size = value.size();
  Check(EVP_PKEY_sign(context, value.data(), &size, digest.data(), digest.size()) == 1 &&
        size == value.size());
}

void XMLCALL IgnoreStart(void* /*userData*/, const XML_Char* /*name*/, const XML_Char** /*attributes*/) {}
void XMLCALL IgnoreEnd(void* /*userData*/, const XML_Char* /*name*/) {}
void XMLCALL IgnoreText(void* /*userData*/, const XML_Char* /*text*/, int /*size*/) {}

}  // namespace

Action SignWithRsa(const TestSupport::KeyPair& key) {
  const KeyContext context = PrepareContext(key, EVP_PKEY_sign_init);
  Bytes value(static_cast<std::size_t>(EVP_PKEY_get_size(key.GetHandle())));
  return [context, value]() mutable {
    Sign(context.get(), Bytes(kDigestBytes), value);
  };
}

Action VerifyWithRsa(const TestSupport::KeyPair& key) {
  const Bytes digest(kDigestBytes);
  Bytes value(static_cast<std::size_t>(EVP_PKEY_get_size(key.GetHandle())));
  Sign(PrepareContext(key, EVP_PKEY_sign_init).get(), digest, value);
  const KeyContext context = PrepareContext(key, EVP_PKEY_verify_init);
  return [context, digest, value] {
    Check(EVP_PKEY_verify(context.get(), value.data(), value.size(), digest.data(), digest.size()) == 1);
  };
}

Action HashText(const std::string& text) {
  const std::shared_ptr<EVP_MD_CTX> context(EVP_MD_CTX_new(), EVP_MD_CTX_free);
  return [context, text] {
    std::array<unsigned char, kDigestBytes> digest;
    Check(EVP_DigestInit_ex2(context.get(), Sha256(), nullptr) == 1 &&
          EVP_DigestUpdate(context.get(), text.data(), text.size()) == 1 &&
          EVP_DigestFinal_ex(context.get(), digest.data(), nullptr) == 1);
  };
}

Action TokeniseText(const std::string& text) {
  return [text] {
    const Pelmar::Xml::ExpatHandle parser = Pelmar::Xml::CreateExpat();
    XML_SetElementHandler(parser.get(), IgnoreStart, IgnoreEnd);
    XML_SetCharacterDataHandler(parser.get(), IgnoreText);
    Check(XML_Parse(parser.get(), text.data(), static_cast<int>(text.size()), XML_TRUE) == XML_STATUS_OK);
  };
}

Action DoAll(const std::vector<Action>& actions) {
  return [actions] {
    for (const Action& action : actions) {
      action();
    }
  };
}

}  // namespace Bench
