// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

// Scripts for the loopback server that answer over HTTP.

#ifndef QUORLIN_TESTS_SUPPORT_HTTPSCRIPTS_H
#define QUORLIN_TESTS_SUPPORT_HTTPSCRIPTS_H

#include <string>
#include <vector>

#include "support/LoopbackServer.h"

namespace TestSupport {

/// The bytes of an HTTP/1.1 answer. `status` is the code with its reason ("200 OK"); `headers` are whole
/// lines, each with its line end.
std::string HttpAnswer(const std::string& status, const std::string& body, const std::string& headers = "");

/// Answers one request after the other on the same connection, then closes it.
LoopbackServer::Script AnswerEach(const std::vector<std::string>& answers);

/// Reads a request and keeps silent until the peer gives up.
void StaySilent(ServerConnection& connection);

}  // namespace TestSupport

#endif  // QUORLIN_TESTS_SUPPORT_HTTPSCRIPTS_H
