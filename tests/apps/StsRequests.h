// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

// Requests to the development token service as texts, written by hand: neither the client library nor the
// service had a part in them.

#ifndef QUORLIN_TESTS_APPS_STSREQUESTS_H
#define QUORLIN_TESTS_APPS_STSREQUESTS_H

#include <string>

namespace StsTests {

/// Every request below was created a second before this instant: 2030-01-01T00:00:01Z in microseconds since
/// the epoch.
constexpr long long kNow = 1893456001LL * 1000000;

constexpr const char* kIssueAction = "\"http://docs.oasis-open.org/ws-sx/ws-trust/200512/RST/Issue\"";
constexpr const char* kXml = "text/xml; charset=utf-8";

/// Alice of the sample directory asks by password for a bearer token for ten minutes. Every element stands on
/// a line of its own.
std::string PasswordRequest();

/// An envelope with this content of wsse:Security and of Body. The prefixes soapenv, wsse, wsu, wst and wsa
/// are declared.
std::string Envelope(const std::string& security, const std::string& body);

/// The Timestamp that belongs to `kNow`.
std::string Timestamp();

}  // namespace StsTests

#endif  // QUORLIN_TESTS_APPS_STSREQUESTS_H
