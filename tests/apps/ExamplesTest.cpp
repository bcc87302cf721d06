// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

// The example programs, run as their users would run them, and the README's code, which is cut from one of
// them.

#include "apps/ChildProcess.h"
#include "support/HttpScripts.h"
#include "support/LoopbackServer.h"
#include "support/HttpCalls.h"
#include "support/Pki.h"
#include "support/Process.h"
#include "support/TemporaryDirectory.h"

#include "devsts/Service.h"

#include <pelmar/crypto/Digest.h>
#include <quorlin/quorlin.h>

#include <gtest/gtest.h>

#include <chrono>
#include <fstream>
#include <iterator>
#include <regex>
#include <sstream>
#include <string>
#include <vector>

namespace {

using TestSupport::ProcessResult;

std::string ReadProjectFile(const std::string& name) {
  const std::string path = std::string(QUORLIN_PROJECT_DIR) + "/" + name;
  std::ifstream file(path, std::ios::binary);
  EXPECT_TRUE(file) << path;
  return std::string(std::istreambuf_iterator<char>(file), std::istreambuf_iterator<char>());
}

std::string GetExamplePath(const std::string& name) {
  return std::string(QUORLIN_EXAMPLES_DIR) + "/" + name;
}

/// A running service, and the files that its clients need.
class World final {
 public:
  explicit World(const DevSts::ServiceConfig& config = DevSts::ServiceConfig()) : _service(config) {
    WriteFile("ca.pem", _service.GetCaCertificate());
    WriteFile("sts.pem", _service.GetSigningCertificate());
  }

  /// Runs an example that takes URL, CA.pem and STS.pem first.
  ProcessResult RunClient(const std::string& name, const std::vector<std::string>& more,
                          const std::string& standardInput) const {
    std::vector<std::string> command = {GetExamplePath(name), _service.GetUrl(), GetPath("ca.pem"),
                                        GetPath("sts.pem")};
    command.insert(command.end(), more.begin(), more.end());
    return TestSupport::RunProcess(command, standardInput);
  }

  std::string GetPath(const std::string& name) const { return _files.GetPath(name); }
  std::string WriteFile(const std::string& name, const std::string& content) const {
    return _files.WriteFile(name, content);
  }
  const std::string& GetUrl() const { return _service.GetUrl(); }
  DevSts::Service& GetService() { return _service; }

  /// Set up with the client's own key, if `identity` is given.
  Quorlin::SecurityTokenServiceConfig MakeClientConfig(
      const TestSupport::Identity* identity = nullptr) const {
    Pelmar::Ssl::SSLContextOptions tls;
    tls.caFile = GetPath("ca.pem");
    Quorlin::SecurityTokenServiceConfig config;
    config.stsUrl = _service.GetUrl();
    config.sslContext = Pelmar::Ssl::CreateSSLContext(tls);
    config.trustedStsCertificates =
        Pelmar::Crypto::CreateCertificatesFromPem(_service.GetSigningCertificate());
    if (identity != nullptr) {
      config.holderOfKeyConfig = Quorlin::HolderOfKeyConfig{identity->GetKey(), identity->certificate};
    }
    return config;
  }

 private:
  DevSts::Service _service;
  TestSupport::TemporaryDirectory _files;
};

ProcessResult AcquireByPassword(const World& world, const std::string& password) {
  return world.RunClient("acquireByPassword", {"alice@example.com"}, password + "\n");
}

/// Each match of `pattern` replaced by `mask`.
std::string Mask(const std::string& text, const std::string& pattern, const std::string& mask) {
  return std::regex_replace(text, std::regex(pattern), mask);
}

constexpr const char* kDatePattern = "[0-9]{4}-[0-9]{2}-[0-9]{2}T[0-9:.]*Z";
constexpr const char* kUuidPattern = "_?[0-9a-f]{8}(-[0-9a-f]{4}){3}-[0-9a-f]{12}";

TestSupport::Identity MakeRobot() {
  TestSupport::CertificateSpec spec;
  spec.commonName = "robot";
  return TestSupport::MakeSelfSigned(spec);
}

DevSts::ServiceConfig MakeConfigWith(const TestSupport::Identity& identity) {
  DevSts::User robot;
  robot.name = "robot";
  robot.domain = "example.com";
  robot.certificates = {Pelmar::Crypto::ToHex(identity.certificate->GetSha256())};
  DevSts::ServiceConfig config;
  config.directory = DevSts::Directory({robot});
  return config;
}

/// A service that knows robot by certificate, and robot's files.
class RobotWorld final {
 public:
  RobotWorld() : _identity(MakeRobot()), _world(MakeConfigWith(_identity)) {
    _world.WriteFile("cert.pem", _identity.GetCertificatePem());
    _world.WriteFile("key.pem", _identity.GetKeyPem());
  }

  ProcessResult Renew(long long lifetimeSec, const std::string& work) const {
    return TestSupport::RunProcess(MakeRenew(lifetimeSec), work);
  }

  /// The command that Renew runs.
  std::vector<std::string> MakeRenew(long long lifetimeSec) const {
    return {GetExamplePath("renewHolderOfKey"), _world.GetUrl(),
            _world.GetPath("ca.pem"),           _world.GetPath("sts.pem"),
            _world.GetPath("cert.pem"),         _world.GetPath("key.pem"),
            std::to_string(lifetimeSec)};
  }

  /// Lets another program sign with the key in this file.
  ProcessResult AcquireWithKeyService(const std::string& keyFile) const {
    return _world.RunClient("acquireWithKeyService",
                            {_world.GetPath("cert.pem"), "openssl", "dgst", "-sha256", "-sign", keyFile}, "");
  }

  const TestSupport::Identity& GetIdentity() const { return _identity; }
  World& GetWorld() { return _world; }

 private:
  TestSupport::Identity _identity;
  World _world;
};

/// The validating server's verdict on `token`, for which it needs the service's certificate alone.
ProcessResult ValidateReceived(const World& world, const std::string& token,
                               const std::vector<std::string>& more = {}) {
  std::vector<std::string> command = {GetExamplePath("validateReceivedToken"), world.GetPath("sts.pem"),
                                      "urn:example:files"};
  command.insert(command.end(), more.begin(), more.end());
  return TestSupport::RunProcess(command, token);
}

std::string AcquireFor(const World& world, const std::string& audience) {
  Quorlin::TokenSpec spec;
  spec.tokenLifetimeSec = 600;
  spec.audienceRestriction = {audience};
  return Quorlin::CreateSecurityTokenService(world.MakeClientConfig())
      ->AcquireToken("alice@example.com", "secret", spec)
      ->ToXml();
}

// The lines between the two markers, with the indentation of the first taken off each.
std::string CutSnippet(const std::string& source) {
  std::istringstream lines(source);
  std::string line;
  std::string snippet;
  bool isInside = false;
  while (std::getline(lines, line)) {
    if (line == "  // README-END") {
      return snippet;
    }
    if (isInside) {
      snippet += (line.empty() ? line : line.substr(2)) + "\n";
    }
    isInside = isInside || line == "  // README-BEGIN";
  }
  return std::string();
}

TEST(Examples, AcquireByPasswordPrintsWhomTheTokenIsFor) {
  const World world;
  const ProcessResult result = AcquireByPassword(world, "secret");
  EXPECT_EQ(result.exitCode, 0);
  EXPECT_EQ(result.standardError, "");
  const std::string end = "Z\n";
  ASSERT_GT(result.standardOutput.size(), end.size());
  EXPECT_EQ(result.standardOutput.substr(0, result.standardOutput.find(" until ")),
            "{Name: alice; Domain:example.com}");
  EXPECT_EQ(result.standardOutput.substr(result.standardOutput.size() - end.size()), end);
}

TEST(Examples, AcquireByPasswordSaysWhyThereIsNoToken) {
  const World world;
  const ProcessResult result = AcquireByPassword(world, "wrong");
  EXPECT_EQ(result.exitCode, 1);
  EXPECT_EQ(result.standardOutput, "");
  EXPECT_EQ(result.standardError, "Authentication failed: Invalid user name or password\n");
}

TEST(Examples, AcquireWithKeyServiceLetsAnotherProgramSign) {
  RobotWorld robot;
  const ProcessResult result = robot.AcquireWithKeyService(robot.GetWorld().GetPath("key.pem"));
  EXPECT_EQ(result.standardError, "");
  EXPECT_EQ(result.standardOutput, "acquired a token for {Name: robot; Domain:example.com}\n");
  EXPECT_EQ(result.exitCode, 0);
}

TEST(Examples, AcquireWithKeyServiceSendsNothingThatAWrongKeySigned) {
  RobotWorld robot;
  const TestSupport::KeyPair other = TestSupport::KeyPair::Get(TestSupport::KeyKind::RSA_2048, 7);
  const ProcessResult result =
      robot.AcquireWithKeyService(robot.GetWorld().WriteFile("other.pem", other.ToPem()));
  EXPECT_EQ(result.standardError,
            "The signing function gave a value that the certificate's key does not verify\n");
  EXPECT_EQ(result.standardOutput, "");
  EXPECT_EQ(result.exitCode, 1);
}

TEST(Examples, RenewHolderOfKeyRenewsATokenThatWillSoonEnd) {
  const RobotWorld robot;
  const ProcessResult result = robot.Renew(30, "sweep\nmow\n");
  EXPECT_EQ(result.standardError, "");
  EXPECT_EQ(Mask(result.standardOutput, kUuidPattern, "ID"),
            "acquired ID\n"
            "sweep as {Name: robot; Domain:example.com}\n"
            "renewed ID\n"
            "mow as {Name: robot; Domain:example.com}\n");
  EXPECT_EQ(result.exitCode, 0);
}

TEST(Examples, RenewHolderOfKeyKeepsATokenThatHoldsLongEnough) {
  const RobotWorld robot;
  const ProcessResult result = robot.Renew(600, "sweep\nmow\n");
  EXPECT_EQ(result.standardError, "");
  EXPECT_EQ(Mask(result.standardOutput, kUuidPattern, "ID"),
            "acquired ID\n"
            "sweep as {Name: robot; Domain:example.com}\n"
            "mow as {Name: robot; Domain:example.com}\n");
  EXPECT_EQ(result.exitCode, 0);
}

TEST(Examples, RenewHolderOfKeyWorksOnWhileTheServiceIsAway) {
  RobotWorld robot;
  StsTests::ChildProcess child(robot.MakeRenew(30), StsTests::ChildProcess::Terminal::OWN);
  child.Type("sweep\n");
  child.ReadUntil("sweep as {Name: robot; Domain:example.com}\r\n");
  robot.GetWorld().GetService().Stop();
  child.Type("mow\n");
  const std::string output = child.ReadUntil("mow as {Name: robot; Domain:example.com}\r\n");
  EXPECT_EQ(Mask(Mask(output, kUuidPattern, "ID"), "127[.]0[.]0[.]1:[0-9]+", "SERVICE"),
            "sweep\r\n"
            "acquired ID\r\n"
            "sweep as {Name: robot; Domain:example.com}\r\n"
            "mow\r\n"
            "not renewed: Connection refused by SERVICE\r\n"
            "mow as {Name: robot; Domain:example.com}\r\n");
  child.Type("\x04");
  EXPECT_EQ(child.Wait(), 0);
}

TEST(Examples, RenewHolderOfKeySaysThatTheLifetimeIsBad) {
  const RobotWorld robot;
  const ProcessResult result = robot.Renew(0, "sweep\n");
  EXPECT_EQ(result.standardError, "Invalid argument : Token lifetime must be positive\n");
  EXPECT_EQ(result.standardOutput, "");
  EXPECT_EQ(result.exitCode, 1);
}

TEST(Examples, ValidateReceivedTokenWelcomesTheSubject) {
  const World world;
  const ProcessResult result = ValidateReceived(world, AcquireFor(world, "urn:example:files"));
  EXPECT_EQ(result.standardError, "");
  EXPECT_EQ(result.standardOutput,
            "welcome {Name: alice; Domain:example.com}\n"
            "group {Name: Administrators; Domain:example.com}\n"
            "group {Name: Staff; Domain:example.com}\n");
  EXPECT_EQ(result.exitCode, 0);
}

TEST(Examples, ValidateReceivedTokenRefusesATokenForAnotherService) {
  const World world;
  const ProcessResult result = ValidateReceived(world, AcquireFor(world, "urn:example:mail"));
  EXPECT_EQ(result.standardError, "refused: the token is for another service\n");
  EXPECT_EQ(result.standardOutput, "");
  EXPECT_EQ(result.exitCode, 1);
}

TEST(Examples, ValidateReceivedTokenRefusesAChangedToken) {
  const World world;
  const std::string token = Mask(AcquireFor(world, "urn:example:files"), "alice@", "admin@");
  const ProcessResult result = ValidateReceived(world, token);
  EXPECT_EQ(result.standardError,
            "refused: Failed to verify signature: token might have been tampered with.\n");
  EXPECT_EQ(result.standardOutput, "");
  EXPECT_EQ(result.exitCode, 1);
}

TEST(Examples, ValidateReceivedTokenRefusesWhatIsNotXml) {
  const World world;
  const ProcessResult result = ValidateReceived(world, "hello");
  EXPECT_EQ(result.standardError, "refused: syntax error at line 1, column 1\n");
  EXPECT_EQ(result.exitCode, 1);
}

// The bad set-up of a server is not the fault of the token.
TEST(Examples, ValidateReceivedTokenTellsAMissingCertificateFromABadToken) {
  const TestSupport::TemporaryDirectory files;
  const std::string path = files.GetPath("none.pem");
  const ProcessResult result =
      TestSupport::RunProcess({GetExamplePath("validateReceivedToken"), path, "urn:example:files"}, "");
  EXPECT_EQ(result.standardError, "cannot read " + path + "\n");
  EXPECT_EQ(result.exitCode, 2);
}

TEST(Examples, ValidateReceivedTokenAsksTheHolderForTheKey) {
  RobotWorld robot;
  const World& world = robot.GetWorld();
  Quorlin::TokenSpec spec;
  spec.tokenLifetimeSec = 600;
  const std::string token = Quorlin::CreateSecurityTokenService(world.MakeClientConfig(&robot.GetIdentity()))
                                ->AcquireTokenByCertificate(spec)
                                ->ToXml();

  const ProcessResult nobody = ValidateReceived(world, token);
  EXPECT_EQ(nobody.standardError, "refused: the client has not proved to hold the token's key\n");
  EXPECT_EQ(nobody.exitCode, 1);
  const ProcessResult other = ValidateReceived(world, token, {world.GetPath("sts.pem")});
  EXPECT_EQ(other.standardError, "refused: the client has not proved to hold the token's key\n");
  EXPECT_EQ(other.exitCode, 1);
  const ProcessResult holder = ValidateReceived(world, token, {world.GetPath("cert.pem")});
  EXPECT_EQ(holder.standardError, "");
  EXPECT_EQ(holder.standardOutput, "welcome {Name: robot; Domain:example.com}\n");
  EXPECT_EQ(holder.exitCode, 0);
}

TEST(Examples, WithOptionsPrintsWhomTheTokenIsFor) {
  const World world;
  const ProcessResult result = world.RunClient("withOptions", {"alice@example.com"}, "secret\n");
  EXPECT_EQ(result.standardError, "");
  EXPECT_EQ(Mask(result.standardOutput, kDatePattern, "DATE"),
            "{Name: alice; Domain:example.com} until DATE\n");
  EXPECT_EQ(result.exitCode, 0);
}

TEST(Examples, WithOptionsGoesThroughTheProxy) {
  const World world;
  const TestSupport::ClosedPort port;
  const std::string proxy = "127.0.0.1:" + std::to_string(port.GetPort());
  const ProcessResult result =
      world.RunClient("withOptions", {"alice@example.com", "http://" + proxy}, "secret\n");
  EXPECT_EQ(result.standardError, "Connection refused by proxy " + proxy + "\n");
  EXPECT_EQ(result.exitCode, 1);
}

TEST(Examples, WithOptionsEndsAtCtrlC) {
  const World world;
  TestSupport::LoopbackServer server({&TestSupport::StaySilent});
  StsTests::ChildProcess child(
      {GetExamplePath("withOptions"), "http://" + server.GetEndpoint() + "/sts", world.GetPath("ca.pem"),
       world.GetPath("sts.pem"), "alice@example.com"},
      StsTests::ChildProcess::Terminal::OWN);
  child.Type("secret\n");
  server.AwaitRequests(1);
  child.Type("\x03");
  EXPECT_EQ(child.ReadAll(), "secret\r\n^CThe operation was cancelled.\r\n");
  EXPECT_EQ(child.Wait(), 1);
}

TEST(Examples, AcquireAsyncGetsTheTokensOfAllUsers) {
  const World world;
  const ProcessResult result =
      world.RunClient("acquireAsync", {}, "alice@example.com secret\nbob@example.com builder\n");
  EXPECT_EQ(result.standardError, "");
  EXPECT_EQ(result.standardOutput,
            "alice@example.com: {Name: alice; Domain:example.com}\n"
            "bob@example.com: {Name: bob; Domain:example.com}\n");
  EXPECT_EQ(result.exitCode, 0);
}

TEST(Examples, AcquireAsyncSaysWhoGotNoToken) {
  const World world;
  const ProcessResult result =
      world.RunClient("acquireAsync", {}, "alice@example.com wrong\nbob@example.com builder\n");
  EXPECT_EQ(result.standardError, "");
  EXPECT_EQ(result.standardOutput,
            "alice@example.com: no token: Authentication failed: Invalid user name or password\n"
            "bob@example.com: {Name: bob; Domain:example.com}\n");
  EXPECT_EQ(result.exitCode, 1);
}

TEST(Examples, LogSinkWritesTheLinesOfAnOperationAsJson) {
  const World world;
  const ProcessResult result = world.RunClient("logSink", {"alice@example.com"}, "secret\n");
  EXPECT_EQ(result.standardError, "");
  EXPECT_EQ(
      Mask(Mask(result.standardOutput, kDatePattern, "DATE"), kUuidPattern, "UUID"),
      "{\"time\":\"DATE\",\"level\":64,\"logger\":\"Quorlin\",\"text\":\"opId=UUID START operation "
      "SecurityTokenServiceImpl::AcquireToken\"}\n"
      "{\"time\":\"DATE\",\"level\":64,\"logger\":\"Quorlin\",\"text\":\"Requested token for subject "
      "`alice@example.com', spec `TokenSpec [tokenLifetimeSec=600, delegable=false, delegateTo=<unset>, "
      "renewable=false, confirmationType=0,audienceRestriction=, advice=[]'\"}\n"
      "{\"time\":\"DATE\",\"level\":64,\"logger\":\"Quorlin\",\"text\":\"SecurityTokenServiceImpl::"
      "AcquireToken sending request\"}\n"
      "{\"time\":\"DATE\",\"level\":64,\"logger\":\"Quorlin\",\"text\":\"SecurityTokenServiceImpl::"
      "AcquireToken processing response\"}\n"
      "{\"time\":\"DATE\",\"level\":64,\"logger\":\"Quorlin\",\"text\":\"Successfully acquired token: SamlToken "
      "[subject={Name: alice; Domain:example.com}, groups=[{Name: Administrators; Domain:example.com}, "
      "{Name: Staff; Domain:example.com}], delegationChain=[], startTime=DATE, expirationTime=DATE, "
      "renewable=false, delegable=false, isSolution=false,confirmationType=0]\"}\n"
      "{\"time\":\"DATE\",\"level\":64,\"logger\":\"Quorlin\",\"text\":\"opId=UUID END operation "
      "SecurityTokenServiceImpl::AcquireToken\"}\n");
  EXPECT_EQ(result.exitCode, 0);
}

// What comes from outside must not make a second line, nor end the string it stands in.
TEST(Examples, LogSinkEscapesWhatCouldForgeALine) {
  const World world;
  const ProcessResult result = world.RunClient("logSink", {"a\n\"b\x1b"}, "secret\n");
  std::istringstream lines(result.standardOutput);
  std::string line;
  std::getline(lines, line);
  std::getline(lines, line);
  EXPECT_EQ(Mask(line, kDatePattern, "DATE"),
            "{\"time\":\"DATE\",\"level\":64,\"logger\":\"Quorlin\",\"text\":\"Requested token for subject "
            "`a\\u000a\\\"b\\u001b', spec `TokenSpec [tokenLifetimeSec=600, delegable=false, "
            "delegateTo=<unset>, renewable=false, confirmationType=0,audienceRestriction=, advice=[]'\"}");
  EXPECT_EQ(result.exitCode, 1);
}

TEST(Examples, LogFieldsWritesOneLinePerOperation) {
  const World world;
  const ProcessResult result = world.RunClient("logFields", {"alice@example.com"}, "secret\n");
  EXPECT_EQ(result.standardError, "");
  EXPECT_EQ(Mask(Mask(Mask(result.standardOutput, kDatePattern, "DATE"), kUuidPattern, "UUID"),
                 "duration_us=[0-9]+", "duration_us=N"),
            "time=DATE operation=AcquireToken operation_id=UUID attempt=1 duration_us=N outcome=success\n");
  EXPECT_EQ(result.exitCode, 0);
}

TEST(Examples, LogFieldsTellsHowAnOperationFailed) {
  const World world;
  const ProcessResult result = world.RunClient("logFields", {"alice@example.com"}, "wrong\n");
  EXPECT_EQ(result.standardError, "Authentication failed: Invalid user name or password\n");
  EXPECT_EQ(Mask(Mask(Mask(result.standardOutput, kDatePattern, "DATE"), kUuidPattern, "UUID"),
                 "duration_us=[0-9]+", "duration_us=N"),
            "time=DATE operation=AcquireToken operation_id=UUID attempt=1 duration_us=N "
            "outcome=invalid_credentials\n");
  EXPECT_EQ(result.exitCode, 1);
}

TEST(Examples, AcquireFuturesGetsTheTokensOfAllUsers) {
  const World world;
  const ProcessResult result =
      world.RunClient("acquireFutures", {}, "alice@example.com secret\nbob@example.com builder\n");
  EXPECT_EQ(result.standardError, "");
  EXPECT_EQ(result.standardOutput,
            "{Name: alice; Domain:example.com} is known\n"
            "{Name: bob; Domain:example.com} is known\n");
  EXPECT_EQ(result.exitCode, 0);
}

TEST(Examples, AcquireFuturesTellsAWrongPasswordFromAMissingService) {
  World world;
  const std::string users = "alice@example.com wrong\nbob@example.com builder\n";
  const ProcessResult wrong = world.RunClient("acquireFutures", {}, users);
  EXPECT_EQ(wrong.standardError, "");
  EXPECT_EQ(wrong.standardOutput,
            "wrong password: Authentication failed: Invalid user name or password\n"
            "{Name: bob; Domain:example.com} is known\n");
  EXPECT_EQ(wrong.exitCode, 1);

  world.GetService().Stop();
  const ProcessResult away = world.RunClient("acquireFutures", {}, users);
  EXPECT_EQ(Mask(away.standardOutput, "127[.]0[.]0[.]1:[0-9]+", "SERVICE"),
            "no answer: Connection refused by SERVICE\nno answer: Connection refused by SERVICE\n");
  EXPECT_EQ(away.exitCode, 1);
}

#ifdef QUORLIN_HAS_COROUTINES
TEST(Examples, AwaitTokenGetsATokenAndTheWordOnItsSubject) {
  const World world;
  const ProcessResult result = world.RunClient("awaitToken", {"alice@example.com"}, "secret\n");
  EXPECT_EQ(result.standardError, "");
  EXPECT_EQ(result.standardOutput, "{Name: alice; Domain:example.com} is known\n");
  EXPECT_EQ(result.exitCode, 0);
}

TEST(Examples, AwaitTokenSaysWhyThereIsNoToken) {
  const World world;
  const ProcessResult result = world.RunClient("awaitToken", {"alice@example.com"}, "wrong\n");
  EXPECT_EQ(result.standardError, "Authentication failed: Invalid user name or password\n");
  EXPECT_EQ(result.standardOutput, "");
  EXPECT_EQ(result.exitCode, 1);
}

TEST(Examples, AwaitTokenStopsWhenItIsTold) {
  DevSts::ServiceConfig config;
  config.delay = std::chrono::hours(24);
  const World world(config);
  const ProcessResult result = world.RunClient("awaitToken", {"alice@example.com"}, "secret\nstop\n");
  EXPECT_EQ(result.standardError, "The operation was cancelled.\n");
  EXPECT_EQ(result.standardOutput, "");
  EXPECT_EQ(result.exitCode, 1);
}
#endif

std::string FindMetricsPort(const std::string& output) {
  std::smatch match;
  EXPECT_TRUE(std::regex_search(output, match, std::regex("http://127[.]0[.]0[.]1:([0-9]+)/metrics")));
  return match[1];
}

TEST(Examples, MetricsEndpointShowsWhatWasCounted) {
  const World world;
  StsTests::ChildProcess child(
      {GetExamplePath("metricsEndpoint"), world.GetUrl(), world.GetPath("ca.pem"), world.GetPath("sts.pem")},
      StsTests::ChildProcess::Terminal::OWN);
  const Pelmar::Ref<Pelmar::Http::UserAgent> scraper =
      TestSupport::MakeAgent(std::stoi(FindMetricsPort(child.ReadUntil("/metrics\r\n"))));
  EXPECT_EQ(TestSupport::Call(*scraper, TestSupport::MakeGet("/metrics")),
            "200 OK|"
            "# HELP quorlin_operation_duration_seconds Time that token service operations took.\n"
            "# TYPE quorlin_operation_duration_seconds summary\n"
            "# HELP quorlin_operation_retries_total Requests that were tried again.\n"
            "# TYPE quorlin_operation_retries_total counter\n");

  child.Type("alice@example.com secret\n");
  child.ReadUntil("{Name: alice; Domain:example.com}\r\n");
  child.Type("alice@example.com wrong\n");
  child.ReadUntil("no token: Authentication failed: Invalid user name or password\r\n");
  child.Type("bob@example.com builder\n");
  child.ReadUntil("{Name: bob; Domain:example.com}\r\n");
  const std::string failed = "{operation=\"AcquireToken\",outcome=\"invalid_credentials\"} ";
  const std::string succeeded = "{operation=\"AcquireToken\",outcome=\"success\"} ";
  EXPECT_EQ(Mask(TestSupport::Call(*scraper, TestSupport::MakeGet("/metrics")), "[0-9]+[.][0-9]{6}\n", "S\n"),
            "200 OK|"
            "# HELP quorlin_operation_duration_seconds Time that token service operations took.\n"
            "# TYPE quorlin_operation_duration_seconds summary\n"
            "quorlin_operation_duration_seconds_sum" +
                failed +
                "S\n"
                "quorlin_operation_duration_seconds_count" +
                failed +
                "1\n"
                "quorlin_operation_duration_seconds_sum" +
                succeeded +
                "S\n"
                "quorlin_operation_duration_seconds_count" +
                succeeded +
                "2\n"
                "# HELP quorlin_operation_retries_total Requests that were tried again.\n"
                "# TYPE quorlin_operation_retries_total counter\n"
                "quorlin_operation_retries_total" +
                failed +
                "0\n"
                "quorlin_operation_retries_total" +
                succeeded + "0\n");
  EXPECT_EQ(TestSupport::Call(*scraper, TestSupport::MakeGet("/")), "404 Not Found|");

  child.Type("\x04");
  EXPECT_EQ(child.Wait(), 0);
}

TEST(Examples, TestAgainstDevStsPasses) {
  const ProcessResult result =
      TestSupport::RunProcess({GetExamplePath("testAgainstDevSts"), "--gtest_color=no", "--gtest_brief=1"});
  EXPECT_EQ(result.standardError, "");
  const std::string verdict = "[  PASSED  ] 5 tests.\n";
  ASSERT_GE(result.standardOutput.size(), verdict.size());
  EXPECT_EQ(result.standardOutput.substr(result.standardOutput.size() - verdict.size()), verdict);
  EXPECT_EQ(result.exitCode, 0);
}

TEST(Readme, ShowsTheCodeOfTheExample) {
  const std::string snippet = CutSnippet(ReadProjectFile("examples/acquireByPassword.cpp"));
  ASSERT_FALSE(snippet.empty());
  EXPECT_NE(ReadProjectFile("README.md").find("```cpp\n" + snippet + "```"), std::string::npos) << snippet;
}

}  // namespace
