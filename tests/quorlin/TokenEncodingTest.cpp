// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

// Tokens in other encodings than UTF-8, and with declarations that say something else than the bytes do. Two
// readers that disagree on the encoding read two tokens.

#include "support/TokenFactory.h"
#include "support/Verdict.h"

#include <gtest/gtest.h>

#include <string>

namespace Quorlin {
namespace {

using namespace TestSupport;

const char* const kNotUtf8 = "Pelmar::Xml::XMLParseException: only UTF-8 is accepted at line 1, column 1";

std::string Declared(const std::string& encoding) {
  return "<?xml version=\"1.0\" encoding=\"" + encoding + "\"?>" + SignToken(TokenText());
}

/// ASCII text in units of so many bytes, without a byte order mark.
std::string Widen(const std::string& ascii, std::size_t unitBytes, bool bigEndian) {
  const std::string zeros(unitBytes - 1, '\0');
  std::string wide;
  for (const char c : ascii) {
    wide += bigEndian ? zeros + c : c + zeros;
  }
  return wide;
}

std::string Mark(std::size_t unitBytes, bool bigEndian) {
  const std::string zeros(unitBytes - 2, '\0');
  return bigEndian ? zeros + "\xFE\xFF" : "\xFF\xFE" + zeros;
}

TEST(EncodingOfAToken, IsNotUtf16) {
  for (const bool bigEndian : {false, true}) {
    for (const std::string& text : {SignToken(TokenText()), Declared("UTF-16"), Declared("utf-8")}) {
      const std::string wide = Widen(text, 2, bigEndian);
      EXPECT_EQ(VerdictOnToken(Mark(2, bigEndian) + wide), kNotUtf8) << bigEndian;
      EXPECT_EQ(VerdictOnToken(wide), kNotUtf8) << bigEndian;
    }
  }
}

TEST(EncodingOfAToken, IsNotUtf32) {
  for (const bool bigEndian : {false, true}) {
    for (const std::string& text : {SignToken(TokenText()), Declared("UTF-32"), Declared("utf-8")}) {
      const std::string wide = Widen(text, 4, bigEndian);
      EXPECT_EQ(VerdictOnToken(Mark(4, bigEndian) + wide), kNotUtf8) << bigEndian;
      EXPECT_EQ(VerdictOnToken(wide), kNotUtf8) << bigEndian;
    }
  }
}

/// "<?xml version="1.0" encoding="IBM037"?>" in that encoding.
const char* const kEbcdicDeclaration =
    "\x4C\x6F\xA7\x94\x93\x40\xA5\x85\x99\xA2\x89\x96\x95\x7E\x7F\xF1\x4B\xF0\x7F\x40\x85\x95\x83\x96\x84\x89"
    "\x95\x87\x7E\x7F\xC9\xC2\xD4\xF0\xF3\xF7\x7F\x6F\x6E";

TEST(EncodingOfAToken, IsNotEbcdic) {
  EXPECT_EQ(VerdictOnToken(kEbcdicDeclaration + SignToken(TokenText())),
            "Pelmar::Xml::XMLParseException: not well-formed (invalid token) at line 1, column 3");
  EXPECT_EQ(VerdictOnToken(Declared("IBM037")), kNotUtf8);
}

TEST(EncodingOfAToken, IsNotWhatADeclarationSaysOtherwise) {
  for (const char* const encoding : {"ISO-8859-1", "US-ASCII", "UTF-16", "UTF-16LE", "UTF-16BE", "UTF-32",
                                     "UTF-7", "windows-1252", "UCS-2", "utf8", "UTF_8", "x"}) {
    EXPECT_EQ(VerdictOnToken(Declared(encoding)), kNotUtf8) << encoding;
    EXPECT_EQ(VerdictOnToken("\xEF\xBB\xBF" + Declared(encoding)), kNotUtf8) << encoding;
  }
}

TEST(EncodingOfAToken, MayBeDeclaredAsUtf8InAnyCase) {
  for (const char* const encoding : {"UTF-8", "utf-8", "Utf-8"}) {
    EXPECT_EQ(VerdictOnToken(Declared(encoding)), "accepted") << encoding;
    EXPECT_EQ(VerdictOnToken("\xEF\xBB\xBF" + Declared(encoding)), "accepted") << encoding;
  }
}

TEST(EncodingOfAToken, HasAWellFormedDeclarationAtItsStart) {
  const std::string token = SignToken(TokenText());
  EXPECT_EQ(
      VerdictOnToken(" " + Declared("utf-8")),
      "Pelmar::Xml::XMLParseException: XML or text declaration not at start of entity at line 1, column 2");
  for (const char* const declaration :
       {"<?xml?>", "<?xml version=\"1.0\" encoding=\"\"?>", "<?xml encoding=\"utf-8\"?>",
        "<?xml version=\"1.0\" encoding=\"utf-8\" x=\"\"?>",
        "<?xml version=\"1.0\" standalone=\"maybe\"?>"}) {
    EXPECT_EQ(VerdictOnToken(declaration + token).substr(0, 66),
              "Pelmar::Xml::XMLParseException: XML declaration not well-formed at")
        << declaration;
  }
  EXPECT_EQ(VerdictOnToken("<?xml version=\"1.0\" standalone=\"no\"?>" + token), "accepted");
}

// Bytes of ISO 8859-1, and of UTF-8 read as ISO 8859-1, are other characters, not other spellings.
TEST(EncodingOfAToken, DecidesWhatItsBytesMean) {
  TokenText text;
  text.nameId = NameIdElement("ren\xC3\xA9@example.com");
  EXPECT_EQ(ReadToken(text)->GetSubject().name, "ren\xC3\xA9");
  const std::string latin = ReplaceOnce(SignToken(text), "\xC3\xA9", "\xE9");
  EXPECT_EQ(VerdictOnToken(latin).substr(0, 64),
            "Pelmar::Xml::XMLParseException: not well-formed (invalid token) ");
}

// Characters that only look alike, or that another normal form would join, stay what they are.
TEST(EncodingOfAToken, IsNotNormalised) {
  const char* const composed = "ren\xC3\xA9@example.com";
  const char* const decomposed = "rene\xCC\x81@example.com";
  TokenText text;
  text.nameId = NameIdElement(composed);
  const std::string good = SignToken(text);
  EXPECT_EQ(
      VerdictOnToken(ReplaceOnce(good, composed, decomposed)),
      "Quorlin::InvalidSignatureException: Failed to verify signature: token might have been tampered with.");
  text.nameId = NameIdElement(decomposed);
  EXPECT_EQ(ReadToken(text)->GetSubject().name, "rene\xCC\x81");
}

}  // namespace
}  // namespace Quorlin
