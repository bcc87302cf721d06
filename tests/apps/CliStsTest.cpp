// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

// quorlin sts, demo, and the program's own flags.

#include "apps/ChildProcess.h"
#include "apps/Cli.h"

#include "quorlin/ToyNegotiationHandler.h"

#include <quorlin/quorlin.h>

#include <nlohmann/json.hpp>

#include <gtest/gtest.h>

#include <algorithm>
#include <chrono>
#include <csignal>
#include <filesystem>
#include <fstream>
#include <iterator>
#include <regex>
#include <string>
#include <vector>

namespace {

using namespace StsTests;
using TestSupport::ProcessResult;
using Json = nlohmann::json;

/// A running "quorlin sts" and the line it printed.
struct RunningSts {
  explicit RunningSts(const std::vector<std::string>& arguments)
      : process(MakeCommand(arguments), ChildProcess::Terminal::NONE),
        ready(Json::parse(process.ReadUntil("\n"))) {}

  /// Killed, it would leave its files behind.
  ~RunningSts() {
    if (process.IsRunning()) {
      process.Signal(SIGTERM);
      process.Wait();
    }
  }

  ProcessResult Acquire(const std::string& user, const std::string& password) const {
    std::vector<std::string> arguments = {
        "acquire", "password", "--json",        "--password-stdin", "--user",
        user,      "--url",    ready.at("url"), "--sts-cert",       ready.at("stsCert")};
    if (!ready.at("ca").is_null()) {
      arguments.insert(arguments.end(), {"--ca", ready.at("ca")});
    }
    return RunCli(arguments, password);
  }

  ChildProcess process;
  Json ready;
};

TEST(CliSts, ServesUntilItIsToldToStop) {
  for (const int signal : {SIGTERM, SIGINT, SIGHUP}) {
    RunningSts sts({"sts"});
    EXPECT_EQ(sts.Acquire("alice@example.com", "secret").exitCode, 0);
    const std::string ca = sts.ready.at("ca");
    EXPECT_TRUE(std::filesystem::exists(ca));
    sts.process.Signal(signal);
    EXPECT_EQ(sts.process.Wait(), 0);
    EXPECT_FALSE(std::filesystem::exists(std::filesystem::path(ca).parent_path()));
    EXPECT_EQ(sts.Acquire("alice@example.com", "secret").exitCode, 2) << "its files are gone";
  }
}

TEST(CliSts, WritesCertificatesWhereToldAndNoKeys) {
  const TestSupport::TemporaryDirectory files;
  RunningSts sts({"sts", "--write-certs", files.GetPath("new/certs")});
  EXPECT_EQ(sts.ready.at("ca"), files.GetPath("new/certs/ca.pem"));
  EXPECT_EQ(sts.ready.at("stsCert"), files.GetPath("new/certs/sts.pem"));
  EXPECT_EQ(sts.Acquire("alice@example.com", "secret").exitCode, 0);
  sts.process.Signal(SIGTERM);
  EXPECT_EQ(sts.process.Wait(), 0);
  std::vector<std::string> names;
  for (const auto& entry : std::filesystem::directory_iterator(files.GetPath("new/certs"))) {
    names.push_back(entry.path().filename());
    const std::string content = files.ReadFile("new/certs/" + names.back());
    EXPECT_EQ(content.find("PRIVATE KEY"), std::string::npos) << names.back();
  }
  std::sort(names.begin(), names.end());
  EXPECT_EQ(names, (std::vector<std::string>{"ca.pem", "server.pem", "sts.pem"}));
}

TEST(CliSts, ServesPlainHttp) {
  RunningSts sts({"sts", "--http"});
  EXPECT_TRUE(sts.ready.at("ca").is_null());
  EXPECT_EQ(sts.ready.at("url").get<std::string>().substr(0, 7), "http://");
  EXPECT_EQ(sts.Acquire("alice@example.com", "secret").exitCode, 0);
}

TEST(CliSts, TakesItsUsersFromAFile) {
  const TestSupport::TemporaryDirectory files;
  const std::string directory = files.WriteFile(
      "users.json", R"({"users": [{"name": "zoe", "domain": "zoo.example", "password": "zebra"}]})");
  RunningSts sts({"sts", "--directory", directory});
  EXPECT_EQ(sts.Acquire("zoe@zoo.example", "zebra").exitCode, 0);
  EXPECT_EQ(sts.Acquire("alice@example.com", "secret").exitCode, 1);
}

TEST(CliSts, ReportsADirectoryFileThatCannotBeUsed) {
  const TestSupport::TemporaryDirectory files;
  const std::string path =
      files.WriteFile("users.json", R"({"users": [{"name": "zoe", "password": "zebra"}]})");
  const ProcessResult result = RunCli({"sts", "--directory", path});
  EXPECT_EQ(result.exitCode, 2);
  EXPECT_EQ(result.standardOutput, "");
  EXPECT_EQ(result.standardError,
            "quorlin: cannot use " + path + ": users[0].domain is missing (UsageException)\n");
}

TEST(CliSts, ReportsAPortThatIsTaken) {
  const std::string& url = ServiceWithFiles::Shared().Get().GetUrl();
  const std::string port = std::regex_replace(url, std::regex(".*:([0-9]+)/sts"), "$1");
  const ProcessResult result = RunCli({"sts", "--port", port});
  EXPECT_EQ(result.exitCode, 2);
  EXPECT_EQ(result.standardError, "quorlin: cannot listen on 127.0.0.1 port " + port +
                                      ": Address already in use (UsageException)\n");
}

TEST(CliSts, ReportsAnAddressThatIsNone) {
  const ProcessResult result = RunCli({"sts", "--address", "localhost,DNS:evil.example"});
  EXPECT_EQ(result.exitCode, 2);
  EXPECT_EQ(result.standardError,
            "quorlin: not a host name or IP address: localhost,DNS:evil.example (UsageException)\n");
}

TEST(CliSts, SignsWithTheKeyItIsGiven) {
  const TestSupport::TemporaryDirectory files;
  ASSERT_EQ(TestSupport::RunProcess({"openssl", "req", "-x509", "-newkey", "rsa:2048", "-nodes", "-subj",
                                     "/CN=Fixed", "-keyout", files.GetPath("key.pem"), "-out",
                                     files.GetPath("cert.pem")})
                .exitCode,
            0);
  RunningSts sts(
      {"sts", "--signing-key", files.GetPath("key.pem"), "--signing-cert", files.GetPath("cert.pem")});
  sts.ready["stsCert"] = files.GetPath("cert.pem");
  EXPECT_EQ(sts.Acquire("alice@example.com", "secret").exitCode, 0);
}

TEST(CliSts, RefusesASigningKeyOfAnotherCertificate) {
  const TestSupport::TemporaryDirectory files;
  ASSERT_EQ(
      TestSupport::RunProcess({"openssl", "genpkey", "-algorithm", "RSA", "-out", files.GetPath("key.pem")})
          .exitCode,
      0);
  const ProcessResult result = RunCli({"sts", "--signing-key", files.GetPath("key.pem"), "--signing-cert",
                                       ServiceWithFiles::Shared().GetFiles().GetPath("sts.pem")});
  EXPECT_EQ(result.exitCode, 2);
  EXPECT_EQ(result.standardError,
            "quorlin: the signing certificate is not that of the signing key (UsageException)\n");
}

std::string ReadFile(const std::string& path) {
  std::ifstream file(path);
  return std::string(std::istreambuf_iterator<char>(file), std::istreambuf_iterator<char>());
}

/// A client of `sts` inside this process.
boost::shared_ptr<Quorlin::SecurityTokenService> Connect(const RunningSts& sts) {
  Pelmar::Ssl::SSLContextOptions options;
  options.trustAnchors = Pelmar::Crypto::CreateCertificatesFromPem(ReadFile(sts.ready.at("ca")));
  Quorlin::SecurityTokenServiceConfig config;
  config.stsUrl = sts.ready.at("url");
  config.sslContext = Pelmar::Ssl::CreateSSLContext(options);
  config.trustedStsCertificates =
      Pelmar::Crypto::CreateCertificatesFromPem(ReadFile(sts.ready.at("stsCert")));
  return Quorlin::CreateSecurityTokenService(config);
}

Quorlin::TokenSpec TenMinutes() {
  Quorlin::TokenSpec spec;
  spec.tokenLifetimeSec = 600;
  return spec;
}

TEST(CliSts, NegotiatesByTheToyMechanismWhenTold) {
  const RunningSts sts({"sts", "--toy-negotiation", "4"});
  DevSts::ToyOptions options;
  options.legs = 4;
  Cli::ToyNegotiationHandler handler(options, "bob@example.com", "builder");
  EXPECT_EQ(Connect(sts)->AcquireTokenByGSS(TenMinutes(), handler)->GetSubject().name, "bob");
}

TEST(CliSts, RefusesAToyMechanismOfNoLegsOrTooMany) {
  for (const char* const legs : {"0", "101"}) {
    const ProcessResult result = RunCli({"sts", "--toy-negotiation", legs});
    EXPECT_EQ(result.exitCode, 2);
    EXPECT_EQ(result.standardError, std::string("quorlin: --toy-negotiation: Value ") + legs +
                                        " not in range 1 to 100\nTry quorlin sts --help\n");
  }
}

/// What a service with these switches makes of a good request: the exit code and what was printed.
ProcessResult AcquireFrom(const std::vector<std::string>& switches) {
  std::vector<std::string> arguments = {"sts"};
  arguments.insert(arguments.end(), switches.begin(), switches.end());
  const RunningSts sts(arguments);
  return sts.Acquire("alice@example.com", "secret");
}

TEST(CliSts, FailsWhenToldTo) {
  const ProcessResult result = AcquireFrom({"--fail", "1"});
  EXPECT_EQ(result.exitCode, 1);
  EXPECT_EQ(Json::parse(result.standardOutput).at("error").at("message"),
            "Unexpected SOAP fault: soapenv:Server; request failed.");
}

TEST(CliSts, DropsConnectionsWhenToldTo) {
  const ProcessResult result = AcquireFrom({"--drop", "1"});
  EXPECT_EQ(result.exitCode, 3);
  EXPECT_EQ(Json::parse(result.standardOutput).at("error").at("type"), "CommunicationException");
}

/// The exit codes of some requests to a service with this seed.
std::string StoryOf(const std::string& seed) {
  const RunningSts sts({"sts", "--fail", "0.4", "--drop", "0.3", "--seed", seed});
  std::string story;
  for (int i = 0; i < 8; ++i) {
    story += std::to_string(sts.Acquire("alice@example.com", "secret").exitCode);
  }
  return story;
}

TEST(CliSts, RepeatsItsTroubleForTheSameSeed) {
  EXPECT_EQ(StoryOf("7"), "03303011");
}

TEST(CliSts, HoldsAnswersBackWhenToldTo) {
  const auto start = std::chrono::steady_clock::now();
  EXPECT_EQ(AcquireFrom({"--delay-ms", "50"}).exitCode, 0);
  EXPECT_GE(std::chrono::steady_clock::now() - start, std::chrono::milliseconds(50));
}

TEST(CliSts, CutsLifetimesDown) {
  const ProcessResult result = AcquireFrom({"--max-lifetime", "60"});
  EXPECT_EQ(result.exitCode, 0);
  const Json token = Json::parse(result.standardOutput).at("token");
  const auto toTime = [&](const char* name) {
    return Pelmar::System::DateTime(token.at(name).get<std::string>()).GetUtcTime();
  };
  EXPECT_EQ(toTime("endDate") - toTime("startDate"), 60LL * 1000000);
}

TEST(CliSts, LetsItsClockBeWrong) {
  for (const char* const offset : {"3600", "-3600"}) {
    const ProcessResult result = AcquireFrom({"--clock-offset", offset});
    EXPECT_EQ(result.exitCode, 1);
    EXPECT_EQ(Json::parse(result.standardOutput).at("error").at("message"),
              "Unexpected SOAP fault: wst:RequestFailed; request failed.");
  }
}

TEST(CliSts, GivesACookieAndWantsItBack) {
  const RunningSts sts({"sts", "--cookie", "--toy-negotiation", "2"});
  Cli::ToyNegotiationHandler handler(DevSts::ToyOptions(), "bob@example.com", "builder");
  EXPECT_EQ(Connect(sts)->AcquireTokenByGSS(TenMinutes(), handler)->GetSubject().name, "bob");
}

TEST(CliSts, RefusesSwitchesOutOfRange) {
  const std::vector<std::vector<std::string>> bad = {
      {"--fail", "1.5"}, {"--drop", "-0.1"}, {"--delay-ms", "-1"}, {"--max-lifetime", "0"}, {"--seed", "x"}};
  for (const std::vector<std::string>& arguments : bad) {
    const ProcessResult result = RunCli({"sts", arguments[0], arguments[1]});
    EXPECT_EQ(result.exitCode, 2) << arguments[0];
    EXPECT_EQ(result.standardOutput, "") << arguments[0];
  }
}

/// Standard error of the program, which a shell puts into a file.
TEST(CliSts, LogsOneLineForEachRequest) {
  const TestSupport::TemporaryDirectory files;
  const std::string log = files.GetPath("log");
  ChildProcess process({"/bin/sh", "-c", "exec \"$0\" sts --http 2>\"$1\"", QUORLIN_CLI_PATH, log},
                       ChildProcess::Terminal::NONE);
  const Json ready = Json::parse(process.ReadUntil("\n"));
  for (const char* const password : {"secret", "guess"}) {
    RunCli({"acquire", "password", "--password-stdin", "--user", "alice@example.com", "--url",
            ready.at("url"), "--sts-cert", ready.at("stsCert")},
           password);
  }
  process.Signal(SIGTERM);
  EXPECT_EQ(process.Wait(), 0);
  const std::string head =
      R"({"time":0,"operation":"issue","user":"alice@example.com","asked":{"confirmation":"bearer","lifetimeSec":600,)"
      R"("renewable":false,"delegable":false,"delegates":false,"audiences":0,"advices":0},)";
  EXPECT_EQ(std::regex_replace(ReadFile(log), std::regex("\"time\":\"[^\"]*\""), "\"time\":0"),
            head +
                R"("passed":["timestamp","password"],"status":200,"answer":"token",)"
                R"("granted":{"confirmation":"bearer","lifetimeSec":600}})"
                "\n" +
                head +
                R"("passed":["timestamp"],"status":500,"answer":"fault","fault":"wst:FailedAuthentication",)"
                R"("reason":"Invalid user name or password"})"
                "\n");
}

// ---- Waiting ----

/// Acquires from a service that takes longer than a second.
std::vector<std::string> SlowAcquire(const ServiceWithFiles& service, const std::string& passwordFile) {
  return MakeCommand({"acquire", "password", "--json", "--url", service.Get().GetUrl(), "--ca",
                      service.GetFiles().GetPath("ca.pem"), "--sts-cert",
                      service.GetFiles().GetPath("sts.pem"), "--user", "alice@example.com", "--password-file",
                      passwordFile});
}

DevSts::ServiceConfig Slow() {
  DevSts::ServiceConfig config;
  config.delay = std::chrono::milliseconds(2500);
  return config;
}

/// To the start of the line, and nothing in it.
const std::string kWipe = "\r\x1b[K";

TEST(CliProgress, ShowsSecondsOnATerminalAndTakesThemAway) {
  const ServiceWithFiles service(Slow());
  ChildProcess process(SlowAcquire(service, service.GetFiles().WriteFile("password", "secret")),
                       ChildProcess::Terminal::OWN);
  const std::string output = process.ReadAll();
  EXPECT_EQ(process.Wait(), 0);
  const std::string token = output.substr(output.find('{'));
  // How many seconds it takes depends on the machine, but the service takes two of them.
  std::string expected;
  for (int second = 1; second <= 2 || expected.size() + kWipe.size() < output.find('{'); ++second) {
    expected += kWipe + "Waiting for the service ... " + std::to_string(second) + " s";
  }
  EXPECT_EQ(output.substr(0, output.find('{')), expected + kWipe);
  EXPECT_EQ(Json::parse(token).at("token").at("subject").at("name"), "alice");
}

TEST(CliProgress, ShowsNothingElsewhere) {
  const ServiceWithFiles service(Slow());
  const ProcessResult result =
      TestSupport::RunProcess(SlowAcquire(service, service.GetFiles().WriteFile("password", "secret")), "");
  EXPECT_EQ(result.exitCode, 0);
  EXPECT_EQ(result.standardError, "");
}

/// The demo's words without what differs from run to run.
std::string MaskStory(std::string story) {
  story = std::regex_replace(story, std::regex("\\([0-9.]+ m?s\\)"), "(time)");
  story = std::regex_replace(story, std::regex("127\\.0\\.0\\.1:(?!8443/)[0-9]+/"), "127.0.0.1:PORT/");
  story = std::regex_replace(story, std::regex("[0-9-]{10}T[0-9:.]+Z"), "DATE");
  story = std::regex_replace(story, std::regex("_[0-9a-f-]{36}"), "ID");
  story = std::regex_replace(story, std::regex("SHA-256 [0-9a-fA-F:]+"), "SHA-256 DIGEST");
  return std::regex_replace(story, std::regex("\\([0-9]+ min( [0-9]+ s)? left\\)"), "(left)");
}

TEST(CliDemo, TellsTheStory) {
  const ProcessResult result = RunCli({"demo"});
  EXPECT_EQ(result.exitCode, 0);
  EXPECT_EQ(result.standardError, "");
  EXPECT_EQ(
      MaskStory(result.standardOutput),
      R"(1. Starting a token service with new keys and certificates ... https://127.0.0.1:PORT/sts (time)
2. Asking it over HTTPS for a token for alice@example.com, by password ... got a token that whoever holds it may use (time)
3. The same with a wrong password ... refused, as it should be: Authentication failed: Invalid user name or password (time)
4. The same with her password, signed with her key ... got a token that only her key makes good (time)
5. Without the password, by her certificate and key ... got a token that only her key makes good (time)
6. Negotiating in 3 legs (SPNEGO, by a toy mechanism) ... got a token that whoever holds it may use (time)
7. Asking for 20 tokens at once, asynchronously ... got 20 different tokens (time)
8. Exchanging her token for one with which bob@example.com may act for her ... got one, delegated to bob (time)
9. Exchanging it for one that only https://files.example.com accepts ... got one (time)
10. Renewing that for 5 minutes ... got one (time)
11. Asking whether its subject is still valid ... yes (time)
12. The service forgets her; asking again ... no (time)
13. Stopping the service and removing its files ... done (time)

The last token:
  subject       alice@example.com
  full name     Alice Example
  groups        Administrators@example.com
                Staff@example.com
  valid from    DATE
  valid until   DATE (left)
  flags         renewable, delegable
  confirmation  holder-of-key: needs the key of CN=Alice Example
                certificate SHA-256 DIGEST
  audience      https://files.example.com
  id            ID

To try it by hand, run a service in one terminal and ask it in another:
  quorlin sts --port 8443 --write-certs certs
  quorlin acquire password --url https://127.0.0.1:8443/sts --ca certs/ca.pem --sts-cert certs/sts.pem \
      --user alice@example.com          (the password is: secret)
)");
}

/// The signal is there before the program is, so that it always meets it at work.
TEST(CliDemo, CleansUpWhenASignalEndsIt) {
  const TestSupport::TemporaryDirectory files;
  ChildProcess process({"/usr/bin/env", "TMPDIR=" + files.GetPath(), QUORLIN_CLI_PATH, "demo"},
                       ChildProcess::Terminal::NONE, SIGTERM);
  EXPECT_EQ(process.Wait(), 128 + SIGTERM);
  EXPECT_TRUE(std::filesystem::is_empty(files.GetPath()));
}

TEST(CliDemo, LeavesNothingBehind) {
  const TestSupport::TemporaryDirectory files;
  EXPECT_EQ(TestSupport::RunProcess({"/usr/bin/env", "TMPDIR=" + files.GetPath(), QUORLIN_CLI_PATH, "demo"})
                .exitCode,
            0);
  EXPECT_TRUE(std::filesystem::is_empty(files.GetPath()));
}

TEST(Cli, SaysItsVersion) {
  const ProcessResult result = RunCli({"--version"});
  EXPECT_EQ(result.exitCode, 0);
  EXPECT_TRUE(std::regex_match(result.standardOutput, std::regex("quorlin [0-9]+\\.[0-9]+\\.[0-9]+\n")))
      << result.standardOutput;
}

TEST(Cli, HelpsWithEveryCommand) {
  const std::vector<std::vector<std::string>> commands = {{},
                                                          {"acquire"},
                                                          {"acquire", "password"},
                                                          {"acquire", "certificate"},
                                                          {"acquire", "token"},
                                                          {"renew"},
                                                          {"validate"},
                                                          {"verify"},
                                                          {"sts"},
                                                          {"demo"}};
  for (std::vector<std::string> command : commands) {
    command.push_back("--help");
    const ProcessResult result = RunCli(command);
    EXPECT_EQ(result.exitCode, 0);
    EXPECT_EQ(result.standardError, "");
    EXPECT_NE(result.standardOutput.find("Usage: quorlin"), std::string::npos) << command.front();
  }
}

TEST(Cli, WantsACommand) {
  for (const std::vector<std::string>& arguments :
       std::vector<std::vector<std::string>>{{}, {"verfy"}, {"acqire", "password"}}) {
    const ProcessResult result = RunCli(arguments);
    EXPECT_EQ(result.exitCode, 2);
    EXPECT_EQ(
        result.standardError,
        "quorlin: there has to be one of these commands: acquire, renew, get-token, validate, verify, inspect, doctor, "
        "request, sts, demo\nTry quorlin --help\n");
  }
}

TEST(Cli, RefusesAnUnknownCommand) {
  const ProcessResult result = RunCli({"frobnicate"});
  EXPECT_EQ(result.exitCode, 2);
}

}  // namespace
