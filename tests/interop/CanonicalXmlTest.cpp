// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

// Our canonical XML against libxml2's, byte for byte, over thousands of random documents.

#include "support/Process.h"
#include "support/RandomXml.h"
#include "support/XmlText.h"

#include <pelmar/xml/security/Algorithms.h>

#include <gtest/gtest.h>

#include <sstream>
#include <string>
#include <system_error>
#include <vector>

namespace {

using namespace Pelmar::Xml;
using TestSupport::RandomXml;

constexpr std::uint32_t kSeed = 20090112;
constexpr std::size_t kDocuments = 3000;
constexpr std::size_t kRequestsPerDocument = 4;

struct Request {
  std::string document;
  bool exclusive;
  bool withComments;
  std::size_t apex;     // Number of an element in document order, from 1; 0: the whole document.
  std::size_t omitted;  // The same; 0: nothing.
  std::vector<std::string> prefixes;
};

std::string Header(const Request& request) {
  std::ostringstream header;
  header << request.exclusive << ' ' << request.withComments << ' ' << request.apex << ' ' << request.omitted
         << ' ' << request.document.size();
  for (const std::string& prefix : request.prefixes) {
    header << ' ' << prefix;
  }
  return header.str();
}

void CollectElements(const Node* node, std::vector<const Node*>& elements) {
  if (node->GetKind() == ELEMENT_NODE) {
    elements.push_back(node);
  }
  for (const Node* child = node->GetFirstChild(); child != nullptr; child = child->GetNextSibling()) {
    CollectElements(child, elements);
  }
}

bool Contains(const Node* container, const Node* node) {
  while (node != nullptr && node != container) {
    node = node->GetParent();
  }
  return node != nullptr;
}

std::vector<std::string> PickPrefixes(RandomXml& random) {
  std::vector<std::string> prefixes;
  for (const std::string& prefix : RandomXml::GetPrefixes()) {
    if (random.OneIn(4)) {
      prefixes.push_back(prefix);
    }
  }
  return prefixes;
}

Request MakeRequest(RandomXml& random, const std::string& document,
                    const std::vector<const Node*>& elements) {
  Request request = {document, random.OneIn(2), random.OneIn(2), random.Below(elements.size() + 1), 0, {}};
  const std::size_t omitted = random.Below(elements.size()) + 1;
  const Node* const apex = elements[request.apex == 0 ? 0 : request.apex - 1];
  if (random.OneIn(2) && !Contains(elements[omitted - 1], apex)) {
    request.omitted = omitted;
  }
  if (request.exclusive && random.OneIn(2)) {
    request.prefixes = PickPrefixes(random);
  }
  return request;
}

std::vector<Request> MakeRequests() {
  RandomXml random(kSeed);
  std::vector<Request> requests;
  for (std::size_t i = 0; i < kDocuments; ++i) {
    const std::string text = random.MakeDocument();
    const Pelmar::Ref<Document> document = TestSupport::ParseXmlText(text);
    std::vector<const Node*> elements;
    CollectElements(document.Get(), elements);
    for (std::size_t j = 0; j < kRequestsPerDocument; ++j) {
      requests.push_back(MakeRequest(random, text, elements));
    }
  }
  return requests;
}

std::string OurAnswer(const Request& request) {
  const Pelmar::Ref<Document> document = TestSupport::ParseXmlText(request.document);
  std::vector<const Node*> elements;
  CollectElements(document.Get(), elements);
  const Node* const apex =
      request.apex == 0 ? static_cast<const Node*>(document.Get()) : elements[request.apex - 1];
  const Node* const omitted = request.omitted == 0 ? nullptr : elements[request.omitted - 1];
  const char* const algorithm =
      request.exclusive
          ? (request.withComments ? Security::kExclusiveC14nWithComments : Security::kExclusiveC14n)
          : (request.withComments ? Security::kC14nWithComments : Security::kC14n);
  return TestSupport::CanonicalText(apex, algorithm, request.prefixes, omitted);
}

// One process answers all: starting one for each would take longer than everything else.
std::string AskOracle(const std::vector<Request>& requests) {
  std::string input;
  for (const Request& request : requests) {
    input += Header(request) + "\n" + request.document + "\n";
  }
  const std::string script = std::string(QUORLIN_TEST_VECTORS_DIR) + "/../interop/canonicalOracle.py";
  const TestSupport::ProcessResult result = TestSupport::RunProcess({"python3", script}, input);
  EXPECT_EQ(result.exitCode, 0) << "the packages python3 and libxml2 are needed; python3 said:\n"
                                << result.standardError;
  return result.exitCode == 0 ? result.standardOutput : "";
}

// Takes the next answer off `answers` at `position`; false when there is none.
bool TakeAnswer(const std::string& answers, std::size_t& position, std::string& answer) {
  const std::size_t lineEnd = answers.find('\n', position);
  if (lineEnd == std::string::npos || answers[position] == '-') {
    return false;
  }
  const std::size_t size = std::stoul(answers.substr(position, lineEnd - position));
  answer = answers.substr(lineEnd + 1, size);
  position = lineEnd + 1 + size + 1;
  return position <= answers.size();
}

TEST(CanonicalXml, EqualsLibxml2OnRandomDocumentsAndSubtrees) {
  const std::vector<Request> requests = MakeRequests();
  const std::string answers = AskOracle(requests);
  ASSERT_FALSE(answers.empty());
  std::size_t position = 0;
  for (const Request& request : requests) {
    std::string expected;
    ASSERT_TRUE(TakeAnswer(answers, position, expected)) << Header(request) << "\n" << request.document;
    ASSERT_EQ(OurAnswer(request), expected) << Header(request) << "\n" << request.document;
  }
  EXPECT_EQ(position, answers.size());
}

}  // namespace
