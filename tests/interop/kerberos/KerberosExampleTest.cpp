// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

// The example program for Kerberos, run as its user would run it, and the documentation's code, which is cut
// from it.

#include "interop/kerberos/KerberosRealm.h"
#include "interop/kerberos/Outcome.h"
#include "support/Process.h"
#include "support/TemporaryDirectory.h"

#include "devsts/KerberosNegotiation.h"
#include "devsts/Service.h"

#include <gtest/gtest.h>

#include <fstream>
#include <iterator>
#include <memory>
#include <sstream>
#include <string>

namespace {

using namespace KerberosTests;

std::string ReadProjectFile(const std::string& name) {
  const std::string path = std::string(QUORLIN_PROJECT_DIR) + "/" + name;
  std::ifstream file(path, std::ios::binary);
  EXPECT_TRUE(file) << path;
  return std::string(std::istreambuf_iterator<char>(file), std::istreambuf_iterator<char>());
}

TestSupport::ProcessResult AcquireByKerberos(const std::string& target) {
  DevSts::ServiceConfig config;
  config.handler.negotiation = std::make_shared<DevSts::KerberosMechanism>(
      DevSts::KerberosOptions{KerberosRealm::Shared().GetKeytab(), ""});
  const DevSts::Service service(config);
  const TestSupport::TemporaryDirectory files;
  return TestSupport::RunProcess({std::string(QUORLIN_EXAMPLES_DIR) + "/acquireByKerberos", service.GetUrl(),
                                  files.WriteFile("ca.pem", service.GetCaCertificate()),
                                  files.WriteFile("sts.pem", service.GetSigningCertificate()), target});
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

TEST(KerberosExample, PrintsWhomTheTokenIsFor) {
  const TestSupport::ProcessResult result = AcquireByKerberos("HTTP@localhost");
  EXPECT_EQ(result.exitCode, 0);
  EXPECT_EQ(result.standardOutput.substr(0, result.standardOutput.find(" until ")),
            "{Name: alice; Domain:example.com}");
}

TEST(KerberosExample, SaysWhyThereIsNoToken) {
  const TestSupport::ProcessResult result = AcquireByKerberos("HTTP@nowhere");
  EXPECT_EQ(result.exitCode, 1);
  EXPECT_EQ(result.standardOutput, "");
  EXPECT_EQ(result.standardError, std::string("Kerberos negotiation with 'HTTP@nowhere' failed: ") +
                                      kUnspecified +
                                      "Server HTTP/nowhere@EXAMPLE.COM not found in Kerberos database\n");
}

TEST(KerberosExample, IsWhatTheDocumentationShows) {
  const std::string snippet = CutSnippet(ReadProjectFile("examples/acquireByKerberos.cpp"));
  ASSERT_FALSE(snippet.empty());
  EXPECT_NE(ReadProjectFile("docs/kerberos.md").find("```cpp\n" + snippet + "```"), std::string::npos)
      << snippet;
}

}  // namespace
