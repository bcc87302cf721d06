// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

// quorlin acquire password.

#include "apps/ChildProcess.h"
#include "apps/Cli.h"
#include "support/HttpScripts.h"
#include "support/LoopbackServer.h"
#include "support/Pki.h"

#include <pelmar/crypto/Certificate.h>
#include <pelmar/crypto/Digest.h>
#include <quorlin/SamlToken.h>

#include <nlohmann/json.hpp>

#include <gtest/gtest.h>

#include <sys/stat.h>

#include <algorithm>
#include <csignal>
#include <filesystem>
#include <fstream>
#include <iterator>
#include <string>
#include <vector>

namespace {

using namespace StsTests;
using TestSupport::ProcessResult;
using Json = nlohmann::json;

const ServiceWithFiles& Shared() {
  return ServiceWithFiles::Shared();
}

std::string HashOf(const std::string& text) {
  using namespace Pelmar::Crypto;
  return ToHex(ComputeDigest(DIGEST_SHA256, text.data(), text.size()));
}

std::string ReadBytes(const std::string& path) {
  std::ifstream file(path, std::ios::binary);
  return std::string(std::istreambuf_iterator<char>(file), std::istreambuf_iterator<char>());
}

TEST(CliAcquire, PrintsOneJsonObjectWithAllOfTheToken) {
  const TestSupport::TemporaryDirectory files;
  const ProcessResult result =
      RunCli(Shared().MakeAcquire({"--json", "--renewable", "--delegable", "--delegate-to", "bob@example.com",
                                   "--audience", "urn:b", "--audience", "urn:a", "--lifetime", "90", "--out",
                                   files.GetPath("token.xml")}),
             "secret\n");
  EXPECT_EQ(result.exitCode, 0);
  EXPECT_EQ(result.standardError, "");
  const std::string xml = files.ReadFile("token.xml");
  const auto token = Quorlin::CreateSamlToken(
      xml, Pelmar::Crypto::CreateCertificateFromPem(Shared().Get().GetSigningCertificate()).Get());
  EXPECT_EQ(token->GetEndDate().GetUtcTime() - token->GetStartDate().GetUtcTime(), 90LL * 1000000);
  std::vector<Quorlin::Delegate> chain;
  token->GetDelegationChain(chain);
  ASSERT_EQ(chain.size(), 1U);
  EXPECT_EQ(
      result.standardOutput,
      "{\"valid\":true,\"token\":{\"id\":\"" + token->GetId() +
          "\",\"subject\":{\"name\":\"alice\",\"domain\":\"example.com\"},\"startDate\":\"" +
          token->GetStartDate().ToString() + "\",\"endDate\":\"" + token->GetEndDate().ToString() +
          "\",\"renewable\":true,\"delegable\":true,\"isSolution\":false,\"confirmation\":\"bearer\","
          "\"givenName\":\"Alice\",\"surname\":\"Example\",\"groups\":[{\"name\":\"Administrators\","
          "\"domain\":\"example.com\"},{\"name\":\"Staff\",\"domain\":\"example.com\"}],"
          "\"delegationChain\":[{\"principal\":{\"name\":\"bob\",\"domain\":\"example.com\"},\"instant\":\"" +
          chain[0].delegationInstant.ToString() +
          "\"}],\"audience\":[\"urn:a\",\"urn:b\"],\"advice\":[],\"confirmationCertificateSha256\":null,"
          "\"xmlSha256\":\"" +
          HashOf(xml) + "\"}}\n");
}

TEST(CliAcquire, PrintsASummaryForPeople) {
  const ProcessResult result = RunCli(Shared().MakeAcquire(), "secret");
  EXPECT_EQ(result.exitCode, 0);
  EXPECT_EQ(result.standardError, "");
  EXPECT_EQ(result.standardOutput.substr(0, result.standardOutput.find("  valid from")),
            "A token from " + Shared().Get().GetUrl() +
                "\n"
                "  subject       alice@example.com\n"
                "  full name     Alice Example\n"
                "  groups        Administrators@example.com\n"
                "                Staff@example.com\n");
  const std::size_t flags = result.standardOutput.find("  flags");
  EXPECT_EQ(result.standardOutput.substr(flags, result.standardOutput.find("  id") - flags),
            "  flags         not renewable, not delegable\n"
            "  confirmation  bearer: whoever holds it may use it\n");
}

TEST(CliAcquire, TakesThePasswordFromAFile) {
  const TestSupport::TemporaryDirectory files;
  for (const char* const content : {"secret", "secret\n", "secret\r\n"}) {
    std::vector<std::string> arguments =
        Shared().MakeAcquire({"--password-file", files.WriteFile("p", content)});
    arguments.erase(std::find(arguments.begin(), arguments.end(), "--password-stdin"));
    EXPECT_EQ(RunCli(arguments).exitCode, 0) << content;
  }
}

TEST(CliAcquire, DropsNoMoreThanOneLineEndOfThePassword) {
  EXPECT_EQ(RunCli(Shared().MakeAcquire(), "secret\n\n").exitCode, 1);
  EXPECT_EQ(RunCli(Shared().MakeAcquire(), " secret\n").exitCode, 1);
  EXPECT_EQ(RunCli(Shared().MakeAcquire(), "secret \n").exitCode, 1);
}

TEST(CliAcquire, ReportsAWrongPasswordAsJson) {
  const ProcessResult result = RunCli(Shared().MakeAcquire({"--json"}), "guess");
  EXPECT_EQ(result.exitCode, 1);
  EXPECT_EQ(result.standardError, "");
  EXPECT_EQ(result.standardOutput,
            "{\"valid\":false,\"error\":{\"type\":\"InvalidCredentialsException\","
            "\"message\":\"Authentication failed: Invalid user name or password\"}}\n");
}

TEST(CliAcquire, ReportsAWrongPasswordToPeople) {
  const ProcessResult result = RunCli(Shared().MakeAcquire(), "guess");
  EXPECT_EQ(result.exitCode, 1);
  EXPECT_EQ(result.standardOutput, "");
  EXPECT_EQ(result.standardError,
            "quorlin: Authentication failed: Invalid user name or password (InvalidCredentialsException)\n"
            "Check the user name and the password.\n");
}

TEST(CliAcquire, ReportsATokenOfAnUntrustedSigner) {
  const TestSupport::TemporaryDirectory files;
  std::vector<std::string> arguments = Shared().MakeAcquire({"--json"});
  *std::next(std::find(arguments.begin(), arguments.end(), "--sts-cert")) =
      files.WriteFile("other.pem", TestSupport::MakeCa().GetCertificatePem());
  const ProcessResult result = RunCli(arguments, "secret");
  EXPECT_EQ(result.exitCode, 1);
  EXPECT_EQ(Json::parse(result.standardOutput).at("error").at("type"), "InvalidSignatureException");
}

TEST(CliAcquire, ReportsAServiceThatIsDown) {
  const TestSupport::ClosedPort port;
  std::vector<std::string> arguments = Shared().MakeAcquire({"--json"});
  *std::next(std::find(arguments.begin(), arguments.end(), "--url")) =
      "https://127.0.0.1:" + std::to_string(port.GetPort()) + "/sts";
  const ProcessResult result = RunCli(arguments, "secret");
  EXPECT_EQ(result.exitCode, 3);
  EXPECT_EQ(
      result.standardOutput,
      "{\"valid\":false,\"error\":{\"type\":\"CommunicationException\",\"message\":\"Connection refused by "
      "127.0.0.1:" +
          std::to_string(port.GetPort()) + "\"}}\n");
}

TEST(CliAcquire, TrustsNoServerOfAnUnknownAuthority) {
  std::vector<std::string> arguments = Shared().MakeAcquire();
  const auto ca = std::find(arguments.begin(), arguments.end(), "--ca");
  arguments.erase(ca, std::next(ca, 2));
  const ProcessResult result = RunCli(arguments, "secret");
  EXPECT_EQ(result.exitCode, 3);
  EXPECT_EQ(result.standardError,
            "quorlin: Certificate of 127.0.0.1 is not trusted: issuer CN=Quorlin development CA "
            "(CommunicationException)\n"
            "If that is the service's authority, name its certificate with --ca. If not, somebody may stand "
            "between.\n");
}

TEST(CliAcquire, LeavesTheOldFileWhenThereIsNoToken) {
  const TestSupport::TemporaryDirectory files;
  const std::string path = files.WriteFile("token.xml", "old");
  EXPECT_EQ(RunCli(Shared().MakeAcquire({"--out", path}), "guess").exitCode, 1);
  EXPECT_EQ(files.ReadFile("token.xml"), "old");
  EXPECT_EQ(std::distance(std::filesystem::directory_iterator(files.GetPath()), {}), 1);
}

TEST(CliAcquire, WritesTheTokenForItsOwnerOnly) {
  const TestSupport::TemporaryDirectory files;
  const std::string path = files.WriteFile("token.xml", "old");
  chmod(path.c_str(), 0644);
  EXPECT_EQ(RunCli(Shared().MakeAcquire({"--out", path}), "secret").exitCode, 0);
  struct stat status;
  ASSERT_EQ(stat(path.c_str(), &status), 0);
  EXPECT_EQ(status.st_mode & 07777, 0600U);
  EXPECT_EQ(std::distance(std::filesystem::directory_iterator(files.GetPath()), {}), 1);
}

TEST(CliAcquire, ShowsTheLibrarysLinesOnRequest) {
  const ProcessResult result = RunCli(Shared().MakeAcquire({"--log"}), "secret");
  EXPECT_EQ(result.exitCode, 0);
  EXPECT_NE(
      result.standardError.find(" INFO Quorlin: SecurityTokenServiceImpl::AcquireToken sending request\n"),
      std::string::npos);
  EXPECT_EQ(result.standardError.find("secret"), std::string::npos);
}

TEST(CliAcquire, WarnsOfPlainHttp) {
  DevSts::ServiceConfig plain;
  plain.tls = false;
  const ServiceWithFiles service(plain);
  const ProcessResult result = RunCli(service.MakeAcquire(), "secret");
  EXPECT_EQ(result.exitCode, 0);
  EXPECT_EQ(result.standardError,
            "quorlin: warning: with an http: URL the password can be read on its way\n");
}

TEST(CliAcquire, ReportsAnAnswerThatWouldSteerTheTerminalInPlainCharacters) {
  const std::string fault =
      "<e:Envelope xmlns:e=\"http://schemas.xmlsoap.org/soap/envelope/\"><e:Body><e:Fault><faultcode "
      "xmlns:w=\"http://docs.oasis-open.org/ws-sx/ws-trust/200512\">w:FailedAuthentication</faultcode><faultstring>"
      "\xC2\x9B"
      "31m red &#x202E;drow \xC3\xA9</faultstring></e:Fault></e:Body></e:Envelope>";
  const TestSupport::LoopbackServer server(
      {TestSupport::AnswerEach({TestSupport::HttpAnswer("500 Internal Server Error", fault)})});
  std::vector<std::string> arguments = Shared().MakeAcquire();
  *std::next(std::find(arguments.begin(), arguments.end(), "--url")) =
      "http://" + server.GetEndpoint() + "/sts";
  const ProcessResult result = RunCli(arguments, "secret");
  EXPECT_EQ(result.exitCode, 1);
  EXPECT_EQ(
      result.standardError,
      "quorlin: warning: with an http: URL the password can be read on its way\n"
      "quorlin: Authentication failed: <U+009B>31m red <U+202E>drow \xC3\xA9 (InvalidCredentialsException)\n"
      "Check the user name and the password.\n");
}

/// Arguments after "acquire password", and what comes of them.
struct Misuse {
  const char* name;
  std::vector<std::string> arguments;
  const char* message;
};

class CliAcquireRefuses : public testing::TestWithParam<Misuse> {};

TEST_P(CliAcquireRefuses, AndSaysWhatToDo) {
  std::vector<std::string> arguments = {"acquire", "password"};
  arguments.insert(arguments.end(), GetParam().arguments.begin(), GetParam().arguments.end());
  const ProcessResult result = RunCli(arguments, "");
  EXPECT_EQ(result.exitCode, 2);
  EXPECT_EQ(result.standardOutput, "");
  EXPECT_EQ(result.standardError, GetParam().message);
}

constexpr const char* kPasswordRefused =
    "quorlin: a password on the command line can be seen by every user of this machine, so it is not taken from there; "
    "use --password-file, --password-stdin or the prompt (and change that password)\n"
    "Try quorlin acquire password --help\n";

const Misuse kMisuses[] = {
    {"NoUrl",
     {"--user", "a", "--sts-cert", "x"},
     "quorlin: --url is required\nTry quorlin acquire password --help\n"},
    {"PasswordArgument", {"--password", "topsecret"}, kPasswordRefused},
    {"PasswordArgumentInOne", {"--password=topsecret"}, kPasswordRefused},
    {"ShortPasswordArgument", {"-ptopsecret"}, kPasswordRefused},
    {"StrayValue",
     {"--url", "https://x", "--user", "a", "--sts-cert", "x", "topsecret"},
     "quorlin: not expected: a value without a flag\nTry quorlin acquire password --help\n"},
    {"UnknownFlag",
     {"--url", "https://x", "--user", "a", "--sts-cert", "x", "--pasword=topsecret"},
     "quorlin: not expected: --pasword\nTry quorlin acquire password --help\n"},
    {"TwoPasswordSources",
     {"--url", "https://x", "--user", "a", "--sts-cert", "x", "--password-stdin", "--password-file",
      "topsecret"},
     "quorlin: --password-file excludes --password-stdin\nTry quorlin acquire password --help\n"},
    {"UnreadableCertificate",
     {"--url", "https://x", "--user", "a", "--sts-cert", "/nonexistent/sts.pem", "--password-stdin"},
     "quorlin: cannot read /nonexistent/sts.pem: No such file or directory (UsageException)\n"},
    {"CertificateFileWithoutCertificate",
     {"--url", "https://x", "--user", "a", "--sts-cert", "/dev/null", "--password-stdin"},
     "quorlin: cannot use the certificates in /dev/null: The PEM text holds no certificate (the file is empty) "
     "(UsageException)\n"},
};

INSTANTIATE_TEST_SUITE_P(Table, CliAcquireRefuses, testing::ValuesIn(kMisuses),
                         [](const auto& test) { return std::string(test.param.name); });

/// Changes to arguments that are otherwise right.
struct BadValue {
  const char* name;
  std::vector<std::string> arguments;
  const char* password;
  const char* error;
};

class CliAcquireRefusesValue : public testing::TestWithParam<BadValue> {};

TEST_P(CliAcquireRefusesValue, AsJson) {
  const ProcessResult result = RunCli(Shared().MakeAcquire(GetParam().arguments), GetParam().password);
  EXPECT_EQ(result.exitCode, 2);
  EXPECT_EQ(result.standardError, "");
  EXPECT_EQ(result.standardOutput, std::string("{\"valid\":false,\"error\":") + GetParam().error + "}\n");
}

const BadValue kBadValues[] = {
    {"LifetimeOfZero",
     {"--json", "--lifetime", "0"},
     "secret",
     R"({"type":"InvalidArgumentException","message":"Invalid argument : Token lifetime must be positive"})"},
    {"EmptyPassword", {"--json"}, "", R"({"type":"UsageException","message":"the password is empty"})"},
    {"EmptyPasswordLine", {"--json"}, "\n", R"({"type":"UsageException","message":"the password is empty"})"},
    {"OutputDirectoryMissing",
     {"--json", "--out", "/nonexistent/token.xml"},
     "secret",
     R"({"type":"UsageException","message":"cannot write /nonexistent/token.xml: No such file or directory"})"},
};

INSTANTIATE_TEST_SUITE_P(Table, CliAcquireRefusesValue, testing::ValuesIn(kBadValues),
                         [](const auto& test) { return std::string(test.param.name); });

TEST(CliAcquire, RefusesAPasswordThatIsTooLong) {
  const ProcessResult result = RunCli(Shared().MakeAcquire(), std::string(5000, 'x'));
  EXPECT_EQ(result.exitCode, 2);
  EXPECT_EQ(result.standardError, "quorlin: the password is longer than 4096 bytes (UsageException)\n");
}

/// While the tool waits for a service that does not answer, everybody may look at its process.
TEST(CliAcquire, KeepsThePasswordOutOfItsArgumentsAndEnvironment) {
  TestSupport::LoopbackServer server({TestSupport::StaySilent});
  const TestSupport::TemporaryDirectory files;
  std::vector<std::string> arguments =
      Shared().MakeAcquire({"--password-file", files.WriteFile("p", "correct-horse")});
  arguments.erase(std::find(arguments.begin(), arguments.end(), "--password-stdin"));
  *std::next(std::find(arguments.begin(), arguments.end(), "--url")) =
      "http://" + server.GetEndpoint() + "/sts";
  ChildProcess process(MakeCommand(arguments), ChildProcess::Terminal::NONE);
  server.AwaitRequests(1);
  const std::string proc = "/proc/" + std::to_string(process.GetId());
  const std::string commandLine = ReadBytes(proc + "/cmdline");
  EXPECT_NE(commandLine.find("--password-file"), std::string::npos);
  EXPECT_EQ(commandLine.find("correct-horse"), std::string::npos);
  EXPECT_EQ(ReadBytes(proc + "/environ").find("correct-horse"), std::string::npos);
  EXPECT_NE(server.GetRecord(0).received.find("correct-horse"), std::string::npos);
  process.Signal(SIGTERM);
  EXPECT_EQ(process.Wait(), 128 + SIGTERM);
}

std::vector<std::string> MakeAsking() {
  std::vector<std::string> arguments = Shared().MakeAcquire();
  arguments.erase(std::find(arguments.begin(), arguments.end(), "--password-stdin"));
  return MakeCommand(arguments);
}

TEST(CliAcquire, AsksOnTheTerminalWithoutEcho) {
  ChildProcess process(MakeAsking(), ChildProcess::Terminal::OWN);
  process.ReadUntil("Password of alice@example.com: ");
  EXPECT_FALSE(process.HasEcho());
  process.Type("secret\n");
  const std::string output = process.ReadAll();
  EXPECT_EQ(process.Wait(), 0);
  EXPECT_NE(output.find("  subject       alice@example.com\r\n"), std::string::npos);
  EXPECT_EQ(output.find("secret"), std::string::npos);
}

TEST(CliAcquire, GivesTheEchoBackWhenASignalEndsIt) {
  for (const int signal : {SIGINT, SIGTERM, SIGHUP, SIGQUIT}) {
    ChildProcess process(MakeAsking(), ChildProcess::Terminal::OWN);
    process.ReadUntil("Password of alice@example.com: ");
    EXPECT_FALSE(process.HasEcho());
    process.Signal(signal);
    EXPECT_EQ(process.Wait(), 128 + signal);
    EXPECT_TRUE(process.HasEcho());
  }
}

TEST(CliAcquire, GivesTheEchoBackOnControlC) {
  ChildProcess process(MakeAsking(), ChildProcess::Terminal::OWN);
  process.ReadUntil("Password of alice@example.com: ");
  process.Type("half a sec\x03");
  EXPECT_EQ(process.Wait(), 128 + SIGINT);
  EXPECT_TRUE(process.HasEcho());
}

TEST(CliAcquire, SaysHowToGiveAPasswordWithoutATerminal) {
  std::vector<std::string> arguments = Shared().MakeAcquire({"--json"});
  arguments.erase(std::find(arguments.begin(), arguments.end(), "--password-stdin"));
  ChildProcess process(MakeCommand(arguments), ChildProcess::Terminal::NONE);
  EXPECT_EQ(
      process.ReadAll(),
      "{\"valid\":false,\"error\":{\"type\":\"UsageException\",\"message\":\"there is no terminal to ask for the "
      "password: use --password-file or --password-stdin\"}}\n");
  EXPECT_EQ(process.Wait(), 2);
}

}  // namespace
