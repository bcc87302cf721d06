// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

// quorlin get-token.

#include "apps/ChildProcess.h"
#include "apps/Cli.h"
#include "support/Pki.h"

#include <pelmar/crypto/Digest.h>
#include <quorlin/quorlin.h>

#include <gtest/gtest.h>

#include <sys/stat.h>

#include <atomic>
#include <filesystem>
#include <memory>
#include <mutex>
#include <regex>
#include <string>
#include <vector>

namespace {

using namespace StsTests;
using TestSupport::ProcessResult;

/// A service that counts its requests, which knows the owner of a key; and a place for caches.
class World {
 public:
  World() : _identity(MakeRobot()), _world(MakeConfig()) {
    _world.GetFiles().WriteFile("cert.pem", _identity.GetCertificatePem());
    _world.GetFiles().WriteFile("key.pem", _identity.GetKeyPem());
    _world.GetFiles().WriteFile("password", "secret\n");
    _world.GetFiles().WriteFile("wrong", "guess\n");
  }

  ProcessResult Run(const std::vector<std::string>& more) const { return RunCli(MakeArguments(more)); }
  ProcessResult RunByPassword(const std::vector<std::string>& more = {}) const {
    return Run(With({"--user", "alice@example.com", "--password-file", GetPath("password")}, more));
  }
  ProcessResult RunByKey(const std::vector<std::string>& more = {}) const {
    return Run(With({"--cert", GetPath("cert.pem"), "--key", GetPath("key.pem")}, more));
  }

  std::vector<std::string> MakeArguments(const std::vector<std::string>& more) const {
    return With({"get-token", "--cache", GetPath("cache"), "--url", _world.Get().GetUrl(), "--ca",
                 GetPath("ca.pem"), "--sts-cert", GetPath("sts.pem")},
                more);
  }

  static std::vector<std::string> With(std::vector<std::string> first, const std::vector<std::string>& more) {
    first.insert(first.end(), more.begin(), more.end());
    return first;
  }

  std::string GetPath(const std::string& name) const { return _world.GetFiles().GetPath(name); }
  std::string ReadCache() const { return _world.GetFiles().ReadFile("cache"); }
  /// Puts another token into the cache, which says that it is for the same.
  void ExchangeToken(const std::string& xml) const {
    const std::string cache = ReadCache();
    _world.GetFiles().WriteFile("cache", xml + cache.substr(cache.rfind("\n<!--")));
  }
  int CountRequests() const { return _requests; }
  /// What the last request asked for, in the service's words.
  std::string GetLastOperation() const {
    const std::lock_guard<std::mutex> lock(_mutex);
    return _lastOperation;
  }

  /// The owner of the key's token, with another lifetime.
  std::string AcquireShort(long long lifetimeSec, bool byKey) {
    Pelmar::Ssl::SSLContextOptions tls;
    tls.caFile = GetPath("ca.pem");
    Quorlin::SecurityTokenServiceConfig config;
    config.stsUrl = _world.Get().GetUrl();
    config.sslContext = Pelmar::Ssl::CreateSSLContext(tls);
    config.trustedStsCertificates =
        Pelmar::Crypto::CreateCertificatesFromPem(_world.Get().GetSigningCertificate());
    if (byKey) {
      config.holderOfKeyConfig = Quorlin::HolderOfKeyConfig{_identity.GetKey(), _identity.certificate};
    }
    Quorlin::TokenSpec spec;
    spec.tokenLifetimeSec = lifetimeSec;
    spec.renewable = true;
    const auto service = Quorlin::CreateSecurityTokenService(config);
    const auto token = byKey ? service->AcquireTokenByCertificate(spec)
                             : service->AcquireToken("alice@example.com", "secret", spec);
    _requests = 0;
    return token->ToXml();
  }

  void StopService() { const_cast<DevSts::Service&>(_world.Get()).Stop(); }

 private:
  static TestSupport::Identity MakeRobot() {
    TestSupport::CertificateSpec spec;
    spec.commonName = "robot";
    return TestSupport::MakeSelfSigned(spec);
  }

  DevSts::ServiceConfig MakeConfig() {
    DevSts::User robot;
    robot.name = "robot";
    robot.domain = "example.com";
    robot.certificates = {Pelmar::Crypto::ToHex(_identity.certificate->GetSha256())};
    DevSts::User alice;
    alice.name = "alice";
    alice.domain = "example.com";
    alice.password = "secret";
    DevSts::ServiceConfig config;
    config.directory = DevSts::Directory({robot, alice});
    config.log = [this](const std::string& line) {
      ++_requests;
      const std::string name = "\"operation\":\"";
      const std::size_t place = line.find(name);
      if (place != std::string::npos) {
        const std::size_t start = place + name.size();
        const std::lock_guard<std::mutex> lock(_mutex);
        _lastOperation = line.substr(start, line.find('"', start) - start);
      }
    };
    return config;
  }

  std::atomic<int> _requests{0};
  mutable std::mutex _mutex;
  std::string _lastOperation;  // Guarded by the mutex.
  TestSupport::Identity _identity;
  ServiceWithFiles _world;
};

constexpr const char* kTrailerPattern = "\n<!-- quorlin get-token [0-9a-f]{64} -->\n$";

TEST(CliGetToken, PrintsTheTokenAndKeepsIt) {
  const World world;
  const ProcessResult result = world.RunByPassword();
  EXPECT_EQ(result.standardError, "");
  EXPECT_EQ(result.exitCode, 0);
  EXPECT_EQ(std::regex_replace(world.ReadCache(), std::regex(kTrailerPattern), "\n"), result.standardOutput);
  struct stat status;
  ASSERT_EQ(stat(world.GetPath("cache").c_str(), &status), 0);
  EXPECT_EQ(status.st_mode & 07777U, 0600U);
  const ProcessResult verified =
      RunCli({"verify", "--trust", world.GetPath("sts.pem"), world.GetPath("cache")});
  EXPECT_EQ(verified.exitCode, 0) << verified.standardError;
}

TEST(CliGetToken, AsksNobodyWhileTheTokenIsGood) {
  const World world;
  const ProcessResult first = world.RunByPassword();
  // A wrong password would be found out.
  const ProcessResult second =
      world.Run({"--user", "alice@example.com", "--password-file", world.GetPath("wrong")});
  EXPECT_EQ(second.standardOutput, first.standardOutput);
  EXPECT_EQ(second.standardError, "");
  EXPECT_EQ(second.exitCode, 0);
  EXPECT_EQ(world.CountRequests(), 1);
}

TEST(CliGetToken, NeedsNoKeyWhileTheTokenIsGood) {
  const World world;
  const ProcessResult first = world.RunByKey();
  ASSERT_EQ(first.exitCode, 0) << first.standardError;
  std::filesystem::remove(world.GetPath("key.pem"));
  const ProcessResult second = world.RunByKey();
  EXPECT_EQ(second.standardOutput, first.standardOutput);
  EXPECT_EQ(second.standardError, "");
  EXPECT_EQ(second.exitCode, 0);
}

TEST(CliGetToken, GetsAnotherTokenForWhomeverElseOrWhateverElseItIs) {
  const World world;
  std::vector<std::string> tokens = {world.RunByPassword().standardOutput};
  for (const std::vector<std::string>& more : std::vector<std::vector<std::string>>{
           {"--audience", "urn:a"},
           {"--audience", "urn:b"},
           {"--lifetime", "700"},
           {"--renewable"},
           {"--delegable"},
           {"--cert", world.GetPath("cert.pem"), "--key", world.GetPath("key.pem")}}) {
    tokens.push_back(world.RunByPassword(more).standardOutput);
    EXPECT_NE(tokens.back(), tokens[tokens.size() - 2]);
    EXPECT_EQ(world.CountRequests(), static_cast<int>(tokens.size()));
    EXPECT_EQ(world.RunByPassword(more).standardOutput, tokens.back());
    EXPECT_EQ(world.CountRequests(), static_cast<int>(tokens.size()));
  }
  EXPECT_EQ(world.RunByKey().exitCode, 0);
  EXPECT_EQ(world.CountRequests(), static_cast<int>(tokens.size()) + 1);
}

TEST(CliGetToken, ReplacesATokenThatWillSoonEnd) {
  World world;
  world.RunByPassword();
  world.ExchangeToken(world.AcquireShort(50, false));
  const ProcessResult result = world.RunByPassword();
  EXPECT_EQ(result.standardError, "");
  EXPECT_EQ(result.exitCode, 0);
  EXPECT_EQ(world.CountRequests(), 1);
  EXPECT_EQ(world.GetLastOperation(), "issue");
  EXPECT_EQ(std::regex_replace(world.ReadCache(), std::regex(kTrailerPattern), "\n"), result.standardOutput);
}

TEST(CliGetToken, RenewsATokenThatIsBoundToTheKey) {
  World world;
  world.RunByKey({"--renewable"});
  world.ExchangeToken(world.AcquireShort(50, true));
  const ProcessResult result = world.RunByKey({"--renewable"});
  EXPECT_EQ(result.standardError, "");
  EXPECT_EQ(result.exitCode, 0);
  EXPECT_EQ(world.CountRequests(), 1);
  EXPECT_EQ(world.GetLastOperation(), "renew");
}

TEST(CliGetToken, GivesTheOldTokenWhileItHoldsWhenThereIsNoNewOne) {
  World world;
  world.RunByPassword();
  const std::string token = world.AcquireShort(50, false);
  world.ExchangeToken(token);
  const std::string kept = world.ReadCache();
  const ProcessResult result =
      world.Run({"--user", "alice@example.com", "--password-file", world.GetPath("wrong")});
  EXPECT_EQ(result.standardOutput, token + "\n");
  EXPECT_EQ(
      std::regex_replace(result.standardError, std::regex("ends at [0-9T:.-]*Z"), "ends at DATE"),
      "quorlin: warning: there is no new token: Authentication failed: Invalid user name or password; the old "
      "one ends at DATE\n");
  EXPECT_EQ(result.exitCode, 0);
  EXPECT_EQ(world.ReadCache(), kept);
}

TEST(CliGetToken, WithoutATokenSaysWhyThereIsNone) {
  World world;
  const ProcessResult wrong =
      world.Run({"--user", "alice@example.com", "--password-file", world.GetPath("wrong")});
  EXPECT_EQ(wrong.standardOutput, "");
  EXPECT_EQ(wrong.standardError,
            "quorlin: Authentication failed: Invalid user name or password (InvalidCredentialsException)\n"
            "Check the user name and the password.\n");
  EXPECT_EQ(wrong.exitCode, 1);
  world.StopService();
  EXPECT_EQ(world.RunByPassword().exitCode, 3);
  EXPECT_FALSE(std::filesystem::exists(world.GetPath("cache")));
}

TEST(CliGetToken, UsesNoTokenThatWasTamperedWith) {
  const World world;
  const std::string good = world.RunByPassword().standardOutput;
  const std::string changed =
      std::regex_replace(good.substr(0, good.size() - 1), std::regex("alice@"), "admin@");
  ASSERT_NE(changed + "\n", good);
  world.ExchangeToken(changed);
  const ProcessResult result = world.RunByPassword();
  EXPECT_EQ(result.standardError,
            "quorlin: warning: the token in " + world.GetPath("cache") +
                " is not used: Failed to verify signature: token might have been tampered "
                "with.\n");
  EXPECT_EQ(result.exitCode, 0);
  EXPECT_NE(result.standardOutput, changed + "\n");
  EXPECT_EQ(world.CountRequests(), 2);
}

TEST(CliGetToken, TouchesNoFileThatIsNoCache) {
  const World world;
  const std::string path = world.GetPath("cert.pem");
  ASSERT_EQ(chmod(path.c_str(), 0600), 0);
  std::vector<std::string> arguments =
      world.MakeArguments({"--user", "alice@example.com", "--password-file", world.GetPath("password")});
  arguments[2] = path;
  const ProcessResult result = RunCli(arguments);
  EXPECT_EQ(result.standardError,
            "quorlin: cannot use " + path + ": it is no token cache (UsageException)\n");
  EXPECT_EQ(result.exitCode, 2);
  EXPECT_EQ(world.CountRequests(), 0);
}

TEST(CliGetToken, RefusesANewTokenThatEndsTooSoon) {
  DevSts::ServiceConfig config;
  config.handler.lifetime.maxSec = 300;
  const ServiceWithFiles service(config);
  const TestSupport::TemporaryDirectory files;
  const ProcessResult result = RunCli(
      {"get-token", "--cache", files.GetPath("cache"), "--url", service.Get().GetUrl(), "--ca",
       service.GetFiles().GetPath("ca.pem"), "--sts-cert", service.GetFiles().GetPath("sts.pem"), "--user",
       "alice@example.com", "--password-file", files.WriteFile("password", "secret"), "--min-life", "400"});
  EXPECT_EQ(std::regex_replace(result.standardError, std::regex("at [0-9T:.-]*Z"), "at DATE"),
            "quorlin: the new token ends at DATE, which is before --min-life (SsoException)\n");
  EXPECT_EQ(result.exitCode, 1);
  EXPECT_FALSE(std::filesystem::exists(files.GetPath("cache")));
}

TEST(CliGetToken, NeedsAWayToGetAToken) {
  const World world;
  const ProcessResult result = world.Run({});
  EXPECT_EQ(
      result.standardError,
      "quorlin: say how to get a token: with --user, with --gss, or with --cert and --key or --pkcs12 (UsageException)\n");
  EXPECT_EQ(result.exitCode, 2);
}

TEST(CliGetToken, RefusesFlagsThatMeanNothing) {
  const World world;
  const ProcessResult ticket = world.RunByPassword({"--ccache", "FILE:/nonexistent"});
  EXPECT_EQ(ticket.standardError,
            "quorlin: --target, --principal and --ccache need --gss (UsageException)\n");
  EXPECT_EQ(ticket.exitCode, 2);
  const ProcessResult password = world.RunByKey({"--password-stdin"});
  EXPECT_EQ(password.standardError,
            "quorlin: --password-file and --password-stdin need --user (UsageException)\n");
  EXPECT_EQ(password.exitCode, 2);
}

TEST(CliGetToken, NeedsALifeThatATokenCanHave) {
  const World world;
  for (const char* life : {"-1", "600"}) {
    const ProcessResult result = world.RunByPassword({"--min-life", life});
    EXPECT_EQ(result.standardError,
              "quorlin: --min-life must be from 0 to less than --lifetime (UsageException)\n");
    EXPECT_EQ(result.exitCode, 2);
  }
}

TEST(CliGetToken, RunsTogetherMakeOneRequest) {
  const World world;
  std::vector<std::unique_ptr<ChildProcess>> children;
  for (int i = 0; i < 8; ++i) {
    children.push_back(std::make_unique<ChildProcess>(
        MakeCommand(world.MakeArguments(
            {"--user", "alice@example.com", "--password-file", world.GetPath("password")})),
        ChildProcess::Terminal::NONE));
  }
  const std::string token = children.front()->ReadAll();
  EXPECT_NE(token, "");
  for (const auto& child : children) {
    EXPECT_EQ(child->ReadAll(), token);
    EXPECT_EQ(child->Wait(), 0);
  }
  EXPECT_EQ(world.CountRequests(), 1);
}

// ---- --exec ----

TEST(CliGetToken, RunsAProgramWithTheTokensPath) {
  const World world;
  const ProcessResult result =
      world.RunByPassword({"--exec", "/bin/sh", "--", "-c",
                           "printf '%s|%s|%s' \"$QUORLIN_TOKEN_FILE\" \"$0\" \"$1\"", "zero", "-o"});
  EXPECT_EQ(result.standardOutput, world.GetPath("cache") + "|zero|-o");
  EXPECT_EQ(result.standardError, "");
  EXPECT_EQ(result.exitCode, 0);
}

TEST(CliGetToken, EndsAsTheProgramEnds) {
  const World world;
  EXPECT_EQ(world.RunByPassword({"--exec", "sh", "--", "-c", "exit 42"}).exitCode, 42);
}

TEST(CliGetToken, LeavesNoDescriptorToTheProgram) {
  const World world;
  const std::string count = "ls /proc/self/fd | wc -l";
  const ProcessResult direct = TestSupport::RunProcess({"sh", "-c", count});
  EXPECT_EQ(world.RunByPassword({"--exec", "sh", "--", "-c", count}).standardOutput, direct.standardOutput);
}

TEST(CliGetToken, RunsNoProgramWithoutAToken) {
  const World world;
  const ProcessResult result = world.Run({"--user", "alice@example.com", "--password-file",
                                          world.GetPath("wrong"), "--exec", "/bin/echo", "ran"});
  EXPECT_EQ(result.standardOutput, "");
  EXPECT_EQ(result.exitCode, 1);
}

TEST(CliGetToken, SaysThatTheProgramCannotBeRun) {
  const World world;
  const ProcessResult result = world.RunByPassword({"--exec", "/nonexistent/program"});
  EXPECT_EQ(result.standardError,
            "quorlin: cannot run /nonexistent/program: No such file or directory (UsageException)\n");
  EXPECT_EQ(result.exitCode, 2);
}

TEST(CliGetToken, TakesNoArgumentsForNoProgram) {
  const World world;
  const ProcessResult result = world.RunByPassword({"report.txt"});
  EXPECT_EQ(result.standardOutput, "");
  EXPECT_EQ(result.standardError, "quorlin: arguments requires --exec\nTry quorlin get-token --help\n");
  EXPECT_EQ(result.exitCode, 2);
}

}  // namespace
