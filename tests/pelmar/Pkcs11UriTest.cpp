// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

#include "pelmar/crypto/Pkcs11Uri.h"

#include <pelmar/crypto/CryptoException.h>
#include <pelmar/crypto/Pkcs11.h>

#include <gtest/gtest.h>

#include <string>

namespace {

using namespace Pelmar::Crypto;

std::string RefusalOf(const std::string& uri) {
  try {
    ParsePkcs11Uri(uri);
  } catch (const CryptoException& error) {
    return error.what();
  }
  return "accepted";
}

TEST(Pkcs11Uri, IsToldFromAFileName) {
  EXPECT_TRUE(IsPkcs11Uri("pkcs11:token=t;object=o"));
  EXPECT_TRUE(IsPkcs11Uri("pkcs11:"));
  for (const char* const other : {"", "pkcs11", "PKCS11:token=t", "./pkcs11:token=t", "key.pem"}) {
    EXPECT_FALSE(IsPkcs11Uri(other)) << other;
  }
}

TEST(Pkcs11Uri, IsWrittenAnewForTheEngine) {
  const Pkcs11Uri uri = ParsePkcs11Uri(
      "pkcs11:type=private;object=my%20key;id=%00%fF;token=A&B(c);serial=1;manufacturer=m;model=n");
  EXPECT_EQ(
      uri.objectUri,
      "pkcs11:id=%00%FF;manufacturer=m;model=n;object=my%20key;serial=1;token=A%26B%28c%29;type=private");
  EXPECT_EQ(uri.modulePath, "");
  EXPECT_EQ(uri.pinFile, "");
}

TEST(Pkcs11Uri, HasAModuleAndAPinFileInItsQuery) {
  const Pkcs11Uri uri =
      ParsePkcs11Uri("pkcs11:token=t;object=o?module-path=/usr/lib/a%20b.so&pin-source=file:/run/my%26pin");
  EXPECT_EQ(uri.objectUri, "pkcs11:object=o;token=t;type=private");
  EXPECT_EQ(uri.modulePath, "/usr/lib/a b.so");
  EXPECT_EQ(uri.pinFile, "/run/my&pin");
}

TEST(Pkcs11Uri, NamesThePinFileInThreeWays) {
  for (const char* const source : {"/run/pin", "file:/run/pin", "file:///run/pin"}) {
    EXPECT_EQ(ParsePkcs11Uri(std::string("pkcs11:token=t;id=%01?pin-source=") + source).pinFile, "/run/pin");
  }
}

struct BadUri {
  const char* name;
  const char* uri;
  const char* message;
};

class Pkcs11UriRefuses : public testing::TestWithParam<BadUri> {};

TEST_P(Pkcs11UriRefuses, WithItsMessage) {
  EXPECT_EQ(RefusalOf(GetParam().uri), std::string("The PKCS #11 URI ") + GetParam().message);
}

constexpr const char* kPinValue =
    "holds pin-value: a PIN in a URI is seen in argument lists and logs, so it is not taken from there; use pin-source "
    "(and change that PIN)";
constexpr const char* kNotAccepted = "has an attribute that is not accepted there";

const BadUri kBadUris[] = {
    {"AnotherScheme", "file:token=t;object=o", "does not start with pkcs11:"},
    {"NoAttribute", "pkcs11:", kNotAccepted},
    {"PinValue", "pkcs11:token=t;object=o?pin-value=1234", kPinValue},
    {"PinValueInThePath", "pkcs11:token=t;object=o;pin-value=1234", kPinValue},
    {"PinValueBesideAPinFile", "pkcs11:token=t;object=o?pin-source=/p&pin-value=1234", kPinValue},
    {"PinValueWithoutValue", "pkcs11:token=t;object=o?pin-value", kPinValue},
    {"UnknownAttribute", "pkcs11:token=t;object=o;slot-id=1", kNotAccepted},
    {"VendorAttribute", "pkcs11:token=t;object=o;x-mine=1", kNotAccepted},
    {"UnknownQuery", "pkcs11:token=t;object=o?module-name=m", kNotAccepted},
    {"ModuleInThePath", "pkcs11:token=t;object=o;module-path=/m", kNotAccepted},
    {"TokenInTheQuery", "pkcs11:object=o?token=t", kNotAccepted},
    {"EmptyPart", "pkcs11:token=t;;object=o", kNotAccepted},
    {"FinalSemicolon", "pkcs11:token=t;object=o;", kNotAccepted},
    {"EmptyQuery", "pkcs11:token=t;object=o?", kNotAccepted},
    {"NoEqualsSign", "pkcs11:token;object=o", "has no value for token"},
    {"EmptyValue", "pkcs11:token=;object=o", "has no value for token"},
    {"TwoValues", "pkcs11:token=t;object=o;token=u", "has two values for token"},
    {"ZeroByte", "pkcs11:token=t%00u;object=o", "has a zero byte in token"},
    {"ShortEscape", "pkcs11:token=t;object=%4", "has a percent sign without two hexadecimal digits"},
    {"NoEscape", "pkcs11:token=t;object=%", "has a percent sign without two hexadecimal digits"},
    {"BadEscape", "pkcs11:token=%zz;object=o", "has a percent sign without two hexadecimal digits"},
    {"Space", "pkcs11:token=my token;object=o", "has a character that must be percent-encoded"},
    {"SlashInThePath", "pkcs11:token=a/b;object=o", "has a character that must be percent-encoded"},
    {"NotAscii", "pkcs11:token=\xC3\xA9;object=o", "has a character that must be percent-encoded"},
    {"SecondQuestionMarkBeforeAPin", "pkcs11:token=t;object=o?module-path=/m?pin-value=1&pin-value=2",
     kPinValue},
    {"NoToken", "pkcs11:object=o", "has neither token nor serial"},
    {"NoObject", "pkcs11:token=t", "has neither object nor id"},
    {"PublicKey", "pkcs11:token=t;object=o;type=public", "has a type other than private"},
    {"RelativePinFile", "pkcs11:token=t;object=o?pin-source=pin",
     "has a pin-source that is not the absolute path of a file"},
    {"PinFileOfAHost", "pkcs11:token=t;object=o?pin-source=file://host/pin",
     "has a pin-source that is not the absolute path of a file"},
    {"PinFromAProgram", "pkcs11:token=t;object=o?pin-source=%7Cecho",
     "has a pin-source that is not the absolute path of a file"},
};

INSTANTIATE_TEST_SUITE_P(Table, Pkcs11UriRefuses, testing::ValuesIn(kBadUris),
                         [](const auto& test) { return std::string(test.param.name); });

TEST(Pkcs11Uri, HasALimitedSize) {
  const std::string begin = "pkcs11:object=o;token=";
  const std::string most = begin + std::string(kMaxPkcs11UriBytes - begin.size(), 't');
  EXPECT_EQ(RefusalOf(most), "accepted");
  EXPECT_EQ(RefusalOf(most + "t"), "The PKCS #11 URI has more than 4096 bytes");
}

}  // namespace
