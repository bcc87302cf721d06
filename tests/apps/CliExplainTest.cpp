// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

// quorlin verify --explain: the checks one by one, and never another verdict than the library's.

#include "apps/Cli.h"

#include <gtest/gtest.h>
#include <nlohmann/json.hpp>

#include <filesystem>
#include <fstream>
#include <regex>
#include <sstream>

namespace {

using Json = nlohmann::json;
using StsTests::RunCli;
using TestSupport::ProcessResult;

const std::string kVectors = std::string(QUORLIN_TEST_VECTORS_DIR) + "/tokens/";
const std::string kTrust = kVectors + "signer.pem";

std::string ReadAll(const std::string& path) {
  std::ifstream file(path, std::ios::binary);
  std::ostringstream text;
  text << file.rdbuf();
  return text.str();
}

/// The text with what depends on the day left out.
std::string MaskTimes(const std::string& text) {
  return std::regex_replace(text, std::regex("now [^,]*, (clock tolerance [0-9]+ s): .*"),
                            "now NOW, $1: ...");
}

Json ExplainVector(const std::string& path) {
  const ProcessResult result = RunCli({"verify", "--trust", kTrust, "--explain", "--json", path});
  EXPECT_EQ("", result.standardError) << path;
  const Json json = Json::parse(result.standardOutput);
  EXPECT_EQ(json["valid"].get<bool>() ? 0 : 1, result.exitCode) << path;
  return json;
}

/// All checks before the one that fails pass, and none after it is reached; without a failure all pass.
void ExpectOneBreak(const Json& json, const std::string& path) {
  std::size_t failed = 0;
  for (const Json& check : json["checks"]) {
    const std::string state = check["state"];
    failed += state == "failed" ? 1 : 0;
    // The place where the signature is reached lies within the structure, which then stays unread.
    const bool isReadInPart =
        state == "not reached" && check.value("finding", "").rfind("read up to ", 0) == 0;
    if (state != "failed" && !isReadInPart) {
      EXPECT_EQ(failed == 0 ? "passed" : "not reached", state) << path << ": " << check;
    }
  }
  EXPECT_EQ(json["valid"].get<bool>() ? 0U : 1U, failed) << path;
}

std::vector<std::string> ListVectors(const std::string& folder) {
  std::vector<std::string> paths;
  for (const auto& entry : std::filesystem::directory_iterator(kVectors + folder)) {
    if (entry.path().extension() == ".xml") {
      paths.push_back(entry.path().string());
    }
  }
  return paths;
}

TEST(CliExplain, AgreesWithTheLibraryOnEveryVector) {
  std::vector<std::string> paths = ListVectors("accept");
  const std::vector<std::string> rejected = ListVectors("reject");
  paths.insert(paths.end(), rejected.begin(), rejected.end());
  ASSERT_LT(100U, paths.size());
  for (const std::string& path : paths) {
    Json json = ExplainVector(path);
    ExpectOneBreak(json, path);
    json.erase("checks");
    const ProcessResult plain = RunCli({"verify", "--trust", kTrust, "--json", path});
    EXPECT_EQ(Json::parse(plain.standardOutput), json) << path;
  }
}

TEST(CliExplain, TellsWhatPassed) {
  const ProcessResult result =
      RunCli({"verify", "--trust", kTrust, "--explain", kVectors + "accept/plain.xml"});
  EXPECT_EQ(0, result.exitCode);
  std::istringstream lines(result.standardOutput);
  std::string checks;
  for (std::string line; std::getline(lines, line);) {
    checks += std::regex_search(line, std::regex("^[0-9]\\. ")) ? line + "\n" : "";
  }
  EXPECT_EQ("1. passed: well-formed XML: " + std::to_string(ReadAll(kVectors + "accept/plain.xml").size()) +
                " bytes\n"
                "2. passed: structure: 11 elements, each in its place\n"
                "3. passed: signature coverage\n"
                "4. passed: properties\n"
                "5. passed: signature algorithms\n"
                "6. passed: signer's certificate chain\n"
                "7. passed: signed content\n"
                "8. passed: signature value\n"
                "9. passed: interpretation\n",
            checks);
}

TEST(CliExplain, TellsBothDigestsOfChangedContent) {
  const Json json = ExplainVector(kVectors + "reject/altered-subject.xml");
  const Json& check = json["checks"][6];
  EXPECT_EQ("signed content", check["name"]);
  EXPECT_EQ("failed", check["state"]);
  EXPECT_EQ("/Assertion/Signature/SignedInfo/Reference", check["place"]["path"]);
  const Json& reference = check["data"]["references"][0];
  EXPECT_EQ(44U, reference["expected"].get<std::string>().size());
  EXPECT_EQ(44U, reference["found"].get<std::string>().size());
  EXPECT_NE(reference["expected"], reference["found"]);
}

TEST(CliExplain, NamesTheSignersAndTheTrusted) {
  const ProcessResult result = RunCli({"verify", "--explain", "--json", kVectors + "accept/plain.xml"});
  const Json check = Json::parse(result.standardOutput)["checks"][5];
  EXPECT_EQ("signer's certificate chain", check["name"]);
  EXPECT_EQ("failed", check["state"]);
  EXPECT_EQ(1U, check["data"]["shown"].size());
  EXPECT_EQ(0U, check["data"]["trusted"].size());
  EXPECT_EQ("/Assertion/Signature/KeyInfo", check["place"]["path"]);
}

TEST(CliExplain, SaysWhereTheStructureEnds) {
  const Json json = ExplainVector(kVectors + "reject/audience-other-element.xml");
  const Json& check = json["checks"][1];
  EXPECT_EQ("structure", check["name"]);
  EXPECT_EQ("failed", check["state"]);
  EXPECT_EQ(check["place"]["path"], check["data"]["steps"].back()["path"]);
  EXPECT_EQ("failed", check["data"]["steps"].back()["state"]);
  EXPECT_LT(0, check["place"]["line"].get<int>());
}

TEST(CliExplain, LeavesOutTheMiddleOfALongWay) {
  std::string token = ReadAll(kVectors + "accept/plain.xml");
  std::string statement = "<saml:AttributeStatement><saml:Attribute Name=\"many\">";
  for (int i = 0; i < 3000; ++i) {
    statement += "<saml:AttributeValue>v</saml:AttributeValue>";
  }
  statement += "</saml:Attribute></saml:AttributeStatement>";
  token.insert(token.rfind("</saml:Assertion>"), statement);
  const TestSupport::TemporaryDirectory directory;
  const std::string path = directory.GetPath("long.xml");
  std::ofstream(path, std::ios::binary) << token;
  const Json json = ExplainVector(path);
  const Json& data = json["checks"][1]["data"];
  EXPECT_EQ(1000U, data["steps"].size());
  EXPECT_LT(2000, data["stepsLeftOut"].get<int>());
  EXPECT_EQ("/Assertion/AttributeStatement/Attribute/AttributeValue[3000]", data["steps"].back()["path"]);
  EXPECT_EQ("failed", json["checks"][6]["state"]) << "the addition was not signed";
}

TEST(CliExplain, SaysWhereTheXmlEnds) {
  const TestSupport::TemporaryDirectory directory;
  const std::string path = directory.GetPath("broken.xml");
  std::ofstream(path) << "<a>\n  <b></c>\n</a>\n";
  const ProcessResult result = RunCli({"verify", "--trust", kTrust, "--explain", path});
  EXPECT_EQ(1, result.exitCode);
  EXPECT_EQ(
      "1. failed: well-formed XML: mismatched tag at line 2, column 8\n"
      "    at line 2, column 8\n"
      "    Look at that place in the file: it is no XML that this library reads.\n"
      "2. not reached: structure\n"
      "3. not reached: signature coverage\n"
      "4. not reached: properties\n"
      "5. not reached: signature algorithms\n"
      "6. not reached: signer's certificate chain\n"
      "7. not reached: signed content\n"
      "8. not reached: signature value\n"
      "9. not reached: interpretation\n"
      "The token is refused: mismatched tag at line 2, column 8 (XMLParseException)\n",
      MaskTimes(result.standardOutput));
}

TEST(CliExplain, TakesATokenOutOfALargerDocument) {
  const TestSupport::TemporaryDirectory directory;
  const std::string path = directory.GetPath("answer.xml");
  const std::string token = ReadAll(kVectors + "accept/plain.xml");
  std::ofstream(path, std::ios::binary) << "<answer>" << token.substr(token.find("<saml")) << "</answer>";
  const ProcessResult result =
      RunCli({"verify", "--trust", kTrust, "--explain", "--embedded", "--json", path});
  EXPECT_EQ(0, result.exitCode) << result.standardOutput;
  ExpectOneBreak(Json::parse(result.standardOutput), path);
}

TEST(CliExplain, IsNotForKeepingTokens) {
  const ProcessResult result =
      RunCli({"verify", "--explain", "--out", "x.xml", kVectors + "accept/plain.xml"});
  EXPECT_EQ(2, result.exitCode);
  EXPECT_EQ("", result.standardOutput);
}

}  // namespace
