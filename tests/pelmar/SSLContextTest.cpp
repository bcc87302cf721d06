// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

#include "pelmar/ssl/SSLContextImpl.h"
#include "support/Pki.h"
#include "support/Process.h"
#include "support/TemporaryDirectory.h"

#include <pelmar/Exception.h>
#include <pelmar/crypto/CryptoException.h>
#include <pelmar/ssl/SSLContext.h>

#include <openssl/bio.h>
#include <openssl/pem.h>
#include <openssl/ssl.h>

#include <gtest/gtest.h>

#include <cstdlib>
#include <filesystem>
#include <functional>
#include <memory>
#include <string>
#include <vector>

namespace {

using namespace Pelmar::Ssl;
using namespace TestSupport;
using Pelmar::Ref;

struct SslDeleter {
  void operator()(SSL_CTX* handle) const { SSL_CTX_free(handle); }
  void operator()(SSL* handle) const { SSL_free(handle); }
};

using ContextHandle = std::unique_ptr<SSL_CTX, SslDeleter>;
using SslHandle = std::unique_ptr<SSL, SslDeleter>;

const Identity& Ca() {
  static const Identity ca = MakeCa("TLS CA");
  return ca;
}

Identity MakeServer(const Identity& issuer) {
  CertificateSpec spec;
  spec.commonName = "localhost";
  spec.subjectAlternativeName = "DNS:localhost";
  return MakeIssued(issuer, spec);
}

X509* BorrowX509(const Identity& identity) {
  return Pelmar::Crypto::ToCertificateImpl(identity.certificate.Get())->GetX509();
}

ContextHandle MakeClientContext(const Ref<SSLContext>& subject) {
  ContextHandle context(SSL_CTX_new(TLS_client_method()));
  static_cast<const SSLContextImpl&>(*subject).ConfigureSslCtx(context.get());
  SSL_CTX_set_verify(context.get(), SSL_VERIFY_PEER, nullptr);
  return context;
}

ContextHandle MakeServerContext(const Identity& identity) {
  ContextHandle context(SSL_CTX_new(TLS_server_method()));
  const Identity server = identity;
  SSL_CTX_use_certificate(context.get(), BorrowX509(server));
  SSL_CTX_use_PrivateKey(context.get(), server.keyPair.GetHandle());
  return context;
}

struct Handshake {
  bool succeeded;
  long verifyResult;
  /// What the server saw: the client's subject, empty without a certificate, and how many certificates came.
  std::string clientSubject;
  int clientChainLength;
  int version;
};

/// Two ends in this thread, joined by memory: each is asked to go on until both are done or one gives up.
Handshake Shake(SSL_CTX* clientContext, SSL_CTX* serverContext) {
  const SslHandle client(SSL_new(clientContext));
  const SslHandle server(SSL_new(serverContext));
  BIO* clientEnd = nullptr;
  BIO* serverEnd = nullptr;
  BIO_new_bio_pair(&clientEnd, 0, &serverEnd, 0);
  SSL_set_bio(client.get(), clientEnd, clientEnd);
  SSL_set_bio(server.get(), serverEnd, serverEnd);
  SSL_set_connect_state(client.get());
  SSL_set_accept_state(server.get());
  const auto isWaiting = [](SSL* end, int result) {
    const int error = SSL_get_error(end, result);
    return error == SSL_ERROR_WANT_READ || error == SSL_ERROR_WANT_WRITE;
  };
  int clientResult = -1;
  int serverResult = -1;
  constexpr int kMaxRounds = 20;
  for (int round = 0; round < kMaxRounds && (clientResult != 1 || serverResult != 1); ++round) {
    clientResult = SSL_do_handshake(client.get());
    if (clientResult != 1 && !isWaiting(client.get(), clientResult)) {
      break;
    }
    serverResult = SSL_do_handshake(server.get());
    if (serverResult != 1 && !isWaiting(server.get(), serverResult)) {
      break;
    }
  }
  Handshake outcome = {clientResult == 1 && serverResult == 1, SSL_get_verify_result(client.get()), "", 0,
                       SSL_version(client.get())};
  if (X509* const shown = SSL_get0_peer_certificate(server.get())) {
    char* const subject = X509_NAME_oneline(X509_get_subject_name(shown), nullptr, 0);
    outcome.clientSubject = subject;
    OPENSSL_free(subject);
    // On the server's side the chain is without the leaf.
    outcome.clientChainLength = 1 + sk_X509_num(SSL_get_peer_cert_chain(server.get()));
  }
  return outcome;
}

Handshake ShakeWith(const SSLContextOptions& options, const Identity& server) {
  const ContextHandle serverContext = MakeServerContext(server);
  return Shake(MakeClientContext(CreateSSLContext(options)).get(), serverContext.get());
}

std::string RefusalOf(const SSLContextOptions& options) {
  try {
    CreateSSLContext(options);
  } catch (const Pelmar::Crypto::CryptoException& error) {
    return std::string("CryptoException: ") + error.what();
  } catch (const Pelmar::InvalidArgumentException& error) {
    return std::string("InvalidArgumentException: ") + error.what();
  }
  return "accepted";
}

/// Names the directory's file as OpenSSL's look-up by subject hash wants it.
std::string GetHashedName(const Identity& identity) {
  const ProcessResult hash = RunProcess({"openssl", "x509", "-noout", "-hash"}, identity.GetCertificatePem());
  return hash.standardOutput.substr(0, hash.standardOutput.find('\n')) + ".0";
}

TEST(SSLContext, TrustsServersThatChainToAnAnchor) {
  SSLContextOptions options;
  options.trustAnchors = {nullptr, MakeCa("Another").certificate, Ca().certificate};
  const Handshake outcome = ShakeWith(options, MakeServer(Ca()));
  EXPECT_TRUE(outcome.succeeded);
  EXPECT_EQ(outcome.verifyResult, X509_V_OK);
  EXPECT_EQ(outcome.version, TLS1_3_VERSION);
}

TEST(SSLContext, TrustsAServerWhoseOwnCertificateIsTheAnchor) {
  const Identity server = MakeServer(Ca());
  SSLContextOptions options;
  options.trustAnchors = Trust({server});
  EXPECT_TRUE(ShakeWith(options, server).succeeded);
}

TEST(SSLContext, WithoutAnchorsTrustsNobody) {
  const Handshake outcome = ShakeWith(SSLContextOptions(), MakeServer(Ca()));
  EXPECT_FALSE(outcome.succeeded);
  EXPECT_EQ(outcome.verifyResult, X509_V_ERR_UNABLE_TO_GET_ISSUER_CERT_LOCALLY);
}

TEST(SSLContext, ReplacesTheAnchorsThatTheTlsContextHadBefore) {
  const TemporaryDirectory directory;
  const std::string file = directory.WriteFile("ca.pem", Ca().GetCertificatePem());
  const ContextHandle client(SSL_CTX_new(TLS_client_method()));
  ASSERT_EQ(SSL_CTX_load_verify_locations(client.get(), file.c_str(), nullptr), 1);
  static_cast<const SSLContextImpl&>(*CreateSSLContext(SSLContextOptions())).ConfigureSslCtx(client.get());
  SSL_CTX_set_verify(client.get(), SSL_VERIFY_PEER, nullptr);
  const ContextHandle server = MakeServerContext(MakeServer(Ca()));
  EXPECT_FALSE(Shake(client.get(), server.get()).succeeded);
}

TEST(SSLContext, TrustsTheCertificatesOfAFile) {
  const TemporaryDirectory directory;
  SSLContextOptions options;
  options.caFile =
      directory.WriteFile("ca.pem", MakeCa("Another").GetCertificatePem() + Ca().GetCertificatePem());
  EXPECT_TRUE(ShakeWith(options, MakeServer(Ca())).succeeded);
}

TEST(SSLContext, TrustsTheCertificatesOfADirectory) {
  const TemporaryDirectory directory;
  directory.WriteFile(GetHashedName(Ca()), Ca().GetCertificatePem());
  SSLContextOptions options;
  options.caDirectory = directory.GetPath();
  EXPECT_TRUE(ShakeWith(options, MakeServer(Ca())).succeeded);
  EXPECT_FALSE(ShakeWith(options, MakeServer(MakeCa("Another"))).succeeded);
}

// The names of files and directories in the environment belong to whoever starts the process, not to whoever
// wrote it.
TEST(SSLContext, SystemStoreIsNotWhatTheEnvironmentNames) {
  const TemporaryDirectory directory;
  const std::string file = directory.WriteFile("ca.pem", Ca().GetCertificatePem());
  directory.WriteFile(GetHashedName(Ca()), Ca().GetCertificatePem());
  setenv("SSL_CERT_FILE", file.c_str(), 1);
  setenv("SSL_CERT_DIR", directory.GetPath().c_str(), 1);
  SSLContextOptions options;
  options.useSystemStore = true;
  std::string refusal;
  bool trusted = false;
  try {
    trusted = ShakeWith(options, MakeServer(Ca())).succeeded;
  } catch (const Pelmar::Crypto::CryptoException& error) {
    refusal = error.what();
  }
  unsetenv("SSL_CERT_FILE");
  unsetenv("SSL_CERT_DIR");
  EXPECT_FALSE(trusted);
  // A bare system has no trust store at all; that is said, not passed over.
  EXPECT_TRUE(refusal.empty() || refusal == "The operating system's trust store was not found") << refusal;
}

int CountAnchors(const SSLContextOptions& options) {
  const ContextHandle client = MakeClientContext(CreateSSLContext(options));
  return sk_X509_OBJECT_num(X509_STORE_get0_objects(SSL_CTX_get_cert_store(client.get())));
}

TEST(SSLContext, TrustsTheSystemsAnchorsOnlyWhenAskedTo) {
  SSLContextOptions options;
  EXPECT_EQ(CountAnchors(options), 0);
  options.useSystemStore = true;
  // A bare system has none.
  const bool hasFile = std::filesystem::is_regular_file(X509_get_default_cert_file()) ||
                       std::filesystem::is_regular_file("/etc/ssl/certs/ca-certificates.crt");
  if (!hasFile && !std::filesystem::is_directory(X509_get_default_cert_dir())) {
    EXPECT_EQ(RefusalOf(options), "CryptoException: The operating system's trust store was not found");
  } else {
    EXPECT_EQ(CountAnchors(options) > 0, hasFile);
  }
}

// Whatever the system's configuration of OpenSSL has as its defaults.
TEST(SSLContext, SetsTheLeastSecurityAndTheOldestVersion) {
  const ContextHandle client(SSL_CTX_new(TLS_client_method()));
  SSL_CTX_set_security_level(client.get(), 0);
  ASSERT_EQ(SSL_CTX_set_min_proto_version(client.get(), TLS1_VERSION), 1);
  static_cast<const SSLContextImpl&>(*CreateSSLContext(SSLContextOptions())).ConfigureSslCtx(client.get());
  EXPECT_EQ(SSL_CTX_get_security_level(client.get()), 2);
  EXPECT_EQ(SSL_CTX_get_min_proto_version(client.get()), TLS1_2_VERSION);
}

TEST(SSLContext, ShowsTheClientCertificateWithItsIntermediates) {
  const Identity intermediate = [] {
    CertificateSpec spec;
    spec.commonName = "Client CA";
    spec.keyNumber = 2;
    spec.ca = true;
    return MakeIssued(Ca(), spec);
  }();
  CertificateSpec spec;
  spec.commonName = "the client";
  const Identity client = MakeIssued(intermediate, spec);
  SSLContextOptions options;
  options.trustAnchors = Trust({Ca()});
  options.clientKey = client.GetKey();
  options.clientCertificate = client.certificate;
  options.clientCertificateChain = Trust({intermediate});

  const ContextHandle server = MakeServerContext(MakeServer(Ca()));
  X509_STORE_add_cert(SSL_CTX_get_cert_store(server.get()), BorrowX509(Ca()));
  SSL_CTX_set_verify(server.get(), SSL_VERIFY_PEER | SSL_VERIFY_FAIL_IF_NO_PEER_CERT, nullptr);
  const Handshake outcome = Shake(MakeClientContext(CreateSSLContext(options)).get(), server.get());
  EXPECT_TRUE(outcome.succeeded);
  EXPECT_EQ(outcome.clientSubject, "/CN=the client");
  EXPECT_EQ(outcome.clientChainLength, 2);
}

TEST(SSLContext, ShowsNoClientCertificateUnasked) {
  SSLContextOptions options;
  options.trustAnchors = Trust({Ca()});
  const ContextHandle server = MakeServerContext(MakeServer(Ca()));
  SSL_CTX_set_verify(server.get(), SSL_VERIFY_PEER, nullptr);
  const Handshake outcome = Shake(MakeClientContext(CreateSSLContext(options)).get(), server.get());
  EXPECT_TRUE(outcome.succeeded);
  EXPECT_EQ(outcome.clientSubject, "");
}

TEST(SSLContext, SpeaksTls12ButNothingOlder) {
  SSLContextOptions options;
  options.trustAnchors = Trust({Ca()});
  const ContextHandle client = MakeClientContext(CreateSSLContext(options));
  const ContextHandle server = MakeServerContext(MakeServer(Ca()));
  SSL_CTX_set_max_proto_version(server.get(), TLS1_2_VERSION);
  EXPECT_EQ(Shake(client.get(), server.get()).version, TLS1_2_VERSION);
  // Security level 0 lets the server's side offer the old versions at all.
  SSL_CTX_set_security_level(server.get(), 0);
  SSL_CTX_set_max_proto_version(server.get(), TLS1_1_VERSION);
  EXPECT_FALSE(Shake(client.get(), server.get()).succeeded);
}

TEST(SSLContext, RefusesHalfAnIdentity) {
  const Identity client = MakeServer(Ca());
  SSLContextOptions options;
  options.clientKey = client.GetKey();
  EXPECT_EQ(RefusalOf(options),
            "InvalidArgumentException: Invalid argument : the client key has no client certificate");
  options.clientKey = nullptr;
  options.clientCertificate = client.certificate;
  EXPECT_EQ(RefusalOf(options),
            "InvalidArgumentException: Invalid argument : the client certificate has no client key");
  options.clientCertificate = nullptr;
  options.clientCertificateChain = Trust({Ca()});
  EXPECT_EQ(
      RefusalOf(options),
      "InvalidArgumentException: Invalid argument : the client certificate chain has no client certificate");
}

TEST(SSLContext, RefusesAKeyOfAnotherCertificate) {
  SSLContextOptions options;
  options.clientKey = Ca().GetKey();
  options.clientCertificate = MakeServer(Ca()).certificate;
  EXPECT_EQ(RefusalOf(options), "CryptoException: The client key does not belong to the client certificate");
}

TEST(SSLContext, RefusesAKeyOfAnotherImplementation) {
  class Foreign final : public Pelmar::Crypto::PrivateKey {
   public:
    Pelmar::Crypto::KeyType GetType() const override { return Pelmar::Crypto::KEY_RSA; }
    std::vector<unsigned char> Sign(Pelmar::Crypto::DigestAlgorithm, const void*,
                                    std::size_t) const override {
      return {};
    }
  };
  SSLContextOptions options;
  options.clientKey = Pelmar::MakeRef<Foreign>();
  options.clientCertificate = MakeServer(Ca()).certificate;
  EXPECT_EQ(RefusalOf(options),
            "InvalidArgumentException: Invalid argument : the client key was not made by this platform");
}

TEST(SSLContext, RefusesAnchorsThatCannotBeRead) {
  const TemporaryDirectory directory;
  SSLContextOptions options;
  options.caFile = directory.GetPath("missing.pem");
  EXPECT_EQ(RefusalOf(options), "CryptoException: The certificate file '" + options.caFile +
                                    "' cannot be used: No such file or directory");
  options.caFile = directory.WriteFile("empty.pem", "nothing");
  EXPECT_EQ(RefusalOf(options), "CryptoException: The certificate file '" + options.caFile +
                                    "' cannot be used: The PEM text holds no certificate");
  options.caFile = directory.GetPath();
  EXPECT_EQ(RefusalOf(options), "CryptoException: The certificate file '" + options.caFile +
                                    "' cannot be used: it cannot be read");
  options.caFile.clear();
  options.caDirectory = directory.GetPath("missing");
  EXPECT_EQ(RefusalOf(options), "CryptoException: The certificate directory '" + options.caDirectory +
                                    "' cannot be used: there is no such directory");
  options.caDirectory = "/a:/b";
  EXPECT_EQ(RefusalOf(options),
            "CryptoException: The certificate directory '/a:/b' cannot be used: its name holds a ':'");
}

}  // namespace
