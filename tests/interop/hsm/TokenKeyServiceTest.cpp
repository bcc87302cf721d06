// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

// Tokens that are bound to a key in a token of SoftHSM, from the development token service; requests signed
// there, judged by xmlsec1; and the command-line tool with such keys and with PKCS #12 files.

#include "apps/ChildProcess.h"
#include "apps/Cli.h"
#include "interop/hsm/SoftHsm.h"
#include "support/Process.h"

#include "devsts/Service.h"
#include "quorlin/RequestBuilderImpl.h"

#include <pelmar/crypto/Digest.h>
#include <pelmar/crypto/Pkcs11.h>
#include <pelmar/crypto/SigningFunction.h>
#include <quorlin/quorlin.h>

#include <nlohmann/json.hpp>

#include <gtest/gtest.h>

#include <memory>
#include <stdexcept>
#include <string>
#include <vector>

namespace {

using namespace HsmTests;
using TestSupport::ProcessResult;
using TestSupport::RunProcess;
using TestSupport::TemporaryDirectory;
using Json = nlohmann::json;
using Arguments = std::vector<std::string>;

const SoftHsm& Hsm() {
  return SoftHsm::Shared();
}

std::string FingerprintOf(const Pelmar::Crypto::Certificate& certificate) {
  return Pelmar::Crypto::ToHex(certificate.GetSha256());
}

/// A user of a running service whose key is in a token, and the files that he has.
class Robot final {
 public:
  static const Robot& Get() {
    static const Robot robot;
    return robot;
  }

  Robot() : _key(Hsm().MakeKey("robot")), _service(MakeConfig(*_key.certificate)) {
    _files.WriteFile("cert.pem", _key.certificate->ToPem());
    _files.WriteFile("pin", std::string(kPin) + "\n");
    _files.WriteFile("ca.pem", _service.GetCaCertificate());
    _files.WriteFile("sts.pem", _service.GetSigningCertificate());
  }

  Quorlin::HolderOfKeyConfig MakeIdentity() const {
    return Quorlin::HolderOfKeyConfig{Pelmar::Crypto::CreatePrivateKeyFromPkcs11(
                                          GetUri(), _key.certificate, [] { return std::string(kPin); }),
                                      _key.certificate};
  }

  boost::shared_ptr<Quorlin::SecurityTokenService> MakeClient() const {
    Pelmar::Ssl::SSLContextOptions tls;
    tls.caFile = _files.GetPath("ca.pem");
    Quorlin::SecurityTokenServiceConfig config;
    config.stsUrl = _service.GetUrl();
    config.sslContext = Pelmar::Ssl::CreateSSLContext(tls);
    config.trustedStsCertificates =
        Pelmar::Crypto::CreateCertificatesFromPem(_service.GetSigningCertificate());
    config.holderOfKeyConfig = MakeIdentity();
    return Quorlin::CreateSecurityTokenService(config);
  }

  /// Where the service is.
  Arguments GetServiceFlags() const {
    return {"--url", _service.GetUrl(), "--ca", GetPath("ca.pem"), "--sts-cert", GetPath("sts.pem")};
  }

  const std::string& GetUrl() const { return _service.GetUrl(); }
  std::string GetUri() const { return Hsm().MakeUri("robot"); }
  const TokenKey& GetKey() const { return _key; }
  std::string GetPath(const std::string& name) const { return _files.GetPath(name); }
  const TemporaryDirectory& GetFiles() const { return _files; }

 private:
  static DevSts::ServiceConfig MakeConfig(const Pelmar::Crypto::Certificate& certificate) {
    DevSts::User robot;
    robot.name = "robot";
    robot.domain = "example.com";
    robot.certificates = {FingerprintOf(certificate)};
    DevSts::ServiceConfig config;
    config.directory = DevSts::Directory({robot});
    return config;
  }

  TokenKey _key;
  DevSts::Service _service;
  TemporaryDirectory _files;
};

Arguments Join(Arguments first, const Arguments& second) {
  first.insert(first.end(), second.begin(), second.end());
  return first;
}

// --- The library ---

TEST(TokenKeyService, BindsATokenToAKeyThatNeverLeavesItsHardware) {
  Quorlin::TokenSpec spec;
  spec.tokenLifetimeSec = 600;
  spec.renewable = true;
  const boost::shared_ptr<Quorlin::SecurityTokenService> client = Robot::Get().MakeClient();
  const auto token = client->AcquireTokenByCertificate(spec);
  EXPECT_EQ(token->GetSubject().ToString(), "{Name: robot; Domain:example.com}");
  EXPECT_EQ(token->GetConfirmationMethod(), Quorlin::SamlToken::CONFIRM_HOLDER_OF_KEY);
  EXPECT_EQ(FingerprintOf(*token->GetConfirmationCertificate()),
            FingerprintOf(*Robot::Get().GetKey().certificate));
  EXPECT_EQ(client->RenewToken(*token, 60)->GetSubject().ToString(), "{Name: robot; Domain:example.com}");
}

// The verdict on the message's own signature.
int AskXmlsec(const std::string& request, const std::string& certificatePem) {
  const TemporaryDirectory files;
  const Arguments command = {
      "xmlsec1",
      "--verify",
      "--pubkey-cert-pem",
      files.WriteFile("certificate.pem", certificatePem),
      "--id-attr:Id",
      "http://schemas.xmlsoap.org/soap/envelope/:Body",
      "--id-attr:Id",
      "http://docs.oasis-open.org/wss/2004/01/oasis-200401-wss-wssecurity-utility-1.0.xsd:Timestamp",
      "--node-xpath",
      "/*[local-name()='Envelope']/*[local-name()='Header']/*[local-name()='Security']/*[local-name()='Signature']",
      files.WriteFile("message.xml", request)};
  return RunProcess(command).exitCode;
}

void ExpectAcceptedByXmlsec(const Quorlin::HolderOfKeyConfig& identity) {
  Quorlin::TokenSpec spec;
  spec.tokenLifetimeSec = 600;
  Quorlin::Request request;
  Quorlin::RequestBuilderImpl(identity).BuildCertificateTokenRequest(spec, request);
  EXPECT_EQ(AskXmlsec(request.body, identity.certificate->ToPem()), 0) << request.body;
  EXPECT_NE(AskXmlsec(request.body, Hsm().GetAuthority().GetCertificatePem()), 0);
}

TEST(TokenKeyService, SignsRequestsThatXmlsecAccepts) {
  ExpectAcceptedByXmlsec(Robot::Get().MakeIdentity());
}

TEST(TokenKeyService, SignsByAFunctionRequestsThatXmlsecAccepts) {
  const Quorlin::HolderOfKeyConfig inToken = Robot::Get().MakeIdentity();
  const auto sign = [&inToken](Pelmar::Crypto::DigestAlgorithm digest,
                               const std::vector<unsigned char>& data) {
    return inToken.privateKey->Sign(digest, data.data(), data.size());
  };
  Quorlin::HolderOfKeyConfig identity = inToken;
  identity.privateKey = Pelmar::Crypto::CreatePrivateKeyFromFunction(
      identity.certificate, Pelmar::Crypto::SIGNING_INPUT_DATA, sign);
  ExpectAcceptedByXmlsec(identity);
}

// --- The tool, with a key in a token ---

ProcessResult RunWithTokenKey(const Arguments& command, const Arguments& more = {}) {
  const Robot& robot = Robot::Get();
  return StsTests::RunCli(Join(Join(command, {"--cert", robot.GetPath("cert.pem"), "--key", robot.GetUri(),
                                              "--key-password-file", robot.GetPath("pin")}),
                               more));
}

Arguments ToService(const Arguments& command) {
  return Join(command, Robot::Get().GetServiceFlags());
}

TEST(CliTokenKey, AcquiresAndRenews) {
  const std::string token = Robot::Get().GetPath("token.xml");
  const ProcessResult acquired =
      RunWithTokenKey(ToService({"acquire", "certificate", "--json", "--renewable", "--out", token}));
  EXPECT_EQ(acquired.exitCode, 0) << acquired.standardOutput;
  EXPECT_EQ(acquired.standardError, "");
  EXPECT_EQ(Json::parse(acquired.standardOutput).at("token").at("confirmationCertificateSha256"),
            FingerprintOf(*Robot::Get().GetKey().certificate));
  EXPECT_EQ(RunWithTokenKey(ToService({"acquire", "token", "--token", token})).exitCode, 0);
  EXPECT_EQ(RunWithTokenKey(ToService({"renew", "--token", token, "--lifetime", "60"})).exitCode, 0);
}

TEST(CliTokenKey, MakesRequestsThatXmlsecAccepts) {
  const std::string file = Robot::Get().GetPath("request.xml");
  EXPECT_EQ(RunWithTokenKey({"request", "certificate", "--out", file}).exitCode, 0);
  EXPECT_EQ(
      AskXmlsec(Robot::Get().GetFiles().ReadFile("request.xml"), Robot::Get().GetKey().certificate->ToPem()),
      0);
}

TEST(CliTokenKey, IsExaminedByTheDoctor) {
  const ProcessResult result =
      RunWithTokenKey({"doctor", "--url", Robot::Get().GetUrl(), "--ca", Robot::Get().GetPath("ca.pem")});
  EXPECT_EQ(result.exitCode, 0) << result.standardOutput;
  EXPECT_NE(result.standardOutput.find("your certificate is valid now and belongs to the key"),
            std::string::npos)
      << result.standardOutput;
}

/// "request certificate" with this --key, which has to fail.
std::string RefusalOf(const std::string& key, const std::string& pinFile = Robot::Get().GetPath("pin")) {
  const ProcessResult result =
      StsTests::RunCli({"request", "certificate", "--cert", Robot::Get().GetPath("cert.pem"), "--key", key,
                        "--key-password-file", pinFile});
  EXPECT_EQ(result.exitCode, 2);
  EXPECT_EQ(result.standardOutput, "");
  return result.standardError;
}

std::string Refused(const std::string& why) {
  return "quorlin: cannot use the key of --key: " + why + " (UsageException)\n";
}

TEST(CliTokenKey, FindsTheTokenThroughP11Kit) {
  const Robot& robot = Robot::Get();
  EXPECT_EQ(StsTests::RunCli({"request", "certificate", "--cert", robot.GetPath("cert.pem"), "--key",
                              "pkcs11:token=quorlin%20test;object=robot", "--key-password-file",
                              robot.GetPath("pin")})
                .standardError,
            "");
}

TEST(CliTokenKey, RefusesAPinInTheUriWithoutRepeatingIt) {
  EXPECT_EQ(
      RefusalOf(Robot::Get().GetUri() + "&pin-value=" + kPin),
      Refused(
          "The PKCS #11 URI holds pin-value: a PIN in a URI is seen in argument lists and logs, so it is not "
          "taken from there; use pin-source (and change that PIN)"));
}

TEST(CliTokenKey, RefusesAWrongPin) {
  EXPECT_EQ(RefusalOf(Robot::Get().GetUri(), Robot::Get().GetFiles().WriteFile("wrong", "9999")),
            Refused("The PKCS #11 key cannot be loaded: PIN incorrect"));
}

TEST(CliTokenKey, TellsAModuleThatCannotBeLoaded) {
  const std::string uri = "pkcs11:token=quorlin%20test;object=robot?module-path=";
  EXPECT_EQ(
      RefusalOf(uri + "/nowhere/module.so"),
      Refused(
          "The PKCS #11 module cannot be loaded: /nowhere/module.so: cannot open shared object file: No such "
          "file or directory"));
  EXPECT_EQ(RefusalOf(uri + "libz.so.1"),
            Refused("The PKCS #11 module 'libz.so.1' cannot be used: it is no PKCS #11 module"));
}

TEST(CliTokenKey, AsksForThePinOnTheTerminal) {
  const Robot& robot = Robot::Get();
  StsTests::ChildProcess process(
      StsTests::MakeCommand(ToService(
          {"acquire", "certificate", "--cert", robot.GetPath("cert.pem"), "--key", robot.GetUri()})),
      StsTests::ChildProcess::Terminal::OWN);
  process.ReadUntil("PIN of the token of --key: ");
  EXPECT_FALSE(process.HasEcho());
  process.Type(std::string(kPin) + "\n");
  const std::string output = process.ReadAll();
  EXPECT_EQ(process.Wait(), 0) << output;
  EXPECT_NE(output.find("  subject       robot@example.com\r\n"), std::string::npos) << output;
  EXPECT_EQ(output.find(kPin), std::string::npos);
}

// After a refused signature the module would not sign for this process any more, so it is one of its own.
TEST(CliTokenKey, AsksForThePinOfASignatureWhenTheTokenWantsIt) {
  const Robot& robot = Robot::Get();
  const TokenKey careful = Hsm().MakeKey("careful-cli", "rsa:2048", "quorlin test", {"--always-auth"});
  const std::string certificate = robot.GetFiles().WriteFile("careful.pem", careful.certificate->ToPem());
  for (const bool isPatient : {true, false}) {
    StsTests::ChildProcess process(StsTests::MakeCommand({"request", "certificate", "--cert", certificate,
                                                          "--key", Hsm().MakeUri("careful-cli")}),
                                   StsTests::ChildProcess::Terminal::OWN);
    process.ReadUntil("PIN of the token of --key: ");
    process.Type(std::string(kPin) + "\n");
    process.ReadUntil("\r\nPIN of the token of --key: ");
    process.Type(isPatient ? std::string(kPin) + "\n" : "\n");
    const std::string output = process.ReadAll();
    EXPECT_EQ(process.Wait(), isPatient ? 0 : 4) << output;
    EXPECT_EQ(output.find("</soapenv:Envelope>") != std::string::npos, isPatient) << output;
    const std::string refusal = "The PIN cannot be had: the password is empty (CryptoException)\r\n";
    EXPECT_EQ(output.find(refusal) == std::string::npos, isPatient) << output;
  }
}

TEST(CliTokenKey, SaysHowToGiveAPinWithoutATerminal) {
  const Robot& robot = Robot::Get();
  StsTests::ChildProcess process(
      Join({"/bin/sh", "-c", "\"$@\" 2>&1", "sh"},
           StsTests::MakeCommand(
               {"request", "certificate", "--cert", robot.GetPath("cert.pem"), "--key", robot.GetUri()})),
      StsTests::ChildProcess::Terminal::NONE);
  EXPECT_EQ(
      process.ReadAll(),
      Refused("The PIN cannot be had: there is no terminal to ask for the PIN: use --key-password-file"));
  EXPECT_EQ(process.Wait(), 2);
}

}  // namespace
