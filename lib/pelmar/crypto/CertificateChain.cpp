// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

#include "pelmar/crypto/CertificateChain.h"

#include "pelmar/crypto/OpenSslError.h"
#include "pelmar/crypto/OpenSslHandles.h"
#include "pelmar/crypto/X509Fields.h"

#include <pelmar/crypto/CryptoException.h>

#include <openssl/x509v3.h>

#include <ctime>
#include <string>

namespace Pelmar {
namespace Crypto {

namespace {

// OpenSSL's level of 112 bits: RSA from 2048 bits, SHA-2.
constexpr int kAuthLevel = 2;
constexpr long long kMicrosecondsPerSecond = 1000000;
constexpr int kCaByBasicConstraints = 1;

[[noreturn]] void ThrowUntrusted(int error, const X509* culprit) {
  ClearOpenSslErrors();
  std::string message =
      std::string("Certificate chain is not trusted: ") + X509_verify_cert_error_string(error);
  if (culprit != nullptr) {
    message += " (" + PrintX509Name(X509_get_subject_name(culprit)) + ")";
  }
  throw CryptoException(message);
}

X509StackHandle MakeStack(const std::vector<Ref<const CertificateImpl>>& certificates) {
  X509StackHandle stack(sk_X509_new_null());
  if (!stack) {
    ThrowOpenSslError("A certificate chain cannot be built");
  }
  for (const Ref<const CertificateImpl>& certificate : certificates) {
    if (sk_X509_push(stack.get(), certificate->GetX509()) <= 0) {
      ThrowOpenSslError("A certificate chain cannot be built");
    }
  }
  return stack;
}

void SetRules(X509_VERIFY_PARAM* rules, const System::DateTime& now) {
  X509_VERIFY_PARAM_set_flags(rules, X509_V_FLAG_PARTIAL_CHAIN);
  X509_VERIFY_PARAM_set_auth_level(rules, kAuthLevel);
  X509_VERIFY_PARAM_set_depth(rules, kMaxChainIssuers);
  X509_VERIFY_PARAM_set_time(rules, static_cast<std::time_t>(now.GetUtcTime() / kMicrosecondsPerSecond));
}

// OpenSSL takes an old self-signed certificate, or one that only has the key usage of a CA, for an issuer
// too. A trusted signer's certificate of that kind must not be able to vouch for others.
void RequireCaIssuers(STACK_OF(X509) * chain) {
  for (int i = 1; i < sk_X509_num(chain); ++i) {
    if (X509_check_ca(sk_X509_value(chain, i)) != kCaByBasicConstraints) {
      ThrowUntrusted(X509_V_ERR_INVALID_CA, sk_X509_value(chain, i));
    }
  }
}

ChainValidity GetCommonValidity(STACK_OF(X509) * chain) {
  ChainValidity common = {ReadX509Time(X509_get0_notBefore(sk_X509_value(chain, 0))),
                          ReadX509Time(X509_get0_notAfter(sk_X509_value(chain, 0)))};
  for (int i = 1; i < sk_X509_num(chain); ++i) {
    const System::DateTime notBefore = ReadX509Time(X509_get0_notBefore(sk_X509_value(chain, i)));
    const System::DateTime notAfter = ReadX509Time(X509_get0_notAfter(sk_X509_value(chain, i)));
    common.notBefore = common.notBefore < notBefore ? notBefore : common.notBefore;
    common.notAfter = notAfter < common.notAfter ? notAfter : common.notAfter;
  }
  return common;
}

}  // namespace

void TrustStore::StoreDeleter::operator()(X509_STORE* store) const noexcept {
  X509_STORE_free(store);
}

TrustStore::TrustStore(const std::list<Ref<const CertificateImpl>>& anchors) : _store(X509_STORE_new()) {
  if (!_store) {
    ThrowOpenSslError("A trust store cannot be made");
  }
  for (const Ref<const CertificateImpl>& anchor : anchors) {
    if (X509_STORE_add_cert(_store.get(), anchor->GetX509()) != 1) {
      ThrowOpenSslError("A trust store cannot be made");
    }
  }
}

TrustStore::~TrustStore() = default;

ChainValidity TrustStore::Verify(const CertificateImpl& leaf,
                                 const std::vector<Ref<const CertificateImpl>>& intermediates,
                                 const System::DateTime& now) const {
  ClearOpenSslErrors();
  const X509StackHandle untrusted = MakeStack(intermediates);
  const X509StoreContextHandle context(X509_STORE_CTX_new());
  if (!context || X509_STORE_CTX_init(context.get(), _store.get(), leaf.GetX509(), untrusted.get()) != 1) {
    ThrowOpenSslError("A certificate chain cannot be verified");
  }
  SetRules(X509_STORE_CTX_get0_param(context.get()), now);
  if (X509_verify_cert(context.get()) != 1) {
    ThrowUntrusted(X509_STORE_CTX_get_error(context.get()), X509_STORE_CTX_get_current_cert(context.get()));
  }
  ClearOpenSslErrors();
  STACK_OF(X509)* const chain = X509_STORE_CTX_get0_chain(context.get());
  RequireCaIssuers(chain);
  return GetCommonValidity(chain);
}

}  // namespace Crypto
}  // namespace Pelmar
