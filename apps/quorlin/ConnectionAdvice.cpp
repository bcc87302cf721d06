// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

#include "quorlin/ConnectionAdvice.h"

#include <cstddef>

namespace Cli {

namespace {

/// `start` is how the message starts, with "*" for one word, which is a host or an endpoint. What a server
/// can put into its messages stands behind it, so that no server chooses our advice.
struct Row {
  const char* start;
  const char* advice;
};

constexpr const char* kPerhapsNoTls =
    "Correct the port in --url: perhaps no TLS is spoken there. A service without TLS is reached with http:, which "
    "hides nothing on the way.";

// The first that fits counts.
const Row kRows[] = {
    {"The operation was cancelled.", ""},
    {"The operation took longer than ",
     "The service is overloaded or stuck, a firewall drops what is sent, or --timeout is too short."},
    {"Connection refused by proxy ", "No proxy listens there: correct --proxy."},
    {"No connection to proxy ",
     "See whether this machine may reach the proxy: network, firewall, and the port in --proxy."},
    {"Proxy * was not found", "Correct the host in --proxy."},
    {"Proxy * demands credentials", "Log in to the proxy with --proxy-user and --proxy-password-file."},
    {"Proxy * refused the credentials", "Correct --proxy-user, or the password in --proxy-password-file."},
    {"Proxy * opens no way to the service",
     "The proxy's rules forbid it, or it cannot reach the service: ask its operator."},
    {"Connection refused by ",
     "Nothing listens there: start the service, or correct the host and port in --url."},
    {"Host * was not found", "Correct the host in --url, or see why this machine cannot resolve its name."},
    {"No connection to ",
     "See whether this machine may reach that host: network, firewall, and the port in --url."},
    {"No answer from ",
     "The service is overloaded or stuck, or a firewall drops what is sent: see its log, then try again."},
    {"Certificate of * is not trusted: issuer",
     "If that is the service's authority, name its certificate with --ca. If not, somebody may stand between."},
    {"Certificate of * is not trusted: it is self-signed",
     "If that is the service's own certificate, name it with --ca. If not, somebody may stand between."},
    {"Certificate of * does not match the name:",
     "Use one of those names in --url, or give the service a certificate for the name that you use."},
    {"Certificate of * expired at ",
     "The service needs a new certificate, unless this machine's clock is wrong."},
    {"Certificate of * is not valid before ",
     "This machine's clock is behind, or the service uses its new certificate too early."},
    {"Certificate of ", "The service needs another certificate."},
    {"Issuing certificate ",
     "The service needs a certificate from another authority, or its authority a new one."},
    {"* does not speak TLS 1.2 or newer",
     "The service has to be taught TLS 1.2; older versions are not used."},
    {"* does not speak TLS",
     "Correct the port in --url. A service without TLS is reached with http:, which hides nothing on the way."},
    {"* closed the connection during the TLS handshake", kPerhapsNoTls},
    {"* reset the connection during the TLS handshake", kPerhapsNoTls},
    {"* demands a client certificate",
     "The service wants TLS with a client certificate: calls take yours as --client-cert and --client-key."},
    {"* refused the client certificate: ",
     "The service does not accept what --client-cert names: ask which authority it trusts."},
    {"* did not answer in HTTP/1",
     "Correct the port in --url: no HTTP service is there, or one with TLS, which is reached with https:."},
    {"* closed the connection before it answered",
     "Correct the port in --url and, if that speaks TLS, use https:; else see the service's log."},
    {"* reset the connection before it answered",
     "Correct the port in --url and, if that speaks TLS, use https:; else see the service's log."},
    {"Server returned error: 3", "Redirects are not followed: put the address it leads to into --url."},
    {"Server returned error: 401",
     "A web server before the service wants a login of its own: ask for another address."},
    {"Server returned error: 403",
     "A web server before the service does not let you through: ask its operator."},
    {"Server returned error: 404", "Correct the path in --url."},
    {"Server returned error: 407",
     "The proxy wants a login: give it one with --proxy-user and --proxy-password-file."},
    {"Server returned error: 4",
     "Correct the path in --url: something else than a token service may answer there."},
    {"Server returned error: 50",
     "A gateway before the service has no service behind it now: try again later."},
};

constexpr const char* kOtherwise = "See the log of the service, and of whatever stands between it and you.";

bool StartsWith(const std::string& text, std::size_t position, const std::string& start) {
  return text.compare(position, start.size(), start) == 0;
}

bool Fits(const std::string& message, const std::string& start) {
  const std::size_t star = start.find('*');
  if (star == std::string::npos) {
    return StartsWith(message, 0, start);
  }
  if (!StartsWith(message, 0, start.substr(0, star))) {
    return false;
  }
  const std::size_t end = message.find(' ', star);
  return end != std::string::npos && StartsWith(message, end, start.substr(star + 1));
}

}  // namespace

std::string AdviseOnConnection(const std::string& message) {
  for (const Row& row : kRows) {
    if (Fits(message, row.start)) {
      return row.advice;
    }
  }
  return kOtherwise;
}

}  // namespace Cli
