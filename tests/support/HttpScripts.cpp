// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

#include "support/HttpScripts.h"

namespace TestSupport {

std::string HttpAnswer(const std::string& status, const std::string& body, const std::string& headers) {
  return "HTTP/1.1 " + status + "\r\n" + headers + "Content-Length: " + std::to_string(body.size()) +
         "\r\n\r\n" + body;
}

LoopbackServer::Script AnswerEach(const std::vector<std::string>& answers) {
  return [answers](ServerConnection& connection) {
    for (const std::string& answer : answers) {
      connection.ReadRequest();
      connection.Send(answer);
    }
    connection.Close();
  };
}

void StaySilent(ServerConnection& connection) {
  connection.ReadRequest();
  connection.AwaitPeerEnd();
}

}  // namespace TestSupport
