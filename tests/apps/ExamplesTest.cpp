// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

// The example programs, run as their users would run them, and the README's code, which is cut from one of
// them.

#include "support/Process.h"
#include "support/TemporaryDirectory.h"

#include "devsts/Service.h"

#include <gtest/gtest.h>

#include <fstream>
#include <iterator>
#include <sstream>
#include <string>

namespace {

std::string ReadProjectFile(const std::string& name) {
  const std::string path = std::string(QUORLIN_PROJECT_DIR) + "/" + name;
  std::ifstream file(path, std::ios::binary);
  EXPECT_TRUE(file) << path;
  return std::string(std::istreambuf_iterator<char>(file), std::istreambuf_iterator<char>());
}

TestSupport::ProcessResult AcquireByPassword(const DevSts::Service& service, const std::string& password) {
  const TestSupport::TemporaryDirectory directory;
  return TestSupport::RunProcess(
      {std::string(QUORLIN_EXAMPLES_DIR) + "/acquireByPassword", service.GetUrl(),
       directory.WriteFile("ca.pem", service.GetCaCertificate()),
       directory.WriteFile("sts.pem", service.GetSigningCertificate()), "alice@example.com"},
      password + "\n");
}

// The lines between the two markers, with the indentation of the first taken off each.
std::string CutSnippet(const std::string& source) {
  std::istringstream lines(source);
  std::string line;
  std::string snippet;
  bool isInside = false;
  while (std::getline(lines, line)) {
    if (line == "  // README-END") {
      return snippet;
    }
    if (isInside) {
      snippet += (line.empty() ? line : line.substr(2)) + "\n";
    }
    isInside = isInside || line == "  // README-BEGIN";
  }
  return std::string();
}

TEST(Examples, AcquireByPasswordPrintsWhomTheTokenIsFor) {
  const DevSts::Service service{DevSts::ServiceConfig()};
  const TestSupport::ProcessResult result = AcquireByPassword(service, "secret");
  EXPECT_EQ(result.exitCode, 0);
  EXPECT_EQ(result.standardError, "");
  const std::string end = "Z\n";
  ASSERT_GT(result.standardOutput.size(), end.size());
  EXPECT_EQ(result.standardOutput.substr(0, result.standardOutput.find(" until ")),
            "{Name: alice; Domain:example.com}");
  EXPECT_EQ(result.standardOutput.substr(result.standardOutput.size() - end.size()), end);
}

TEST(Examples, AcquireByPasswordSaysWhyThereIsNoToken) {
  const DevSts::Service service{DevSts::ServiceConfig()};
  const TestSupport::ProcessResult result = AcquireByPassword(service, "wrong");
  EXPECT_EQ(result.exitCode, 1);
  EXPECT_EQ(result.standardOutput, "");
  EXPECT_EQ(result.standardError, "Authentication failed: Invalid user name or password\n");
}

TEST(Readme, ShowsTheCodeOfTheExample) {
  const std::string snippet = CutSnippet(ReadProjectFile("examples/acquireByPassword.cpp"));
  ASSERT_FALSE(snippet.empty());
  EXPECT_NE(ReadProjectFile("README.md").find("```cpp\n" + snippet + "```"), std::string::npos) << snippet;
}

}  // namespace
