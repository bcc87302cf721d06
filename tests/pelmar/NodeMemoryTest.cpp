// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

#include <pelmar/Ref.h>
#include <pelmar/xml/Node.h>
#include <pelmar/xml/NodeMemory.h>

#include "support/XmlText.h"

#include <gtest/gtest.h>

#include <cstddef>
#include <cstdint>
#include <cstring>
#include <string>
#include <thread>
#include <utility>
#include <vector>

namespace Pelmar {
namespace Xml {
namespace {

using Piece = std::pair<unsigned char*, std::size_t>;

// Pieces of all sizes, filled with a byte of their own, so that two that overlap are seen.
std::vector<Piece> Take(std::size_t count) {
  std::vector<Piece> pieces;
  for (std::size_t i = 0; i < count; ++i) {
    const std::size_t size = 1 + i * 37 % 3000;
    pieces.emplace_back(static_cast<unsigned char*>(AllocateNodeMemory(size)), size);
    std::memset(pieces.back().first, static_cast<int>(i % 251), size);
  }
  return pieces;
}

std::size_t CountSpoilt(const std::vector<Piece>& pieces) {
  std::size_t spoilt = 0;
  for (std::size_t i = 0; i < pieces.size(); ++i) {
    for (std::size_t at = 0; at < pieces[i].second; ++at) {
      spoilt += pieces[i].first[at] == i % 251 ? 0 : 1;
    }
  }
  return spoilt;
}

void Give(const std::vector<Piece>& pieces) {
  for (const Piece& piece : pieces) {
    FreeNodeMemory(piece.first, piece.second);
  }
}

TEST(NodeMemory, GivesPiecesThatDoNotOverlap) {
  const std::vector<Piece> pieces = Take(2000);
  EXPECT_EQ(CountSpoilt(pieces), 0u);
  Give(pieces);
}

TEST(NodeMemory, IsAlignedForEveryType) {
  for (std::size_t size = 1; size < 3000; size += 7) {
    void* const piece = AllocateNodeMemory(size);
    EXPECT_EQ(reinterpret_cast<std::uintptr_t>(piece) % alignof(std::max_align_t), 0u) << size;
    FreeNodeMemory(piece, size);
  }
}

TEST(NodeMemory, TakesNullBack) {
  FreeNodeMemory(nullptr, 16);
  FreeNodeMemory(nullptr, 16000);
}

// What was taken by a thread that ended since is intact, and may be given back by any other.
TEST(NodeMemory, OutlivesTheThreadThatTookIt) {
  std::vector<Piece> pieces;
  std::thread([&pieces] { pieces = Take(500); }).join();
  EXPECT_EQ(CountSpoilt(pieces), 0u);
  std::thread([&pieces] { Give(pieces); }).join();
}

// One half is given back elsewhere while this thread takes more from the same blocks.
TEST(NodeMemory, IsSharedByThreads) {
  for (int round = 0; round < 50; ++round) {
    std::vector<Piece> mine = Take(200);
    const std::vector<Piece> others(mine.begin() + 100, mine.end());
    mine.resize(100);
    std::thread other([&others] { Give(others); });
    const std::vector<Piece> more = Take(200);
    other.join();
    EXPECT_EQ(CountSpoilt(mine), 0u);
    EXPECT_EQ(CountSpoilt(more), 0u);
    Give(mine);
    Give(more);
  }
}

TEST(NodeMemory, HoldsTreesThatOutliveTheirDocumentAndThread) {
  Ref<ElementNode> kept;
  std::thread([&kept] {
    const Ref<Document> document = TestSupport::ParseXmlText("<a><b x='1'>text</b><c/></a>");
    kept = Ref<ElementNode>(document->GetDocumentElement()->FindChildElement("b"));
  }).join();
  EXPECT_EQ(kept->GetParent(), nullptr);
  EXPECT_EQ(kept->GetNextSibling(), nullptr);
  EXPECT_EQ(kept->GetQualifiedName(), "b");
  std::string value;
  EXPECT_TRUE(kept->GetAttribute("x", value));
  EXPECT_EQ(value, "1");
  EXPECT_EQ(AsText(kept->GetFirstChild())->GetText(), "text");
}

// A host's own thread-local objects may parse, and release trees, when ours are gone already.
struct Latecomer {
  std::string* outcome = nullptr;
  Ref<Document> tree;
  ~Latecomer() {
    tree = nullptr;
    const Ref<Document> document = TestSupport::ParseXmlText("<late:e xmlns:late='urn:late'>t</late:e>");
    *outcome = document->GetDocumentElement()->GetQualifiedName();
  }
};

TEST(NodeMemory, ServesWhatRunsAtTheVeryEndOfAThread) {
  std::string outcome;
  std::thread([&outcome] {
    thread_local Latecomer latecomer;  // Made before our thread-local objects, so it goes after them.
    latecomer.outcome = &outcome;
    latecomer.tree = TestSupport::ParseXmlText("<a/>");
  }).join();
  EXPECT_EQ(outcome, "late:e");
}

}  // namespace
}  // namespace Xml
}  // namespace Pelmar
