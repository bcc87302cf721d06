// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

#include "pelmar/xml/SignatureProfile.h"

#include <pelmar/xml/security/Algorithms.h>
#include <pelmar/xml/security/Exceptions.h>

#include <algorithm>
#include <cstddef>
#include <iterator>

namespace Pelmar {
namespace Xml {
namespace Security {

namespace {

using namespace Crypto;

constexpr std::size_t kMaxQuotedBytes = 200;
// What signers write on the wire; XML Signature 1.1, section 6.1, has it so.
constexpr const char* kC14nOnTheWire = "http://www.w3.org/TR/2001/REC-xml-c14n-20010315";

struct DigestRow {
  const char* algorithm;
  DigestAlgorithm digest;
};

constexpr DigestRow kDigests[] = {
    {kSha256, DIGEST_SHA256}, {kSha384, DIGEST_SHA384}, {kSha512, DIGEST_SHA512}};

struct MethodRow {
  const char* algorithm;
  SignatureMethod method;
};

constexpr MethodRow kMethods[] = {
    {kRsaSha256, {KEY_RSA, DIGEST_SHA256}},  {kRsaSha384, {KEY_RSA, DIGEST_SHA384}},
    {kRsaSha512, {KEY_RSA, DIGEST_SHA512}},  {kEcdsaSha256, {KEY_EC, DIGEST_SHA256}},
    {kEcdsaSha384, {KEY_EC, DIGEST_SHA384}}, {kEcdsaSha512, {KEY_EC, DIGEST_SHA512}},
};

/// The row of a table for `algorithm`; null when there is none.
template <typename Row, std::size_t size>
const Row* FindRow(const Row (&table)[size], const std::string& algorithm) {
  const auto found = std::find_if(std::begin(table), std::end(table),
                                  [&algorithm](const Row& row) { return algorithm == row.algorithm; });
  return found == std::end(table) ? nullptr : found;
}

[[noreturn]] void ThrowNotAccepted(const char* what, const std::string& value) {
  throw XmlSecurityException(std::string(what) + " " + QuoteForMessage(value) + " is not accepted");
}

bool IsContinuationByte(char byte) {
  return (static_cast<unsigned char>(byte) & 0xC0) == 0x80;
}

}  // namespace

bool IsExclusiveCanonicalization(const std::string& algorithm) {
  return algorithm == kExclusiveC14n || algorithm == kExclusiveC14nWithComments;
}

bool IsCanonicalization(const std::string& algorithm) {
  return IsExclusiveCanonicalization(algorithm) || algorithm == kC14nOnTheWire || algorithm == kC14n ||
         algorithm == kC14nWithComments;
}

bool IsDigestMethod(const std::string& algorithm) {
  return FindRow(kDigests, algorithm) != nullptr;
}

bool IsSignatureMethod(const std::string& algorithm) {
  return FindRow(kMethods, algorithm) != nullptr;
}

bool IsTransform(const std::string& algorithm) {
  return algorithm == kEnvelopedSignature || IsCanonicalization(algorithm);
}

bool IsReferenceUri(const std::string& uri) {
  return uri.empty() || (uri.size() > 1 && uri[0] == '#');
}

DigestAlgorithm RequireDigestMethod(const std::string& algorithm) {
  const DigestRow* const row = FindRow(kDigests, algorithm);
  if (row == nullptr) {
    ThrowNotAccepted("Digest method", algorithm);
  }
  return row->digest;
}

SignatureMethod RequireSignatureMethod(const std::string& algorithm) {
  const MethodRow* const row = FindRow(kMethods, algorithm);
  if (row == nullptr) {
    ThrowNotAccepted("Signature method", algorithm);
  }
  return row->method;
}

void RequireCanonicalizationMethod(const std::string& algorithm) {
  if (!IsCanonicalization(algorithm)) {
    ThrowNotAccepted("Canonicalization method", algorithm);
  }
}

void RequireReferenceUri(const std::string& uri) {
  if (!IsReferenceUri(uri)) {
    ThrowNotAccepted("Reference URI", uri);
  }
}

void RequireTransforms(const std::vector<std::string>& algorithms) {
  bool envelopedMayCome = true;
  bool canonicalizationMayCome = true;
  for (const std::string& algorithm : algorithms) {
    if (!IsTransform(algorithm)) {
      ThrowNotAccepted("Transform", algorithm);
    }
    const bool isEnveloped = algorithm == kEnvelopedSignature;
    if (isEnveloped ? !envelopedMayCome : !canonicalizationMayCome) {
      throw XmlSecurityException("Transform " + QuoteForMessage(algorithm) +
                                 " is repeated or stands in the wrong order");
    }
    envelopedMayCome = false;
    canonicalizationMayCome = isEnveloped;
  }
}

std::string WithoutComments(const std::string& canonicalization) {
  if (canonicalization == kC14nWithComments) {
    return kC14n;
  }
  return canonicalization == kExclusiveC14nWithComments ? kExclusiveC14n : canonicalization;
}

std::string QuoteForMessage(const std::string& text) {
  if (text.size() <= kMaxQuotedBytes) {
    return "'" + text + "'";
  }
  std::size_t size = kMaxQuotedBytes;
  while (size > 0 && IsContinuationByte(text[size])) {
    --size;
  }
  return "'" + text.substr(0, size) + "...'";
}

}  // namespace Security
}  // namespace Xml
}  // namespace Pelmar
