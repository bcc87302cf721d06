// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

// quorlin doctor: TLS.

#include "apps/Cli.h"
#include "apps/Doctor.h"
#include "support/HttpCalls.h"
#include "support/HttpScripts.h"
#include "support/LoopbackServer.h"
#include "support/Pki.h"

#include <pelmar/StringUtil.h>
#include <pelmar/crypto/Digest.h>
#include <pelmar/ssl/SSLContext.h>

#include <nlohmann/json.hpp>

#include <gtest/gtest.h>
#include <openssl/ssl.h>

#include <string>
#include <vector>

namespace {

using namespace StsTests;
using namespace TestSupport;
using Json = nlohmann::json;

constexpr const char* kSoapAnswer =
    "<e:Envelope xmlns:e=\"http://schemas.xmlsoap.org/soap/envelope/\"><e:Body/></e:Envelope>";

const Identity& GetCa() {
  static const Identity ca = MakeCa("Good CA");
  return ca;
}

CertificateSpec ServerSpec(const std::string& names, long long notBefore = -kHour,
                           long long notAfter = kYear) {
  CertificateSpec spec;
  spec.commonName = "server";
  spec.subjectAlternativeName = names;
  spec.notBefore = notBefore;
  spec.notAfter = notAfter;
  return spec;
}

Identity MakeServer(const std::string& names, long long notBefore = -kHour, long long notAfter = kYear) {
  return MakeIssued(GetCa(), ServerSpec(names, notBefore, notAfter));
}

std::string PinOf(const Identity& identity) {
  const std::string pem = identity.keyPair.ToPublicPem();
  const std::size_t start = pem.find('\n') + 1;
  const std::vector<unsigned char> key =
      Pelmar::StringUtil::Base64Decode(pem.substr(start, pem.find("-----END") - start));
  return "sha256//" + Pelmar::StringUtil::Base64Encode(Pelmar::Crypto::ComputeDigest(
                          Pelmar::Crypto::DIGEST_SHA256, key.data(), key.size()));
}

/// A TLS server, and the authority that the doctor is told to trust.
class TlsServer final {
 public:
  explicit TlsServer(const TlsServerSettings& settings, const Identity& trusted = GetCa())
      : _server(settings, {AnswerEach({HttpAnswer("200 OK", kSoapAnswer)})}), _trusted(trusted) {
    _files.WriteFile("ca.pem", trusted.GetCertificatePem());
  }

  std::string GetUrl(const std::string& host = "127.0.0.1") const {
    return "https://" + host + ":" + std::to_string(_server.GetPort()) + "/sts";
  }

  ProcessResult Examine(const std::vector<std::string>& more = {},
                        const std::string& host = "127.0.0.1") const {
    std::vector<std::string> arguments = {"--url", GetUrl(host), "--ca", _files.GetPath("ca.pem")};
    arguments.insert(arguments.end(), more.begin(), more.end());
    return RunDoctor(arguments);
  }

  /// What is printed before the step "tls".
  std::string GetStart() const { return GetUrl() + "\n" + NameLine() + TcpLine(_server.GetPort()); }

  /// What the library's own client says to this server.
  std::string AskLibrary() const {
    Pelmar::Ssl::SSLContextOptions options;
    options.trustAnchors = Trust({_trusted});
    return Call(*MakeAgent(Pelmar::Http::CreateSSLConnectionSpec(
                    Pelmar::Http::CreateTCPConnectionSpec("127.0.0.1", _server.GetPort()),
                    Pelmar::Ssl::CreateSSLContext(options), "127.0.0.1", "")),
                MakePost("/sts", ""));
  }

  const LoopbackServer& Get() const { return _server; }

 private:
  LoopbackServer _server;
  TemporaryDirectory _files;
  const Identity _trusted;
};

constexpr const char* kServerOfGoodCa = "1. CN=server, issued by CN=Good CA, valid from DATE until DATE";
constexpr const char* kGoodCa = "2. CN=Good CA, its own issuer, valid from DATE until DATE";

std::string PassedEnd() {
  return StepLine("http", "passed", "the answer is 200 OK") +
         StepLine("soap", "passed", "a SOAP answer without fault") +
         StepLine("clock", "skipped", "the answer does not tell the service's time") + UnaskedLines() +
         "\nAll checks passed.\n";
}

// --- Certificates ---

/// A server that is refused, and the lines from "tls" up to those not reached.
struct Refused {
  const char* name;
  TlsServerSettings (*makeSettings)();
  Identity (*getTrusted)();
  std::string lines;
  const char* advice;
};

class CliDoctorRefusesServer : public testing::TestWithParam<Refused> {};

TEST_P(CliDoctorRefusesServer, AndSaysWhatToDo) {
  const TlsServer server(GetParam().makeSettings(), GetParam().getTrusted());
  const ProcessResult result = server.Examine();
  EXPECT_EQ(result.exitCode, 3);
  EXPECT_EQ(result.standardError, "");
  EXPECT_EQ(MaskTimes(result.standardOutput), server.GetStart() + GetParam().lines +
                                                  StepsNotReachedAfter("tls") +
                                                  FailureText("tls", GetParam().advice));
  EXPECT_EQ(server.Get().CountConnections(), 1U);
  EXPECT_EQ(server.Get().GetRecord(0).received, "");
}

/// The doctor's verdict must be the library's own.
TEST_P(CliDoctorRefusesServer, InTheWordsOfTheLibrary) {
  const TlsServer server(GetParam().makeSettings(), GetParam().getTrusted());
  const Json report = Json::parse(server.Examine({"--json"}).standardOutput);
  EXPECT_EQ("HttpException: " + report.at("steps").at(2).at("found").get<std::string>(), server.AskLibrary());
}

Identity TrustGoodCa() {
  return GetCa();
}

Identity TrustOtherCa() {
  return MakeCa("Other CA", 2);
}

const Refused kRefused[] = {
    {"OfUnknownAuthority", [] { return TlsServerSettings(MakeServer("IP:127.0.0.1")); }, TrustOtherCa,
     StepLine("tls", "failed", "Certificate of 127.0.0.1 is not trusted: issuer CN=Good CA") +
         DetailLine(std::string(kServerOfGoodCa) + " <-- unable to get local issuer certificate"),
     "If that is the service's authority, name its certificate with --ca. If not, somebody may stand between."},
    {"OfUnknownAuthorityThatIsShown",
     [] {
       TlsServerSettings settings(MakeServer("IP:127.0.0.1"));
       settings.chain = {GetCa()};
       return settings;
     },
     TrustOtherCa,
     StepLine("tls", "failed", "Certificate of 127.0.0.1 is not trusted: issuer CN=Good CA") +
         DetailLine(kServerOfGoodCa) +
         DetailLine(std::string(kGoodCa) + " <-- self-signed certificate in certificate chain"),
     "If that is the service's authority, name its certificate with --ca. If not, somebody may stand between."},
    {"SelfSigned", [] { return TlsServerSettings(MakeSelfSigned(ServerSpec("IP:127.0.0.1"))); }, TrustGoodCa,
     StepLine("tls", "failed", "Certificate of 127.0.0.1 is not trusted: it is self-signed (CN=server)") +
         DetailLine("1. CN=server, its own issuer, valid from DATE until DATE <-- self-signed certificate"),
     "If that is the service's own certificate, name it with --ca. If not, somebody may stand between."},
    {"OfAnotherName", [] { return TlsServerSettings(MakeServer("DNS:sts.example.com,IP:127.0.0.2")); },
     TrustGoodCa,
     StepLine("tls", "failed",
              "Certificate of 127.0.0.1 does not match the name: it is for sts.example.com, 127.0.0.2") +
         DetailLine(std::string(kServerOfGoodCa) + " <-- IP address mismatch") + DetailLine(kGoodCa),
     "Use one of those names in --url, or give the service a certificate for the name that you use."},
    {"WithoutNames", [] { return TlsServerSettings(MakeServer("")); }, TrustGoodCa,
     StepLine("tls", "failed", "Certificate of 127.0.0.1 does not match the name: it is for no host at all") +
         DetailLine(std::string(kServerOfGoodCa) + " <-- IP address mismatch") + DetailLine(kGoodCa),
     "Use one of those names in --url, or give the service a certificate for the name that you use."},
    {"Expired", [] { return TlsServerSettings(MakeServer("IP:127.0.0.1", -kDay, -kHour)); }, TrustGoodCa,
     StepLine("tls", "failed", "Certificate of 127.0.0.1 expired at DATE") +
         DetailLine(std::string(kServerOfGoodCa) + " <-- certificate has expired") + DetailLine(kGoodCa),
     "The service needs a new certificate, unless this machine's clock is wrong."},
    {"NotYetValid", [] { return TlsServerSettings(MakeServer("IP:127.0.0.1", kHour, kDay)); }, TrustGoodCa,
     StepLine("tls", "failed", "Certificate of 127.0.0.1 is not valid before DATE") +
         DetailLine(std::string(kServerOfGoodCa) + " <-- certificate is not yet valid") + DetailLine(kGoodCa),
     "This machine's clock is behind, or the service uses its new certificate too early."},
};

INSTANTIATE_TEST_SUITE_P(Table, CliDoctorRefusesServer, testing::ValuesIn(kRefused),
                         [](const auto& test) { return std::string(test.param.name); });

TEST(CliDoctorTls, RefusesAServerWithTls11Only) {
  TlsServerSettings settings(MakeServer("IP:127.0.0.1"));
  settings.maxVersion = TLS1_1_VERSION;
  const TlsServer server(settings);
  const ProcessResult result = server.Examine();
  EXPECT_EQ(result.exitCode, 3);
  EXPECT_EQ(MaskTimes(result.standardOutput),
            server.GetStart() +
                StepLine("tls", "failed", server.Get().GetEndpoint() + " does not speak TLS 1.2 or newer") +
                StepsNotReachedAfter("tls") +
                FailureText("tls", "The service has to be taught TLS 1.2; older versions are not used."));
}

TEST(CliDoctorTls, ShowsAnIntermediateThatHasExpired) {
  CertificateSpec spec;
  spec.commonName = "Old CA";
  spec.ca = true;
  spec.keyNumber = 3;
  spec.notBefore = -kDay;
  spec.notAfter = -kHour;
  const Identity intermediate = MakeIssued(GetCa(), spec);
  TlsServerSettings settings(MakeIssued(intermediate, ServerSpec("IP:127.0.0.1")));
  settings.chain = {intermediate};
  const TlsServer server(settings);
  const ProcessResult result = server.Examine();
  EXPECT_EQ(result.exitCode, 3);
  EXPECT_EQ(
      MaskTimes(result.standardOutput),
      server.GetStart() +
          StepLine("tls", "failed",
                   "Issuing certificate CN=Old CA above the certificate of 127.0.0.1 expired at DATE") +
          DetailLine("1. CN=server, issued by CN=Old CA, valid from DATE until DATE") +
          DetailLine("2. CN=Old CA, issued by CN=Good CA, valid from DATE until DATE <-- certificate has "
                     "expired") +
          DetailLine("3. CN=Good CA, its own issuer, valid from DATE until DATE") +
          StepsNotReachedAfter("tls") +
          FailureText("tls",
                      "The service needs a certificate from another authority, or its authority a new one."));
}

// --- Names ---

TEST(CliDoctorTls, AcceptsAServerByItsName) {
  const TlsServer server(TlsServerSettings(MakeServer("DNS:localhost")));
  const ProcessResult result = server.Examine({"--json"}, "localhost");
  EXPECT_EQ(result.exitCode, 0) << result.standardOutput;
  const Json tls = Json::parse(result.standardOutput).at("steps").at(2);
  EXPECT_EQ(tls.at("data").at("names"), Json::array({"localhost"}));
  EXPECT_EQ(server.Get().GetRecord(0).serverNameAsked, "localhost");
}

TEST(CliDoctorTls, SpeaksTls12) {
  TlsServerSettings settings(MakeServer("IP:127.0.0.1"));
  settings.maxVersion = TLS1_2_VERSION;
  const TlsServer server(settings);
  const ProcessResult result = server.Examine({"--json"});
  EXPECT_EQ(result.exitCode, 0) << result.standardOutput;
  EXPECT_EQ(Json::parse(result.standardOutput).at("steps").at(2).at("data").at("protocol"), "TLSv1.2");
}

TEST(CliDoctorTls, TrustsOnlyWhatTheSystemTrustsUnlessToldOtherwise) {
  const TlsServer server(TlsServerSettings(MakeServer("IP:127.0.0.1")));
  const ProcessResult result = RunDoctor({"--url", server.GetUrl(), "--json"});
  EXPECT_EQ(result.exitCode, 3);
  EXPECT_EQ(Json::parse(result.standardOutput).at("steps").at(2).at("found"),
            "Certificate of 127.0.0.1 is not trusted: issuer CN=Good CA");
}

// --- Pins ---

TEST(CliDoctorTls, AcceptsAPinnedKey) {
  const Identity identity = MakeServer("IP:127.0.0.1");
  const TlsServer server((TlsServerSettings(identity)));
  const ProcessResult result = server.Examine({"--pin", PinOf(TrustOtherCa()), "--pin", PinOf(identity)});
  EXPECT_EQ(result.exitCode, 0);
  EXPECT_EQ(
      MaskTimes(result.standardOutput),
      server.GetStart() +
          StepLine("tls", "passed",
                   "TLSv1.3, TLS_AES_256_GCM_SHA384; the certificate is for 127.0.0.1; its key is pinned") +
          DetailLine(kServerOfGoodCa) + DetailLine(kGoodCa) + PassedEnd());
}

TEST(CliDoctorTls, RefusesAKeyThatIsNotPinned) {
  const Identity identity = MakeServer("IP:127.0.0.1");
  const TlsServer server((TlsServerSettings(identity)));
  const ProcessResult result = server.Examine({"--pin", PinOf(TrustOtherCa())});
  EXPECT_EQ(result.exitCode, 3);
  EXPECT_EQ(
      MaskTimes(result.standardOutput),
      server.GetStart() + StepLine("tls", "failed", "Public key of 127.0.0.1 matches none of the pins") +
          DetailLine("the key is " + PinOf(identity)) + DetailLine(kServerOfGoodCa) + DetailLine(kGoodCa) +
          StepsNotReachedAfter("tls") +
          FailureText(
              "tls",
              "Ask the service's operator, by another way, whether its key was replaced. Only if it was, and "
              "this is the new one, give that as --pin; otherwise somebody stands between."));
}

// --- Peers that break off ---

/// A server without TLS at an https: URL, and what is said to it.
struct NoTlsCase {
  const char* name;
  LoopbackServer::Script script;
  const char* found;  ///< After the endpoint.
  const char* advice;
};

class CliDoctorMeetsNoTls : public testing::TestWithParam<NoTlsCase> {};

TEST_P(CliDoctorMeetsNoTls, AndSaysWhatToDo) {
  const LoopbackServer server({GetParam().script});
  const std::string url = "https://" + server.GetEndpoint() + "/sts";
  const ProcessResult result = RunDoctor({"--url", url});
  EXPECT_EQ(result.exitCode, 3);
  EXPECT_EQ(result.standardError, "");
  EXPECT_EQ(MaskTimes(result.standardOutput),
            url + "\n" + NameLine() + TcpLine(server.GetPort()) +
                StepLine("tls", "failed", server.GetEndpoint() + GetParam().found) +
                StepsNotReachedAfter("tls") + FailureText("tls", GetParam().advice));
}

constexpr const char* kPerhapsNoTls =
    "Correct the port in --url: perhaps no TLS is spoken there. A service without TLS is reached with http:, which "
    "hides nothing on the way.";

const NoTlsCase kNoTlsCases[] = {
    {"PlainHttp",
     [](ServerConnection& connection) {
       connection.ReadSome();
       connection.Send("HTTP/1.1 400 Bad Request\r\nContent-Length: 0\r\n\r\n");
       connection.Close();
     },
     " does not speak TLS",
     "Correct the port in --url. A service without TLS is reached with http:, which hides nothing on the way."},
    {"EndAtOnce", [](ServerConnection& connection) { connection.Close(); },
     " closed the connection during the TLS handshake", kPerhapsNoTls},
    {"Reset",
     [](ServerConnection& connection) {
       connection.ReadSome();
       connection.Reset();
     },
     " reset the connection during the TLS handshake", kPerhapsNoTls},
};

INSTANTIATE_TEST_SUITE_P(Table, CliDoctorMeetsNoTls, testing::ValuesIn(kNoTlsCases),
                         [](const auto& test) { return std::string(test.param.name); });

TEST(CliDoctorTls, DoesNotWaitForAHandshakeForEver) {
  const LoopbackServer server({[](ServerConnection& connection) {
    connection.AwaitPeerEnd();
  }});
  const std::string url = "https://" + server.GetEndpoint() + "/sts";
  const ProcessResult result = RunDoctor({"--url", url, "--timeout", "1"});
  EXPECT_EQ(result.exitCode, 3);
  EXPECT_EQ(
      MaskTimes(result.standardOutput),
      url + "\n" + NameLine() + TcpLine(server.GetPort()) +
          StepLine("tls", "failed",
                   "No answer from " + server.GetEndpoint() + " to the TLS handshake within 1 s") +
          StepsNotReachedAfter("tls") +
          FailureText("tls",
                      "The service is overloaded or stuck, or a firewall drops what is sent: see its log, "
                      "then try again."));
}

TEST(CliDoctorTls, LeavesTheVerdictOnAMissingClientCertificateToTheLibrary) {
  TlsServerSettings settings(MakeServer("IP:127.0.0.1"));
  settings.clientCa = GetCa();
  const TlsServer server(settings);
  const ProcessResult result = server.Examine();
  EXPECT_EQ(result.exitCode, 3);
  EXPECT_EQ(
      MaskTimes(result.standardOutput),
      server.GetStart() +
          StepLine("tls", "passed", "TLSv1.3, TLS_AES_256_GCM_SHA384; the certificate is for 127.0.0.1") +
          DetailLine(kServerOfGoodCa) + DetailLine(kGoodCa) +
          StepLine("http", "failed", server.Get().GetEndpoint() + " demands a client certificate") +
          StepsNotReachedAfter("http") +
          FailureText(
              "http",
              "The service wants TLS with a client certificate: calls take yours as --client-cert and "
              "--client-key."));
}

}  // namespace
