// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

#include <pelmar/Exception.h>
#include <pelmar/StringUtil.h>

// The test puts a random generator of its own in place, through an interface that OpenSSL 3 keeps but advises
// against.
#define OPENSSL_SUPPRESS_DEPRECATED
#include <openssl/rand.h>

#include <gtest/gtest.h>

#include <algorithm>
#include <cstddef>
#include <set>
#include <string>
#include <vector>

namespace Pelmar {
namespace StringUtil {
namespace {

std::vector<unsigned char> ToBytes(const std::string& text) {
  return std::vector<unsigned char>(text.begin(), text.end());
}

std::string DecodeFailure(const std::string& text) {
  try {
    Base64Decode(text);
    return "accepted";
  } catch (const Base64FormatException& e) {
    return e.what();
  }
}

struct Base64Case {
  std::string bytes;
  const char* text;
};

// RFC 4648, section 10, and the letters of the two highest values.
const Base64Case kBase64Cases[] = {
    {"", ""},
    {"f", "Zg=="},
    {"fo", "Zm8="},
    {"foo", "Zm9v"},
    {"foob", "Zm9vYg=="},
    {"fooba", "Zm9vYmE="},
    {"foobar", "Zm9vYmFy"},
    {"\xFB\xEF\xFF", "++//"},
    {std::string(3, '\0'), "AAAA"},
};

TEST(Base64, EncodesThePublishedVectors) {
  for (const Base64Case& c : kBase64Cases) {
    EXPECT_EQ(Base64Encode(ToBytes(c.bytes)), c.text);
  }
}

TEST(Base64, DecodesThePublishedVectors) {
  for (const Base64Case& c : kBase64Cases) {
    EXPECT_EQ(Base64Decode(c.text), ToBytes(c.bytes)) << c.text;
  }
}

TEST(Base64, SkipsXmlWhiteSpaceAnywhere) {
  EXPECT_EQ(Base64Decode(" Z\tm\r\n9 v\nY g = \t= "), ToBytes("foob"));
  EXPECT_EQ(Base64Decode(" \t\r\n"), ToBytes(""));
}

TEST(Base64, RoundTripsEveryLengthAndByte) {
  std::vector<unsigned char> bytes;
  for (int size = 0; size < 520; ++size) {
    EXPECT_EQ(Base64Decode(Base64Encode(bytes)), bytes) << size;
    bytes.push_back(static_cast<unsigned char>(size * 7));
  }
}

TEST(Base64, RoundTripsInputOfSeveralPieces) {
  // OpenSSL is given at most 2^20 groups at a time: three such pieces and a padded rest.
  std::vector<unsigned char> bytes(3 * 3 * (1u << 20) + 1);
  for (std::size_t i = 0; i < bytes.size(); ++i) {
    bytes[i] = static_cast<unsigned char>((i * 31) >> 3);
  }
  const std::string text = Base64Encode(bytes);
  EXPECT_EQ(text.size(), (bytes.size() + 2) / 3 * 4);
  EXPECT_EQ(text.find('\0'), std::string::npos);
  EXPECT_EQ(Base64Decode(text), bytes);
}

TEST(Base64, RefusesWhatIsNotExact) {
  const char kLength[] = "Invalid base64 text: the length is not a multiple of four";
  const char kCharacter[] = "Invalid base64 text: unexpected character";
  const char kTrailing[] = "Invalid base64 text: the trailing bits are not zero";
  const struct {
    std::string text;
    const char* message;
  } cases[] = {
      {"Z", kLength},
      {"Zg", kLength},
      {"Zg=", kLength},
      {"Zm9vY", kLength},
      {"Zg===", kLength},
      {"=", kLength},
      {"==", kLength},
      {"====", kCharacter},
      {"Z===", kCharacter},
      {"=Zg=", kCharacter},
      {"Z=g=", kCharacter},
      {"Zg==Zg==", kCharacter},
      {"Zg=a", kCharacter},
      {"Zm9-", kCharacter},
      {"Zm9_", kCharacter},
      {"Zm9.", kCharacter},
      {"Zm\v9v", kLength},
      {"Zm9\v", kCharacter},
      {"Zm9\xC3", kCharacter},
      {std::string("Zm9\0", 4), kCharacter},
      {"Zm9v----", kCharacter},
      {"Zm9v\xC2\xA0"
       "Zg",
       kCharacter},
      // The letters after "Zg" and "Zm8" that differ in the unused bits only.
      {"Zh==", kTrailing},
      {"Zv==", kTrailing},
      {"Zm9=", kTrailing},
      {"Zm+=", kTrailing},
      {"Z/==", kTrailing},
      {"Zm/=", kTrailing},
  };
  for (const auto& c : cases) {
    EXPECT_EQ(DecodeFailure(c.text), c.message) << c.text;
  }
}

TEST(Base64, AcceptsExactlyTheTextsThatItWrites) {
  static const char kLetters[] = "ABCDEFGHIJKLMNOPQRSTUVWXYZabcdefghijklmnopqrstuvwxyz0123456789+/";
  int accepted = 0;
  for (const char* last = kLetters; *last != '\0'; ++last) {
    for (const std::string& text : {std::string("Q") + *last + "==", std::string("QU") + *last + "="}) {
      if (DecodeFailure(text) == "accepted") {
        ++accepted;
        EXPECT_EQ(Base64Encode(Base64Decode(text)), text);
      }
    }
  }
  EXPECT_EQ(accepted, 4 + 16);
}

int FillWith(unsigned char value, unsigned char* buffer, int size) {
  std::fill_n(buffer, size, value);
  return 1;
}

int GiveZeros(unsigned char* buffer, int size) {
  return FillWith(0x00, buffer, size);
}

int GiveOnes(unsigned char* buffer, int size) {
  return FillWith(0xFF, buffer, size);
}

int Count(unsigned char* buffer, int size) {
  for (int i = 0; i < size; ++i) {
    buffer[i] = static_cast<unsigned char>(i * 0x11);
  }
  return 1;
}

int Fail(unsigned char*, int) {
  return 0;
}

int AlwaysReady() {
  return 1;
}

/// Replaces the process's random generator while it lives.
class RandomGenerator {
 public:
  explicit RandomGenerator(int (*generate)(unsigned char*, int))
      : _method{nullptr, generate, nullptr, nullptr, generate, AlwaysReady} {
    RAND_set_rand_method(&_method);
  }
  RandomGenerator(const RandomGenerator&) = delete;
  RandomGenerator& operator=(const RandomGenerator&) = delete;
  ~RandomGenerator() { RAND_set_rand_method(nullptr); }

 private:
  const RAND_METHOD _method;
};

TEST(GenerateUuid, MarksVersionAndVariantAndKeepsAllOtherBits) {
  const struct {
    int (*generate)(unsigned char*, int);
    const char* uuid;
  } cases[] = {
      {GiveZeros, "00000000-0000-4000-8000-000000000000"},
      {GiveOnes, "ffffffff-ffff-4fff-bfff-ffffffffffff"},
      {Count, "00112233-4455-4677-8899-aabbccddeeff"},
  };
  for (const auto& c : cases) {
    const RandomGenerator generator(c.generate);
    EXPECT_EQ(GenerateUuid(), c.uuid);
  }
}

TEST(GenerateUuid, ThrowsWhenTheRandomGeneratorFails) {
  const RandomGenerator generator(Fail);
  try {
    GenerateUuid();
    FAIL() << "no exception";
  } catch (const Exception& e) {
    EXPECT_STREQ(e.what(), "Unable to generate an identifier: the random generator failed");
  }
}

TEST(GenerateUuid, NeverRepeats) {
  std::set<std::string> seen;
  for (int i = 0; i < 1000; ++i) {
    EXPECT_TRUE(seen.insert(GenerateUuid()).second);
  }
}

TEST(LetterCase, MapsAsciiLettersOnly) {
  std::string all;
  for (int c = 0; c < 256; ++c) {
    all += static_cast<char>(c);
  }
  std::string lower = all;
  std::string upper = all;
  for (int i = 0; i < 26; ++i) {
    lower[static_cast<std::size_t>('A' + i)] = static_cast<char>('a' + i);
    upper[static_cast<std::size_t>('a' + i)] = static_cast<char>('A' + i);
  }
  EXPECT_EQ(ToLower(all), lower);
  EXPECT_EQ(ToUpper(all), upper);
  EXPECT_EQ(ToLower(""), "");
}

struct XmlTextCase {
  const char* what;
  std::string text;
  bool accepted;
};

TEST(IsXmlText, DecidesByEncodingAndCharacter) {
  const XmlTextCase cases[] = {
      {"empty", "", true},
      {"ASCII", "user@example.com", true},
      {"tab, line feed, carriage return", "\t\n\r", true},
      {"NUL", std::string("a\0b", 3), false},
      {"U+0001", "\x01", false},
      {"U+0008", "\x08", false},
      {"U+000B", "\x0B", false},
      {"U+000C", "\x0C", false},
      {"U+001F", "\x1F", false},
      {"U+0020", " ", true},
      {"DEL is allowed by the production", "\x7F", true},
      {"U+0080", "\xC2\x80", true},
      {"U+07FF", "\xDF\xBF", true},
      {"U+0800", "\xE0\xA0\x80", true},
      {"U+D7FF", "\xED\x9F\xBF", true},
      {"U+D800, a surrogate", "\xED\xA0\x80", false},
      {"U+DFFF, a surrogate", "\xED\xBF\xBF", false},
      {"surrogate pair", "\xED\xA0\xBD\xED\xB8\x80", false},
      {"U+E000", "\xEE\x80\x80", true},
      {"U+FFFD", "\xEF\xBF\xBD", true},
      {"U+FFFE", "\xEF\xBF\xBE", false},
      {"U+FFFF", "\xEF\xBF\xBF", false},
      {"U+10000", "\xF0\x90\x80\x80", true},
      {"U+1FFFE is allowed by the production", "\xF0\x9F\xBF\xBE", true},
      {"U+10FFFF", "\xF4\x8F\xBF\xBF", true},
      {"U+110000", "\xF4\x90\x80\x80", false},
      {"lead byte F5", "\xF5\x80\x80\x80", false},
      {"lead byte F8", "\xF8\x88\x80\x80\x80", false},
      {"byte FE", "\xFE", false},
      {"byte FF", "\xFF", false},
      {"overlong NUL", "\xC0\x80", false},
      {"overlong two bytes", "\xC1\xBF", false},
      {"overlong three bytes", "\xE0\x9F\xBF", false},
      {"overlong four bytes", "\xF0\x8F\xBF\xBF", false},
      {"lone continuation", "\x80", false},
      {"truncated two bytes", "a\xC3", false},
      {"truncated three bytes", "a\xE2\x82", false},
      {"truncated four bytes", "a\xF0\x9F\x98", false},
      {"second byte is no continuation", "\xC3\x28", false},
      {"third byte is no continuation", "\xE2\x82\x28", false},
      {"fourth byte is no continuation", "\xF0\x9F\x98\x28", false},
      {"third byte is a lead byte", "\xE2\x82\xC3", false},
      {"good after bad", "\xFFgood", false},
      {"bad after good", "good\x1B", false},
  };
  for (const XmlTextCase& c : cases) {
    EXPECT_EQ(IsXmlText(c.text), c.accepted) << c.what;
  }
}

TEST(Wipe, OverwritesAllTheMemoryOfTheText) {
  std::string text(100, 's');
  text.resize(60);  // What was longer is still there, beyond the end.
  const volatile char* const memory = text.data();
  const std::size_t size = text.capacity();
  Wipe(text);
  EXPECT_EQ("", text);
  ASSERT_EQ(size, text.capacity());
  EXPECT_EQ(0, std::count(memory, memory + size, 's'));
  std::string empty;
  Wipe(empty);
  EXPECT_EQ("", empty);
}

}  // namespace
}  // namespace StringUtil
}  // namespace Pelmar
