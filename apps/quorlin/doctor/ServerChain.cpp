// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

#include "quorlin/doctor/ServerChain.h"

#include <pelmar/StringUtil.h>
#include <pelmar/crypto/CryptoException.h>
#include <pelmar/crypto/Digest.h>

#include <arpa/inet.h>

#include <new>

namespace Cli {
namespace Doctor {

namespace {

using Pelmar::Crypto::Certificate;

CertificateHandle Share(X509* certificate) {
  X509_up_ref(certificate);
  return CertificateHandle(certificate);
}

void Record(X509_STORE_CTX* verification, ServerChain& chain) {
  chain.certificates.clear();
  const X509* const current = X509_STORE_CTX_get_current_cert(verification);
  const STACK_OF(X509)* const seen = X509_STORE_CTX_get0_chain(verification);
  for (int i = 0; i < sk_X509_num(seen); ++i) {
    X509* const certificate = sk_X509_value(seen, i);
    if (certificate == current) {
      chain.culprit = chain.certificates.size();
    }
    chain.certificates.push_back(Share(certificate));
  }
}

int VerifyAndRecord(X509_STORE_CTX* verification, void* chain) {
  auto& record = *static_cast<ServerChain*>(chain);
  const int verdict = X509_verify_cert(verification);
  record.error = verdict > 0 ? X509_V_OK : X509_STORE_CTX_get_error(verification);
  try {
    Record(verification, record);
  } catch (const std::bad_alloc&) {
    // Nothing may be thrown through OpenSSL; less is shown then.
    record.certificates.clear();
  }
  return verdict;
}

std::string ReadAddress(const ASN1_STRING* address) {
  const int family = ASN1_STRING_length(address) == 4 ? AF_INET : AF_INET6;
  if (family == AF_INET6 && ASN1_STRING_length(address) != 16) {
    return "?";
  }
  char text[INET6_ADDRSTRLEN];
  return inet_ntop(family, ASN1_STRING_get0_data(address), text, sizeof text) == nullptr ? "?" : text;
}

std::string ReadString(const ASN1_STRING* text) {
  return std::string(reinterpret_cast<const char*>(ASN1_STRING_get0_data(text)),
                     static_cast<std::size_t>(ASN1_STRING_length(text)));
}

/// The certificate that the verification failed at, and whether it is the server's own.
struct Culprit {
  Pelmar::Ref<const Certificate> certificate;
  bool isServers;
};

/// The start of a sentence about it.
std::string NameCulprit(const Culprit& culprit, const std::string& host) {
  return culprit.isServers ? "Certificate of " + host
                           : "Issuing certificate " + culprit.certificate->GetSubject() +
                                 " above the certificate of " + host;
}

std::string DescribeOf(int error, const Culprit& culprit, const std::vector<std::string>& names,
                       const std::string& host) {
  const std::string server = "Certificate of " + host;
  switch (error) {
    case X509_V_ERR_UNABLE_TO_GET_ISSUER_CERT:
    case X509_V_ERR_UNABLE_TO_GET_ISSUER_CERT_LOCALLY:
    case X509_V_ERR_UNABLE_TO_VERIFY_LEAF_SIGNATURE:
    case X509_V_ERR_SELF_SIGNED_CERT_IN_CHAIN:
      return server + " is not trusted: issuer " + culprit.certificate->GetIssuer();
    case X509_V_ERR_DEPTH_ZERO_SELF_SIGNED_CERT:
      return server + " is not trusted: it is self-signed (" + culprit.certificate->GetSubject() + ")";
    case X509_V_ERR_CERT_HAS_EXPIRED:
      return NameCulprit(culprit, host) + " expired at " + culprit.certificate->GetNotAfter().ToString();
    case X509_V_ERR_CERT_NOT_YET_VALID:
      return NameCulprit(culprit, host) + " is not valid before " +
             culprit.certificate->GetNotBefore().ToString();
    case X509_V_ERR_HOSTNAME_MISMATCH:
    case X509_V_ERR_IP_ADDRESS_MISMATCH:
      return server + " does not match the name: it is for " +
             (names.empty() ? "no host at all" : Join(names));
    default:
      return NameCulprit(culprit, host) + " is not accepted: " + X509_verify_cert_error_string(error);
  }
}

}  // namespace

void RecordServerChain(SSL_CTX* context, ServerChain& chain) {
  SSL_CTX_set_cert_verify_callback(context, VerifyAndRecord, &chain);
}

Pelmar::Ref<const Certificate> Read(const CertificateHandle& certificate) {
  unsigned char* bytes = nullptr;
  const int size = i2d_X509(certificate.get(), &bytes);
  if (size <= 0) {
    return nullptr;
  }
  const std::vector<unsigned char> der(bytes, bytes + size);
  OPENSSL_free(bytes);
  try {
    return Pelmar::Crypto::CreateCertificateFromDer(der);
  } catch (const Pelmar::Crypto::CryptoException&) {
    return nullptr;
  }
}

std::vector<std::string> ReadNames(const CertificateHandle& certificate) {
  const NamesHandle list(static_cast<GENERAL_NAMES*>(
      X509_get_ext_d2i(certificate.get(), NID_subject_alt_name, nullptr, nullptr)));
  std::vector<std::string> names;
  for (int i = 0; list && i < sk_GENERAL_NAME_num(list.get()); ++i) {
    const GENERAL_NAME* const name = sk_GENERAL_NAME_value(list.get(), i);
    if (name->type != GEN_DNS && name->type != GEN_IPADD) {
      continue;
    }
    if (names.size() == kMaxNamesShown) {
      names.emplace_back("...");
      break;
    }
    names.push_back(name->type == GEN_DNS ? ReadString(name->d.dNSName) : ReadAddress(name->d.iPAddress));
  }
  return names;
}

std::string DescribeProblem(const ServerChain& chain, const std::string& host) {
  if (chain.culprit < chain.certificates.size()) {
    const Culprit culprit = {Read(chain.certificates[chain.culprit]), chain.culprit == 0};
    if (culprit.certificate) {
      return DescribeOf(chain.error, culprit, ReadNames(chain.certificates.front()), host);
    }
  }
  return "Certificate of " + host + " is not accepted: " + X509_verify_cert_error_string(chain.error);
}

std::string ComputePin(const CertificateHandle& certificate) {
  unsigned char* bytes = nullptr;
  const int size = i2d_X509_PUBKEY(X509_get_X509_PUBKEY(certificate.get()), &bytes);
  if (size <= 0) {
    return "";
  }
  const std::vector<unsigned char> key(bytes, bytes + size);
  OPENSSL_free(bytes);
  return "sha256//" + Pelmar::StringUtil::Base64Encode(Pelmar::Crypto::ComputeDigest(
                          Pelmar::Crypto::DIGEST_SHA256, key.data(), key.size()));
}

std::string Join(const std::vector<std::string>& texts) {
  std::string all;
  for (const std::string& text : texts) {
    all += (all.empty() ? "" : ", ") + text;
  }
  return all;
}

}  // namespace Doctor
}  // namespace Cli
