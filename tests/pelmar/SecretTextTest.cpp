// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

#include "pelmar/http/CurlMemory.h"

#include <pelmar/SecretText.h>
#include <pelmar/Writer.h>
#include <pelmar/xml/Node.h>

#include <gtest/gtest.h>

#include <malloc.h>

#include <cstdlib>
#include <cstring>
#include <string>
#include <utility>

namespace Pelmar {
namespace {

const std::string kShort = "pass-word";
const std::string kLong(100, 'p');

TEST(Wipe, OverwritesBytes) {
  char bytes[] = "secret";
  Wipe(bytes, sizeof(bytes) - 2);
  EXPECT_EQ(std::string(bytes, sizeof(bytes)), std::string("\0\0\0\0\0t\0", 7));
  Wipe(nullptr, 0);
}

TEST(Wipe, OverwritesATextBeyondItsEndAndKeepsItsMemory) {
  for (const std::string& original : {kShort, kLong}) {
    std::string text = original;
    const char* const memory = text.data();
    text.resize(2);
    Wipe(text);
    EXPECT_EQ(text, "");
    EXPECT_EQ(text.data(), memory);
    text.resize(original.size(), '.');
    EXPECT_EQ(text, std::string(original.size(), '.'));
  }
  std::vector<unsigned char> bytes = {1, 2, 3};
  Wipe(bytes);
  EXPECT_TRUE(bytes.empty());
}

TEST(SecretText, IsLikeATextToOthers) {
  for (const std::string& original : {std::string(), kShort, kLong}) {
    const SecretText text(original);
    EXPECT_EQ(text.Reveal(), original);
    const SecretText copy(text);
    SecretText assigned;
    assigned = copy;
    EXPECT_EQ(assigned.Reveal(), original);
    const std::string& asText = copy;
    EXPECT_EQ(asText, original);
  }
}

TEST(SecretText, LeavesNothingInWhatItIsMovedFrom) {
  for (const std::string& original : {kShort, kLong}) {
    std::string text = original;
    SecretText first(std::move(text));
    // NOLINTNEXTLINE(bugprone-use-after-move): its state is what is tested.
    EXPECT_EQ(std::string(text.data(), 10), std::string(10, '\0'));
    SecretText second(std::move(first));
    EXPECT_EQ(first.Reveal(), "");
    EXPECT_EQ(std::string(first.Reveal().data(), 10), std::string(10, '\0'));
    SecretText third(std::string("another"));
    third = std::move(second);
    EXPECT_EQ(std::string(second.Reveal().data(), 10), std::string(10, '\0'));
    EXPECT_EQ(third.Reveal(), original);
  }
}

TEST(SecretText, MayBeAssignedToItself) {
  SecretText text(kShort);
  const SecretText& same = text;
  text = same;
  EXPECT_EQ(text.Reveal(), kShort);
}

TEST(SecretStringWriter, CollectsWhatItIsGiven) {
  const Ref<StringWriter> writer = CreateSecretStringWriter();
  std::string expected;
  for (std::size_t size = 0; size < 3000; size = size * 2 + 1) {
    const std::string piece(size, static_cast<char>('a' + size % 26));
    writer->Write(piece.data(), piece.size());
    expected += piece;
    EXPECT_EQ(writer->GetText(), expected);
  }
}

TEST(TextNode, MayBeSetToItsOwnText) {
  Ref<Xml::TextNode> node;
  Xml::CreateTextNode(node);
  node->SetText("first");
  node->SetText("second");
  node->SetText(node->GetText());
  EXPECT_EQ(node->GetText(), "second");
}

TEST(CurlMemory, KeepsItsContentWhenItGrows) {
  char* block = static_cast<char*>(Http::WipeAndReallocate(nullptr, 8));
  ASSERT_NE(block, nullptr);
  std::memcpy(block, "content", 8);
  for (const std::size_t size : {16, 4000, 400000}) {
    block = static_cast<char*>(Http::WipeAndReallocate(block, size));
    ASSERT_NE(block, nullptr);
    EXPECT_STREQ(block, "content");
    EXPECT_GE(malloc_usable_size(block), size);
  }
  EXPECT_EQ(Http::WipeAndReallocate(block, 10), block);
  Http::WipeAndFree(block);
  Http::WipeAndFree(nullptr);
}

}  // namespace
}  // namespace Pelmar
