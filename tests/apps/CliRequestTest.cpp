// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

// quorlin request: what it shows is what the library would send, and a service takes it.

#include "apps/Cli.h"
#include "support/GoldenText.h"
#include "support/HttpCalls.h"
#include "support/Pki.h"

#include "devsts/Service.h"
#include "devsts/ToyNegotiation.h"

#include <pelmar/StringUtil.h>
#include <pelmar/http/Url.h>
#include <quorlin/quorlin.h>

#include <nlohmann/json.hpp>

#include <gtest/gtest.h>

#include <sys/stat.h>

#include <cstddef>
#include <memory>
#include <string>
#include <utility>
#include <vector>

namespace {

using namespace StsTests;
using namespace TestSupport;
using Json = nlohmann::json;

constexpr const char* kIssueUri = "http://docs.oasis-open.org/ws-sx/ws-trust/200512/RST/Issue";
constexpr const char* kRenewUri = "http://docs.oasis-open.org/ws-sx/ws-trust/200512/RST/Renew";
constexpr const char* kValidateUri = "http://docs.oasis-open.org/ws-sx/ws-trust/200512/RST/Validate";
constexpr const char* kChallengeUri = "http://docs.oasis-open.org/ws-sx/ws-trust/200512/RSTR/Issue";

/// A service without TLS that knows robot by certificate, and robot's files: a holder-of-key token of that
/// service in "token.xml", the service's certificate in "sts.pem".
class Desk final {
 public:
  Desk() : _identity(MakeIdentity()), _service(MakeConfig(_identity)) {
    WriteFile("cert.pem", _identity.GetCertificatePem());
    WriteFile("key.pem", _identity.GetKeyPem());
    WriteFile("sts.pem", _service.GetSigningCertificate());
    WriteFile("leg.bin", "\x60\x01\xFF");
    WriteFile("leg.b64", "YAH/\n");
    WriteFile("password", "correct horse\n");
    WriteFile("advice.json",
              R"([{"source":"https://app.example/","attributes":[{"name":"role","values":["admin","user"]},)"
              R"({"name":"empty","values":[]}]},{"source":"urn:other","attributes":[]}])");
    _token = AcquireToken();
    WriteFile("token.xml", _token);
  }

  static const Desk& Get() {
    static const Desk desk;
    return desk;
  }

  /// Runs "quorlin request", with {name} in an argument replaced by the path of that file.
  ProcessResult Run(const std::vector<std::string>& arguments, const std::string& standardInput = "") const {
    std::vector<std::string> command = {"request"};
    for (const std::string& argument : arguments) {
      const bool isFile = argument.front() == '{';
      command.push_back(isFile ? GetPath(argument.substr(1, argument.size() - 2)) : argument);
    }
    return RunCli(command, standardInput);
  }

  /// The same with robot's key.
  ProcessResult RunWithKey(std::vector<std::string> arguments, const std::string& standardInput = "") const {
    arguments.insert(arguments.end(), {"--cert", "{cert.pem}", "--key", "{key.pem}"});
    return Run(arguments, standardInput);
  }

  /// `envelope` with masks for what differs from request to request, for robot's certificate and for the
  /// token.
  std::string Mask(const std::string& envelope) const {
    const std::string certificate = Pelmar::StringUtil::Base64Encode(_identity.certificate->GetDer());
    return MaskVolatile(ReplaceAll(ReplaceAll(envelope, _token, "{token}"), certificate, "{certificate}"));
  }

  std::string GetPath(const std::string& name) const { return _files.GetPath(name); }
  std::string ReadFile(const std::string& name) const { return _files.ReadFile(name); }
  void WriteFile(const std::string& name, const std::string& content) const {
    _files.WriteFile(name, content);
  }
  const Identity& GetIdentity() const { return _identity; }
  const DevSts::Service& GetService() const { return _service; }

 private:
  static Identity MakeIdentity() {
    CertificateSpec spec;
    spec.keyNumber = 3;
    return MakeSelfSigned(spec);
  }

  static DevSts::ServiceConfig MakeConfig(const Identity& identity) {
    DevSts::User robot;
    robot.name = "robot";
    robot.domain = "example.com";
    robot.password = "correct horse";
    robot.certificates = {Pelmar::Crypto::ToHex(identity.certificate->GetSha256())};
    DevSts::ServiceConfig config;
    config.tls = false;
    config.directory = DevSts::Directory({robot});
    config.handler.negotiation = std::make_shared<DevSts::ToyMechanism>(
        DevSts::ToyOptions(), config.directory, DevSts::MakeSystemClock(0));
    return config;
  }

  std::string AcquireToken() const {
    Quorlin::SecurityTokenServiceConfig config;
    config.stsUrl = _service.GetUrl();
    config.trustedStsCertificates =
        Pelmar::Crypto::CreateCertificatesFromPem(_service.GetSigningCertificate());
    Quorlin::HolderOfKeyConfig identity;
    identity.certificate = _identity.certificate;
    identity.privateKey = _identity.GetKey();
    config.holderOfKeyConfig = identity;
    Quorlin::TokenSpec spec;
    spec.tokenLifetimeSec = 3600;
    spec.renewable = true;
    spec.delegable = true;
    return Quorlin::CreateSecurityTokenService(config)->AcquireTokenByCertificate(spec)->ToXml();
  }

  Identity _identity;
  DevSts::Service _service;
  TemporaryDirectory _files;
  std::string _token;
};

/// The golden text of a request, with the mask in the place of the token and of the password.
std::string Golden(const std::string& name) {
  const std::string text = ReadGoldenText("requests/" + name);
  const std::string open = "<saml2:Assertion";
  const std::string close = "</saml2:Assertion>";
  const std::size_t start = text.find(open);
  const std::string token =
      start == std::string::npos ? "" : text.substr(start, text.find(close) + close.size() - start);
  return ReplaceAll(token.empty() ? text : ReplaceAll(text, token, "{token}"), "correct horse", "********");
}

// --- Whole texts ---

struct Shown {
  const char* name;
  bool hasKey;
  std::vector<std::string> arguments;
  const char* action;
  const char* golden;
};

std::vector<std::string> Join(std::vector<std::string> head, const std::vector<std::string>& tail) {
  head.insert(head.end(), tail.begin(), tail.end());
  return head;
}

const std::vector<std::string> kPassword = {"password", "--user", "alice@example.com", "--lifetime", "3600"};
const std::vector<std::string> kSpnego = {"spnego", "--lifetime", "3600", "--leg", "{leg.bin}"};
const std::vector<std::string> kContinued = {"spnego", "--context", "urn:context:7", "--leg", "{leg.bin}"};
const std::vector<std::string> kCertificate = {"certificate", "--lifetime", "3600"};
const std::vector<std::string> kExchange = {"exchange",  "--token",    "{token.xml}", "--sts-cert",
                                            "{sts.pem}", "--lifetime", "3600"};
const std::vector<std::string> kRenew = {"renew",     "--token",    "{token.xml}", "--sts-cert",
                                         "{sts.pem}", "--lifetime", "3600"};
const std::vector<std::string> kValidate = {"validate", "--token", "{token.xml}", "--sts-cert", "{sts.pem}"};
const std::vector<std::string> kExtras = {"--audience",         "https://b.example/", "--audience",
                                          "https://a.example/", "--advice",           "{advice.json}"};
const std::vector<std::string> kFull =
    Join(kExtras, {"--delegate-to", "bob@example.com", "--renewable", "--delegable"});

const Shown kShown[] = {
    {"Password", false, kPassword, kIssueUri, "password-bearer.xml"},
    {"PasswordGiven", false, Join(kPassword, {"--password-file", "{password}"}), kIssueUri,
     "password-bearer.xml"},
    {"PasswordFull", false, Join(kPassword, kFull), kIssueUri, "password-bearer-full.xml"},
    {"PasswordWithKey", true, kPassword, kIssueUri, "password-holder-of-key.xml"},
    {"PasswordWithKeyExtras", true, Join(Join(kPassword, kExtras), {"--renewable", "--delegable"}), kIssueUri,
     "password-holder-of-key-audience-advice.xml"},
    {"PasswordWithKeyDelegate", true, Join(kPassword, {"--delegate-to", "bob@example.com", "--delegable"}),
     kIssueUri, "password-holder-of-key-delegate.xml"},
    {"PasswordWithKeyBearer", true, Join(kPassword, {"--bearer"}), kIssueUri, "password-bearer.xml"},
    {"Spnego", false, kSpnego, kIssueUri, "spnego-initial-bearer.xml"},
    {"SpnegoBase64",
     false,
     {"spnego", "--lifetime", "3600", "--leg", "{leg.b64}", "--base64"},
     kIssueUri,
     "spnego-initial-bearer.xml"},
    {"SpnegoFull", false, Join(kSpnego, kFull), kIssueUri, "spnego-initial-bearer-full.xml"},
    {"SpnegoWithKey", true, kSpnego, kIssueUri, "spnego-initial-holder-of-key.xml"},
    {"SpnegoWithKeyBearer", true, Join(kSpnego, {"--bearer"}), kIssueUri, "spnego-initial-bearer.xml"},
    {"SpnegoContinued", false, kContinued, kChallengeUri, "spnego-continued.xml"},
    {"SpnegoContinuedEmptyLeg",
     false,
     {"spnego", "--context", "urn:context:7", "--leg", "/dev/null"},
     kChallengeUri,
     "spnego-continued-empty-leg.xml"},
    {"Certificate", true, kCertificate, kIssueUri, "certificate.xml"},
    {"CertificateFull", true, Join(kCertificate, kFull), kIssueUri, "certificate-full.xml"},
    {"Exchange", true, kExchange, kIssueUri, "exchange-holder-of-key.xml"},
    {"ExchangeBearer", true, Join(kExchange, {"--bearer"}), kIssueUri, "exchange-bearer.xml"},
    {"ExchangeFull", true, Join(kExchange, kFull), kIssueUri, "exchange-holder-of-key-full.xml"},
    {"Renew", true, kRenew, kRenewUri, "renew.xml"},
    {"Validate", false, kValidate, kValidateUri, "validate.xml"},
};

class CliRequestShows : public testing::TestWithParam<Shown> {
 protected:
  ProcessResult Run(const std::vector<std::string>& more) const {
    const std::vector<std::string> arguments = Join(GetParam().arguments, more);
    return GetParam().hasKey ? Desk::Get().RunWithKey(arguments) : Desk::Get().Run(arguments);
  }
};

INSTANTIATE_TEST_SUITE_P(Requests, CliRequestShows, testing::ValuesIn(kShown),
                         [](const testing::TestParamInfo<Shown>& shown) {
                           return std::string(shown.param.name);
                         });

TEST_P(CliRequestShows, TheActionAndTheEnvelope) {
  const ProcessResult result = Run({});
  EXPECT_EQ(result.exitCode, 0);
  EXPECT_EQ(result.standardError, "");
  EXPECT_EQ(Desk::Get().Mask(result.standardOutput),
            std::string("SOAPAction: \"") + GetParam().action + "\"\n\n" + Golden(GetParam().golden) + "\n");
}

TEST_P(CliRequestShows, OneJsonObject) {
  const ProcessResult result = Run({"--json"});
  EXPECT_EQ(result.exitCode, 0);
  EXPECT_EQ(result.standardError, "");
  const Json json = Json::parse(result.standardOutput);
  const std::string envelope = json.at("envelope").get<std::string>();
  EXPECT_EQ(result.standardOutput, std::string("{\"soapAction\":\"") + GetParam().action +
                                       "\",\"envelope\":" + Json(envelope).dump() + "}\n");
  EXPECT_EQ(Desk::Get().Mask(envelope), Golden(GetParam().golden));
}

TEST_P(CliRequestShows, TheBareEnvelopeInAFileOfOnesOwn) {
  Desk::Get().WriteFile("out.xml", "old");
  ASSERT_EQ(chmod(Desk::Get().GetPath("out.xml").c_str(), 0644), 0);
  const ProcessResult result = Run({"--out", Desk::Get().GetPath("out.xml")});
  EXPECT_EQ(result.exitCode, 0);
  EXPECT_EQ(result.standardOutput, std::string("SOAPAction: \"") + GetParam().action + "\"\n");
  EXPECT_EQ(Desk::Get().Mask(Desk::Get().ReadFile("out.xml")), Golden(GetParam().golden));
  struct stat status;
  ASSERT_EQ(stat(Desk::Get().GetPath("out.xml").c_str(), &status), 0);
  EXPECT_EQ(status.st_mode & 07777, 0600U);
}

// --- The password ---

std::string EnvelopeOf(const ProcessResult& result) {
  EXPECT_EQ(result.exitCode, 0) << result.standardError;
  return Json::parse(result.standardOutput).at("envelope").get<std::string>();
}

constexpr const char* kPasswordOpen =
    "<wsse:Password "
    "Type=\"http://docs.oasis-open.org/wss/2004/01/oasis-200401-wss-username-token-profile-1.0#PasswordText\">";

TEST(CliRequest, MasksNothingButThePassword) {
  // The password is also the user, the delegate, an audience and a piece of the markup.
  const std::vector<std::string> arguments = {"password",         "--user",        "wsse",
                                              "--password-stdin", "--delegate-to", "wsse",
                                              "--audience",       "wsse",          "--json"};
  const std::string masked = MaskVolatile(EnvelopeOf(Desk::Get().Run(arguments, "wsse")));
  const std::string revealed =
      MaskVolatile(EnvelopeOf(Desk::Get().Run(Join(arguments, {"--reveal"}), "wsse")));
  const std::string open = kPasswordOpen;
  EXPECT_EQ(CutBetween(masked, open, "</wsse:Password>"), "********");
  EXPECT_EQ(CutBetween(revealed, open, "</wsse:Password>"), "wsse");
  EXPECT_EQ(masked, ReplaceAll(revealed, open + "wsse<", open + "********<"));
}

TEST(CliRequest, TellsNothingOfThePasswordsLength) {
  const std::vector<std::string> arguments = {"password", "--user", "alice@example.com", "--password-stdin",
                                              "--json"};
  EXPECT_EQ(MaskVolatile(EnvelopeOf(Desk::Get().Run(arguments, "a"))),
            MaskVolatile(EnvelopeOf(Desk::Get().Run(arguments, std::string(1000, 'a')))));
}

TEST(CliRequest, MasksThePasswordInTheFileToo) {
  const std::vector<std::string> arguments = {
      "password", "--user", "alice@example.com", "--password-stdin", "--lifetime",
      "3600",     "--out",  "{password.xml}",
  };
  EXPECT_EQ(Desk::Get().Run(arguments, "correct horse").exitCode, 0);
  EXPECT_EQ(MaskVolatile(Desk::Get().ReadFile("password.xml")), Golden("password-bearer.xml"));
  EXPECT_EQ(Desk::Get().Run(Join(arguments, {"--reveal"}), "correct horse").exitCode, 0);
  EXPECT_EQ(MaskVolatile(Desk::Get().ReadFile("password.xml")),
            ReadGoldenText("requests/password-bearer.xml"));
}

TEST(CliRequest, RefusesAPasswordThatXmlCannotCarryAlsoWhenItIsNotShown) {
  for (const char* const reveal : {"--reveal", "--password-stdin"}) {
    const ProcessResult result = Desk::Get().Run(
        {"password", "--user", "alice@example.com", "--password-stdin", reveal}, "top\x01secret");
    EXPECT_EQ(result.exitCode, 2);
    EXPECT_EQ(result.standardOutput, "");
    EXPECT_EQ(result.standardError,
              "quorlin: Invalid argument : the text of a node is not XML text (InvalidArgumentException)\n");
  }
}

// --- What others make of it ---

/// Posts what is shown to the service; the answer as "200 OK|body".
std::string PostAsIs(const ProcessResult& shown) {
  EXPECT_EQ(shown.exitCode, 0) << shown.standardError;
  const Json json = Json::parse(shown.standardOutput);
  const Pelmar::Http::HttpURL url = Pelmar::Http::ParseHttpURL(Desk::Get().GetService().GetUrl());
  const auto request = MakePost(url.path, json.at("envelope").get<std::string>());
  request->SetHeader("Content-Type", "text/xml; charset=utf-8");
  request->SetHeader("SOAPAction", "\"" + json.at("soapAction").get<std::string>() + "\"");
  return Call(*MakeAgent(url.port), request);
}

/// The same, but of the body only what it holds.
std::string Post(const ProcessResult& shown) {
  const std::string answer = PostAsIs(shown);
  for (const char* const word : {"RequestedSecurityToken", "/status/valid", "faultcode"}) {
    if (answer.find(word) != std::string::npos) {
      return answer.substr(0, answer.find('|')) + ": " + word;
    }
  }
  return answer;
}

TEST(CliRequest, IsTakenByAService) {
  const Desk& desk = Desk::Get();
  const std::vector<std::string> password = {"password",         "--user",   "robot@example.com",
                                             "--password-stdin", "--reveal", "--json"};
  EXPECT_EQ(Post(desk.Run(password, "correct horse")), "200 OK: RequestedSecurityToken");
  EXPECT_EQ(Post(desk.RunWithKey(password, "correct horse")), "200 OK: RequestedSecurityToken");
  EXPECT_EQ(Post(desk.RunWithKey(Join(kCertificate, {"--json"}))), "200 OK: RequestedSecurityToken");
  EXPECT_EQ(Post(desk.RunWithKey(Join(kExchange, {"--json"}))), "200 OK: RequestedSecurityToken");
  EXPECT_EQ(Post(desk.RunWithKey(Join(kRenew, {"--json"}))), "200 OK: RequestedSecurityToken");
  EXPECT_EQ(Post(desk.Run(Join(kValidate, {"--json"}))), "200 OK: /status/valid");
}

TEST(CliRequest, CarriesANegotiation) {
  const Desk& desk = Desk::Get();
  DevSts::ToyClient client(DevSts::ToyOptions(), "robot@example.com", "correct horse",
                           DevSts::MakeSystemClock(0));
  const auto writeLeg = [&](const DevSts::NegotiationLeg& serverLeg) {
    const DevSts::NegotiationLeg leg = client.Answer(serverLeg);
    desk.WriteFile("toy.bin", std::string(leg.begin(), leg.end()));
  };
  writeLeg({});
  const std::string answer = PostAsIs(desk.Run({"spnego", "--leg", "{toy.bin}", "--json"}));
  const std::string exchange = CutBetween(answer, "BinaryExchange", "</");
  const std::vector<unsigned char> serverLeg =
      Pelmar::StringUtil::Base64Decode(exchange.substr(exchange.find('>') + 1));
  writeLeg(DevSts::NegotiationLeg(serverLeg.begin(), serverLeg.end()));
  EXPECT_EQ(Post(desk.Run({"spnego", "--leg", "{toy.bin}", "--context",
                           CutBetween(answer, "Context=\"", "\""), "--json"})),
            "200 OK: RequestedSecurityToken");
}

TEST(CliRequest, WithTheMaskIsNoMoreThanAWrongPassword) {
  EXPECT_EQ(Post(Desk::Get().Run({"password", "--user", "robot@example.com", "--json"})),
            "500 Internal Server Error: faultcode");
}

// The verdict of xmlsec1 on the message's signature. The IDs are declared, because there is no DTD to do so.
bool XmlsecAccepts(const std::string& envelope) {
  const TemporaryDirectory directory;
  const ProcessResult result = RunProcess(
      {"xmlsec1", "--verify", "--pubkey-cert-pem", Desk::Get().GetPath("cert.pem"), "--id-attr:Id",
       "http://schemas.xmlsoap.org/soap/envelope/:Body", "--id-attr:Id",
       "http://docs.oasis-open.org/wss/2004/01/oasis-200401-wss-wssecurity-utility-1.0.xsd:Timestamp",
       "--node-xpath",
       "/*[local-name()='Envelope']/*[local-name()='Header']/*[local-name()='Security']/*[local-name()='Signature']",
       directory.WriteFile("envelope.xml", envelope)});
  return result.exitCode == 0;
}

TEST(CliRequest, IsSignedSoThatXmlsecAgrees) {
  for (const std::vector<std::string>& arguments :
       {Join(kPassword, kExtras), kCertificate, Join(kCertificate, kFull), kExchange, kRenew, kSpnego}) {
    const std::string envelope = EnvelopeOf(Desk::Get().RunWithKey(Join(arguments, {"--json"})));
    EXPECT_TRUE(XmlsecAccepts(envelope)) << arguments.front();
    EXPECT_FALSE(XmlsecAccepts(ReplaceAll(envelope, "</wsu:Expires>", " </wsu:Expires>")))
        << arguments.front();
  }
}

// --- Misuse ---

struct Refused {
  const char* name;
  std::vector<std::string> arguments;
  int exitCode;
  const char* message;
};

const Refused kRefused[] = {
    {"NoRequest",
     {},
     2,
     "quorlin: there has to be one of these commands: password, certificate, exchange, renew, validate, spnego\nTry quorlin request --help\n"},
    {"PasswordOnTheCommandLine", Join(kPassword, {"--password", "topsecret"}), 2,
     "quorlin: a password on the command line can be seen by every user of this machine, so it is not taken from "
     "there; use --password-file, --password-stdin or the prompt (and change that password)\n"
     "Try quorlin request password --help\n"},
    {"CertificateWithoutKey", kCertificate, 2,
     "quorlin: --cert or --pkcs12 is required\nTry quorlin request certificate --help\n"},
    {"BearerByCertificate", Join(kCertificate, {"--bearer"}), 2,
     "quorlin: --cert or --pkcs12 is required\nTry quorlin request certificate --help\n"},
    {"NoLifetime",
     {"password", "--user", "a", "--lifetime", "0"},
     2,
     "quorlin: Invalid argument : Token lifetime must be positive (InvalidArgumentException)\n"},
    {"LifetimeOfAFurtherLeg", Join(kContinued, {"--lifetime", "60"}), 2,
     "quorlin: --lifetime excludes --context\nTry quorlin request spnego --help\n"},
    {"KeyOfAFurtherLeg", Join(kContinued, {"--cert", "{cert.pem}", "--key", "{key.pem}"}), 2,
     "quorlin: --cert excludes --context\nTry quorlin request spnego --help\n"},
    {"NoLeg", {"spnego"}, 2, "quorlin: --leg is required\nTry quorlin request spnego --help\n"},
};

class CliRequestRefuses : public testing::TestWithParam<Refused> {};

INSTANTIATE_TEST_SUITE_P(Misuse, CliRequestRefuses, testing::ValuesIn(kRefused),
                         [](const testing::TestParamInfo<Refused>& shown) {
                           return std::string(shown.param.name);
                         });

TEST_P(CliRequestRefuses, AndSaysWhy) {
  const ProcessResult result = Desk::Get().Run(GetParam().arguments);
  EXPECT_EQ(result.exitCode, GetParam().exitCode);
  EXPECT_EQ(result.standardOutput, "");
  EXPECT_EQ(result.standardError, GetParam().message);
}

TEST(CliRequest, RefusesALegThatIsNotBase64) {
  const ProcessResult result = Desk::Get().Run({"spnego", "--leg", "{leg.bin}", "--base64"});
  EXPECT_EQ(result.exitCode, 2);
  EXPECT_EQ(result.standardError,
            "quorlin: " + Desk::Get().GetPath("leg.bin") + " is not base64 text (UsageException)\n");
}

TEST(CliRequest, ReportsATokenThatIsNoneAsJson) {
  const ProcessResult result =
      Desk::Get().Run({"validate", "--token", "{advice.json}", "--sts-cert", "{sts.pem}", "--json"});
  EXPECT_EQ(result.exitCode, 1);
  EXPECT_EQ(Json::parse(result.standardOutput).at("error").at("type"), "XMLParseException");
}

}  // namespace
