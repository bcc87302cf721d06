// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

// Through a proxy that others wrote: tinyproxy, started by the test on a port of its own.

#include "apps/ChildProcess.h"
#include "support/HttpScripts.h"
#include "support/LoopbackServer.h"
#include "support/TemporaryDirectory.h"

#include "devsts/Service.h"

#include <quorlin/quorlin.h>

#include <gtest/gtest.h>

#include <unistd.h>

#include <cstdlib>
#include <memory>
#include <stdexcept>
#include <string>
#include <thread>
#include <vector>

namespace {

using namespace TestSupport;
using StsTests::ChildProcess;

constexpr int kMaxStarts = 10;
constexpr const char* kProgram = "/usr/bin/tinyproxy";

/// The proxy, which lets no other machine in. It ends with its owner, also when that crashes.
class Proxy final {
 public:
  /// `settings` are further lines of its configuration.
  explicit Proxy(const std::string& settings = "") {
    if (::access(kProgram, X_OK) != 0) {
      throw std::runtime_error("there is no tinyproxy (it comes with the Debian package tinyproxy-bin)");
    }
    for (int start = 1;; ++start) {
      // Free again when it is given away: the proxy cannot be handed a socket, so another may be quicker.
      _port = ClosedPort().GetPort();
      _files.WriteFile("proxy.conf", "Port " + std::to_string(_port) +
                                         "\nListen 127.0.0.1\nAllow 127.0.0.1\nTimeout 600\nLogLevel Info\n" +
                                         settings);
      _process = std::make_unique<ChildProcess>(
          std::vector<std::string>{"/usr/bin/setpriv", "--pdeathsig", "KILL", kProgram, "-d", "-c",
                                   _files.GetPath("proxy.conf")},
          ChildProcess::Terminal::NONE);
      try {
        _process->ReadUntil("Accepting connections.");
        break;
      } catch (const std::runtime_error&) {
        if (start == kMaxStarts) {
          throw;
        }
      }
    }
  }
  Proxy(const Proxy&) = delete;
  Proxy& operator=(const Proxy&) = delete;
  ~Proxy() = default;

  std::string GetEndpoint() const { return "127.0.0.1:" + std::to_string(_port); }
  std::string GetUrl() const { return "http://" + GetEndpoint(); }
  /// What it has logged so far, as soon as `text` is in it.
  std::string ReadLogUntil(const std::string& text) { return _process->ReadUntil(text); }

 private:
  TemporaryDirectory _files;
  int _port = 0;
  std::unique_ptr<ChildProcess> _process;
};

DevSts::ServiceConfig MakeServiceConfig(bool tls) {
  DevSts::ServiceConfig config;
  config.tls = tls;
  return config;
}

Quorlin::SecurityTokenServiceConfig MakeConfig(const DevSts::Service& service) {
  Pelmar::Ssl::SSLContextOptions tls;
  tls.trustAnchors = Pelmar::Crypto::CreateCertificatesFromPem(service.GetCaCertificate());
  Quorlin::SecurityTokenServiceConfig config;
  config.stsUrl = service.GetUrl();
  config.sslContext = Pelmar::Ssl::CreateSSLContext(tls);
  config.trustedStsCertificates = Pelmar::Crypto::CreateCertificatesFromPem(service.GetSigningCertificate());
  return config;
}

std::string Acquire(const Quorlin::SecurityTokenServiceConfig& config,
                    const Quorlin::ServiceOptions& options) {
  Quorlin::TokenSpec spec;
  spec.tokenLifetimeSec = 600;
  try {
    return Quorlin::CreateSecurityTokenService(config, options)
        ->AcquireToken("alice@example.com", "secret", spec)
        ->GetSubject()
        .ToString();
  } catch (const Quorlin::CommunicationException& error) {
    return std::string("CommunicationException: ") + error.what();
  }
}

const std::string kAlice = "{Name: alice; Domain:example.com}";

Quorlin::ServiceOptions Through(const Proxy& proxy, const std::string& user = "",
                                const std::string& password = "") {
  Quorlin::ServiceOptions options;
  options.proxyUrl = proxy.GetUrl();
  options.proxyUser = user;
  options.proxyPassword = password;
  return options;
}

TEST(Proxy, TunnelsHttps) {
  const DevSts::Service service(MakeServiceConfig(true));
  Proxy proxy;
  EXPECT_EQ(Acquire(MakeConfig(service), Through(proxy)), kAlice);
  const std::string url = service.GetUrl();
  const std::string endpoint = url.substr(8, url.rfind('/') - 8);
  proxy.ReadLogUntil("CONNECT " + endpoint + " HTTP/1.1");
}

TEST(Proxy, PassesHttpOn) {
  const DevSts::Service service(MakeServiceConfig(false));
  Proxy proxy;
  EXPECT_EQ(Acquire(MakeConfig(service), Through(proxy)), kAlice);
  proxy.ReadLogUntil("POST " + service.GetUrl() + " HTTP/1.1");
}

TEST(Proxy, LetsInWhoHasCredentials) {
  const DevSts::Service tls(MakeServiceConfig(true));
  const DevSts::Service plain(MakeServiceConfig(false));
  const Proxy proxy("BasicAuth carol pass-word\n");
  EXPECT_EQ(Acquire(MakeConfig(tls), Through(proxy, "carol", "pass-word")), kAlice);
  EXPECT_EQ(Acquire(MakeConfig(plain), Through(proxy, "carol", "pass-word")), kAlice);
}

TEST(Proxy, KeepsOutWhoHasNone) {
  const DevSts::Service tls(MakeServiceConfig(true));
  const DevSts::Service plain(MakeServiceConfig(false));
  const Proxy proxy("BasicAuth carol pass-word\n");
  const std::string start = "CommunicationException: Proxy " + proxy.GetEndpoint();
  EXPECT_EQ(Acquire(MakeConfig(tls), Through(proxy)), start + " demands credentials");
  EXPECT_EQ(Acquire(MakeConfig(tls), Through(proxy, "carol", "wrong")), start + " refused the credentials");
  // It answers before it has read the request, and then resets the connection, which may take the answer
  // along.
  for (const std::string& user : {std::string(), std::string("carol")}) {
    const std::string outcome = Acquire(MakeConfig(plain), Through(proxy, user, user.empty() ? "" : "wrong"));
    const std::string prefix = "CommunicationException: ";
    EXPECT_EQ(outcome.substr(0, prefix.size()), prefix) << outcome;
  }
}

TEST(Proxy, TellsThatItDoesNotReachTheService) {
  const ClosedPort port;
  const Proxy proxy;
  const DevSts::Service service(MakeServiceConfig(true));
  Quorlin::SecurityTokenServiceConfig config = MakeConfig(service);
  config.stsUrl = "https://127.0.0.1:" + std::to_string(port.GetPort()) + "/sts";
  const std::string outcome = Acquire(config, Through(proxy));
  const std::string start =
      "CommunicationException: Proxy " + proxy.GetEndpoint() + " opens no way to the service: it answered 50";
  EXPECT_EQ(outcome.substr(0, start.size()), start) << outcome;
}

TEST(Proxy, ForbidsWhatItsRulesForbid) {
  const DevSts::Service service(MakeServiceConfig(true));
  const Proxy proxy("ConnectPort 1\n");
  EXPECT_EQ(Acquire(MakeConfig(service), Through(proxy)),
            "CommunicationException: Proxy " + proxy.GetEndpoint() +
                " opens no way to the service: it answered 403");
}

TEST(Proxy, IsNotTakenFromTheEnvironment) {
  const DevSts::Service service(MakeServiceConfig(true));
  const Proxy proxy("ConnectPort 1\n");  // Whoever goes through it fails.
  for (const char* const name : {"https_proxy", "HTTPS_PROXY", "all_proxy", "ALL_PROXY"}) {
    ::setenv(name, proxy.GetUrl().c_str(), 1);
  }
  const std::string direct = Acquire(MakeConfig(service), Quorlin::ServiceOptions());
  ::setenv("NO_PROXY", "*", 1);
  const std::string through = Acquire(MakeConfig(service), Through(proxy));
  for (const char* const name : {"https_proxy", "HTTPS_PROXY", "all_proxy", "ALL_PROXY", "NO_PROXY"}) {
    ::unsetenv(name);
  }
  EXPECT_EQ(direct, kAlice);
  EXPECT_EQ(through, "CommunicationException: Proxy " + proxy.GetEndpoint() +
                         " opens no way to the service: it answered 403");
}

TEST(Proxy, IsLeftWhenTheCallIsCancelled) {
  LoopbackServer silent({&StaySilent});
  const Proxy proxy;
  Quorlin::ServiceOptions options = Through(proxy);
  options.cancellation = Pelmar::System::CreateCancellationHandle();
  Quorlin::SecurityTokenServiceConfig config;
  config.stsUrl = "http://" + silent.GetEndpoint() + "/sts";
  std::thread canceller([&] {
    silent.AwaitRequests(1);
    options.cancellation->Cancel();
  });
  EXPECT_EQ(Acquire(config, options), "CommunicationException: The operation was cancelled.");
  canceller.join();
}

}  // namespace
