// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

// Resuming a TLS session checks no certificate: how long sessions are resumed.

#include "pelmar/http/HttpLoop.h"
#include "pelmar/http/SpecShare.h"

#include "support/HttpCalls.h"
#include "support/LoopbackServer.h"
#include "support/Pki.h"

#include <pelmar/http/Client.h>
#include <pelmar/ssl/SSLContext.h>

#include <gtest/gtest.h>
#include <openssl/ssl.h>

#include <atomic>
#include <cstdint>
#include <ctime>
#include <memory>
#include <string>
#include <vector>

namespace {

using namespace TestSupport;
using namespace Pelmar::Http;
using Pelmar::Ref;

TEST(SpecShare, GivesAllExchangesTheSameUntilTheSessionsExpire) {
  SpecShare share;
  const SharedState first = share.Get(1000);
  EXPECT_EQ(first.handle, share.Get(5000).handle);
  first.expiry->Limit(2000);
  first.expiry->Limit(3000);
  EXPECT_EQ(first.handle, share.Get(2000).handle);
  const SharedState second = share.Get(2001);
  EXPECT_NE(first.handle, second.handle);
  EXPECT_EQ(second.handle, share.Get(9000).handle);
}

TEST(SpecShare, HearsOfSessionsOfConnectionsFromBefore) {
  SpecShare share;
  const SharedState before = share.Get(1000);
  before.expiry->Limit(1000);
  const SharedState after = share.Get(1001);
  // A connection of old brings a session into the new store.
  before.expiry->Limit(1000);
  EXPECT_NE(after.handle, share.Get(1001).handle);
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

CertificateSpec MakeSpecUntil(const std::string& name, long long notAfter) {
  CertificateSpec spec;
  spec.commonName = name;
  spec.notAfter = notAfter;
  spec.extendedKeyUsage = "serverAuth";
  spec.subjectAlternativeName = "DNS:sts.test";
  return spec;
}

/// The HTTP thread with a clock that the test sets, and a server to which each exchange makes a connection of
/// its own.
class Client final {
 public:
  explicit Client(const TlsServerSettings& settings, const Identity& anchor = GetCa())
      : _server(settings, {AnswerAndClose}),
        _spec(ToConnectionSpecImpl(MakeConnectionSpec(_server.GetPort(), anchor).Get())),
        _loop([](const boost::function<void()>& work) { work(); }, [this] { return _now.load(); }) {}

  /// Whether an exchange, `seconds` from now by the clock of the sessions, resumed one.
  bool Resumes(long long seconds) {
    _now = std::time(nullptr) + seconds;
    const AgentParts agent{++_lastAgent, _spec, Pelmar::MakeRef<CookieStoreImpl>(),
                           std::make_shared<const AgentOptions>(ClientOptions())};
    const Ref<Exchange> exchange =
        Exchange::Create(agent, RequestParts{METHOD_GET, "/", {}, {}},
                         [](const Pelmar::Exception*, ClientResponse*, PendingRequestItem*) {});
    _loop.Submit(exchange);
    exchange->Wait(-1);
    EXPECT_EQ("200 OK|hello", Describe(*exchange->GetResult()));
    _server.AwaitEnd(_connections);
    return _server.GetRecord(_connections++).wasResumed;
  }

 private:
  static Ref<ConnectionSpec> MakeConnectionSpec(int port, const Identity& anchor) {
    Pelmar::Ssl::SSLContextOptions options;
    options.trustAnchors = Trust({anchor});
    return CreateSSLConnectionSpec(CreateTCPConnectionSpec("127.0.0.1", port),
                                   Pelmar::Ssl::CreateSSLContext(options), "sts.test", "");
  }

  LoopbackServer _server;
  const Ref<const ConnectionSpecImpl> _spec;
  std::atomic<long long> _now{0};
  std::uint64_t _lastAgent = 0;
  std::size_t _connections = 0;
  HttpLoop _loop;
};

class SessionExpiryTest : public testing::TestWithParam<int> {
 protected:
  static TlsServerSettings MakeSettings(const Identity& identity) {
    TlsServerSettings settings(identity);
    settings.maxVersion = GetParam();
    return settings;
  }
};

INSTANTIATE_TEST_SUITE_P(Versions, SessionExpiryTest, testing::Values(TLS1_2_VERSION, TLS1_3_VERSION),
                         [](const testing::TestParamInfo<int>& version) {
                           return version.param == TLS1_2_VERSION ? "Tls12" : "Tls13";
                         });

TEST_P(SessionExpiryTest, ResumesNoSessionBeyondTheCertificate) {
  Client client(MakeSettings(MakeIssued(GetCa(), MakeSpecUntil("sts.test", kDay))));
  EXPECT_FALSE(client.Resumes(0));
  EXPECT_TRUE(client.Resumes(0));
  EXPECT_TRUE(client.Resumes(kDay - kHour));
  EXPECT_FALSE(client.Resumes(kDay + kHour));
  // By the verifier's clock the certificate is still good, so there is a new session, which has not much
  // time.
  EXPECT_FALSE(client.Resumes(kDay + kHour));
  EXPECT_TRUE(client.Resumes(kDay - kHour));
}

TEST_P(SessionExpiryTest, ResumesNoSessionBeyondAnIntermediate) {
  CertificateSpec spec = MakeSpecUntil("Intermediate", kDay);
  spec.ca = true;
  spec.keyNumber = 2;
  spec.extendedKeyUsage = "";
  spec.subjectAlternativeName = "";
  const Identity intermediate = MakeIssued(GetCa(), spec);
  TlsServerSettings settings = MakeSettings(MakeIssued(intermediate, MakeSpecUntil("sts.test", 9 * kDay)));
  settings.chain = {intermediate};
  Client client(settings);
  EXPECT_FALSE(client.Resumes(0));
  EXPECT_TRUE(client.Resumes(kDay - kHour));
  EXPECT_FALSE(client.Resumes(kDay + kHour));
}

TEST_P(SessionExpiryTest, ResumesNoSessionBeyondTheAnchor) {
  CertificateSpec spec = MakeSpecUntil("Short-lived CA", kDay);
  spec.ca = true;
  spec.keyNumber = 4;
  spec.extendedKeyUsage = "";
  spec.subjectAlternativeName = "";
  const Identity anchor = MakeSelfSigned(spec);
  Client client(MakeSettings(MakeIssued(anchor, MakeSpecUntil("sts.test", 9 * kDay))), anchor);
  EXPECT_FALSE(client.Resumes(0));
  EXPECT_TRUE(client.Resumes(kDay - kHour));
  EXPECT_FALSE(client.Resumes(kDay + kHour));
}

TEST_P(SessionExpiryTest, ASessionThatCameWithAResumedConnectionIsNoYounger) {
  Client client(MakeSettings(MakeIssued(GetCa(), MakeSpecUntil("sts.test", kDay))));
  EXPECT_FALSE(client.Resumes(0));
  for (int i = 0; i < 4; ++i) {
    EXPECT_TRUE(client.Resumes(kDay - kHour));
  }
  EXPECT_FALSE(client.Resumes(kDay + kHour));
}

}  // namespace
