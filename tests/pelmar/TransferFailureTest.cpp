// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

// Failures that a peer on the loopback interface cannot cause.

#include "pelmar/http/TransferFailure.h"

#include <pelmar/http/HttpException.h>

#include <gtest/gtest.h>

#include <cerrno>
#include <memory>
#include <string>
#include <typeinfo>

namespace {

using namespace Pelmar::Http;

TransferFacts MakeFacts(CURLcode code, const std::string& engineText = "", int systemError = 0) {
  TransferFacts facts;
  facts.code = code;
  facts.engineText = engineText;
  facts.systemError = systemError;
  facts.host = "sts.test";
  facts.endpoint = "sts.test:443";
  facts.serverName = "sts.test";
  return facts;
}

std::string Tell(const TransferFacts& facts) {
  return DescribeFailure(facts)->what();
}

TEST(TransferFailure, TellsTheSystemsReasonForNoConnection) {
  EXPECT_EQ("No connection to sts.test:443: Network is unreachable",
            Tell(MakeFacts(CURLE_COULDNT_CONNECT, "", ENETUNREACH)));
  EXPECT_EQ("No connection to sts.test:443: No route to host",
            Tell(MakeFacts(CURLE_COULDNT_CONNECT, "", EHOSTUNREACH)));
  EXPECT_EQ("No connection to sts.test:443", Tell(MakeFacts(CURLE_COULDNT_CONNECT)));
}

TEST(TransferFailure, IsATimeoutWhenConnectingTakesTooLong) {
  const std::shared_ptr<const HttpException> failure = DescribeFailure(MakeFacts(CURLE_OPERATION_TIMEDOUT));
  EXPECT_STREQ("No connection to sts.test:443 within 300 s", failure->what());
  EXPECT_TRUE(typeid(*failure) == typeid(HttpTimeoutException));
}

TEST(TransferFailure, TellsTheConnectTimeoutThatPassed) {
  TransferFacts facts = MakeFacts(CURLE_OPERATION_TIMEDOUT);
  facts.connectTimeoutMicroseconds = 1500000;
  EXPECT_EQ("No connection to sts.test:443 within 1.5 s", Tell(facts));
}

TEST(TransferFailure, TellsAProxyThatIsNotFound) {
  TransferFacts facts = MakeFacts(CURLE_COULDNT_RESOLVE_PROXY);
  facts.proxyHost = "proxy.test";
  EXPECT_EQ("Proxy proxy.test was not found", Tell(facts));
}

TEST(TransferFailure, TellsTheSystemsReasonForNoConnectionToTheProxy) {
  TransferFacts facts = MakeFacts(CURLE_COULDNT_CONNECT, "", ENETUNREACH);
  facts.proxyHost = "proxy.test";
  facts.proxyEndpoint = "proxy.test:3128";
  EXPECT_EQ("No connection to proxy proxy.test:3128: Network is unreachable", Tell(facts));
}

TEST(TransferFailure, IsSafeToRetryOnlyWhenNothingWasSent) {
  TransferFacts refused = MakeFacts(CURLE_COULDNT_CONNECT, "", ECONNREFUSED);
  EXPECT_TRUE(IsSafeToRetry(refused));
  refused.wasReady = true;  // Over another connection, which broke.
  EXPECT_FALSE(IsSafeToRetry(refused));
  EXPECT_FALSE(IsSafeToRetry(MakeFacts(CURLE_COULDNT_CONNECT, "", ENETUNREACH)));
  EXPECT_FALSE(IsSafeToRetry(MakeFacts(CURLE_COULDNT_RESOLVE_HOST)));
  EXPECT_FALSE(IsSafeToRetry(MakeFacts(CURLE_SEND_ERROR, "", ECONNREFUSED)));
  EXPECT_FALSE(IsSafeToRetry(MakeFacts(CURLE_RECV_ERROR, "", ECONNRESET)));
  EXPECT_FALSE(IsSafeToRetry(MakeFacts(CURLE_GOT_NOTHING)));
  EXPECT_FALSE(IsSafeToRetry(MakeFacts(CURLE_OK)));
}

TEST(TransferFailure, IsSafeToRetryWhenTheHandshakeEndsWithoutAReason) {
  TransferFacts facts = MakeFacts(CURLE_SSL_CONNECT_ERROR, "", ECONNRESET);
  const auto tls = std::make_shared<TlsRecord>();
  facts.tls = tls;
  EXPECT_TRUE(IsSafeToRetry(facts));
  facts.engineText = "error:0A000126:SSL routines::unexpected eof while reading";
  EXPECT_TRUE(IsSafeToRetry(facts));
  facts.engineText = "error:0A00018A:SSL routines::dh key too small";
  EXPECT_FALSE(IsSafeToRetry(facts));
  facts.engineText = "";
  tls->alert = TlsAlert::OTHER;
  EXPECT_FALSE(IsSafeToRetry(facts));
  tls->alert = TlsAlert::NONE;
  tls->problem = CertificateProblem::EXPIRED;
  EXPECT_FALSE(IsSafeToRetry(facts));
  facts.code = CURLE_SSL_PINNEDPUBKEYNOTMATCH;
  EXPECT_FALSE(IsSafeToRetry(facts));
}

TEST(TransferFailure, IsSafeToRetryWhenTheHandshakeIsNotCompletedInTime) {
  TransferFacts facts = MakeFacts(CURLE_OPERATION_TIMEDOUT);
  EXPECT_FALSE(IsSafeToRetry(facts));
  facts.hasTlsStarted = true;
  EXPECT_TRUE(IsSafeToRetry(facts));
}

TEST(TransferFailure, TellsBrokenConnections) {
  EXPECT_EQ("Connection to sts.test:443 broke: No route to host",
            Tell(MakeFacts(CURLE_RECV_ERROR, "", EHOSTUNREACH)));
  EXPECT_EQ("sts.test:443 reset the connection before it answered",
            Tell(MakeFacts(CURLE_SEND_ERROR, "", EPIPE)));
  EXPECT_EQ("sts.test:443 closed the connection before it answered", Tell(MakeFacts(CURLE_SEND_ERROR)));
}

TEST(TransferFailure, TellsOpenSslsReason) {
  EXPECT_EQ("TLS with sts.test:443 failed: dh key too small",
            Tell(MakeFacts(CURLE_SSL_CONNECT_ERROR, "error:0A00018A:SSL routines::dh key too small")));
  EXPECT_EQ("TLS with sts.test:443 failed: decryption failed or bad record mac",
            Tell(MakeFacts(CURLE_RECV_ERROR, "OpenSSL SSL_read: error:0A000119:SSL routines::x, errno 0")));
}

TEST(TransferFailure, RemindsOfTheClientCertificateAfterAReset) {
  TransferFacts facts = MakeFacts(CURLE_RECV_ERROR, "", ECONNRESET);
  const auto tls = std::make_shared<TlsRecord>();
  tls->wasClientCertificateRequested = true;
  facts.tls = tls;
  EXPECT_EQ("sts.test:443 reset the connection before it answered; it had asked for a client certificate",
            Tell(facts));
  tls->hasClientCertificate = true;
  EXPECT_EQ("sts.test:443 reset the connection before it answered", Tell(facts));
}

TEST(TransferFailure, TellsTheServersAlert) {
  TransferFacts facts =
      MakeFacts(CURLE_SSL_CONNECT_ERROR, "error:0A000410:SSL routines::sslv3 alert handshake failure");
  const auto tls = std::make_shared<TlsRecord>();
  tls->alert = TlsAlert::OTHER;
  tls->alertText = "handshake failure";
  tls->isAlertFromServer = true;
  facts.tls = tls;
  EXPECT_EQ("sts.test:443 ended TLS: handshake failure", Tell(facts));
}

TEST(TransferFailure, TellsTheAlertOfOurOwnSide) {
  TransferFacts facts = MakeFacts(CURLE_SSL_CONNECT_ERROR);
  const auto tls = std::make_shared<TlsRecord>();
  tls->alert = TlsAlert::OTHER;
  tls->alertText = "decode error";
  facts.tls = tls;
  EXPECT_EQ("TLS with sts.test:443 failed: decode error", Tell(facts));
  tls->alert = TlsAlert::PROTOCOL_VERSION;
  EXPECT_EQ("sts.test:443 does not speak TLS 1.2 or newer", Tell(facts));
}

TEST(TransferFailure, TellsAnEndWithoutGoodbye) {
  // SSL_R_UNEXPECTED_EOF_WHILE_READING.
  const std::string engineText = "error:0A000126:SSL routines::unexpected eof while reading";
  EXPECT_EQ("sts.test:443 closed the connection during the TLS handshake",
            Tell(MakeFacts(CURLE_SSL_CONNECT_ERROR, engineText)));
  EXPECT_EQ("sts.test:443 closed the connection before it answered",
            Tell(MakeFacts(CURLE_RECV_ERROR, engineText)));
}

TEST(TlsFailureReason, IsReadOnlyFromAReasonOfOpenSslsTls) {
  const TlsFailureReason reason = FindTlsFailureReason("error:0A00010B:SSL routines::wrong version number");
  EXPECT_EQ(reason.kind, TlsFailureKind::NOT_TLS);
  EXPECT_EQ(reason.text, "wrong version number");
  // No mark before the number; the same number of another part of OpenSSL.
  for (const char* const engineText : {"code 0A00010B", "error:0300010B:digital envelope routines::"}) {
    const TlsFailureReason none = FindTlsFailureReason(engineText);
    EXPECT_EQ(none.kind, TlsFailureKind::OTHER) << engineText;
    EXPECT_EQ(none.text, "") << engineText;
  }
}

TEST(TransferFailure, MasksControlCharactersOfTheEngine) {
  EXPECT_EQ("Exchange with sts.test:443 failed: a?b", Tell(MakeFacts(CURLE_BAD_FUNCTION_ARGUMENT, "a\nb")));
  EXPECT_EQ("Exchange with sts.test:443 failed: Out of memory", Tell([] {
              TransferFacts facts = MakeFacts(CURLE_OUT_OF_MEMORY);
              for (const std::string line : {"HTTP/1.1 200 OK\r\n", "\r\n"}) {
                facts.head.TakeLine(line.data(), line.size());
              }
              return facts;
            }()));
}

}  // namespace
