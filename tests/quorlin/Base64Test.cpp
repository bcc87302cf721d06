// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

#include <pelmar/StringUtil.h>
#include <quorlin/Base64.h>

#include <gtest/gtest.h>

#include <cctype>
#include <clocale>
#include <cstddef>
#include <cstdint>
#include <cstdlib>
#include <cstring>
#include <limits>
#include <memory>
#include <string>
#include <vector>

namespace {

constexpr std::size_t kMaxLength = std::numeric_limits<std::size_t>::max();
constexpr char kUntouched = '\x5a';
constexpr std::size_t kGuard = 8;

struct MallocDeleter {
  void operator()(void* memory) const { std::free(memory); }
};

// The outcome of one call: whether it succeeded, the count it gave and what it left in its buffer.
struct Outcome {
  bool succeeded;
  std::size_t written;
  std::string data;
};

bool operator==(const Outcome& a, const Outcome& b) {
  return a.succeeded == b.succeeded && a.written == b.written && a.data == b.data;
}

std::ostream& operator<<(std::ostream& stream, const Outcome& outcome) {
  return stream << (outcome.succeeded ? "true " : "false ") << outcome.written << " '" << outcome.data << "'";
}

void ExpectGuardUntouched(const std::vector<char>& buffer, std::size_t size) {
  for (std::size_t i = size; i < buffer.size(); ++i) {
    EXPECT_EQ(buffer[i], kUntouched) << "written behind the buffer at " << i - size;
  }
}

Outcome Encode(const std::string& bytes, std::size_t size) {
  std::vector<char> buffer(size + kGuard, kUntouched);
  std::size_t written = 12345;
  const bool succeeded = Base64_Encode(bytes.data(), bytes.size(), buffer.data(), size, &written);
  ExpectGuardUntouched(buffer, succeeded ? written + 1 : 0);
  EXPECT_TRUE(!succeeded || buffer[written] == '\0');
  return {succeeded, written, succeeded ? std::string(buffer.data()) : std::string()};
}

Outcome ChunkDecode(const std::string& text, std::size_t size) {
  std::vector<char> buffer(size + kGuard, kUntouched);
  std::size_t written = 12345;
  const bool succeeded = Base64_ChunkDecode(text.data(), text.size(), buffer.data(), size, &written);
  ExpectGuardUntouched(buffer, size);
  return {succeeded, written, std::string(buffer.data(), written)};
}

Outcome Decode(const char* text, std::size_t size) {
  std::vector<char> buffer(size + kGuard, kUntouched);
  std::size_t written = 12345;
  const bool succeeded = Base64_Decode(text, buffer.data(), size, &written);
  ExpectGuardUntouched(buffer, size);
  return {succeeded, written, std::string(buffer.data(), written)};
}

Outcome EasyDecode(const char* text) {
  void* result = &text;
  std::size_t length = 12345;
  const bool succeeded = Base64_EasyDecode(text, &result, &length);
  const std::unique_ptr<void, MallocDeleter> owner(result);
  EXPECT_EQ(succeeded, result != nullptr);
  return {succeeded, length,
          succeeded ? std::string(static_cast<const char*>(result), length) : std::string()};
}

std::string EasyEncode(const std::string& bytes) {
  char* text = nullptr;
  EXPECT_TRUE(Base64_EasyEncode(bytes.data(), bytes.size(), &text));
  const std::unique_ptr<char, MallocDeleter> owner(text);
  return text == nullptr ? std::string() : std::string(text);
}

struct Vector {
  std::string bytes;
  const char* text;
};

// RFC 4648, section 10, and what shows the last letters of the alphabet.
const Vector kVectors[] = {
    {"", ""},
    {"f", "Zg=="},
    {"fo", "Zm8="},
    {"foo", "Zm9v"},
    {"foob", "Zm9vYg=="},
    {"fooba", "Zm9vYmE="},
    {"foobar", "Zm9vYmFy"},
    {std::string(1, '\0'), "AA=="},
    {"\xFB\xEF\xBE", "++++"},
    {"\xFF\xFF\xFF", "////"},
    {"\xFF\xFF", "//8="},
    {"\xFF", "/w=="},
};

// --- Encoding ---

TEST(Base64Codec, EncodesThePublishedVectors) {
  for (const Vector& v : kVectors) {
    const std::size_t length = std::strlen(v.text);
    EXPECT_EQ(Encode(v.bytes, length + 1), (Outcome{true, length, v.text}));
    EXPECT_EQ(Encode(v.bytes, length + 100), (Outcome{true, length, v.text}));
  }
}

TEST(Base64Codec, EncodesTheWholeAlphabetInOrder) {
  std::string bytes;
  for (unsigned group = 0; group < 16; ++group) {
    const unsigned bits = (4 * group) << 18 | (4 * group + 1) << 12 | (4 * group + 2) << 6 | (4 * group + 3);
    bytes += static_cast<char>(bits >> 16 & 255);
    bytes += static_cast<char>(bits >> 8 & 255);
    bytes += static_cast<char>(bits & 255);
  }
  EXPECT_EQ(EasyEncode(bytes), "ABCDEFGHIJKLMNOPQRSTUVWXYZabcdefghijklmnopqrstuvwxyz0123456789+/");
}

TEST(Base64Codec, RefusesToEncodeIntoABufferWithoutRoomForTheNul) {
  for (const Vector& v : kVectors) {
    for (std::size_t size = 0; size <= std::strlen(v.text); ++size) {
      EXPECT_EQ(Encode(v.bytes, size), (Outcome{false, 0, ""})) << v.text << " into " << size;
    }
  }
}

TEST(Base64Codec, EncodesNothingIntoOneByteButNotIntoNone) {
  EXPECT_EQ(Encode("", 1), (Outcome{true, 0, ""}));
  EXPECT_EQ(Encode("", 0), (Outcome{false, 0, ""}));
}

TEST(Base64Codec, EncodesThreeBytesIntoFiveButNotIntoFour) {
  EXPECT_EQ(Encode("foo", 5), (Outcome{true, 4, "Zm9v"}));
  EXPECT_EQ(Encode("foo", 4), (Outcome{false, 0, ""}));
}

TEST(Base64Codec, EncodesWithoutBeingAskedForTheCount) {
  char buffer[5];
  EXPECT_TRUE(Base64_Encode("foo", 3, buffer, sizeof buffer, nullptr));
  EXPECT_STREQ(buffer, "Zm9v");
  EXPECT_FALSE(Base64_Encode("foo", 3, buffer, 4, nullptr));
}

TEST(Base64Codec, RefusesSourcesWhoseTextNoBufferCanHold) {
  char buffer[1] = {kUntouched};
  for (const std::size_t length : {kMaxLength, kMaxLength - 1, kMaxLength - 2, kMaxLength / 4 * 3 + 1}) {
    std::size_t written = 12345;
    EXPECT_FALSE(Base64_Encode("", length, buffer, kMaxLength, &written)) << length;
    EXPECT_EQ(written, 0u);
    EXPECT_EQ(Base64_EncodedLength("", length), kMaxLength) << length;
    char* text = buffer;
    EXPECT_FALSE(Base64_EasyEncode("", length, &text)) << length;
    EXPECT_EQ(text, nullptr);
  }
  EXPECT_EQ(buffer[0], kUntouched);
}

TEST(Base64Codec, ComputesTheLengthOfEncodedText) {
  const std::size_t expected[] = {1, 5, 5, 5, 9, 9, 9, 13};
  for (std::size_t length = 0; length < 8; ++length) {
    EXPECT_EQ(Base64_EncodedLength(nullptr, length), expected[length]) << length;
  }
}

// --- Decoding ---

TEST(Base64Codec, DecodesThePublishedVectors) {
  for (const Vector& v : kVectors) {
    const Outcome expected = {true, v.bytes.size(), v.bytes};
    EXPECT_EQ(ChunkDecode(v.text, v.bytes.size()), expected) << v.text;
    EXPECT_EQ(ChunkDecode(v.text, v.bytes.size() + 10), expected) << v.text;
    EXPECT_EQ(Decode(v.text, v.bytes.size()), expected) << v.text;
  }
}

struct DecodeCase {
  const char* description;
  std::string text;
  std::size_t size;
  Outcome expected;
};

// Texts for the chunk decoder, which may hold NUL.
const DecodeCase kDecodeCases[] = {
    {"nothing", "", 0, {true, 0, ""}},
    {"white space alone", "\t\n\v\f\r ", 0, {true, 0, ""}},
    {"white space inside", " Z\tm\n9\vv\f\r ", 3, {true, 3, "foo"}},
    {"white space behind a full buffer", "Zm9v \n", 3, {true, 3, "foo"}},
    {"a group into two bytes", "Zm9v", 2, {false, 0, ""}},
    {"a group into one byte", "Zm9v", 1, {false, 0, ""}},
    {"a group into none", "Zm9v", 0, {false, 0, ""}},
    // The buffer is asked for at every character, also for bits that complete no byte.
    {"rest bits behind a full buffer", "Zm9vY", 3, {false, 0, ""}},
    {"padding behind a full buffer", "Zm9v=", 3, {true, 3, "foo"}},
    {"NUL behind a full buffer", std::string("Zm9v\0!", 6), 3, {true, 3, "foo"}},
    {"invalid character behind a full buffer", "Zm9v!", 3, {false, 0, ""}},
    {"one character", "Z", 1, {true, 0, ""}},
    {"two characters without padding", "Zg", 1, {true, 1, "f"}},
    {"three characters without padding", "Zm8", 2, {true, 2, "fo"}},
    {"rest bits that are not zero", "Zh", 1, {true, 1, "f"}},
    {"one sign of padding of two", "Zg=", 1, {true, 1, "f"}},
    {"three signs of padding", "Zm8===", 2, {true, 2, "fo"}},
    {"padding first", "=Zm9v", 3, {true, 0, ""}},
    {"anything after padding", "Zm8=!\x80\x01 Zm9v", 2, {true, 2, "fo"}},
    {"anything after NUL", std::string("Zm8\0!", 5), 2, {true, 2, "fo"}},
    {"NUL first", std::string("\0Zm9v", 5), 3, {true, 0, ""}},
    {"invalid character", "Zm!v", 3, {false, 0, ""}},
    {"invalid character first", "!Zm9v", 3, {false, 0, ""}},
    {"invalid character last", "Zm9v!", 10, {false, 0, ""}},
    {"the other alphabet", "-_-_", 3, {false, 0, ""}},
};

TEST(Base64Codec, DecodesTextsOfAllShapes) {
  for (const DecodeCase& c : kDecodeCases) {
    EXPECT_EQ(ChunkDecode(c.text, c.size), c.expected) << c.description;
  }
}

TEST(Base64Codec, DecodesTheSameUpToTheNulWhenNoLengthIsGiven) {
  for (const DecodeCase& c : kDecodeCases) {
    EXPECT_EQ(Decode(c.text.c_str(), c.size), c.expected) << c.description;
  }
}

TEST(Base64Codec, ReadsNoFurtherThanTheGivenLength) {
  std::size_t written = 12345;
  char buffer[3] = {kUntouched, kUntouched, kUntouched};
  EXPECT_TRUE(Base64_ChunkDecode("Zm9v!!!!", 4, buffer, sizeof buffer, &written));
  EXPECT_EQ(std::string(buffer, written), "foo");
  EXPECT_TRUE(Base64_ChunkDecode(nullptr, 0, nullptr, 0, &written));
  EXPECT_EQ(written, 0u);
}

TEST(Base64Codec, KnowsTheMeaningOfEveryByte) {
  const std::string alphabet = "ABCDEFGHIJKLMNOPQRSTUVWXYZabcdefghijklmnopqrstuvwxyz0123456789+/";
  const std::string spaces = "\t\n\v\f\r ";
  for (int byte = 0; byte < 256; ++byte) {
    const char c = static_cast<char>(byte);
    const std::size_t value = c == '\0' ? std::string::npos : alphabet.find(c);
    const Outcome outcome = ChunkDecode(std::string(4, c), 3);
    if (value != std::string::npos) {
      const unsigned bits = static_cast<unsigned>(value << 18 | value << 12 | value << 6 | value);
      const char bytes[] = {static_cast<char>(bits >> 16 & 255), static_cast<char>(bits >> 8 & 255),
                            static_cast<char>(bits & 255)};
      EXPECT_EQ(outcome, (Outcome{true, 3, std::string(bytes, 3)})) << byte;
    } else {
      const bool isKnown = c == '\0' || c == '=' || spaces.find(c) != std::string::npos;
      EXPECT_EQ(outcome, (Outcome{isKnown, 0, ""})) << byte;
    }
  }
}

TEST(Base64Codec, RoundTripsEveryLengthAndAgreesWithThePlatform) {
  std::string bytes;
  for (int size = 0; size < 400; ++size) {
    const std::string text = EasyEncode(bytes);
    const std::vector<unsigned char> raw(bytes.begin(), bytes.end());
    EXPECT_EQ(text, Pelmar::StringUtil::Base64Encode(raw)) << size;
    EXPECT_EQ(text.size() + 1, Base64_EncodedLength(bytes.data(), bytes.size()));
    EXPECT_EQ(Base64_DecodedLength(text.data(), text.size()), bytes.size());
    EXPECT_EQ(EasyDecode(text.c_str()), (Outcome{true, bytes.size(), bytes})) << size;
    bytes += static_cast<char>(size * 37 + 11);
  }
}

// --- Lengths and allocation ---

TEST(Base64Codec, ComputesTheLengthOfDecodedText) {
  const struct {
    const char* text;
    std::size_t length;
  } cases[] = {
      {"", 0},       {"A", 0},      {"AA", 0},       {"AAA", 0},      {"==", 0},
      {"AAAA", 3},   {"AAA=", 2},   {"AA==", 1},     {"====", 1},     {"AAAAA", 3},
      {"AAAAA=", 2}, {"AAAA==", 1}, {"AAAAAAAA", 6}, {"AAAAAA==", 4}, {"AAA= ", 3},
      {"AA==\n", 3}, {"AA=A", 3},   {"AA== \n", 3},  {"    ", 3},
  };
  for (const auto& c : cases) {
    EXPECT_EQ(Base64_DecodedLength(c.text, std::strlen(c.text)), c.length) << c.text;
  }
}

TEST(Base64Codec, EasyDecodingNeedsPaddedText) {
  const struct {
    const char* text;
    Outcome expected;
  } cases[] = {
      {"", {true, 0, ""}},
      {"Zg==", {true, 1, "f"}},
      {"Zm8=", {true, 2, "fo"}},
      {"Zm9v", {true, 3, "foo"}},
      {"Zg", {false, 0, ""}},
      {"Zm8", {false, 0, ""}},
      {"Zm9vYg", {false, 0, ""}},
      {"Zm9vYmE", {false, 0, ""}},
      {"Zm!v", {false, 0, ""}},
      {"Zm8=\n", {true, 2, "fo"}},
      {"Zm9v\nYmFy", {true, 6, "foobar"}},
  };
  for (const auto& c : cases) {
    EXPECT_EQ(EasyDecode(c.text), c.expected) << c.text;
  }
}

TEST(Base64Codec, EasyEncodingGivesTextThatEndsInNul) {
  EXPECT_EQ(EasyEncode(""), "");
  EXPECT_EQ(EasyEncode(std::string("\0\0\0\0", 4)), "AAAAAA==");
}

// --- Validity ---

TEST(Base64Codec, TellsWhichBytesAreValid) {
  for (int byte = 0; byte < 256; ++byte) {
    const char c = static_cast<char>(byte);
    const bool isValid = (c >= 'A' && c <= 'Z') || (c >= 'a' && c <= 'z') || (c >= '0' && c <= '9') ||
                         c == '+' || c == '/' || c == '=';
    EXPECT_EQ(Base64_ValidEncoding(&c, 1), isValid) << byte;
  }
}

TEST(Base64Codec, AcceptsPaddingAnywhereButNoSpace) {
  const struct {
    const char* text;
    std::size_t length;
    bool isValid;
  } cases[] = {
      {"", 0, true},        {"=", 1, true},          {"=AAA", 4, true},    {"A=A=", 4, true},
      {"====", 4, true},    {"Zm9v Zm9v", 9, false}, {" Zm9v", 5, false},  {"Zm9v ", 5, false},
      {"Zm9v\n", 5, false}, {"Zm9v", 5, false},      {"Zm9v!!!", 4, true}, {"Zm!v", 4, false},
  };
  for (const auto& c : cases) {
    EXPECT_EQ(Base64_ValidEncoding(c.text, c.length), c.isValid) << c.text;
  }
}

// Puts the process's character classes back.
class CharacterClasses final {
 public:
  CharacterClasses() : _before(std::setlocale(LC_CTYPE, nullptr)) {}
  ~CharacterClasses() { std::setlocale(LC_CTYPE, _before.c_str()); }

 private:
  std::string _before;
};

TEST(Base64Codec, FollowsTheCharacterClassesOfTheLocale) {
  const CharacterClasses restored;
  for (const char* const locale : {"C", "C.UTF-8"}) {
    ASSERT_NE(std::setlocale(LC_CTYPE, locale), nullptr) << locale;
    for (int byte = 0; byte < 256; ++byte) {
      const char c = static_cast<char>(byte);
      const bool isValid = std::isalnum(byte) != 0 || c == '+' || c == '/' || c == '=';
      EXPECT_EQ(Base64_ValidEncoding(&c, 1), isValid) << locale << " " << byte;
    }
  }
}

}  // namespace
