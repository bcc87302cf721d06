// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

// The commands that work with a key of one's own: acquire certificate, acquire token, renew; and validate.

#include "apps/Cli.h"
#include "support/Pki.h"

#include <pelmar/crypto/Digest.h>

#include <nlohmann/json.hpp>

#include <gtest/gtest.h>

#include <memory>
#include <string>
#include <vector>

namespace {

using namespace StsTests;
using namespace TestSupport;
using Json = nlohmann::json;

std::string FingerprintOf(const Identity& identity) {
  return Pelmar::Crypto::ToHex(identity.certificate->GetSha256());
}

/// A service that knows robot by certificate, the files that robot has, and robot's first token in
/// "token.xml".
class Robot final {
 public:
  Robot() : _identity(MakeIdentity()), _service(MakeConfig(_identity)) {
    WriteFile("cert.pem", _identity.GetCertificatePem());
    WriteFile("key.pem", _identity.GetKeyPem());
    WriteFile("encrypted.pem", _identity.keyPair.ToEncryptedPem("pass phrase"));
    WriteFile("phrase", "pass phrase\n");
    WriteFile("ca.pem", _service.GetCaCertificate());
    WriteFile("sts.pem", _service.GetSigningCertificate());
  }

  static Robot& Get() {
    static Robot robot;
    return robot;
  }

  /// Runs a command with the service's flags added.
  ProcessResult Run(std::vector<std::string> arguments, const std::string& standardInput = "") const {
    const std::vector<std::string> service = {"--url",           _service.GetUrl(), "--ca",
                                              GetPath("ca.pem"), "--sts-cert",      GetPath("sts.pem")};
    arguments.insert(arguments.end(), service.begin(), service.end());
    return RunCli(arguments, standardInput);
  }

  /// The same with robot's key.
  ProcessResult RunWithKey(std::vector<std::string> arguments) const {
    arguments.insert(arguments.end(), {"--cert", GetPath("cert.pem"), "--key", GetPath("key.pem")});
    return Run(arguments);
  }

  /// A path for a token that was just acquired.
  std::string Acquire(const std::vector<std::string>& more = {}) const {
    std::vector<std::string> arguments = {"acquire", "certificate", "--out", GetPath("token.xml")};
    arguments.insert(arguments.end(), more.begin(), more.end());
    const ProcessResult result = RunWithKey(arguments);
    EXPECT_EQ(result.exitCode, 0) << result.standardError;
    return GetPath("token.xml");
  }

  std::string GetPath(const std::string& name) const { return _files.GetPath(name); }
  std::string WriteFile(const std::string& name, const std::string& content) const {
    return _files.WriteFile(name, content);
  }
  const Identity& GetIdentity() const { return _identity; }
  DevSts::Service& GetService() { return _service; }

  static DevSts::Directory MakeDirectory(const Identity& identity) {
    DevSts::User robot;
    robot.name = "robot";
    robot.domain = "example.com";
    robot.password = "oil";
    robot.solution = true;
    robot.certificates = {FingerprintOf(identity)};
    return DevSts::Directory({robot});
  }

 private:
  static Identity MakeIdentity() {
    CertificateSpec spec;
    spec.keyNumber = 3;
    return MakeSelfSigned(spec);
  }

  static DevSts::ServiceConfig MakeConfig(const Identity& identity) {
    DevSts::ServiceConfig config;
    config.directory = MakeDirectory(identity);
    return config;
  }

  Identity _identity;
  DevSts::Service _service;
  TemporaryDirectory _files;
};

Json TokenOf(const ProcessResult& result) {
  return Json::parse(result.standardOutput).at("token");
}

TEST(CliKey, AcquiresByCertificate) {
  const ProcessResult result = Robot::Get().RunWithKey({"acquire", "certificate", "--json"});
  EXPECT_EQ(result.exitCode, 0);
  const Json token = TokenOf(result);
  EXPECT_EQ(token.at("confirmation"), "holder-of-key");
  EXPECT_EQ(token.at("confirmationCertificateSha256"), FingerprintOf(Robot::Get().GetIdentity()));
  EXPECT_EQ(token.at("isSolution"), true);
}

TEST(CliKey, AcquiresByPasswordWithAndWithoutTheKey) {
  const Robot& robot = Robot::Get();
  std::vector<std::string> arguments = {"acquire", "password",
                                        "--json",  "--user",
                                        "robot",   "--password-stdin",
                                        "--cert",  robot.GetPath("cert.pem"),
                                        "--key",   robot.GetPath("key.pem")};
  EXPECT_EQ(TokenOf(robot.Run(arguments, "oil")).at("confirmation"), "holder-of-key");
  arguments.push_back("--bearer");
  EXPECT_EQ(TokenOf(robot.Run(arguments, "oil")).at("confirmation"), "bearer");
}

TEST(CliKey, TakesAnEncryptedKey) {
  const Robot& robot = Robot::Get();
  const std::vector<std::string> arguments = {
      "acquire", "certificate", "--cert", robot.GetPath("cert.pem"), "--key", robot.GetPath("encrypted.pem")};
  std::vector<std::string> withPhrase = arguments;
  withPhrase.insert(withPhrase.end(), {"--key-password-file", robot.GetPath("phrase")});
  EXPECT_EQ(robot.Run(withPhrase).exitCode, 0);
  const ProcessResult without = robot.Run(arguments);
  EXPECT_EQ(without.exitCode, 2);
  const std::string expected = "quorlin: cannot use the key in " + robot.GetPath("encrypted.pem") + ": ";
  EXPECT_EQ(without.standardError.substr(0, expected.size()), expected);
}

// Requests are always signed with rsa-sha256.
TEST(CliKey, SaysThatItHasToBeAnRsaKey) {
  const Robot& robot = Robot::Get();
  const std::string key = robot.GetPath("ec-key.pem");
  ASSERT_EQ(TestSupport::RunProcess({"openssl", "req", "-x509", "-newkey", "ec", "-pkeyopt",
                                     "ec_paramgen_curve:P-256", "-nodes", "-subj", "/CN=robot", "-days", "1",
                                     "-keyout", key, "-out", robot.GetPath("ec-cert.pem")})
                .exitCode,
            0);
  const ProcessResult result =
      robot.Run({"acquire", "certificate", "--cert", robot.GetPath("ec-cert.pem"), "--key", key});
  EXPECT_EQ(result.exitCode, 4);
  EXPECT_EQ(
      result.standardError,
      "quorlin: Signature method 'http://www.w3.org/2001/04/xmldsig-more#rsa-sha256' does not fit the key "
      "(XmlSecurityException)\n"
      "Requests are signed with RSA and SHA-256: the key of --key has to be an RSA key.\n");
}

TEST(CliKey, WantsTheKeyWithTheCertificate) {
  const Robot& robot = Robot::Get();
  const ProcessResult result = robot.Run({"acquire", "certificate", "--cert", robot.GetPath("cert.pem")});
  EXPECT_EQ(result.exitCode, 2);
  EXPECT_EQ(result.standardError, "quorlin: --cert requires --key\nTry quorlin acquire certificate --help\n");
}

TEST(CliKey, AsksForAdvice) {
  const Robot& robot = Robot::Get();
  const std::string advice =
      R"([{"source":"urn:s","attributes":[{"name":"color","values":["red","blue"]},{"name":"none","values":[]}]}])";
  const ProcessResult result = robot.RunWithKey(
      {"acquire", "certificate", "--json", "--advice", robot.WriteFile("advice.json", advice)});
  EXPECT_EQ(TokenOf(result).at("advice"), Json::parse(advice));
}

struct BadAdvice {
  const char* name;
  const char* json;
  const char* message;
};

class CliKeyRefusesAdvice : public testing::TestWithParam<BadAdvice> {};

TEST_P(CliKeyRefusesAdvice, AndSaysWhere) {
  const Robot& robot = Robot::Get();
  const std::string file = robot.WriteFile("bad.json", GetParam().json);
  const ProcessResult result = robot.RunWithKey({"acquire", "certificate", "--advice", file});
  EXPECT_EQ(result.exitCode, 2);
  EXPECT_EQ(result.standardError, "quorlin: " + file + GetParam().message + " (UsageException)\n");
}

const BadAdvice kBadAdvice[] = {
    {"NoJson", "[", " is not JSON: see byte 2"},
    {"NoArray", "{}", ": advice must be an array"},
    {"NoObject", "[1]", ": advice[0] must be an object of \"source\" and \"attributes\""},
    {"NoAttributes", R"([{"source":"s"}])", ": advice[0] must be an object of \"source\" and \"attributes\""},
    {"SourceNoString", R"([{"source":1,"attributes":[]}])", ": advice[0].source must be a string"},
    {"UnknownMember", R"([{"source":"s","attributes":[{"name":"n","values":[],"x":1}]}])",
     ": advice[0].attributes[0] must be an object of \"name\" and \"values\""},
    {"ValueNoString", R"([{"source":"s","attributes":[{"name":"n","values":["a",1]}]}])",
     ": advice[0].attributes[0].values[1] must be a string"},
};

INSTANTIATE_TEST_SUITE_P(Table, CliKeyRefusesAdvice, testing::ValuesIn(kBadAdvice),
                         [](const auto& test) { return std::string(test.param.name); });

TEST(CliKey, ExchangesAToken) {
  const Robot& robot = Robot::Get();
  const std::string token = robot.Acquire({"--delegable"});
  const ProcessResult result = robot.RunWithKey(
      {"acquire", "token", "--json", "--token", token, "--delegate-to", "robot@example.com"});
  EXPECT_EQ(result.exitCode, 0) << result.standardOutput;
  EXPECT_EQ(TokenOf(result).at("delegationChain").at(0).at("principal"),
            (Json{{"name", "robot"}, {"domain", "example.com"}}));
}

TEST(CliKey, RenewsAToken) {
  const Robot& robot = Robot::Get();
  const std::string token = robot.Acquire({"--renewable"});
  EXPECT_EQ(robot.RunWithKey({"renew", "--token", token, "--lifetime", "60", "--out", token}).exitCode, 0);
  const ProcessResult verified = RunCli({"verify", "--json", "--trust", robot.GetPath("sts.pem"), token});
  EXPECT_EQ(verified.exitCode, 0);
  EXPECT_EQ(TokenOf(verified).at("renewable"), true);
}

TEST(CliKey, RefusesToRenewABearerToken) {
  const Robot& robot = Robot::Get();
  const std::string token = robot.GetPath("bearer.xml");
  EXPECT_EQ(robot.Run({"acquire", "password", "--user", "robot", "--password-stdin", "--out", token}, "oil")
                .exitCode,
            0);
  const ProcessResult result = robot.RunWithKey({"renew", "--json", "--token", token});
  EXPECT_EQ(result.exitCode, 2);
  EXPECT_EQ(
      result.standardOutput,
      "{\"valid\":false,\"error\":{\"type\":\"InvalidArgumentException\",\"message\":\"Invalid argument : Unable to "
      "renew token: the provided token must be Holder Of Key\"}}\n");
}

TEST(CliKey, ValidatesATokensSubject) {
  Robot& robot = Robot::Get();
  const std::string token = robot.Acquire();
  const ProcessResult known = robot.Run({"validate", "--json", "--token", token});
  EXPECT_EQ(known.exitCode, 0);
  EXPECT_EQ(known.standardOutput, "{\"subjectValid\":true}\n");
  EXPECT_EQ(robot.Run({"validate", "--token", token}).standardOutput,
            "robot@example.com is a valid subject\n");
  robot.GetService().SetDirectory(DevSts::Directory::MakeSample());
  const ProcessResult unknown = robot.Run({"validate", "--json", "--token", token});
  const ProcessResult unknownForPeople = robot.Run({"validate", "--token", token});
  robot.GetService().SetDirectory(Robot::MakeDirectory(robot.GetIdentity()));
  EXPECT_EQ(unknown.exitCode, 1);
  EXPECT_EQ(unknown.standardOutput, "{\"subjectValid\":false}\n");
  EXPECT_EQ(unknownForPeople.exitCode, 1);
  EXPECT_EQ(unknownForPeople.standardOutput, "robot@example.com is no longer a valid subject\n");
}

TEST(CliKey, ChecksATokenBeforeItSendsIt) {
  const Robot& robot = Robot::Get();
  const ProcessResult result =
      robot.Run({"validate", "--json", "--token", robot.WriteFile("broken.xml", "<Assertion/>")});
  EXPECT_EQ(result.exitCode, 1);
  EXPECT_EQ(Json::parse(result.standardOutput).at("error").at("type"), "ParseException");
}

}  // namespace
