// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

#include "pelmar/crypto/X509Fields.h"

#include "pelmar/crypto/OpenSslError.h"
#include "pelmar/crypto/OpenSslHandles.h"

#include <pelmar/crypto/CryptoException.h>

#include <ctime>

namespace Pelmar {
namespace Crypto {

namespace {

constexpr unsigned long kNameFlags = XN_FLAG_RFC2253 & ~static_cast<unsigned long>(ASN1_STRFLGS_ESC_MSB);
constexpr long long kMicrosecondsPerSecond = 1000000;

}  // namespace

std::string PrintX509Name(const X509_NAME* name) {
  const BioHandle memory(BIO_new(BIO_s_mem()));
  if (!memory || X509_NAME_print_ex(memory.get(), name, 0, kNameFlags) < 0) {
    ThrowOpenSslError("The certificate's name cannot be printed");
  }
  char* data = nullptr;
  const long size = BIO_get_mem_data(memory.get(), &data);
  return size <= 0 ? std::string() : std::string(data, static_cast<std::size_t>(size));
}

System::DateTime ReadX509Time(const ASN1_TIME* time) {
  std::tm fields = {};
  if (ASN1_TIME_to_tm(time, &fields) != 1) {
    ClearOpenSslErrors();
    throw CryptoException("The certificate's validity period cannot be read");
  }
  return System::DateTimeFromUtc(static_cast<long long>(timegm(&fields)) * kMicrosecondsPerSecond, false);
}

}  // namespace Crypto
}  // namespace Pelmar
