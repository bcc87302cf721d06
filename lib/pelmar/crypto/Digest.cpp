// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

#include <pelmar/crypto/Digest.h>

#include "pelmar/crypto/DigestWriter.h"

namespace Pelmar {
namespace Crypto {

std::vector<unsigned char> ComputeDigest(DigestAlgorithm algorithm, const void* data, std::size_t size) {
  const Ref<DigestWriter> writer = MakeRef<DigestWriter>(algorithm);
  writer->Write(static_cast<const char*>(data), size);
  return writer->Finish();
}

std::string ToHex(const std::vector<unsigned char>& bytes) {
  static const char kDigits[] = "0123456789abcdef";
  std::string text;
  text.reserve(bytes.size() * 2);
  for (const unsigned char byte : bytes) {
    text += kDigits[byte >> 4];
    text += kDigits[byte & 15];
  }
  return text;
}

}  // namespace Crypto
}  // namespace Pelmar
