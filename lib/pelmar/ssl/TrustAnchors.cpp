// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

#include "pelmar/ssl/TrustAnchors.h"

#include "pelmar/crypto/CertificateImpl.h"
#include "pelmar/crypto/OpenSslError.h"
#include "pelmar/crypto/PemInput.h"

#include <pelmar/crypto/CryptoException.h>

#include <openssl/x509.h>
#include <openssl/x509_vfy.h>

#include <array>
#include <cerrno>
#include <cstddef>
#include <cstring>
#include <filesystem>
#include <fstream>
#include <system_error>

namespace Pelmar {
namespace Ssl {

namespace {

using Crypto::CryptoException;
using Crypto::ThrowOpenSslError;

// Where Debian and its kin keep the bundle; OpenSSL's own default there names a file that does not exist.
constexpr const char* kDebianBundle = "/etc/ssl/certs/ca-certificates.crt";

constexpr std::size_t kPieceBytes = 64 * 1024;

[[noreturn]] void ThrowFileError(const std::string& path, const std::string& reason) {
  throw CryptoException("The certificate file '" + path + "' cannot be used: " + reason);
}

std::string ReadFile(const std::string& path) {
  std::ifstream stream(path, std::ios::binary);
  if (!stream) {
    ThrowFileError(path, std::strerror(errno));
  }
  std::string text;
  std::array<char, kPieceBytes> piece;
  // One byte too many is enough to be refused; the rest of a huge file stays unread.
  while (stream && text.size() <= Crypto::kMaxPemBytes) {
    stream.read(piece.data(), static_cast<std::streamsize>(piece.size()));
    text.append(piece.data(), static_cast<std::size_t>(stream.gcount()));
  }
  if (stream.bad()) {
    ThrowFileError(path, "it cannot be read");
  }
  return text;
}

std::list<Ref<const Crypto::Certificate>> ReadCertificateFile(const std::string& path) {
  const std::string pem = ReadFile(path);
  try {
    return Crypto::CreateCertificatesFromPem(pem);
  } catch (const CryptoException& error) {
    ThrowFileError(path, error.what());
  }
}

bool IsFile(const std::string& path) {
  std::error_code ignored;
  return std::filesystem::is_regular_file(path, ignored);
}

bool IsDirectory(const std::string& path) {
  std::error_code ignored;
  return std::filesystem::is_directory(path, ignored);
}

}  // namespace

void AddCertificates(X509_STORE* store, const std::list<Ref<const Crypto::Certificate>>& certificates) {
  for (const Ref<const Crypto::Certificate>& certificate : certificates) {
    if (certificate &&
        X509_STORE_add_cert(store, Crypto::ToCertificateImpl(certificate.Get())->GetX509()) != 1) {
      ThrowOpenSslError("A trust anchor cannot be used");
    }
  }
}

void AddFile(X509_STORE* store, const std::string& path) {
  AddCertificates(store, ReadCertificateFile(path));
}

void AddDirectory(X509_STORE* store, const std::string& path) {
  // OpenSSL would take the colon as the end of one directory's name and the beginning of another's.
  if (path.find(':') != std::string::npos) {
    throw CryptoException("The certificate directory '" + path + "' cannot be used: its name holds a ':'");
  }
  if (!IsDirectory(path)) {
    throw CryptoException("The certificate directory '" + path +
                          "' cannot be used: there is no such directory");
  }
  X509_LOOKUP* const lookup = X509_STORE_add_lookup(store, X509_LOOKUP_hash_dir());
  if (lookup == nullptr || X509_LOOKUP_add_dir(lookup, path.c_str(), X509_FILETYPE_PEM) != 1) {
    ThrowOpenSslError("The certificate directory '" + path + "' cannot be used");
  }
}

void AddSystemStore(X509_STORE* store) {
  const std::string file =
      IsFile(X509_get_default_cert_file()) ? X509_get_default_cert_file() : kDebianBundle;
  const std::string directory = X509_get_default_cert_dir();
  if (!IsFile(file) && !IsDirectory(directory)) {
    throw CryptoException("The operating system's trust store was not found");
  }
  if (IsFile(file)) {
    AddFile(store, file);
  }
  if (IsDirectory(directory)) {
    AddDirectory(store, directory);
  }
}

}  // namespace Ssl
}  // namespace Pelmar
