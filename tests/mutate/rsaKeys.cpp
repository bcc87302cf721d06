// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

// Linked into a test program that is run many times over: the RSA keys that its tests make come from files in
// the folder that QUORLIN_MUTANT_KEYS names, where the first run to need them leaves them. Making them anew
// takes longer than most tests. Within a process every key is another one, as it would be.

#include <openssl/bio.h>
#include <openssl/evp.h>
#include <openssl/pem.h>

#include <dlfcn.h>
#include <unistd.h>

#include <cstdarg>
#include <cstdio>
#include <cstdlib>
#include <map>
#include <mutex>
#include <string>

namespace {

using KeyGenerator = EVP_PKEY* (*)(OSSL_LIB_CTX*, const char*, const char*, ...);

KeyGenerator GetOpenSslGenerator() {
  static const auto generator = reinterpret_cast<KeyGenerator>(dlsym(RTLD_NEXT, "EVP_PKEY_Q_keygen"));
  return generator;
}

std::string DrawPath(const char* folder, std::size_t bits) {
  static std::mutex mutex;
  static std::map<std::size_t, int> counts;
  const std::lock_guard<std::mutex> lock(mutex);
  return std::string(folder) + "/rsa" + std::to_string(bits) + "-" + std::to_string(++counts[bits]) + ".pem";
}

EVP_PKEY* ReadKey(const std::string& path) {
  BIO* const input = BIO_new_file(path.c_str(), "r");
  EVP_PKEY* const key =
      input == nullptr ? nullptr : PEM_read_bio_PrivateKey(input, nullptr, nullptr, nullptr);
  BIO_free(input);
  return key;
}

/// Under another name first: several programs run at once.
void WriteKey(const std::string& path, EVP_PKEY* key) {
  const std::string unfinished = path + "." + std::to_string(getpid());
  BIO* const output = BIO_new_file(unfinished.c_str(), "w");
  if (output == nullptr ||
      PEM_write_bio_PrivateKey(output, key, nullptr, nullptr, 0, nullptr, nullptr) != 1 ||
      BIO_free(output) != 1 || std::rename(unfinished.c_str(), path.c_str()) != 0) {
    std::abort();
  }
}

EVP_PKEY* MakeRsaKey(OSSL_LIB_CTX* library, const char* properties, std::size_t bits) {
  const char* const folder = std::getenv("QUORLIN_MUTANT_KEYS");
  if (folder == nullptr) {
    return GetOpenSslGenerator()(library, properties, "RSA", bits);
  }
  const std::string path = DrawPath(folder, bits);
  if (access(path.c_str(), R_OK) == 0) {
    return ReadKey(path);
  }
  EVP_PKEY* const key = GetOpenSslGenerator()(library, properties, "RSA", bits);
  WriteKey(path, key);
  return key;
}

}  // namespace

// Takes the place of OpenSSL's function, which EVP_RSA_gen and EVP_EC_gen stand for.
extern "C" EVP_PKEY* EVP_PKEY_Q_keygen(OSSL_LIB_CTX* library, const char* properties, const char* type, ...) {
  std::va_list arguments;
  va_start(arguments, type);
  EVP_PKEY* key = nullptr;
  if (std::string(type) == "RSA") {
    key = MakeRsaKey(library, properties, va_arg(arguments, std::size_t));
  } else if (std::string(type) == "EC") {
    key = GetOpenSslGenerator()(library, properties, type, va_arg(arguments, char*));
  } else {
    key = GetOpenSslGenerator()(library, properties, type);
  }
  va_end(arguments);
  return key;
}
