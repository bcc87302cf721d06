// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

#include "support/GoldenText.h"

#include <gtest/gtest.h>

#include <stdexcept>
#include <string>

namespace TestSupport {
namespace {

std::string Times(const std::string& created, const std::string& expires) {
  return "<wsu:Created>" + created + "</wsu:Created><wsu:Expires>" + expires + "</wsu:Expires>";
}

struct MaskCase {
  const char* description;
  std::string text;
  std::string masked;
};

TEST(GoldenText, MasksWhatDiffersFromMessageToMessage) {
  const std::string a = "01234567-89ab-cdef-0123-456789abcdef";
  const std::string b = "fedcba98-7654-3210-fedc-ba9876543210";
  const std::string digest = "<ds:DigestValue>";
  const std::string digestEnd = "</ds:DigestValue>";
  const std::string signature = "<ds:SignatureValue>";
  const std::string signatureEnd = "</ds:SignatureValue>";
  const MaskCase cases[] = {
      {"nothing", "", ""},
      {"plain text", "<a b=\"c\">d</a>", "<a b=\"c\">d</a>"},
      {"UUIDs by first appearance", "#Body" + b + " " + a + " " + b, "#Body{uuid 1} {uuid 2} {uuid 1}"},
      {"UUID at both ends", a + a, "{uuid 1}{uuid 1}"},
      {"upper-case UUID", "01234567-89AB-cdef-0123-456789abcdef", "01234567-89AB-cdef-0123-456789abcdef"},
      {"cut UUID", a.substr(0, 35), a.substr(0, 35)},
      {"times", Times("2012-03-05T07:04:09.045Z", "2012-03-05T07:14:09.045Z"),
       Times("{time}", "{time + 600 s}")},
      {"times backwards", Times("2012-03-05T07:04:09.045Z", "2012-03-05T07:04:08.000Z"),
       Times("{time}", "{time - 1.045 s}")},
      {"times with a fraction between", Times("2012-03-05T07:04:09.045Z", "2012-03-05T07:04:10.050Z"),
       Times("{time}", "{time + 1.005 s}")},
      {"two pairs",
       Times("2012-03-05T07:04:09.045Z", "2012-03-05T07:04:09.045Z") + "x" +
           Times("2012-03-05T07:04:09.000Z", "2012-03-06T07:04:09.000Z"),
       Times("{time}", "{time + 0 s}") + "x" + Times("{time}", "{time + 86400 s}")},
      {"times without milliseconds", Times("2012-03-05T07:04:09Z", "2012-03-05T07:14:09.045Z"),
       Times("2012-03-05T07:04:09Z", "2012-03-05T07:14:09.045Z")},
      {"no time", Times("2012-13-05T07:04:09.045Z", "2012-03-05T07:14:09.045Z"),
       Times("2012-13-05T07:04:09.045Z", "2012-03-05T07:14:09.045Z")},
      {"Created alone", "<wsu:Created>2012-03-05T07:04:09.045Z</wsu:Created>",
       "<wsu:Created>2012-03-05T07:04:09.045Z</wsu:Created>"},
      {"digest", digest + std::string(43, 'A') + "=" + digestEnd, digest + "{digest}" + digestEnd},
      {"short digest", digest + "AAAA" + digestEnd, digest + "AAAA" + digestEnd},
      {"empty digest", digest + digestEnd, digest + digestEnd},
      {"malformed digest", digest + std::string(44, '!') + digestEnd,
       digest + std::string(44, '!') + digestEnd},
      {"signature", signature + std::string(342, 'A') + "==" + signatureEnd,
       signature + "{signature}" + signatureEnd},
      {"short signature", signature + "AAAA" + signatureEnd, signature + "AAAA" + signatureEnd},
      {"unclosed digest", digest + "AAAA", digest + "AAAA"},
  };
  for (const MaskCase& c : cases) {
    EXPECT_EQ(MaskVolatile(c.text), c.masked) << c.description;
  }
}

TEST(GoldenText, ReplacesEveryOccurrence) {
  EXPECT_EQ(ReplaceAll("aXbXX", "X", "--"), "a--b----");
  EXPECT_EQ(ReplaceAll("aaa", "aa", "b"), "ba");
  EXPECT_EQ(ReplaceAll("abc", "d", "e"), "abc");
  EXPECT_EQ(ReplaceAll("", "d", "e"), "");
}

TEST(GoldenText, CutsWhatLiesBetween) {
  EXPECT_EQ(CutBetween("<a>1</a><a>2</a>", "<a>", "</a>"), "1");
  EXPECT_EQ(CutBetween("<a></a>", "<a>", "</a>"), "");
  EXPECT_THROW(CutBetween("<a>1", "<a>", "</a>"), std::runtime_error);
  EXPECT_THROW(CutBetween("1</a>", "<a>", "</a>"), std::runtime_error);
}

TEST(GoldenText, ReadsFilesWithoutTheirLayout) {
  const std::string text = ReadGoldenText("requests/spnego-continued.xml");
  EXPECT_EQ(text.find('\n'), std::string::npos);
  EXPECT_EQ(text.find("> <"), std::string::npos);
  EXPECT_EQ(CutBetween(text, "Context=\"", "\""), "urn:context:7");
}

TEST(GoldenText, FillsInTheVendorUris) {
  const std::string text = ReadGoldenText("requests/certificate-full.xml");
  EXPECT_EQ(CutBetween(text, "xmlns:rsa-advice=\"", "/names/"), QUORLIN_VENDOR_URI_BASE);
}

TEST(GoldenText, RefusesMissingFiles) {
  EXPECT_THROW(ReadGoldenText("requests/no-such-request.xml"), std::runtime_error);
  EXPECT_THROW(ReadVector("requests/no-such-request.xml"), std::runtime_error);
}

}  // namespace
}  // namespace TestSupport
