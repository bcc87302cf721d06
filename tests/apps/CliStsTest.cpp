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

TEST(CliDemo, TellsTheStory) {
  const ProcessResult result = RunCli({"demo"});
  EXPECT_EQ(result.exitCode, 0);
  EXPECT_EQ(result.standardError, "");
  std::string story = std::regex_replace(result.standardOutput, std::regex("\\([0-9.]+ m?s\\)"), "(time)");
  story = std::regex_replace(story, std::regex("127\\.0\\.0\\.1:(?!8443/)[0-9]+/"), "127.0.0.1:PORT/");
  story = std::regex_replace(story, std::regex("[0-9-]{10}T[0-9:.]+Z"), "DATE");
  story = std::regex_replace(story, std::regex("_[0-9a-f-]{36}"), "ID");
  story = std::regex_replace(story, std::regex("\\([0-9]+ min( [0-9]+ s)? left\\)"), "(left)");
  EXPECT_EQ(
      story,
      "1. Starting a token service with new keys and certificates ... https://127.0.0.1:PORT/sts (time)\n"
      "2. Asking it over HTTPS for a token for alice@example.com, by password ... got one, its signature and dates "
      "are good (time)\n"
      "\n"
      "  subject       alice@example.com\n"
      "  full name     Alice Example\n"
      "  groups        Administrators@example.com\n"
      "                Staff@example.com\n"
      "  valid from    DATE\n"
      "  valid until   DATE (left)\n"
      "  flags         renewable, not delegable\n"
      "  confirmation  bearer: whoever holds it may use it\n"
      "  id            ID\n"
      "\n"
      "3. Asking again with a wrong password ... refused, as it should be: Authentication failed: Invalid user name "
      "or password (time)\n"
      "4. Stopping the service and removing its files ... done (time)\n"
      "\n"
      "To try it by hand, run a service in one terminal and ask it in another:\n"
      "  quorlin sts --port 8443 --write-certs certs\n"
      "  quorlin acquire password --url https://127.0.0.1:8443/sts --ca certs/ca.pem --sts-cert certs/sts.pem \\\n"
      "      --user alice@example.com          (the password is: secret)\n");
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
  const ProcessResult result = RunCli({});
  EXPECT_EQ(result.exitCode, 2);
  EXPECT_EQ(result.standardError, "quorlin: A subcommand is required\nTry quorlin --help\n");
}

TEST(Cli, RefusesAnUnknownCommand) {
  const ProcessResult result = RunCli({"frobnicate"});
  EXPECT_EQ(result.exitCode, 2);
}

}  // namespace
