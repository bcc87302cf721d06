// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

#include "pelmar/crypto/DigestWriter.h"

#include <pelmar/crypto/Digest.h>

#include <gtest/gtest.h>

#include <string>

namespace {

using namespace Pelmar::Crypto;

std::string HexDigest(DigestAlgorithm algorithm, const std::string& text) {
  return ToHex(ComputeDigest(algorithm, text.data(), text.size()));
}

// FIPS 180-4 example texts.
TEST(Digest, GivesThePublishedValues) {
  EXPECT_EQ(HexDigest(DIGEST_SHA256, "abc"),
            "ba7816bf8f01cfea414140de5dae2223b00361a396177a9cb410ff61f20015ad");
  EXPECT_EQ(HexDigest(DIGEST_SHA256, ""), "e3b0c44298fc1c149afbf4c8996fb92427ae41e4649b934ca495991b7852b855");
  EXPECT_EQ(
      HexDigest(DIGEST_SHA384, "abc"),
      "cb00753f45a35e8bb5a03d699ac65007272c32ab0eded1631a8b605a43ff5bed8086072ba1e7cc2358baeca134c825a7");
  EXPECT_EQ(HexDigest(DIGEST_SHA512, "abc"),
            "ddaf35a193617abacc417349ae20413112e6fa4e89a97ea20a9eeee64b55d39a"
            "2192992a274fc1a836ba3c23a3feebbd454d4423643ce80e2a9ac94fa54ca49f");
}

TEST(Digest, TakesNullForNoBytes) {
  EXPECT_EQ(ComputeDigest(DIGEST_SHA256, nullptr, 0), ComputeDigest(DIGEST_SHA256, "", 0));
}

TEST(Digest, IsTheSameInPieces) {
  for (const DigestAlgorithm algorithm : {DIGEST_SHA256, DIGEST_SHA384, DIGEST_SHA512}) {
    const std::string text(1000, 'q');
    const Pelmar::Ref<DigestWriter> writer = Pelmar::MakeRef<DigestWriter>(algorithm);
    for (const char& letter : text) {
      writer->Write(&letter, 1);
    }
    EXPECT_EQ(writer->Finish(), ComputeDigest(algorithm, text.data(), text.size()));
  }
}

TEST(Digest, HexadecimalTextIsLowerCase) {
  EXPECT_EQ(ToHex({0x00, 0x0a, 0xf9, 0xff}), "000af9ff");
  EXPECT_EQ(ToHex({}), "");
}

}  // namespace
