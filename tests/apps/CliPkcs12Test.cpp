// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

// The commands that work with a key of one's own, with the key in a PKCS #12 file.

#include "apps/ChildProcess.h"
#include "apps/Cli.h"
#include "support/Pki.h"

#include <pelmar/crypto/Digest.h>

#include <nlohmann/json.hpp>

#include <gtest/gtest.h>

#include <stdexcept>
#include <string>
#include <vector>

namespace {

using namespace StsTests;
using namespace TestSupport;
using Json = nlohmann::json;
using Arguments = std::vector<std::string>;

constexpr const char* kPassPhrase = "pass phrase";

std::string FingerprintOf(const Identity& identity) {
  return Pelmar::Crypto::ToHex(identity.certificate->GetSha256());
}

Identity MakeIdentity() {
  CertificateSpec spec;
  spec.keyNumber = 3;
  return MakeSelfSigned(spec);
}

DevSts::ServiceConfig MakeConfig(const Identity& identity) {
  DevSts::User robot;
  robot.name = "robot";
  robot.domain = "example.com";
  robot.certificates = {FingerprintOf(identity)};
  DevSts::ServiceConfig config;
  config.directory = DevSts::Directory({robot});
  return config;
}

/// A service that knows robot by certificate, and robot's file "me.p12".
class Robot final {
 public:
  Robot() : _identity(MakeIdentity()), _service(MakeConfig(_identity)) {
    _files.WriteFile("phrase", std::string(kPassPhrase) + "\n");
    _files.WriteFile("ca.pem", _service.GetCaCertificate());
    _files.WriteFile("sts.pem", _service.GetSigningCertificate());
    Export("me.p12");
  }

  static const Robot& Get() {
    static const Robot robot;
    return robot;
  }

  /// Lets the openssl program make a file.
  std::string Export(const std::string& name, const Arguments& more = {}) const {
    const std::string pem =
        _files.WriteFile("both.pem", _identity.GetKeyPem() + _identity.GetCertificatePem());
    const ProcessResult made = RunProcess(Join({"openssl", "pkcs12", "-export", "-in", pem, "-passout",
                                                "file:" + GetPath("phrase"), "-out", GetPath(name)},
                                               more));
    if (made.exitCode != 0) {
      throw std::runtime_error(made.standardError);
    }
    return GetPath(name);
  }

  Arguments ToService(const Arguments& command) const {
    return Join(command,
                {"--url", _service.GetUrl(), "--ca", GetPath("ca.pem"), "--sts-cert", GetPath("sts.pem")});
  }

  ProcessResult Run(const Arguments& command) const {
    return RunCli(Join(command, {"--pkcs12", GetPath("me.p12"), "--key-password-file", GetPath("phrase")}));
  }

  std::string GetPath(const std::string& name) const { return _files.GetPath(name); }
  std::string WriteFile(const std::string& name, const std::string& content) const {
    return _files.WriteFile(name, content);
  }
  const Identity& GetIdentity() const { return _identity; }

 private:
  static Arguments Join(Arguments first, const Arguments& second) {
    first.insert(first.end(), second.begin(), second.end());
    return first;
  }

  Identity _identity;
  DevSts::Service _service;
  TemporaryDirectory _files;
};

TEST(CliPkcs12, AcquiresAndRenews) {
  const Robot& robot = Robot::Get();
  const std::string token = robot.GetPath("token.xml");
  const ProcessResult acquired =
      robot.Run(robot.ToService({"acquire", "certificate", "--json", "--renewable", "--out", token}));
  EXPECT_EQ(acquired.exitCode, 0) << acquired.standardOutput;
  EXPECT_EQ(Json::parse(acquired.standardOutput).at("token").at("confirmationCertificateSha256"),
            FingerprintOf(robot.GetIdentity()));
  EXPECT_EQ(robot.Run(robot.ToService({"acquire", "token", "--token", token})).exitCode, 0);
  EXPECT_EQ(robot.Run(robot.ToService({"renew", "--token", token})).exitCode, 0);
  EXPECT_EQ(robot.Run({"request", "certificate"}).exitCode, 0);
}

TEST(CliPkcs12, AsksForThePassPhraseOnTheTerminal) {
  const Robot& robot = Robot::Get();
  ChildProcess process(
      MakeCommand(robot.ToService({"acquire", "certificate", "--pkcs12", robot.GetPath("me.p12")})),
      ChildProcess::Terminal::OWN);
  process.ReadUntil("Pass phrase of " + robot.GetPath("me.p12") + ": ");
  EXPECT_FALSE(process.HasEcho());
  process.Type(std::string(kPassPhrase) + "\n");
  const std::string output = process.ReadAll();
  EXPECT_EQ(process.Wait(), 0) << output;
  EXPECT_NE(output.find("  subject       robot@example.com\r\n"), std::string::npos) << output;
  EXPECT_EQ(output.find(kPassPhrase), std::string::npos);
}

/// What "request certificate" says with these arguments, which it has to refuse.
std::string RefusalOf(Arguments arguments) {
  arguments.insert(arguments.begin(), {"request", "certificate"});
  const ProcessResult result = RunCli(arguments);
  EXPECT_EQ(result.exitCode, 2);
  EXPECT_EQ(result.standardOutput, "");
  return result.standardError;
}

TEST(CliPkcs12, RefusesAWrongPassPhrase) {
  const Robot& robot = Robot::Get();
  const std::string file = robot.GetPath("me.p12");
  EXPECT_EQ(
      RefusalOf({"--pkcs12", file, "--key-password-file", robot.WriteFile("wrong", "wrong")}),
      "quorlin: cannot use " + file +
          ": The PKCS #12 file cannot be read: the pass phrase is wrong or the file is damaged (UsageException)\n");
}

TEST(CliPkcs12, RefusesOldEncryption) {
  const Robot& robot = Robot::Get();
  const std::string file = robot.Export("old.p12", {"-legacy", "-macalg", "sha256"});
  EXPECT_EQ(
      RefusalOf({"--pkcs12", file, "--key-password-file", robot.GetPath("phrase")}),
      "quorlin: cannot use " + file +
          ": The PKCS #12 file is encrypted with pbeWithSHA1And40BitRC2-CBC; PBES2 with PBKDF2 and AES-CBC is "
          "needed (UsageException)\n");
}

TEST(CliPkcs12, TakesThePlaceOfCertificateAndKey) {
  const Robot& robot = Robot::Get();
  const std::string advice = "\nTry quorlin request certificate --help\n";
  EXPECT_EQ(RefusalOf({"--pkcs12", robot.GetPath("me.p12"), "--cert", "c.pem", "--key", "k.pem"}),
            "quorlin: --cert excludes --pkcs12" + advice);
  EXPECT_EQ(RefusalOf({}), "quorlin: --cert or --pkcs12 is required" + advice);
  EXPECT_EQ(RunCli({"request", "password", "--user", "alice", "--key-password-file", "f"}).standardError,
            "quorlin: --key-password-file requires --key or --pkcs12\nTry quorlin request password --help\n");
}

TEST(CliPkcs12, TellsAFileThatIsNotThere) {
  EXPECT_EQ(RefusalOf({"--pkcs12", "/nowhere/me.p12", "--key-password-file", Robot::Get().GetPath("phrase")}),
            "quorlin: cannot read /nowhere/me.p12: No such file or directory (UsageException)\n");
}

}  // namespace
