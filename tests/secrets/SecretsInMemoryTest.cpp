// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

// After a call no copy of its password, pass phrase or key is in the memory of the process, but the host's
// own.

#include "secrets/MemoryScan.h"

#include "support/HttpScripts.h"
#include "support/LoopbackServer.h"
#include "support/Pki.h"
#include "support/Process.h"
#include "support/ServiceAnswers.h"
#include "support/TemporaryDirectory.h"

#include <pelmar/StringUtil.h>

#include <gtest/gtest.h>

#include <random>
#include <string>
#include <vector>

namespace Secrets {
namespace {

using TestSupport::AnswerEach;
using TestSupport::HttpAnswer;
using TestSupport::LoopbackServer;
using TestSupport::ServerConnection;
using TestSupport::TemporaryDirectory;

/// Short enough to stand in a std::string itself; longer; longer than the buffers it is written through.
constexpr std::size_t kLengths[] = {12, 40, 5000};

std::string MakeRandomText(std::size_t length) {
  static const std::string kLetters = "ABCDEFGHIJKLMNOPQRSTUVWXYZabcdefghijklmnopqrstuvwxyz0123456789";
  static std::mt19937_64 device{std::random_device()()};
  std::uniform_int_distribution<std::size_t> draw(0, kLetters.size() - 1);
  std::string text;
  while (text.size() < length) {
    text += kLetters[draw(device)];
  }
  return text;
}

/// What the probe prints.
std::string Probe(const std::string& scenario, const std::vector<std::string>& arguments,
                  const std::vector<std::string>& secrets) {
  std::vector<std::string> command = {QUORLIN_SECRETS_PROBE_PATH, scenario};
  command.insert(command.end(), arguments.begin(), arguments.end());
  command.emplace_back("--");
  for (const std::string& secret : secrets) {
    command.push_back(Mask(secret));
  }
  const TestSupport::ProcessResult result = TestSupport::RunProcess(command);
  return result.standardOutput + result.standardError;
}

// --- The scan itself ---

TEST(MemoryScan, FindsWhatWasLeftOnTheHeap) {
  const std::string output = Probe("leave-on-heap", {}, {MakeRandomText(40)});
  EXPECT_EQ(output.substr(0, 12), "left\nfound: ") << output;
}

TEST(MemoryScan, FindsTheRestOfAShortText) {
  const std::string output = Probe("leave-rest-of-short-text", {}, {MakeRandomText(12)});
  EXPECT_EQ(output.substr(0, 12), "left\nfound: ") << output;
}

TEST(MemoryScan, FindsNothingWhereNothingIs) {
  for (const std::size_t length : kLengths) {
    EXPECT_EQ(Probe("leave-nothing", {}, {MakeRandomText(length)}), "done\n");
  }
}

// --- Passwords ---

std::string Answer(const std::string& status, const std::string& envelope) {
  return HttpAnswer(status, envelope, "Content-Type: text/xml\r\n");
}

struct Ending {
  const char* name;
  LoopbackServer::Script script;
  std::string outcome;       ///< Of the blocking call.
  std::string asyncOutcome;  ///< Of the asynchronous one.
};

std::vector<Ending> MakeEndings() {
  const std::string token = TestSupport::IssueAnswer(TestSupport::SignedToken("valid"));
  const std::string fault = TestSupport::FaultAnswer("wst:FailedAuthentication", "No.");
  return {
      {"a token", AnswerEach({Answer("200 OK", token)}), "accepted\n", "no error\n"},
      {"a fault", AnswerEach({Answer("500 Internal Server Error", fault)}),
       "Quorlin::InvalidCredentialsException: Authentication failed: No.\n", "Authentication failed: No.\n"},
      {"no sense", AnswerEach({Answer("200 OK", "<a/>")}),
       "Quorlin::SsoException: Unexpected response format: missing SAOP Body.\n",
       "Unexpected response format: missing SAOP Body.\n"},
      {"another status", AnswerEach({Answer("404 Not Found", "")}),
       "Quorlin::CommunicationException: Server returned error: 404 Not Found\n",
       "Server returned error: 404 Not Found\n"},
  };
}

TEST(SecretsInMemory, NoPasswordIsLeftByABlockingCall) {
  for (const Ending& ending : MakeEndings()) {
    for (const std::size_t length : kLengths) {
      LoopbackServer server({ending.script});
      const std::string url = "http://" + server.GetEndpoint() + "/sts";
      EXPECT_EQ(Probe("acquire", {url, "", "", ""}, {MakeRandomText(length)}), ending.outcome)
          << ending.name << ", " << length;
    }
  }
}

TEST(SecretsInMemory, NoPasswordIsLeftByAnAsynchronousCall) {
  for (const Ending& ending : MakeEndings()) {
    for (const std::size_t length : kLengths) {
      LoopbackServer server({ending.script});
      const std::string url = "http://" + server.GetEndpoint() + "/sts";
      EXPECT_EQ(Probe("acquire-async", {url, "", "", ""}, {MakeRandomText(length)}), ending.asyncOutcome)
          << ending.name << ", " << length;
    }
  }
}

class TlsService final {
 public:
  explicit TlsService(const LoopbackServer::Script& script, const char* authority = "Test CA")
      : _ca(TestSupport::MakeCa(authority)),
        _server(TestSupport::TlsServerSettings(MakeServer(_ca)), {script}) {
    _files.WriteFile("ca.pem", _ca.GetCertificatePem());
  }

  std::string GetUrl() const { return "https://" + _server.GetEndpoint() + "/sts"; }
  std::string GetCaFile() const { return _files.GetPath("ca.pem"); }

 private:
  static TestSupport::Identity MakeServer(const TestSupport::Identity& ca) {
    TestSupport::CertificateSpec spec;
    spec.commonName = "Test server";
    spec.subjectAlternativeName = "IP:127.0.0.1";
    return TestSupport::MakeIssued(ca, spec);
  }

  const TestSupport::Identity _ca;
  const TemporaryDirectory _files;
  LoopbackServer _server;
};

TEST(SecretsInMemory, NoPasswordIsLeftByTls) {
  for (const Ending& ending : MakeEndings()) {
    for (const std::size_t length : kLengths) {
      const TlsService service(ending.script);
      EXPECT_EQ(Probe("acquire", {service.GetUrl(), service.GetCaFile(), "", ""}, {MakeRandomText(length)}),
                ending.outcome)
          << ending.name << ", " << length;
    }
  }
}

/// The outcome's class; its text tells what the system had to say.
std::string GetClass(const std::string& output) {
  const std::size_t colon = output.find(": ");
  const std::size_t lineEnd = output.find('\n');
  return output.substr(0, colon) + output.substr(lineEnd);
}

TEST(SecretsInMemory, NoPasswordIsLeftWhenTheServerBreaksOff) {
  const LoopbackServer::Script breakOff = [](ServerConnection& connection) {
    connection.ReadSome();
    connection.Reset();
  };
  for (const std::size_t length : kLengths) {
    LoopbackServer server({breakOff});
    const std::string url = "http://" + server.GetEndpoint() + "/sts";
    const TlsService service(breakOff);
    EXPECT_EQ(GetClass(Probe("acquire", {url, "", "", ""}, {MakeRandomText(length)})),
              "Quorlin::CommunicationException\n");
    EXPECT_EQ(
        GetClass(Probe("acquire", {service.GetUrl(), service.GetCaFile(), "", ""}, {MakeRandomText(length)})),
        "Quorlin::CommunicationException\n");
  }
}

TEST(SecretsInMemory, NoPasswordIsLeftWhenTheServerIsNotTrusted) {
  const TlsService service(AnswerEach({Answer("200 OK", "")}));
  const TlsService other(AnswerEach({Answer("200 OK", "")}), "Other CA");
  for (const std::size_t length : kLengths) {
    EXPECT_EQ(
        GetClass(Probe("acquire", {service.GetUrl(), other.GetCaFile(), "", ""}, {MakeRandomText(length)})),
        "Quorlin::CommunicationException\n");
  }
}

TEST(SecretsInMemory, NoPasswordIsLeftWhenXmlCannotCarryIt) {
  for (const std::size_t length : kLengths) {
    EXPECT_EQ(Probe("acquire", {"http://127.0.0.1:1/sts", "", "", ""}, {MakeRandomText(length) + "\x01"}),
              "Pelmar::InvalidArgumentException: Invalid argument : the text of a node is not XML text\n");
  }
}

class ClientFiles final {
 public:
  ClientFiles() {
    TestSupport::CertificateSpec spec;
    spec.commonName = "Client";
    const TestSupport::Identity client = TestSupport::MakeSelfSigned(spec);
    _files.WriteFile("key.pem", client.GetKeyPem());
    _files.WriteFile("cert.pem", client.GetCertificatePem());
  }
  std::string GetKey() const { return _files.GetPath("key.pem"); }
  std::string GetCertificate() const { return _files.GetPath("cert.pem"); }

 private:
  const TemporaryDirectory _files;
};

TEST(SecretsInMemory, NoPasswordIsLeftByASignedRequest) {
  const ClientFiles files;
  for (const Ending& ending : MakeEndings()) {
    for (const std::size_t length : kLengths) {
      LoopbackServer server({ending.script});
      const std::string url = "http://" + server.GetEndpoint() + "/sts";
      EXPECT_EQ(Probe("acquire", {url, "", files.GetKey(), files.GetCertificate()}, {MakeRandomText(length)}),
                ending.outcome)
          << ending.name << ", " << length;
    }
  }
}

// --- Negotiation legs ---

TEST(SecretsInMemory, NoLegIsLeftByANegotiation) {
  const ClientFiles files;
  const std::string fault = TestSupport::FaultAnswer("wst:FailedAuthentication", "No.");
  for (const bool isSigned : {false, true}) {
    for (const std::size_t length : kLengths) {
      const std::string leg = MakeRandomText(length);
      const std::string text =
          Pelmar::StringUtil::Base64Encode(std::vector<unsigned char>(leg.begin(), leg.end()));
      LoopbackServer server({AnswerEach({Answer("500 Internal Server Error", fault)})});
      const std::string url = "http://" + server.GetEndpoint() + "/sts";
      EXPECT_EQ(Probe("negotiate",
                      {url, "", isSigned ? files.GetKey() : "", isSigned ? files.GetCertificate() : ""},
                      {leg, text}),
                "Quorlin::InvalidCredentialsException: Authentication failed: No.\n")
          << length;
    }
  }
}

// --- Pass phrases ---

constexpr TestSupport::KeyKind kKeyKinds[] = {TestSupport::KeyKind::RSA_2048, TestSupport::KeyKind::EC_P256,
                                              TestSupport::KeyKind::EC_P384, TestSupport::KeyKind::EC_P521};

std::string ToText(const std::vector<unsigned char>& bytes) {
  return std::string(bytes.begin(), bytes.end());
}

TEST(SecretsInMemory, NoPassPhraseIsLeft) {
  for (const TestSupport::KeyKind kind : kKeyKinds) {
    const TestSupport::KeyPair key = TestSupport::KeyPair::Get(kind);
    for (const std::size_t length : {12, 40, 800}) {
      const TemporaryDirectory files;
      const std::string phrase = MakeRandomText(length);
      EXPECT_EQ(Probe("encrypted-pem-key", {files.WriteFile("a.pem", key.ToEncryptedPem(phrase))}, {phrase}),
                "accepted\n");
      EXPECT_EQ(
          Probe("encrypted-pem-key", {files.WriteFile("b.pem", key.ToTraditionalPem(phrase))}, {phrase}),
          "accepted\n");
      EXPECT_EQ(Probe("encrypted-der-key", {files.WriteFile("c.der", ToText(key.ToEncryptedDer(phrase)))},
                      {phrase}),
                "accepted\n");
    }
  }
}

TEST(SecretsInMemory, NoWrongPassPhraseIsLeft) {
  const TestSupport::KeyPair key = TestSupport::KeyPair::Get(TestSupport::KeyKind::RSA_2048);
  const TemporaryDirectory files;
  for (const std::size_t length : kLengths) {
    const std::string phrase = MakeRandomText(length);
    const std::string refusal =
        "Pelmar::Crypto::CryptoException: The private key cannot be read: the pass phrase is wrong or the key "
        "is damaged\n";
    EXPECT_EQ(Probe("encrypted-pem-key", {files.WriteFile("a.pem", key.ToEncryptedPem("right"))}, {phrase}),
              refusal);
    EXPECT_EQ(Probe("encrypted-pem-key", {files.WriteFile("b.pem", key.ToTraditionalPem("right"))}, {phrase}),
              refusal);
    EXPECT_EQ(
        Probe("encrypted-der-key", {files.WriteFile("c.der", ToText(key.ToEncryptedDer("right")))}, {phrase}),
        refusal);
  }
}

// --- The tool ---

TEST(SecretsInMemory, NothingIsLeftByTheToolReadingAPassword) {
  for (const std::size_t length : {12, 40, 4096}) {
    const TemporaryDirectory files;
    const std::string password = MakeRandomText(length);
    EXPECT_EQ(Probe("password-file", {files.WriteFile("password", password + "\n")}, {password}),
              std::to_string(length) + " bytes\n");
  }
}

TEST(SecretsInMemory, NothingIsLeftByTheToolReadingAKey) {
  for (const std::size_t length : {40, 5000, 200000}) {
    const TemporaryDirectory files;
    const std::string content = MakeRandomText(length);
    EXPECT_EQ(Probe("key-file", {files.WriteFile("key", content)}, {content.substr(0, 3000)}),
              std::to_string(length) + " bytes\n");
  }
}

}  // namespace
}  // namespace Secrets
