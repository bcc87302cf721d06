// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

#include "support/ServiceAnswers.h"

#include <pelmar/StringUtil.h>

#include <boost/algorithm/string/classification.hpp>
#include <boost/algorithm/string/replace.hpp>
#include <boost/algorithm/string/split.hpp>

#include <fstream>
#include <iterator>
#include <sstream>
#include <stdexcept>

namespace TestSupport {

namespace {

std::string Envelope(const std::string& body) {
  return "<soapenv:Envelope xmlns:soapenv=\"http://schemas.xmlsoap.org/soap/envelope/\" "
         "xmlns:wst=\"http://docs.oasis-open.org/ws-sx/ws-trust/200512\"><soapenv:Body>" +
         body + "</soapenv:Body></soapenv:Envelope>";
}

std::string Response(const std::string& attributes, const std::string& content) {
  return "<wst:RequestSecurityTokenResponse" + attributes + ">" + content +
         "</wst:RequestSecurityTokenResponse>";
}

std::string Collection(const std::string& response) {
  return "<wst:RequestSecurityTokenResponseCollection>" + response +
         "</wst:RequestSecurityTokenResponseCollection>";
}

std::string RequestedToken(const std::string& token) {
  return "<wst:TokenType>urn:oasis:names:tc:SAML:2.0:assertion</wst:TokenType><wst:RequestedSecurityToken>" +
         token + "</wst:RequestedSecurityToken>";
}

std::string Context(const std::string& contextId) {
  return " Context=\"" + contextId + "\"";
}

std::string Exchange(const std::string& leg) {
  return "<wst:BinaryExchange>" +
         Pelmar::StringUtil::Base64Encode(std::vector<unsigned char>(leg.begin(), leg.end())) +
         "</wst:BinaryExchange>";
}

}  // namespace

std::string ReadResponseVector(const std::string& name) {
  const std::string path = std::string(QUORLIN_TEST_VECTORS_DIR) + "/responses/" + name;
  std::ifstream stream(path, std::ios::binary);
  if (!stream) {
    throw std::runtime_error("cannot read " + path);
  }
  return std::string(std::istreambuf_iterator<char>(stream), std::istreambuf_iterator<char>());
}

std::vector<std::vector<std::string>> ReadExpectations(const std::string& name) {
  std::vector<std::vector<std::string>> expectations;
  std::istringstream lines(ReadResponseVector(name));
  for (std::string line; std::getline(lines, line);) {
    std::vector<std::string> fields;
    boost::algorithm::split(fields, line, boost::algorithm::is_any_of("\t"));
    for (std::string& field : fields) {
      boost::algorithm::replace_all(field, "\\n", "\n");
    }
    expectations.push_back(fields);
  }
  return expectations;
}

std::string SignedToken(const std::string& name) {
  std::string text = ReadResponseVector("tokens/" + name + ".xml");
  return text.substr(0, text.find_last_not_of('\n') + 1);
}

std::list<Pelmar::Ref<const Pelmar::Crypto::Certificate>> TrustedSigner() {
  return {Pelmar::Crypto::CreateCertificateFromPem(ReadResponseVector("tokens/signer.pem"))};
}

std::string IssueAnswer(const std::string& token) {
  return Envelope(Collection(Response("", RequestedToken(token))));
}

std::string RenewAnswer(const std::string& token) {
  return Envelope(Response("", RequestedToken(token)));
}

std::string ValidateAnswer(bool isValid) {
  return Envelope(Response(
      "", std::string("<wst:Status><wst:Code>http://docs.oasis-open.org/ws-sx/ws-trust/200512/status/") +
              (isValid ? "valid" : "invalid") + "</wst:Code></wst:Status>"));
}

std::string ChallengeAnswer(const std::string& contextId, const std::string& leg) {
  return Envelope(Response(Context(contextId), Exchange(leg)));
}

std::string FinalAnswer(const std::string& contextId, const std::string& leg, const std::string& token) {
  return Envelope(Collection(
      Response(Context(contextId), (leg.empty() ? std::string() : Exchange(leg)) + RequestedToken(token))));
}

std::string FaultAnswer(const std::string& code, const std::string& text) {
  return Envelope("<soapenv:Fault><faultcode>" + code + "</faultcode><faultstring>" + text +
                  "</faultstring></soapenv:Fault>");
}

}  // namespace TestSupport
