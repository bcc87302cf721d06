// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

// The tokens below tests/vectors/tokens, which other programs made and signed.

#include "support/GoldenText.h"
#include "support/TokenFactory.h"
#include "support/Verdict.h"

#include <pelmar/crypto/Certificate.h>

#include <gtest/gtest.h>

#include <filesystem>
#include <set>
#include <sstream>
#include <string>
#include <vector>

namespace Quorlin {
namespace {

using namespace TestSupport;

struct VectorLine {
  std::string name;
  std::vector<std::string> expected;
};

std::vector<VectorLine> ReadExpectations(const std::string& folder) {
  std::istringstream file(ReadVector("tokens/" + folder + "/expected.txt"));
  std::vector<VectorLine> lines;
  for (std::string text; std::getline(file, text);) {
    std::istringstream columns(text);
    VectorLine line;
    std::getline(columns, line.name, '\t');
    for (std::string column; std::getline(columns, column, '\t');) {
      line.expected.push_back(column);
    }
    lines.push_back(line);
  }
  return lines;
}

std::string ReadTokenFile(const std::string& folder, const std::string& name) {
  return ReplaceAll(ReadVector("tokens/" + folder + "/" + name + ".xml"), "{vendor}",
                    QUORLIN_VENDOR_URI_BASE);
}

TrustList VectorTrust() {
  return {Pelmar::Crypto::CreateCertificateFromPem(ReadVector("tokens/signer.pem"))};
}

/// The names of the files of a folder, and of those that have an expectation.
void ExpectNothingOverlooked(const std::string& folder) {
  std::multiset<std::string> files;
  for (const auto& entry :
       std::filesystem::directory_iterator(QUORLIN_TEST_VECTORS_DIR "/tokens/" + folder)) {
    if (entry.path().extension() == ".xml") {
      files.insert(entry.path().stem().string());
    }
  }
  std::multiset<std::string> expected;
  for (const VectorLine& line : ReadExpectations(folder)) {
    expected.insert(line.name);
  }
  EXPECT_EQ(files, expected);
  EXPECT_FALSE(files.empty());
}

TEST(TokenVectors, AreAllListed) {
  ExpectNothingOverlooked("accept");
  ExpectNothingOverlooked("reject");
}

TEST(TokenVectors, AcceptedOnesMeanWhatIsExpected) {
  const TrustList trusted = VectorTrust();
  for (const VectorLine& line : ReadExpectations("accept")) {
    const std::string text = ReadTokenFile("accept", line.name);
    std::string expected;
    for (const std::string& column : line.expected) {
      expected += column + "\n";
    }
    std::string meaning;
    EXPECT_EQ(VerdictOf([&] { meaning = MeaningOf(*CreateSamlToken(text, trusted)); }), "accepted")
        << line.name;
    EXPECT_EQ(meaning, expected) << line.name;
  }
}

TEST(TokenVectors, AcceptedOnesAreRefusedWithoutTrust) {
  for (const VectorLine& line : ReadExpectations("accept")) {
    EXPECT_EQ(
        VerdictOnToken(ReadTokenFile("accept", line.name), TrustList()),
        "Quorlin::InvalidSignatureException: Signature verification error. Certificate chain is not trusted: "
        "self-signed certificate (CN=Token vectors)")
        << line.name;
  }
}

TEST(TokenVectors, RefusedOnesGiveClassAndWholeText) {
  const TrustList trusted = VectorTrust();
  for (const VectorLine& line : ReadExpectations("reject")) {
    ASSERT_EQ(line.expected.size(), 2U) << line.name;
    EXPECT_EQ(VerdictOnToken(ReadTokenFile("reject", line.name), trusted),
              line.expected[0] + ": " + line.expected[1])
        << line.name;
  }
}

}  // namespace
}  // namespace Quorlin
