// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

// Real TLS handshakes with good and bad peers.

#include "support/HttpCalls.h"
#include "support/LoopbackServer.h"
#include "support/Pki.h"
#include "support/TemporaryDirectory.h"

#include <pelmar/Exception.h>
#include <pelmar/StringUtil.h>
#include <pelmar/http/Client.h>
#include <pelmar/http/HttpException.h>
#include <pelmar/ssl/SSLContext.h>

#include <gtest/gtest.h>
#include <openssl/evp.h>
#include <openssl/ssl.h>
#include <openssl/x509.h>

#include <cstdio>
#include <cstdlib>
#include <fstream>
#include <future>
#include <iterator>
#include <string>
#include <vector>

namespace {

using namespace TestSupport;
using namespace Pelmar::Http;
using Pelmar::InvalidArgumentException;
using Pelmar::Ref;
using Pelmar::Ssl::CreateSSLContext;
using Pelmar::Ssl::SSLContext;
using Pelmar::Ssl::SSLContextOptions;

const std::string kHello = "HTTP/1.1 200 OK\r\nContent-Length: 5\r\n\r\nhello";
constexpr long long kSoon = 50 * 1000;

void AnswerAll(ServerConnection& connection) {
  for (;;) {
    connection.ReadRequest();
    connection.Send(kHello);
  }
}

void AnswerAndClose(ServerConnection& connection) {
  connection.ReadRequest();
  connection.Send("HTTP/1.1 200 OK\r\nContent-Length: 5\r\nConnection: close\r\n\r\nhello");
  connection.Close();
}

const Identity& GetCa() {
  static const Identity ca = MakeCa("Test CA");
  return ca;
}

CertificateSpec ServerSpec() {
  CertificateSpec spec;
  spec.commonName = "sts.test";
  spec.extendedKeyUsage = "serverAuth";
  spec.subjectAlternativeName = "DNS:sts.test,DNS:*.wild.test,IP:127.0.0.1";
  return spec;
}

const Identity& GetServerIdentity() {
  static const Identity identity = MakeIssued(GetCa(), ServerSpec());
  return identity;
}

Ref<SSLContext> MakeContext(const Identity& anchor) {
  SSLContextOptions options;
  options.trustAnchors = Trust({anchor});
  return CreateSSLContext(options);
}

Ref<ConnectionSpec> MakeSpec(const LoopbackServer& server, const Ref<SSLContext>& context,
                             const std::string& name = "sts.test", const std::string& pins = "") {
  return CreateSSLConnectionSpec(CreateTCPConnectionSpec("127.0.0.1", server.GetPort()), context, name, pins);
}

std::string Replace(std::string text, const std::string& what, const std::string& by) {
  const std::size_t start = text.find(what);
  return start == std::string::npos ? text : text.replace(start, what.size(), by);
}

/// A call to a server with this identity; its address is given as "PEER". The server is told nothing if the
/// handshake fails.
std::string CallServer(const TlsServerSettings& settings, const Ref<SSLContext>& context,
                       const std::string& name = "sts.test", const std::string& pins = "") {
  LoopbackServer server(settings, {AnswerAndClose});
  const std::string outcome =
      Call(*MakeAgent(MakeSpec(server, context, name, pins)), MakePost("/", "secret"));
  server.AwaitEnd(0);
  EXPECT_EQ(outcome == "200 OK|hello", !server.GetRecord(0).received.empty())
      << "a request to a refused peer, or none";
  return Replace(outcome, server.GetEndpoint(), "PEER");
}

std::string CallIdentity(const Identity& identity, const std::string& name = "sts.test") {
  return CallServer(TlsServerSettings(identity), MakeContext(GetCa()), name);
}

// --- Who the server is ---

TEST(HttpTls, TrustsServersOfItsAnchors) {
  EXPECT_EQ("200 OK|hello", CallIdentity(GetServerIdentity()));
}

TEST(HttpTls, ChecksTheName) {
  const std::string names = "it is for sts.test, *.wild.test, 127.0.0.1";
  const struct {
    std::string name;
    std::string outcome;
  } cases[] = {
      {"STS.Test", "200 OK|hello"},
      {"a.wild.test", "200 OK|hello"},
      {"127.0.0.1", "200 OK|hello"},
      {"other.test", "HttpException: Certificate of other.test does not match the name: " + names},
      {"wild.test", "HttpException: Certificate of wild.test does not match the name: " + names},
      {"a.b.wild.test", "HttpException: Certificate of a.b.wild.test does not match the name: " + names},
      {"test", "HttpException: Certificate of test does not match the name: " + names},
      {"127.0.0.2", "HttpException: Certificate of 127.0.0.2 does not match the name: " + names},
      {"::1", "HttpException: Certificate of ::1 does not match the name: " + names},
  };
  for (const auto& c : cases) {
    EXPECT_EQ(c.outcome, CallIdentity(GetServerIdentity(), c.name)) << c.name;
  }
}

TEST(HttpTls, DoesNotTakeTheCommonNameForAHostName) {
  CertificateSpec spec = ServerSpec();
  spec.subjectAlternativeName = "";
  EXPECT_EQ("HttpException: Certificate of sts.test does not match the name: it is for no host at all",
            CallIdentity(MakeIssued(GetCa(), spec)));
}

TEST(HttpTls, TellsAFewOfManyNames) {
  CertificateSpec spec = ServerSpec();
  spec.subjectAlternativeName = "DNS:n0.test";
  std::string told = "n0.test";
  for (int i = 1; i < 12; ++i) {
    const std::string name = "n" + std::to_string(i) + ".test";
    spec.subjectAlternativeName += ",DNS:" + name;
    told += i < 10 ? ", " + name : "";
  }
  EXPECT_EQ("HttpException: Certificate of sts.test does not match the name: it is for " + told + ", ...",
            CallIdentity(MakeIssued(GetCa(), spec)));
}

TEST(HttpTls, TellsTheNamesOfHostsAndAddressesOnly) {
  CertificateSpec spec = ServerSpec();
  spec.subjectAlternativeName = "email:sts@other.test,DNS:other.test,URI:http://sts.test/,IP:::1";
  EXPECT_EQ("HttpException: Certificate of sts.test does not match the name: it is for other.test, ::1",
            CallIdentity(MakeIssued(GetCa(), spec)));
  // An address of three bytes.
  spec.subjectAlternativeName = "DER:30:05:87:03:7F:00:01";
  EXPECT_EQ("HttpException: Certificate of sts.test does not match the name: it is for ?",
            CallIdentity(MakeIssued(GetCa(), spec)));
}

// Otherwise our own certificate would be shown to it, and it could believe that we trust it.
TEST(HttpTls, BreaksTheHandshakeWithARefusedServerOff) {
  CertificateSpec otherName = ServerSpec();
  otherName.subjectAlternativeName = "DNS:other.test";
  for (const Identity& identity :
       {MakeIssued(MakeCa("Strange CA", 2), ServerSpec()), MakeIssued(GetCa(), otherName)}) {
    LoopbackServer server(TlsServerSettings(identity), {AnswerAndClose});
    Call(*MakeAgent(MakeSpec(server, MakeContext(GetCa()))), MakeGet("/"));
    server.AwaitEnd(0);
    EXPECT_FALSE(server.GetRecord(0).isSecured);
  }
}

TEST(HttpTls, RefusesUnknownIssuers) {
  const Identity stranger = MakeCa("Strange CA", 2);
  EXPECT_EQ("HttpException: Certificate of sts.test is not trusted: issuer CN=Strange CA",
            CallIdentity(MakeIssued(stranger, ServerSpec())));
}

TEST(HttpTls, RefusesUnknownIssuersWhoseRootIsSent) {
  const Identity stranger = MakeCa("Strange CA", 2);
  TlsServerSettings settings(MakeIssued(stranger, ServerSpec()));
  settings.chain = {stranger};
  EXPECT_EQ("HttpException: Certificate of sts.test is not trusted: issuer CN=Strange CA",
            CallServer(settings, MakeContext(GetCa())));
}

TEST(HttpTls, RefusesIssuersOfTheSameNameWithAnotherKey) {
  const Identity impostor = MakeCa("Test CA", 2);
  EXPECT_EQ("HttpException: Certificate of sts.test is not accepted: certificate signature failure",
            CallIdentity(MakeIssued(impostor, ServerSpec())));
}

TEST(HttpTls, RefusesSelfSignedServers) {
  EXPECT_EQ("HttpException: Certificate of sts.test is not trusted: it is self-signed (CN=sts.test)",
            CallIdentity(MakeSelfSigned(ServerSpec())));
}

TEST(HttpTls, TrustsASelfSignedServerThatIsItsAnchor) {
  const Identity server = MakeSelfSigned(ServerSpec());
  EXPECT_EQ("200 OK|hello", CallServer(TlsServerSettings(server), MakeContext(server)));
}

TEST(HttpTls, TrustsNobodyWithoutAnchors) {
  EXPECT_EQ("HttpException: Certificate of sts.test is not trusted: issuer CN=Test CA",
            CallServer(TlsServerSettings(GetServerIdentity()), CreateSSLContext(SSLContextOptions())));
}

TEST(HttpTls, RefusesExpiredCertificates) {
  CertificateSpec spec = ServerSpec();
  spec.notBefore = -2 * kDay;
  spec.notAfter = -kDay;
  const Identity identity = MakeIssued(GetCa(), spec);
  EXPECT_EQ(
      "HttpException: Certificate of sts.test expired at " + identity.certificate->GetNotAfter().ToString(),
      CallIdentity(identity));
}

TEST(HttpTls, RefusesCertificatesNotYetValid) {
  CertificateSpec spec = ServerSpec();
  spec.notBefore = kDay;
  const Identity identity = MakeIssued(GetCa(), spec);
  EXPECT_EQ("HttpException: Certificate of sts.test is not valid before " +
                identity.certificate->GetNotBefore().ToString(),
            CallIdentity(identity));
}

Identity MakeIntermediate(long long notAfter = kYear) {
  CertificateSpec spec;
  spec.commonName = "Intermediate CA";
  spec.ca = true;
  spec.keyNumber = 3;
  spec.keyUsage = "default";
  spec.notBefore = -2 * kDay;
  spec.notAfter = notAfter;
  return MakeIssued(GetCa(), spec);
}

TEST(HttpTls, FollowsAChainWithAnIntermediate) {
  const Identity intermediate = MakeIntermediate();
  TlsServerSettings settings(MakeIssued(intermediate, ServerSpec()));
  settings.chain = {intermediate};
  EXPECT_EQ("200 OK|hello", CallServer(settings, MakeContext(GetCa())));
}

TEST(HttpTls, RefusesAChainWithoutItsIntermediate) {
  EXPECT_EQ("HttpException: Certificate of sts.test is not trusted: issuer CN=Intermediate CA",
            CallIdentity(MakeIssued(MakeIntermediate(), ServerSpec())));
}

TEST(HttpTls, RefusesAChainWithAnExpiredIntermediate) {
  const Identity intermediate = MakeIntermediate(-kDay);
  TlsServerSettings settings(MakeIssued(intermediate, ServerSpec()));
  settings.chain = {intermediate};
  EXPECT_EQ(
      "HttpException: Issuing certificate CN=Intermediate CA above the certificate of sts.test expired at " +
          intermediate.certificate->GetNotAfter().ToString(),
      CallServer(settings, MakeContext(GetCa())));
}

TEST(HttpTls, RefusesCertificatesForOtherUses) {
  CertificateSpec spec = ServerSpec();
  spec.extendedKeyUsage = "clientAuth";
  EXPECT_EQ("HttpException: Certificate of sts.test is not accepted: unsuitable certificate purpose",
            CallIdentity(MakeIssued(GetCa(), spec)));
}

TEST(HttpTls, KeepsTheAnchorsOfContextsApart) {
  const Identity stranger = MakeCa("Strange CA", 2);
  LoopbackServer server(TlsServerSettings(GetServerIdentity()), {AnswerAndClose});
  const Ref<SSLContext> right = MakeContext(GetCa());
  const Ref<SSLContext> wrong = MakeContext(stranger);
  const std::string refusal = "HttpException: Certificate of sts.test is not trusted: issuer CN=Test CA";
  EXPECT_EQ("200 OK|hello", Call(*MakeAgent(MakeSpec(server, right)), MakeGet("/")));
  EXPECT_EQ(refusal, Call(*MakeAgent(MakeSpec(server, wrong)), MakeGet("/")));
  EXPECT_EQ("200 OK|hello", Call(*MakeAgent(MakeSpec(server, right)), MakeGet("/")));
  EXPECT_EQ(refusal, Call(*MakeAgent(MakeSpec(server, wrong)), MakeGet("/")));
}

TEST(HttpTls, AsksForTheServerByNameAndForHttp11) {
  LoopbackServer server(TlsServerSettings(GetServerIdentity()), {AnswerAndClose});
  EXPECT_EQ("200 OK|hello", Call(*MakeAgent(MakeSpec(server, MakeContext(GetCa()))), MakeGet("/path")));
  EXPECT_EQ("sts.test", server.GetRecord(0).serverNameAsked);
  EXPECT_EQ("\x08http/1.1", server.GetRecord(0).protocolsAsked);
  EXPECT_EQ("GET /path HTTP/1.1\r\nHost: sts.test:" + std::to_string(server.GetPort()) +
                "\r\nAccept-Encoding: identity\r\n\r\n",
            server.GetRecord(0).received);
}

// --- Protocol versions and peers that do not speak TLS ---

TEST(HttpTls, SpeaksTls12) {
  TlsServerSettings settings(GetServerIdentity());
  settings.maxVersion = TLS1_2_VERSION;
  EXPECT_EQ("200 OK|hello", CallServer(settings, MakeContext(GetCa())));
}

TEST(HttpTls, RefusesTls11) {
  TlsServerSettings settings(GetServerIdentity());
  settings.maxVersion = TLS1_1_VERSION;
  EXPECT_EQ("HttpException: PEER does not speak TLS 1.2 or newer",
            CallServer(settings, MakeContext(GetCa())));
}

/// A call by TLS to a server that does not speak it.
std::string CallPlain(const LoopbackServer::Script& script, long long timeoutMicroseconds = kPatience) {
  LoopbackServer server({script});
  const std::string outcome =
      Call(*MakeAgent(MakeSpec(server, MakeContext(GetCa()))), MakeGet("/"), timeoutMicroseconds);
  return Replace(outcome, server.GetEndpoint(), "PEER");
}

TEST(HttpTls, RefusesPlainHttp) {
  EXPECT_EQ("HttpException: PEER does not speak TLS", CallPlain([](ServerConnection& connection) {
              connection.ReadSome();
              connection.Send("HTTP/1.1 400 Bad Request\r\nContent-Length: 0\r\n\r\n");
              connection.Close();
            }));
}

TEST(HttpTls, TellsOfAnEndDuringTheHandshake) {
  EXPECT_EQ("HttpException: PEER closed the connection during the TLS handshake",
            CallPlain([](ServerConnection& connection) {
              connection.ReadSome();
              connection.Close();
            }));
  EXPECT_EQ("HttpException: PEER reset the connection during the TLS handshake",
            CallPlain([](ServerConnection& connection) {
              connection.ReadSome();
              connection.Reset();
            }));
}

TEST(HttpTls, GivesUpOnSilenceDuringTheHandshake) {
  EXPECT_EQ("HttpTimeoutException: No answer from PEER within 0.05 s",
            CallPlain([](ServerConnection& connection) { connection.AwaitPeerEnd(); }, kSoon));
}

TEST(HttpTls, TakesAHandshakeInSingleBytes) {
  for (const int version : {TLS1_2_VERSION, TLS1_3_VERSION}) {
    TlsServerSettings settings(GetServerIdentity());
    settings.maxVersion = version;
    settings.inSingleBytes = true;
    EXPECT_EQ("200 OK|hello", CallServer(settings, MakeContext(GetCa())));
  }
}

TEST(HttpTls, GivesUpOnSilenceAnywhereInTheHandshake) {
  for (const int version : {TLS1_2_VERSION, TLS1_3_VERSION}) {
    // The record's header, the ServerHello, the certificate.
    for (const std::size_t bytes : {1, 4, 20, 90, 200, 700}) {
      TlsServerSettings settings(GetServerIdentity());
      settings.maxVersion = version;
      settings.inSingleBytes = true;
      settings.bytesBeforeSilence = bytes;
      LoopbackServer server(settings, {AnswerAndClose});
      EXPECT_EQ("HttpTimeoutException: No answer from " + server.GetEndpoint() + " within 0.05 s",
                Call(*MakeAgent(MakeSpec(server, MakeContext(GetCa()))), MakePost("/", "secret"), kSoon))
          << version << ", " << bytes;
      server.AwaitEnd(0);
      EXPECT_EQ("", server.GetRecord(0).received);
    }
  }
}

TEST(HttpTls, CancelsDuringTheHandshake) {
  LoopbackServer server({[](ServerConnection& connection) {
    connection.AwaitPeerEnd();
  }});
  const Ref<UserAgent> agent = MakeAgent(MakeSpec(server, MakeContext(GetCa())));
  Completions completions;
  Ref<PendingRequestItem> item;
  agent->SendAsync(MakeGet("/"), completions.GetFunctor(), item);
  server.AwaitConnections(1);
  item->Cancel();
  EXPECT_EQ(std::vector<std::string>{"HttpException: Request was cancelled"}, completions.AwaitOutcomes(1));
  server.AwaitEnd(0);
}

/// A call to a trusted server with this script.
std::string CallTrusted(const LoopbackServer::Script& script) {
  LoopbackServer server(TlsServerSettings(GetServerIdentity()), {script});
  return Replace(Call(*MakeAgent(MakeSpec(server, MakeContext(GetCa()))), MakeGet("/")), server.GetEndpoint(),
                 "PEER");
}

TEST(HttpTls, RefusesABodyCutOffWithoutNotice) {
  // Anyone on the way can close the TCP connection; only close_notify says that the body, which has no
  // length, is whole.
  EXPECT_EQ("HttpException: PEER closed the connection inside the body of its answer",
            CallTrusted([](ServerConnection& connection) {
              connection.ReadRequest();
              connection.Send("HTTP/1.1 200 OK\r\n\r\nhalf");
              connection.CloseWithoutNotice();
            }));
}

TEST(HttpTls, RefusesABodyCutOffWithoutNoticeOnAKeptConnection) {
  LoopbackServer server(TlsServerSettings(GetServerIdentity()), {[](ServerConnection& connection) {
                          connection.ReadRequest();
                          connection.Send(kHello);
                          connection.ReadRequest();
                          connection.Send("HTTP/1.1 200 OK\r\n\r\nhalf");
                          connection.CloseWithoutNotice();
                        }});
  const Ref<UserAgent> agent = MakeAgent(MakeSpec(server, MakeContext(GetCa())));
  EXPECT_EQ("200 OK|hello", Call(*agent, MakeGet("/")));
  EXPECT_EQ("HttpException: " + server.GetEndpoint() + " closed the connection inside the body of its answer",
            Call(*agent, MakeGet("/")));
  EXPECT_EQ(1U, server.CountConnections());
}

TEST(HttpTls, TakesABodyEndedWithNoticeOnAKeptConnection) {
  LoopbackServer server(TlsServerSettings(GetServerIdentity()), {[](ServerConnection& connection) {
                          connection.ReadRequest();
                          connection.Send(kHello);
                          connection.ReadRequest();
                          connection.Send("HTTP/1.1 200 OK\r\n\r\nwhole");
                          connection.Close();
                        }});
  const Ref<UserAgent> agent = MakeAgent(MakeSpec(server, MakeContext(GetCa())));
  EXPECT_EQ("200 OK|hello", Call(*agent, MakeGet("/")));
  EXPECT_EQ("200 OK|whole", Call(*agent, MakeGet("/")));
  EXPECT_EQ(1U, server.CountConnections());
}

TEST(HttpTls, TakesABodyEndedWithNotice) {
  EXPECT_EQ("200 OK|whole", CallTrusted([](ServerConnection& connection) {
              connection.ReadRequest();
              connection.Send("HTTP/1.1 200 OK\r\n\r\nwhole");
              connection.Close();
            }));
}

TEST(HttpTls, TellsOfAnEndBeforeTheAnswer) {
  EXPECT_EQ("HttpException: PEER closed the connection before it answered",
            CallTrusted([](ServerConnection& connection) {
              connection.ReadRequest();
              connection.CloseWithoutNotice();
            }));
  EXPECT_EQ("HttpException: PEER closed the connection before it answered",
            CallTrusted([](ServerConnection& connection) {
              connection.ReadRequest();
              connection.Close();
            }));
  EXPECT_EQ("HttpException: PEER reset the connection before it answered",
            CallTrusted([](ServerConnection& connection) {
              connection.ReadRequest();
              connection.Reset();
            }));
}

// --- Public-key pins ---

/// The pin of an identity's key, worked out apart from the code under test.
std::string MakePin(const Identity& identity) {
  unsigned char* der = nullptr;
  const int size = i2d_PUBKEY(identity.keyPair.GetHandle(), &der);
  std::vector<unsigned char> hash(32);
  EXPECT_EQ(1, EVP_Digest(der, static_cast<std::size_t>(size), hash.data(), nullptr, EVP_sha256(), nullptr));
  OPENSSL_free(der);
  return "sha256//" + Pelmar::StringUtil::Base64Encode(hash);
}

std::string CallPinned(const std::string& pins) {
  return CallServer(TlsServerSettings(GetServerIdentity()), MakeContext(GetCa()), "sts.test", pins);
}

TEST(HttpTlsPins, AcceptTheRightKey) {
  EXPECT_EQ("200 OK|hello", CallPinned(MakePin(GetServerIdentity())));
}

TEST(HttpTlsPins, AcceptTheRightKeyAmongOthers) {
  EXPECT_EQ("200 OK|hello", CallPinned(MakePin(GetCa()) + ";" + MakePin(GetServerIdentity())));
}

TEST(HttpTlsPins, RefuseAnotherKey) {
  EXPECT_EQ("HttpException: Public key of sts.test matches none of the pins", CallPinned(MakePin(GetCa())));
}

TEST(HttpTlsPins, HoldForResumedSessionsToo) {
  LoopbackServer server(TlsServerSettings(GetServerIdentity()), {AnswerAndClose});
  const Ref<ConnectionSpec> spec =
      MakeSpec(server, MakeContext(GetCa()), "sts.test", MakePin(GetServerIdentity()));
  for (std::size_t i = 0; i < 2; ++i) {
    EXPECT_EQ("200 OK|hello", Call(*MakeAgent(spec), MakePost("/", "x")));
    EXPECT_EQ(i > 0, server.GetRecord(i).wasResumed) << i;
  }
}

TEST(HttpTlsPins, DoNotReplaceTrust) {
  const Identity stranger = MakeCa("Strange CA", 2);
  EXPECT_EQ("HttpException: Certificate of sts.test is not trusted: issuer CN=Test CA",
            CallServer(TlsServerSettings(GetServerIdentity()), MakeContext(stranger), "sts.test",
                       MakePin(GetServerIdentity())));
}

template <typename Action>
std::string CatchArgumentRefusal(Action action) {
  try {
    action();
  } catch (const InvalidArgumentException& e) {
    return e.what();
  }
  return "accepted";
}

TEST(HttpTlsPins, AreCheckedAtConstruction) {
  const std::string pin = "sha256//" + std::string(43, 'A') + "=";
  const auto create = [](const std::string& pins) {
    return CatchArgumentRefusal([&] {
      CreateSSLConnectionSpec(CreateTCPConnectionSpec("a", 1), CreateSSLContext(SSLContextOptions()), "a",
                              pins);
    });
  };
  EXPECT_EQ("accepted", create(""));
  EXPECT_EQ("accepted", create(pin));
  EXPECT_EQ("accepted", create(pin + ";" + pin + ";" + pin));
  const std::string end = " is not sha256// followed by the base64 text of 32 bytes";
  const struct {
    std::string pins;
    std::string number;
  } cases[] = {
      {" ", "1"},
      {";", "1"},
      {pin + ";", "2"},
      {";" + pin, "1"},
      {pin + ";;" + pin, "2"},
      {pin + "; " + pin, "2"},
      {pin + "," + pin, "1"},
      {"SHA256//" + std::string(43, 'A') + "=", "1"},
      {"sha1//" + std::string(27, 'A') + "=", "1"},
      {"sha256//", "1"},
      {"sha256//" + std::string(43, 'A'), "1"},
      {"sha256//" + std::string(42, 'A') + "==", "1"},
      {"sha256//" + std::string(42, 'A') + "B=", "1"},
      {"sha256//" + std::string(44, 'A'), "1"},
      {"sha256//" + std::string(42, 'A') + "_=", "1"},
      {"sha256// " + std::string(43, 'A') + "=", "1"},
      {pin + "\n", "1"},
      {"/etc/passwd", "1"},
  };
  for (const auto& c : cases) {
    EXPECT_EQ("Invalid argument : public-key pin " + c.number + end, create(c.pins)) << c.pins;
  }
}

TEST(HttpTls, RefusesBadParts) {
  const Ref<ConnectionSpec> tcp = CreateTCPConnectionSpec("a", 1);
  const Ref<SSLContext> context = CreateSSLContext(SSLContextOptions());
  EXPECT_EQ("Invalid argument : the connection spec is null or was not made by this platform",
            CatchArgumentRefusal([&] { CreateSSLConnectionSpec(nullptr, context, "a", ""); }));
  EXPECT_EQ("Invalid argument : the SSL context is null or was not made by this platform",
            CatchArgumentRefusal([&] { CreateSSLConnectionSpec(tcp, nullptr, "a", ""); }));
  EXPECT_EQ("Invalid argument : the host is empty",
            CatchArgumentRefusal([&] { CreateSSLConnectionSpec(tcp, context, "", ""); }));
  EXPECT_EQ("Invalid argument : the connection spec uses TLS already", CatchArgumentRefusal([&] {
              CreateSSLConnectionSpec(CreateSSLConnectionSpec(tcp, context, "a", ""), context, "a", "");
            }));
}

// --- Client certificates ---

const Identity& GetClientCa() {
  static const Identity ca = MakeCa("Client CA", 4);
  return ca;
}

Ref<SSLContext> MakeContextWithIdentity(const Identity& identity, const std::vector<Identity>& chain = {}) {
  SSLContextOptions options;
  options.trustAnchors = Trust({GetCa()});
  options.clientKey = identity.GetKey();
  options.clientCertificate = identity.certificate;
  for (const Identity& issuer : chain) {
    options.clientCertificateChain.push_back(issuer.certificate);
  }
  return CreateSSLContext(options);
}

TlsServerSettings MakeDemandingServer(int maxVersion) {
  TlsServerSettings settings(GetServerIdentity());
  settings.clientCa = GetClientCa();
  settings.maxVersion = maxVersion;
  return settings;
}

class HttpTlsClientCertificate : public testing::TestWithParam<int> {};

INSTANTIATE_TEST_SUITE_P(Versions, HttpTlsClientCertificate, testing::Values(TLS1_2_VERSION, TLS1_3_VERSION),
                         [](const testing::TestParamInfo<int>& version) {
                           return version.param == TLS1_2_VERSION ? "Tls12" : "Tls13";
                         });

TEST_P(HttpTlsClientCertificate, IsShownOnDemand) {
  CertificateSpec spec;
  spec.keyNumber = 5;
  EXPECT_EQ("200 OK|hello", CallServer(MakeDemandingServer(GetParam()),
                                       MakeContextWithIdentity(MakeIssued(GetClientCa(), spec))));
}

TEST_P(HttpTlsClientCertificate, IsShownWithItsChain) {
  CertificateSpec spec;
  spec.commonName = "Client intermediate";
  spec.ca = true;
  spec.keyNumber = 6;
  const Identity intermediate = MakeIssued(GetClientCa(), spec);
  CertificateSpec leaf;
  leaf.keyNumber = 5;
  EXPECT_EQ("200 OK|hello",
            CallServer(MakeDemandingServer(GetParam()),
                       MakeContextWithIdentity(MakeIssued(intermediate, leaf), {intermediate})));
}

TEST_P(HttpTlsClientCertificate, IsMissedByTheServer) {
  EXPECT_EQ("HttpException: PEER demands a client certificate",
            CallServer(MakeDemandingServer(GetParam()), MakeContext(GetCa())));
}

TEST_P(HttpTlsClientCertificate, OfAnUnknownIssuerIsRefused) {
  CertificateSpec spec;
  spec.keyNumber = 5;
  EXPECT_EQ("HttpException: PEER refused the client certificate: unknown CA",
            CallServer(MakeDemandingServer(GetParam()), MakeContextWithIdentity(MakeSelfSigned(spec))));
}

// --- Sessions and connections ---

class HttpTlsSession : public testing::TestWithParam<int> {
 protected:
  static TlsServerSettings MakeSettings() {
    TlsServerSettings settings(GetServerIdentity());
    settings.maxVersion = GetParam();
    return settings;
  }
};

INSTANTIATE_TEST_SUITE_P(Versions, HttpTlsSession, testing::Values(TLS1_2_VERSION, TLS1_3_VERSION),
                         [](const testing::TestParamInfo<int>& version) {
                           return version.param == TLS1_2_VERSION ? "Tls12" : "Tls13";
                         });

TEST_P(HttpTlsSession, IsResumedByOtherUserAgentsOfTheSpec) {
  LoopbackServer server(MakeSettings(), {AnswerAndClose});
  const Ref<ConnectionSpec> spec = MakeSpec(server, MakeContext(GetCa()));
  for (std::size_t i = 0; i < 4; ++i) {
    EXPECT_EQ("200 OK|hello", Call(*MakeAgent(spec), MakePost("/", "x")));
    EXPECT_EQ(i > 0, server.GetRecord(i).wasResumed) << i;
  }
}

TEST_P(HttpTlsSession, IsNotResumedByOtherSpecs) {
  LoopbackServer server(MakeSettings(), {AnswerAndClose});
  const Ref<SSLContext> context = MakeContext(GetCa());
  for (std::size_t i = 0; i < 2; ++i) {
    EXPECT_EQ("200 OK|hello", Call(*MakeAgent(MakeSpec(server, context)), MakePost("/", "x")));
    EXPECT_FALSE(server.GetRecord(i).wasResumed) << i;
  }
}

TEST_P(HttpTlsSession, IsKeptAliveWithinAUserAgent) {
  LoopbackServer server(MakeSettings(), {AnswerAll});
  const Ref<UserAgent> agent = MakeAgent(MakeSpec(server, MakeContext(GetCa())));
  for (int i = 0; i < 3; ++i) {
    EXPECT_EQ("200 OK|hello", Call(*agent, MakePost("/", "leg")));
  }
  EXPECT_EQ(1U, server.CountConnections());
}

// The close_notify is still unread when the next request is sent.
TEST_P(HttpTlsSession, IsReplacedWhenTheServerHasClosed) {
  std::promise<void> isClosed;
  LoopbackServer server(MakeSettings(), {[&](ServerConnection& connection) {
                                           connection.ReadRequest();
                                           connection.Send(kHello);
                                           connection.EndSending();
                                           isClosed.set_value();
                                           connection.AwaitPeerEnd();
                                         },
                                         AnswerAll});
  const Ref<UserAgent> agent = MakeAgent(MakeSpec(server, MakeContext(GetCa())));
  EXPECT_EQ("200 OK|hello", Call(*agent, MakePost("/", "leg")));
  isClosed.get_future().wait();
  EXPECT_EQ("200 OK|hello", Call(*agent, MakePost("/", "leg")));
  EXPECT_EQ("200 OK|hello", Call(*agent, MakePost("/", "leg")));
  EXPECT_EQ(2U, server.CountConnections());
}

TEST_P(HttpTlsSession, IsNotReplacedForAPostThatMayHaveBeenRead) {
  LoopbackServer server(MakeSettings(), {[](ServerConnection& connection) {
                                           connection.ReadRequest();
                                           connection.Send(kHello);
                                           connection.ReadRequest();
                                           connection.CloseWithoutNotice();
                                         },
                                         AnswerAll});
  const Ref<UserAgent> agent = MakeAgent(MakeSpec(server, MakeContext(GetCa())));
  EXPECT_EQ("200 OK|hello", Call(*agent, MakePost("/", "leg")));
  EXPECT_EQ("HttpException: " + server.GetEndpoint() + " closed the connection before it answered",
            Call(*agent, MakePost("/", "leg")));
  EXPECT_EQ("200 OK|hello", Call(*agent, MakeGet("/")));
}

TEST_P(HttpTlsSession, OfTwoHundredUserAgentsAtOnce) {
  constexpr std::size_t kMany = 200;
  LoopbackServer server(MakeSettings(), {AnswerAndClose});
  const Ref<ConnectionSpec> spec = MakeSpec(server, MakeContext(GetCa()));
  Completions completions;
  for (std::size_t i = 0; i < kMany; ++i) {
    Ref<PendingRequestItem> item;
    MakeAgent(spec)->SendAsync(MakePost("/", "x"), completions.GetFunctor(), item);
  }
  EXPECT_EQ(std::vector<std::string>(kMany, "200 OK|hello"), completions.AwaitOutcomes(kMany));
}

TEST(HttpTlsCookies, AreKeptFromPlainConnectionsWhenSecure) {
  // The very same host, but in the clear; not an address, for loopback addresses count as safe.
  const std::string host = "sts.localhost";
  CertificateSpec spec = ServerSpec();
  spec.subjectAlternativeName = "DNS:" + host;
  const std::string answer =
      "HTTP/1.1 200 OK\r\nSet-Cookie: a=1; Secure\r\nSet-Cookie: b=2\r\nContent-Length: 0\r\n\r\n";
  const auto script = [&](ServerConnection& connection) {
    connection.ReadRequest();
    connection.Send(answer);
    connection.AwaitPeerEnd();
  };
  LoopbackServer secured(TlsServerSettings(MakeIssued(GetCa(), spec)), {script});
  LoopbackServer plain({script});
  const Ref<CookieStore> cookies = CreateCookieStore("");
  const Ref<ConnectionSpec> securedSpec = MakeSpec(secured, MakeContext(GetCa()), host);
  const Ref<ConnectionSpec> plainSpec = CreateTCPConnectionSpec(host, plain.GetPort());
  EXPECT_EQ("200 OK|", Call(*CreateHttpUserAgent(securedSpec, cookies, nullptr), MakeGet("/")));
  EXPECT_EQ("200 OK|", Call(*CreateHttpUserAgent(plainSpec, cookies, nullptr), MakeGet("/")));
  EXPECT_EQ("200 OK|", Call(*CreateHttpUserAgent(securedSpec, cookies, nullptr), MakeGet("/")));
  EXPECT_EQ("GET / HTTP/1.1\r\nHost: sts.localhost:" + std::to_string(plain.GetPort()) +
                "\r\nCookie: b=2\r\nAccept-Encoding: identity\r\n\r\n",
            plain.GetRecord(0).received);
  EXPECT_EQ("GET / HTTP/1.1\r\nHost: sts.localhost:" + std::to_string(secured.GetPort()) +
                "\r\nCookie: a=1; b=2\r\nAccept-Encoding: identity\r\n\r\n",
            secured.GetRecord(1).received);
}

// --- The environment ---

/// In a process of its own, for the variables are looked at when the first request is sent.
void CallWithEnvironmentAndExit(const std::string& caFile, const std::string& keyLogFile) {
  ::setenv("SSL_CERT_FILE", caFile.c_str(), 1);
  ::setenv("CURL_CA_BUNDLE", caFile.c_str(), 1);
  ::setenv("SSLKEYLOGFILE", keyLogFile.c_str(), 1);
  static LoopbackServer server(TlsServerSettings(GetServerIdentity()), {AnswerAndClose});
  const std::string trusted = Call(*MakeAgent(MakeSpec(server, MakeContext(GetCa()))), MakeGet("/"));
  const std::string untrusted =
      Call(*MakeAgent(MakeSpec(server, CreateSSLContext(SSLContextOptions()))), MakeGet("/"));
  std::ifstream keyLog(keyLogFile);
  const std::string keys((std::istreambuf_iterator<char>(keyLog)), std::istreambuf_iterator<char>());
  std::fprintf(stderr, "[%s][%s][%s]", trusted.c_str(), untrusted.c_str(), keys.c_str());
  std::exit(0);
}

TEST(HttpTlsDeathTest, TakesNothingFromTheEnvironment) {
  testing::FLAGS_gtest_death_test_style = "threadsafe";
  const TemporaryDirectory directory;
  const std::string caFile = directory.WriteFile("ca.pem", GetCa().GetCertificatePem());
  EXPECT_EXIT(CallWithEnvironmentAndExit(caFile, directory.GetPath("keys")), testing::ExitedWithCode(0),
              "^\\[200 OK\\|hello\\]"
              "\\[HttpException: Certificate of sts.test is not trusted: issuer CN=Test CA\\]\\[\\]$");
}

}  // namespace
