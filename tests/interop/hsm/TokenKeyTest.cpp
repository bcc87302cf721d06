// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

// Keys that were made in a token of SoftHSM and never leave it: what they sign is judged by the openssl
// program and by ourselves.

#include "interop/hsm/SoftHsm.h"
#include "pelmar/crypto/SignatureValue.h"
#include "support/HttpCalls.h"
#include "support/LoopbackServer.h"
#include "support/Process.h"

#include <pelmar/Exception.h>
#include <pelmar/crypto/CryptoException.h>
#include <pelmar/crypto/Pkcs11.h>
#include <pelmar/http/Client.h>
#include <pelmar/ssl/SSLContext.h>

#include <gtest/gtest.h>

#include <openssl/ssl.h>

#include <functional>
#include <stdexcept>
#include <string>
#include <thread>
#include <vector>

namespace {

using namespace HsmTests;
using namespace Pelmar::Crypto;
using namespace TestSupport;
using Pelmar::Ref;
using Bytes = std::vector<unsigned char>;

const std::string kText = "what is signed";

const SoftHsm& Hsm() {
  return SoftHsm::Shared();
}

std::string RefusalOf(const std::function<void()>& action) {
  try {
    action();
  } catch (const Pelmar::Exception& error) {
    return error.what();
  }
  return "accepted";
}

PinFunction Answer(const std::string& pin) {
  return [pin] {
    return pin;
  };
}

Ref<const PrivateKey> Open(const TokenKey& key, const PinFunction& askPin = Answer(kPin)) {
  return CreatePrivateKeyFromPkcs11(Hsm().MakeUri(key.label), key.certificate, askPin);
}

Bytes Sign(const PrivateKey* key, DigestAlgorithm digest = DIGEST_SHA256) {
  return key->Sign(digest, kText.data(), kText.size());
}

bool Verifies(const TokenKey& key, DigestAlgorithm digest, const Bytes& value) {
  return VerifySignatureValue(key.certificate.Get(), digest,
                              ComputeDigest(digest, kText.data(), kText.size()), value);
}

TEST(TokenKey, SignsWithRsa) {
  const TokenKey made = Hsm().MakeKey("rsa");
  const Ref<const PrivateKey> key = Open(made);
  EXPECT_EQ(key->GetType(), KEY_RSA);
  for (const DigestAlgorithm digest : {DIGEST_SHA256, DIGEST_SHA384, DIGEST_SHA512}) {
    EXPECT_TRUE(Verifies(made, digest, Sign(key.Get(), digest)));
  }
}

TEST(TokenKey, SignsWithEcdsa) {
  const struct {
    const char* kind;
    std::size_t valueBytes;
  } cases[] = {{"EC:prime256v1", 64}, {"EC:secp521r1", 132}};
  for (const auto& c : cases) {
    const TokenKey made = Hsm().MakeKey(std::string(c.kind).substr(3), c.kind);
    const Ref<const PrivateKey> key = Open(made);
    EXPECT_EQ(key->GetType(), KEY_EC);
    const Bytes value = Sign(key.Get(), DIGEST_SHA384);
    EXPECT_EQ(value.size(), c.valueBytes);
    EXPECT_TRUE(Verifies(made, DIGEST_SHA384, value));
  }
}

TEST(TokenKey, SignsWhatTheOpensslProgramVerifies) {
  const TokenKey made = Hsm().MakeKey("judged");
  const Bytes value = Sign(Open(made).Get());
  const TemporaryDirectory files;
  const ProcessResult key = RunProcess({"openssl", "x509", "-noout", "-pubkey", "-in",
                                        files.WriteFile("cert.pem", made.certificate->ToPem())});
  const std::vector<std::string> verify = {"openssl",
                                           "dgst",
                                           "-sha256",
                                           "-verify",
                                           files.WriteFile("key.pem", key.standardOutput),
                                           "-signature",
                                           files.WriteFile("value", std::string(value.begin(), value.end()))};
  EXPECT_EQ(RunProcess(verify, kText).standardOutput, "Verified OK\n");
  EXPECT_EQ(RunProcess(verify, kText + "!").exitCode, 1);
}

// The token's own word for it.
TEST(TokenKey, NeverLeavesItsToken) {
  const TokenKey made = Hsm().MakeKey("hidden");
  Sign(Open(made).Get());
  const std::string listed =
      Hsm().RunTool("quorlin test", {"--list-objects", "--type", "privkey", "--label", "hidden"});
  EXPECT_NE(listed.find("Access:     sensitive, always sensitive, never extractable, local\n"),
            std::string::npos)
      << listed;
}

TEST(TokenKey, SignsOnSeveralThreadsAtOnce) {
  const TokenKey made = Hsm().MakeKey("shared", "EC:prime256v1");
  const Ref<const PrivateKey> key = Open(made);
  std::vector<std::thread> threads;
  for (int i = 0; i < 8; ++i) {
    threads.emplace_back([&] {
      for (int j = 0; j < 25; ++j) {
        EXPECT_TRUE(Verifies(made, DIGEST_SHA256, Sign(key.Get())));
      }
    });
  }
  for (std::thread& thread : threads) {
    thread.join();
  }
}

TEST(TokenKey, IsNamedByItsIdToo) {
  const TokenKey made = Hsm().MakeKey("numbered");
  const std::string uri = "pkcs11:token=quorlin%20test;id=%6eumbere%64?module-path=" + Hsm().GetModule();
  EXPECT_TRUE(Verifies(made, DIGEST_SHA256,
                       Sign(CreatePrivateKeyFromPkcs11(uri, made.certificate, Answer(kPin)).Get())));
}

// --- PINs ---

TEST(TokenKey, TakesThePinFromAFile) {
  const TokenKey made = Hsm().MakeKey("filed");
  const std::string file = Hsm().GetFiles().WriteFile("pin", std::string(kPin) + "\n");
  const PinFunction refuse = []() -> std::string {
    throw std::runtime_error("nobody was to be asked");
  };
  const Ref<const PrivateKey> key = CreatePrivateKeyFromPkcs11(
      Hsm().MakeUri("filed") + "&pin-source=file:" + file, made.certificate, refuse);
  EXPECT_TRUE(Verifies(made, DIGEST_SHA256, Sign(key.Get())));
}

// In a token of its own: where the process is logged in already, no PIN is looked at.
TEST(TokenKey, RefusesAWrongPinAndTakesTheRightOneAfterIt) {
  const TokenKey made = Hsm().MakeKey("key", "rsa:2048", "guarded");
  const std::string uri = Hsm().MakeUri("key", "guarded");
  int asked = 0;
  const PinFunction askWrong = [&asked] {
    ++asked;
    return std::string("9999");
  };
  EXPECT_EQ(RefusalOf([&] { CreatePrivateKeyFromPkcs11(uri, made.certificate, askWrong); }),
            "The PKCS #11 key cannot be loaded: PIN incorrect");
  EXPECT_EQ(asked, 1);
  EXPECT_TRUE(Verifies(made, DIGEST_SHA256,
                       Sign(CreatePrivateKeyFromPkcs11(uri, made.certificate, Answer(kPin)).Get())));
}

// The engine would go on with the PIN that it has: a wrong one there.
TEST(TokenKey, KeepsThePinsOfTokensApart) {
  const TokenKey first = Hsm().MakeKey("first");
  const TokenKey second = Hsm().MakeKey("second-key", "rsa:2048", "second");
  const Ref<const PrivateKey> keys[] = {Open(first),
                                        CreatePrivateKeyFromPkcs11(Hsm().MakeUri("second-key", "second"),
                                                                   second.certificate, Answer(kSecondPin)),
                                        Open(first)};
  EXPECT_TRUE(Verifies(first, DIGEST_SHA256, Sign(keys[0].Get())));
  EXPECT_TRUE(Verifies(second, DIGEST_SHA256, Sign(keys[1].Get())));
  EXPECT_TRUE(Verifies(first, DIGEST_SHA256, Sign(keys[2].Get())));
}

TEST(TokenKey, NeedsAPin) {
  const TokenKey made = Hsm().MakeKey("pinless");
  EXPECT_EQ(
      RefusalOf([&] { Open(made, PinFunction()); }),
      "There is no PIN for the PKCS #11 token: the URI has no pin-source, and there is no function to ask");
  EXPECT_EQ(RefusalOf([&] { Open(made, Answer("")); }),
            "The PIN is empty, has more than 255 bytes, or holds a zero byte");
}

TEST(TokenKey, TellsWhyThereIsNoPin) {
  const TokenKey made = Hsm().MakeKey("unasked");
  EXPECT_EQ(
      RefusalOf([&] { Open(made, []() -> std::string { throw std::runtime_error("nobody is there"); }); }),
      "The PIN cannot be had: nobody is there");
}

// --- Tokens that want the PIN for each signature ---

TEST(TokenKey, AsksForThePinOfEachSignatureWhenTheTokenWantsIt) {
  const TokenKey made = Hsm().MakeKey("careful", "rsa:2048", "quorlin test", {"--always-auth"});
  int asked = 0;
  const Ref<const PrivateKey> key = Open(made, [&asked] {
    ++asked;
    return std::string(kPin);
  });
  EXPECT_EQ(asked, 1);
  EXPECT_TRUE(Verifies(made, DIGEST_SHA256, Sign(key.Get())));
  EXPECT_TRUE(Verifies(made, DIGEST_SHA256, Sign(key.Get())));
  EXPECT_EQ(asked, 3);
}

// --- What cannot be used ---

TEST(TokenKey, RefusesTheCertificateOfAnotherKey) {
  Hsm().MakeKey("one");
  const TokenKey other = Hsm().MakeKey("other");
  EXPECT_EQ(
      RefusalOf([&] { CreatePrivateKeyFromPkcs11(Hsm().MakeUri("one"), other.certificate, Answer(kPin)); }),
      "The PKCS #11 key does not belong to the certificate, or its public half is not in the token");
}

TEST(TokenKey, RefusesAnEcKeyWithoutItsPublicHalf) {
  const TokenKey made = Hsm().MakeKey("half", "EC:prime256v1");
  Hsm().RunTool("quorlin test", {"--delete-object", "--type", "pubkey", "--label", "half"});
  EXPECT_EQ(RefusalOf([&] { Open(made); }),
            "The PKCS #11 key does not belong to the certificate, or its public half is not in the token");
}

TEST(TokenKey, NeedsACertificate) {
  EXPECT_EQ(RefusalOf([] { CreatePrivateKeyFromPkcs11(Hsm().MakeUri("any"), nullptr, Answer(kPin)); }),
            "Invalid argument : a key in a PKCS #11 token needs its certificate");
}

TEST(TokenKey, TellsWhatIsNotThere) {
  const TokenKey made = Hsm().MakeKey("there");
  const std::string module = "?module-path=" + Hsm().GetModule();
  const struct {
    std::string uri;
    std::string message;
  } cases[] = {
      {"pkcs11:token=quorlin%20test;object=nowhere" + module,
       "The PKCS #11 key cannot be loaded: object not found"},
      {"pkcs11:token=nowhere;object=there" + module, "The PKCS #11 key cannot be loaded: object not found"},
      {"pkcs11:token=quorlin%20test;id=%77" + module, "The PKCS #11 key cannot be loaded: object not found"},
      {"pkcs11:token=quorlin%20test;object=there" + module + "&pin-source=/nowhere/pin",
       "The PIN file '/nowhere/pin' cannot be used: No such file or directory"},
  };
  for (const auto& c : cases) {
    EXPECT_EQ(RefusalOf([&] { CreatePrivateKeyFromPkcs11(c.uri, made.certificate, Answer(kPin)); }),
              c.message);
  }
}

TEST(TokenKey, RefusesASecondModule) {
  const TokenKey made = Hsm().MakeKey("modular");
  const Ref<const PrivateKey> key = Open(made);
  EXPECT_EQ(RefusalOf([&] {
              CreatePrivateKeyFromPkcs11("pkcs11:token=quorlin%20test;object=modular?module-path=/other.so",
                                         made.certificate, Answer(kPin));
            }),
            "The PKCS #11 module '/other.so' cannot be used: this process uses '" + Hsm().GetModule() +
                "' already");
  EXPECT_TRUE(Verifies(made, DIGEST_SHA256, Sign(key.Get())));
}

// --- TLS ---

void AnswerAndClose(ServerConnection& connection) {
  connection.ReadRequest();
  connection.Send("HTTP/1.1 200 OK\r\nContent-Length: 5\r\nConnection: close\r\n\r\nhello");
  connection.Close();
}

class TokenKeyInTls : public testing::TestWithParam<int> {};

INSTANTIATE_TEST_SUITE_P(Versions, TokenKeyInTls, testing::Values(TLS1_2_VERSION, TLS1_3_VERSION),
                         [](const testing::TestParamInfo<int>& version) {
                           return version.param == TLS1_2_VERSION ? "Tls12" : "Tls13";
                         });

TEST_P(TokenKeyInTls, ProvesWhoTheClientIs) {
  const Identity ca = MakeCa("Servers");
  CertificateSpec server;
  server.subjectAlternativeName = "IP:127.0.0.1";
  TlsServerSettings settings(MakeIssued(ca, server));
  settings.clientCa = Hsm().GetAuthority();
  settings.maxVersion = GetParam();
  const std::string version = std::to_string(GetParam());
  for (const TokenKey& made :
       {Hsm().MakeKey("client" + version), Hsm().MakeKey("ec-client" + version, "EC:prime256v1")}) {
    LoopbackServer peer(settings, {AnswerAndClose});
    Pelmar::Ssl::SSLContextOptions options;
    options.trustAnchors = Trust({ca});
    options.clientKey = Open(made);
    options.clientCertificate = made.certificate;
    const Ref<Pelmar::Http::UserAgent> agent = MakeAgent(Pelmar::Http::CreateSSLConnectionSpec(
        Pelmar::Http::CreateTCPConnectionSpec("127.0.0.1", peer.GetPort()),
        Pelmar::Ssl::CreateSSLContext(options), "127.0.0.1", ""));
    EXPECT_EQ(Call(*agent, MakePost("/", "hello")), "200 OK|hello") << made.label;
  }
}

}  // namespace
