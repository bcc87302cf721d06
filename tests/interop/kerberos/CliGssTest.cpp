// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

// quorlin acquire gss against quorlin sts --keytab, and both in a program without Kerberos.

#include "apps/ChildProcess.h"
#include "apps/Cli.h"
#include "interop/kerberos/KerberosRealm.h"
#include "interop/kerberos/Outcome.h"
#include "support/Process.h"

#include <nlohmann/json.hpp>

#include <gtest/gtest.h>

#include <csignal>
#include <string>
#include <vector>

namespace {

using namespace KerberosTests;
using StsTests::ChildProcess;
using TestSupport::ProcessResult;
using Json = nlohmann::json;

using Arguments = std::vector<std::string>;

constexpr const char* kTickets = "Look at your Kerberos tickets with klist, and get a new one with kinit.\n";

const KerberosRealm& Realm() {
  return KerberosRealm::Shared();
}

/// A running "quorlin sts" that takes Kerberos tickets.
class RunningSts final {
 public:
  explicit RunningSts(const Arguments& more = {})
      : _process(StsTests::MakeCommand(Join({"sts", "--keytab", Realm().GetKeytab()}, more)),
                 ChildProcess::Terminal::NONE),
        _ready(Json::parse(_process.ReadUntil("\n"))) {}

  /// Killed, it would leave its files behind.
  ~RunningSts() {
    _process.Signal(SIGTERM);
    _process.Wait();
  }

  std::string GetUrl() const { return _ready.at("url"); }

  ProcessResult Acquire(const Arguments& more = {}) const {
    return StsTests::RunCli(Join({"acquire", "gss", "--url", _ready.at("url"), "--ca", _ready.at("ca"),
                                  "--sts-cert", _ready.at("stsCert")},
                                 more));
  }

 private:
  static Arguments Join(Arguments first, const Arguments& second) {
    first.insert(first.end(), second.begin(), second.end());
    return first;
  }

  ChildProcess _process;
  Json _ready;
};

Json MakeError(const std::string& type, const std::string& message) {
  return {{"valid", false}, {"error", {{"type", type}, {"message", message}}}};
}

TEST(CliAcquireGss, GetsATokenFromTheServiceOfTheUrlsHost) {
  const RunningSts sts;
  const ProcessResult result = sts.Acquire({"--json", "--lifetime", "90", "--renewable"});
  EXPECT_EQ(result.exitCode, 0);
  EXPECT_EQ(result.standardError, "");
  const Json token = Json::parse(result.standardOutput).at("token");
  EXPECT_EQ(token.at("subject"), (Json{{"name", "alice"}, {"domain", "example.com"}}));
  EXPECT_EQ(token.at("confirmation"), "bearer");
  EXPECT_EQ(token.at("renewable"), true);
}

TEST(CliAcquireGss, PrintsASummaryForPeople) {
  const RunningSts sts;
  const ProcessResult result = sts.Acquire();
  EXPECT_EQ(result.exitCode, 0);
  EXPECT_EQ(result.standardError, "");
  EXPECT_EQ(result.standardOutput.substr(0, result.standardOutput.find("  full name")),
            "A token from " + sts.GetUrl() +
                "\n"
                "  subject       alice@example.com\n");
}

TEST(CliAcquireGss, TakesTargetPrincipalAndCacheFromItsFlags) {
  const TestSupport::TemporaryDirectory files;
  const RunningSts sts(
      {"--gss-service", "HTTP@localhost", "--directory",
       files.WriteFile("users.json", R"({"users": [{"name": "carol", "domain": "example.com"}]})")});
  const std::string cache = Realm().LogIn("carol", "carol's", "carols");
  const Arguments flags = {"--json",   "--target", "HTTP@localhost", "--principal", "carol@EXAMPLE.COM",
                           "--ccache", cache};
  const ProcessResult result = sts.Acquire(flags);
  EXPECT_EQ(result.exitCode, 0) << result.standardOutput;
  EXPECT_EQ(Json::parse(result.standardOutput).at("token").at("subject").at("name"), "carol");
  EXPECT_EQ(
      Json::parse(sts.Acquire({"--json", "--ccache", cache}).standardOutput),
      MakeError("InvalidCredentialsException",
                std::string("Authentication failed: Kerberos: ") + kUnspecified +
                    "Request ticket server HTTP/127.0.0.1@EXAMPLE.COM found in keytab but does not match "
                    "server principal HTTP/localhost@"));
}

TEST(CliAcquireGss, ShowsTheWarningAmongTheLibrarysLinesOnRequest) {
  const RunningSts sts;
  const ProcessResult result = sts.Acquire({"--log"});
  EXPECT_EQ(result.exitCode, 0);
  EXPECT_NE(result.standardError.find(
                " WARNING Quorlin: GSS contract error: non-empty user leg after negotiation is complete\n"),
            std::string::npos)
      << result.standardError;
}

TEST(CliAcquireGss, TellsWhatToDoWithoutATicket) {
  const RunningSts sts;
  const std::string problem = std::string("Kerberos credentials cannot be used: ") + kNoCredentials;
  const ProcessResult result = sts.Acquire({"--ccache", Realm().MakeCacheName("none")});
  EXPECT_EQ(result.exitCode, 1);
  EXPECT_EQ(result.standardOutput, "");
  EXPECT_EQ(result.standardError,
            "quorlin: " + problem + "No credentials cache found (InvalidCredentialsException)\n" + kTickets);
}

TEST(CliAcquireGss, TellsWhatToDoWithAnExpiredTicket) {
  const RunningSts sts;
  const ProcessResult result = sts.Acquire({"--ccache", Realm().MakeExpiredCache("expired")});
  EXPECT_EQ(result.exitCode, 1);
  EXPECT_EQ(result.standardOutput, "");
  EXPECT_EQ(result.standardError,
            std::string("quorlin: Kerberos negotiation with 'HTTP@127.0.0.1' failed: ") + kUnspecified +
                "Ticket expired (InvalidCredentialsException)\n" + kTickets);
}

TEST(CliAcquireGss, ReportsAnUnknownService) {
  const RunningSts sts;
  const ProcessResult result = sts.Acquire({"--json", "--target", "HTTP@nowhere"});
  EXPECT_EQ(result.exitCode, 1);
  EXPECT_EQ(result.standardError, "");
  EXPECT_EQ(Json::parse(result.standardOutput),
            MakeError("SsoException", std::string("Kerberos negotiation with 'HTTP@nowhere' failed: ") +
                                          kUnspecified +
                                          "Server HTTP/nowhere@EXAMPLE.COM not found in Kerberos database"));
}

TEST(CliAcquireGss, RefusesATargetWithoutAHost) {
  const ProcessResult result = RunningSts().Acquire({"--target", "HTTP/localhost"});
  EXPECT_EQ(result.exitCode, 2);
  EXPECT_EQ(result.standardError,
            "quorlin: Invalid argument : GssapiOptions::targetService must be SERVICE@HOST "
            "(InvalidArgumentException)\n");
}

TEST(CliStsWithKeytab, ReportsAKeytabThatCannotBeUsed) {
  const std::string path = Realm().GetFiles().GetPath("nothing");
  const ProcessResult result = StsTests::RunCli({"sts", "--keytab", path});
  EXPECT_EQ(result.exitCode, 2);
  EXPECT_EQ(result.standardOutput, "");
  EXPECT_EQ(result.standardError, "quorlin: cannot use the keytab " + path + ": " + kNoCredentials +
                                      "Keytab FILE:" + path + " is nonexistent or empty (UsageException)\n");
}

TEST(CliStsWithKeytab, NegotiatesInOneWayOnly) {
  const ProcessResult result =
      StsTests::RunCli({"sts", "--keytab", Realm().GetKeytab(), "--toy-negotiation", "2"});
  EXPECT_EQ(result.exitCode, 2);
  EXPECT_EQ(result.standardError,
            "quorlin: --toy-negotiation excludes --keytab\n"
            "Try quorlin sts --help\n");
}

// ---- A program without Kerberos ----

ProcessResult RunWithoutKerberos(const Arguments& arguments) {
  Arguments command = {QUORLIN_CLI_WITHOUT_KERBEROS_PATH};
  command.insert(command.end(), arguments.begin(), arguments.end());
  return TestSupport::RunProcess(command);
}

TEST(CliWithoutKerberos, HasTheCommandButSaysThatItCannot) {
  const ProcessResult result =
      RunWithoutKerberos({"acquire", "gss", "--url", "https://localhost/sts", "--sts-cert", "sts.pem"});
  EXPECT_EQ(result.exitCode, 2);
  EXPECT_EQ(result.standardOutput, "");
  EXPECT_EQ(result.standardError, "quorlin: this quorlin was built without Kerberos (UsageException)\n");
}

TEST(CliWithoutKerberos, SaysSoAsJson) {
  const ProcessResult result = RunWithoutKerberos(
      {"acquire", "gss", "--json", "--url", "https://localhost/sts", "--sts-cert", "sts.pem"});
  EXPECT_EQ(result.exitCode, 2);
  EXPECT_EQ(result.standardError, "");
  EXPECT_EQ(Json::parse(result.standardOutput),
            MakeError("UsageException", "this quorlin was built without Kerberos"));
}

TEST(CliWithoutKerberos, RunsNoServiceThatWouldNeedIt) {
  const ProcessResult result = RunWithoutKerberos({"sts", "--keytab", Realm().GetKeytab()});
  EXPECT_EQ(result.exitCode, 2);
  EXPECT_EQ(result.standardOutput, "");
  EXPECT_EQ(result.standardError, "quorlin: this quorlin was built without Kerberos (UsageException)\n");
}

}  // namespace
