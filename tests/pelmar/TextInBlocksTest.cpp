// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

// Text is looked at several bytes at a time. What is decided about a byte must not depend on where in such a
// block it stands: each of these tests puts it in every place of texts that are longer than two blocks.

#include "pelmar/xml/TextPlace.h"
#include "pelmar/xml/XmlTextSink.h"

#include <pelmar/StringUtil.h>
#include <pelmar/Writer.h>

#include <gtest/gtest.h>

#include <cstddef>
#include <string>

namespace Pelmar {
namespace {

constexpr std::size_t kTextBytes = 24;

std::string PutAt(std::size_t place, const std::string& what) {
  return std::string(place, 'x') + what + std::string(kTextBytes - place, 'x');
}

TEST(TextInBlocks, XmlTextIsDecidedByEveryByte) {
  for (std::size_t place = 0; place <= kTextBytes; ++place) {
    for (int byte = 0; byte < 0x80; ++byte) {
      const bool accepted = byte >= 0x20 || byte == '\t' || byte == '\n' || byte == '\r';
      EXPECT_EQ(StringUtil::IsXmlText(PutAt(place, std::string(1, static_cast<char>(byte)))), accepted)
          << byte << " at " << place;
    }
    EXPECT_TRUE(StringUtil::IsXmlText(PutAt(place, "\xE2\x82\xAC"))) << place;
    EXPECT_FALSE(StringUtil::IsXmlText(PutAt(place, "\xEF\xBF\xBF"))) << place;
    EXPECT_FALSE(StringUtil::IsXmlText(PutAt(place, "\x80"))) << place;
    EXPECT_FALSE(StringUtil::IsXmlText(PutAt(place, "\xE2\x82"))) << place;
  }
}

using PutText = void (Xml::XmlTextSink::*)(std::string_view text);

std::string Written(PutText put, const std::string& text) {
  const Ref<StringWriter> writer = CreateStringWriter();
  Xml::XmlTextSink sink(writer.Get());
  (sink.*put)(text);
  sink.Flush();
  return writer->GetText();
}

struct EscapeCase {
  const char* byte;
  const char* inText;
  const char* inAttribute;
};

TEST(TextInBlocks, EveryByteIsEscapedWhereverItStands) {
  const EscapeCase cases[] = {{"&", "&amp;", "&amp;"},  {"<", "&lt;", "&lt;"},
                              {">", "&gt;", ">"},       {"\"", "\"", "&quot;"},
                              {"\t", "\t", "&#x9;"},    {"\n", "\n", "&#xA;"},
                              {"\r", "&#xD;", "&#xD;"}, {"\xC3\xBF", "\xC3\xBF", "\xC3\xBF"}};
  for (const EscapeCase& c : cases) {
    for (std::size_t place = 0; place <= kTextBytes; ++place) {
      EXPECT_EQ(Written(&Xml::XmlTextSink::PutText, PutAt(place, c.byte)), PutAt(place, c.inText)) << place;
      EXPECT_EQ(Written(&Xml::XmlTextSink::PutAttributeValue, PutAt(place, c.byte)),
                PutAt(place, c.inAttribute))
          << place;
    }
  }
}

TEST(TextInBlocks, TextMayCrossTheEndOfTheSinksBuffer) {
  constexpr std::size_t kAroundBufferBytes = 4096;
  for (std::size_t size = kAroundBufferBytes - 8; size <= kAroundBufferBytes + 8; ++size) {
    const std::string before(size, 'x');
    EXPECT_EQ(Written(&Xml::XmlTextSink::PutText, before + "<y&"), before + "&lt;y&amp;") << size;
  }
}

// A column is a character, not a byte.
TEST(TextInBlocks, AColumnIsACharacterWhereverItStands) {
  for (const char* const character : {"\xC3\xA9", "\xE2\x82\xAC", "\xF0\x9F\x98\x80"}) {
    for (std::size_t place = 0; place <= kTextBytes; ++place) {
      const std::string text = PutAt(place, character) + character;
      Xml::TextPlace counted(text);
      counted.AdvanceTo(text.data() + text.size());
      EXPECT_EQ(counted.GetLine(), 1u) << place;
      EXPECT_EQ(counted.GetColumn(), kTextBytes + 3) << place;
    }
  }
}

}  // namespace
}  // namespace Pelmar
