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
