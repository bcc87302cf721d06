// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

// What the tool says when the service cannot be reached: whole texts, exit code 3.

#include "apps/Cli.h"
#include "support/HttpScripts.h"
#include "support/LoopbackServer.h"
#include "support/Pki.h"

#include "quorlin/ConnectionAdvice.h"

#include <gtest/gtest.h>

#include <openssl/ssl.h>

#include <regex>
#include <string>
#include <vector>

namespace {

using namespace StsTests;
using namespace TestSupport;

constexpr const char* kHttpWarning =
    "quorlin: warning: with an http: URL the password can be read on its way\n";

const Identity& GetCa() {
  static const Identity ca = MakeCa("Some CA");
  return ca;
}

std::string Replace(const std::string& text, const std::string& what, const std::string& by) {
  const std::size_t start = what.empty() ? std::string::npos : text.find(what);
  return start == std::string::npos ? text : text.substr(0, start) + by + text.substr(start + what.size());
}

/// Standard error of "acquire password" with this URL, and "PEER" for `endpoint` and {time} for dates. The
/// authority above is trusted.
std::string Fail(const std::string& url, const std::string& endpoint = "") {
  const TemporaryDirectory files;
  const ProcessResult result = RunCli(
      {"acquire", "password", "--url", url, "--ca", files.WriteFile("ca.pem", GetCa().GetCertificatePem()),
       "--sts-cert", files.GetPath("ca.pem"), "--user", "alice@example.com", "--password-stdin"},
      "secret");
  EXPECT_EQ(result.exitCode, 3);
  EXPECT_EQ(result.standardOutput, "");
  EXPECT_EQ(result.standardError.find("secret"), std::string::npos);
  static const std::regex kDate("[0-9]{4}-[0-9]{2}-[0-9]{2}T[0-9:.]+Z");
  return std::regex_replace(Replace(result.standardError, endpoint, "PEER"), kDate, "{time}");
}

std::string FailWith(const LoopbackServer& server, const std::string& scheme) {
  return Fail(scheme + "://" + server.GetEndpoint() + "/sts", server.GetEndpoint());
}

/// The words for a peer that answers one request over plain HTTP with these bytes.
std::string FailWithAnswer(const std::string& answer) {
  const LoopbackServer server({AnswerEach({answer})});
  const std::string error = FailWith(server, "http");
  EXPECT_EQ(error.substr(0, std::string(kHttpWarning).size()), kHttpWarning);
  return error.substr(std::string(kHttpWarning).size());
}

/// The words for a TLS server like this.
std::string FailWithServer(const TlsServerSettings& settings) {
  const LoopbackServer server(settings, {AnswerEach({HttpAnswer("200 OK", "")})});
  return FailWith(server, "https");
}

CertificateSpec ServerSpec() {
  CertificateSpec spec;
  spec.commonName = "sts.test";
  spec.subjectAlternativeName = "IP:127.0.0.1,DNS:sts.test";
  return spec;
}

// --- Connecting ---

TEST(CliConnection, RefusedByAPort) {
  const ClosedPort port;
  const std::string endpoint = "127.0.0.1:" + std::to_string(port.GetPort());
  EXPECT_EQ(Fail("https://" + endpoint + "/sts", endpoint),
            "quorlin: Connection refused by PEER (CommunicationException)\n"
            "Nothing listens there: start the service, or correct the host and port in --url.\n");
}

TEST(CliConnection, UnknownHost) {
  EXPECT_EQ(Fail("https://nowhere.invalid/sts"),
            "quorlin: Host nowhere.invalid was not found (CommunicationException)\n"
            "Correct the host in --url, or see why this machine cannot resolve its name.\n");
}

// --- Certificates ---

TEST(CliConnection, UnknownIssuer) {
  EXPECT_EQ(FailWithServer(TlsServerSettings(MakeIssued(MakeCa("Other CA", 2), ServerSpec()))),
            "quorlin: Certificate of 127.0.0.1 is not trusted: issuer CN=Other CA (CommunicationException)\n"
            "If that is the service's authority, name its certificate with --ca. If not, somebody may stand "
            "between.\n");
}

TEST(CliConnection, SelfSigned) {
  EXPECT_EQ(
      FailWithServer(TlsServerSettings(MakeSelfSigned(ServerSpec()))),
      "quorlin: Certificate of 127.0.0.1 is not trusted: it is self-signed (CN=sts.test) "
      "(CommunicationException)\n"
      "If that is the service's own certificate, name it with --ca. If not, somebody may stand between.\n");
}

TEST(CliConnection, AnotherName) {
  CertificateSpec spec = ServerSpec();
  spec.subjectAlternativeName = "DNS:sts.test,DNS:*.example.com,IP:192.0.2.1";
  EXPECT_EQ(
      FailWithServer(TlsServerSettings(MakeIssued(GetCa(), spec))),
      "quorlin: Certificate of 127.0.0.1 does not match the name: it is for sts.test, *.example.com, "
      "192.0.2.1 (CommunicationException)\n"
      "Use one of those names in --url, or give the service a certificate for the name that you use.\n");
}

TEST(CliConnection, Expired) {
  CertificateSpec spec = ServerSpec();
  spec.notBefore = -kDay;
  spec.notAfter = -kHour;
  EXPECT_EQ(FailWithServer(TlsServerSettings(MakeIssued(GetCa(), spec))),
            "quorlin: Certificate of 127.0.0.1 expired at {time} (CommunicationException)\n"
            "The service needs a new certificate, unless this machine's clock is wrong.\n");
}

TEST(CliConnection, NotYetValid) {
  CertificateSpec spec = ServerSpec();
  spec.notBefore = kDay;
  EXPECT_EQ(FailWithServer(TlsServerSettings(MakeIssued(GetCa(), spec))),
            "quorlin: Certificate of 127.0.0.1 is not valid before {time} (CommunicationException)\n"
            "This machine's clock is behind, or the service uses its new certificate too early.\n");
}

TEST(CliConnection, ForAnotherUse) {
  CertificateSpec spec = ServerSpec();
  spec.extendedKeyUsage = "clientAuth";
  EXPECT_EQ(FailWithServer(TlsServerSettings(MakeIssued(GetCa(), spec))),
            "quorlin: Certificate of 127.0.0.1 is not accepted: unsuitable certificate purpose "
            "(CommunicationException)\n"
            "The service needs another certificate.\n");
}

TEST(CliConnection, ClientCertificateDemanded) {
  TlsServerSettings settings(MakeIssued(GetCa(), ServerSpec()));
  settings.clientCa = GetCa();
  EXPECT_EQ(
      FailWithServer(settings),
      "quorlin: PEER demands a client certificate (CommunicationException)\n"
      "The service wants TLS with a client certificate: calls take yours as --client-cert and "
      "--client-key.\n");
}

TEST(CliConnection, OldTls) {
  TlsServerSettings settings(MakeIssued(GetCa(), ServerSpec()));
  settings.maxVersion = TLS1_1_VERSION;
  EXPECT_EQ(FailWithServer(settings),
            "quorlin: PEER does not speak TLS 1.2 or newer (CommunicationException)\n"
            "The service has to be taught TLS 1.2; older versions are not used.\n");
}

// --- The wrong protocol ---

TEST(CliConnection, TlsToAPortThatAnswersInPlainHttp) {
  const LoopbackServer server({[](ServerConnection& connection) {
    connection.ReadSome();
    connection.Send(HttpAnswer("400 Bad Request", ""));
    connection.Close();
  }});
  EXPECT_EQ(
      FailWith(server, "https"),
      "quorlin: PEER does not speak TLS (CommunicationException)\n"
      "Correct the port in --url. A service without TLS is reached with http:, which hides nothing on the "
      "way.\n");
}

TEST(CliConnection, TlsToAServiceWithoutTls) {
  DevSts::ServiceConfig config;
  config.tls = false;
  const DevSts::Service service(config);
  const std::string endpoint = Replace(Replace(service.GetUrl(), "http://", ""), "/sts", "");
  EXPECT_EQ(
      Fail("https://" + endpoint + "/sts", endpoint),
      "quorlin: PEER closed the connection during the TLS handshake (CommunicationException)\n"
      "Correct the port in --url: perhaps no TLS is spoken there. A service without TLS is reached with http:, "
      "which hides nothing on the way.\n");
}

TEST(CliConnection, PlainHttpToAServiceWithTls) {
  const std::string endpoint =
      Replace(Replace(ServiceWithFiles::Shared().Get().GetUrl(), "https://", ""), "/sts", "");
  EXPECT_EQ(
      Fail("http://" + endpoint + "/sts", endpoint),
      std::string(kHttpWarning) +
          "quorlin: PEER closed the connection before it answered (CommunicationException)\n"
          "Correct the port in --url and, if that speaks TLS, use https:; else see the service's log.\n");
}

TEST(CliConnection, PlainHttpToAPortThatAnswersWithATlsAlert) {
  EXPECT_EQ(
      FailWithAnswer(std::string("\x15\x03\x01\x00\x02\x02\x46", 7)),
      "quorlin: PEER did not answer in HTTP/1 (CommunicationException)\n"
      "Correct the port in --url: no HTTP service is there, or one with TLS, which is reached with https:.\n");
}

TEST(CliConnection, NoHttpService) {
  EXPECT_EQ(
      FailWithAnswer("220 mail.example.org ESMTP\r\n"),
      "quorlin: PEER did not answer in HTTP/1 (CommunicationException)\n"
      "Correct the port in --url: no HTTP service is there, or one with TLS, which is reached with https:.\n");
}

TEST(CliConnection, NoAnswerAtAll) {
  EXPECT_EQ(FailWithAnswer(""),
            "quorlin: PEER closed the connection before it answered (CommunicationException)\n"
            "Correct the port in --url and, if that speaks TLS, use https:; else see the service's log.\n");
}

TEST(CliConnection, HalfAnAnswer) {
  EXPECT_EQ(FailWithAnswer("HTTP/1.1 200 OK\r\nContent-Length: 9\r\n\r\n<a>"),
            "quorlin: PEER closed the connection inside the body of its answer (CommunicationException)\n"
            "See the log of the service, and of whatever stands between it and you.\n");
}

// --- Answers of others than the service ---

TEST(CliConnection, OtherStatuses) {
  const struct {
    const char* status;
    const char* advice;
  } cases[] = {
      {"302 Found", "Redirects are not followed: put the address it leads to into --url."},
      {"401 Unauthorized",
       "A web server before the service wants a login of its own: ask for another address."},
      {"403 Forbidden", "A web server before the service does not let you through: ask its operator."},
      {"404 Not Found", "Correct the path in --url."},
      {"405 Method Not Allowed",
       "Correct the path in --url: something else than a token service may answer there."},
      {"407 Proxy Authentication Required",
       "The proxy wants a login: give it one with --proxy-user and --proxy-password-file."},
      {"502 Bad Gateway", "A gateway before the service has no service behind it now: try again later."},
      {"503 Service Unavailable",
       "A gateway before the service has no service behind it now: try again later."},
      {"599 Strange", "See the log of the service, and of whatever stands between it and you."},
  };
  for (const auto& c : cases) {
    EXPECT_EQ(FailWithAnswer(HttpAnswer(c.status, "<html>page</html>", "Location: https://192.0.2.1/\r\n")),
              std::string("quorlin: Server returned error: ") + c.status + " (CommunicationException)\n" +
                  c.advice + "\n");
  }
}

// --- What cannot be waited for ---

TEST(ConnectionAdvice, ForATimeOut) {
  const std::string advice =
      "The service is overloaded or stuck, or a firewall drops what is sent: see its log, then try again.";
  EXPECT_EQ(Cli::AdviseOnConnection("No answer from sts.example.com:443 within 240 s"), advice);
  EXPECT_EQ(Cli::AdviseOnConnection("No connection to sts.example.com:443: No route to host"),
            "See whether this machine may reach that host: network, firewall, and the port in --url.");
}

TEST(ConnectionAdvice, IsNotForTheServerToChoose) {
  EXPECT_EQ(
      Cli::AdviseOnConnection("Certificate of a is not trusted: issuer CN=Certificate of a expired at 1"),
      Cli::AdviseOnConnection("Certificate of b is not trusted: issuer CN=B"));
  EXPECT_EQ(Cli::AdviseOnConnection("Server returned error: 404 does not speak TLS"),
            "Correct the path in --url.");
  EXPECT_EQ(Cli::AdviseOnConnection("Certificate of "), "The service needs another certificate.");
  EXPECT_EQ(Cli::AdviseOnConnection(""),
            "See the log of the service, and of whatever stands between it and you.");
}

}  // namespace
