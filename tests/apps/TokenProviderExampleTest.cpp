// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

// The example with a token provider, run as its user would run it, and the page that shows a part of it.

#include "support/Process.h"
#include "support/TemporaryDirectory.h"

#include "devsts/Service.h"

#include <gtest/gtest.h>

#include <algorithm>
#include <fstream>
#include <iterator>
#include <regex>
#include <sstream>
#include <string>
#include <vector>

namespace {

std::string ReadProjectFile(const std::string& name) {
  const std::string path = std::string(QUORLIN_PROJECT_DIR) + "/" + name;
  std::ifstream file(path, std::ios::binary);
  EXPECT_TRUE(file) << path;
  return std::string(std::istreambuf_iterator<char>(file), std::istreambuf_iterator<char>());
}

TestSupport::ProcessResult KeepTokenAtHand(const std::string& password, const std::string& work) {
  const DevSts::Service service{DevSts::ServiceConfig()};
  const TestSupport::TemporaryDirectory files;
  return TestSupport::RunProcess({std::string(QUORLIN_EXAMPLES_DIR) + "/keepTokenAtHand", service.GetUrl(),
                                  files.WriteFile("ca.pem", service.GetCaCertificate()),
                                  files.WriteFile("sts.pem", service.GetSigningCertificate()),
                                  "alice@example.com", files.WriteFile("password", password + "\n")},
                                 work);
}

/// Threads finish in any order.
std::string SortLines(const std::string& text) {
  std::istringstream stream(text);
  std::vector<std::string> lines;
  for (std::string line; std::getline(stream, line);) {
    lines.push_back(line + "\n");
  }
  std::sort(lines.begin(), lines.end());
  std::string sorted;
  for (const std::string& line : lines) {
    sorted += line;
  }
  return sorted;
}

TEST(TokenProviderExample, DoesAllTheWorkWithOneToken) {
  const TestSupport::ProcessResult result = KeepTokenAtHand("secret", "mow\nsweep\nwater\n");
  EXPECT_EQ(SortLines(result.standardOutput),
            "mow as {Name: alice; Domain:example.com}\n"
            "sweep as {Name: alice; Domain:example.com}\n"
            "water as {Name: alice; Domain:example.com}\n");
  EXPECT_EQ(std::regex_replace(result.standardError, std::regex("until [0-9T:.-]*Z"), "until DATE"),
            "a new token, good until DATE\n");
  EXPECT_EQ(result.exitCode, 0);
}

TEST(TokenProviderExample, AsksOnceWithAWrongPassword) {
  const TestSupport::ProcessResult result = KeepTokenAtHand("wrong", "mow\nsweep\nwater\n");
  EXPECT_EQ(result.standardOutput, "");
  EXPECT_EQ(SortLines(result.standardError),
            "Authentication failed: Invalid user name or password\n"
            "no new token: Authentication failed: Invalid user name or password\n");
  EXPECT_EQ(result.exitCode, 1);
}

/// The lines between the two markers, with the indentation of the first taken off each.
std::string CutSnippet(const std::string& source) {
  std::istringstream lines(source);
  std::string line;
  std::string snippet;
  bool isInside = false;
  while (std::getline(lines, line) && line != "  // DOCS-END") {
    if (isInside) {
      snippet += (line.empty() ? line : line.substr(2)) + "\n";
    }
    isInside = isInside || line == "  // DOCS-BEGIN";
  }
  return snippet;
}

TEST(TokenProviderExample, IsWhatTheDocumentationShows) {
  const std::string snippet = CutSnippet(ReadProjectFile("examples/keepTokenAtHand.cpp"));
  ASSERT_FALSE(snippet.empty());
  EXPECT_NE(ReadProjectFile("docs/token-provider.md").find("```cpp\n" + snippet + "```"), std::string::npos)
      << snippet;
}

}  // namespace
