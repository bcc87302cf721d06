// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors
//
// Asks a token service for a token by the Kerberos ticket of whoever runs it, and prints whom the token is
// for.
//
//   acquireByKerberos URL CA.pem STS.pem TARGET
//
// CA.pem holds the authority of the server's TLS certificate, STS.pem the certificate that signs tokens;
// TARGET is the Kerberos service as SERVICE@HOST, usually HTTP@ and the URL's host.

#include <quorlin-gssapi/GssapiNegotiation.h>
#include <quorlin/quorlin.h>

#include <fstream>
#include <iostream>
#include <iterator>
#include <string>

namespace {

std::string ReadFile(const char* path) {
  std::ifstream file(path, std::ios::binary);
  return std::string(std::istreambuf_iterator<char>(file), std::istreambuf_iterator<char>());
}

void PrintToken(const Quorlin::SamlToken& token) {
  std::cout << token.GetSubject().ToString() << " until " << token.GetEndDate().ToString() << "\n";
}

int Run(const std::string& url, const char* caFile, const char* stsFile, const std::string& target) {
  Pelmar::Ssl::SSLContextOptions tls;
  tls.caFile = caFile;
  Quorlin::SecurityTokenServiceConfig config;
  config.stsUrl = url;
  config.sslContext = Pelmar::Ssl::CreateSSLContext(tls);
  config.trustedStsCertificates = Pelmar::Crypto::CreateCertificatesFromPem(ReadFile(stsFile));
  auto service = Quorlin::CreateSecurityTokenService(config);

  // DOCS-BEGIN
  Quorlin::GssapiOptions gssapi;
  gssapi.targetService = target;  // "HTTP@sts.example.com"
  auto handler = Quorlin::CreateGssapiNegotiationHandler(gssapi);

  Quorlin::TokenSpec spec;
  spec.tokenLifetimeSec = 600;
  auto token = service->AcquireTokenByGSS(spec, *handler);
  handler->RequireComplete();  // Throws unless the service has proved its identity, too.
  PrintToken(*token);
  // DOCS-END
  return 0;
}

}  // namespace

int main(int argc, char** argv) {
  if (argc != 5) {
    std::cerr << "usage: acquireByKerberos URL CA.pem STS.pem TARGET\n";
    return 2;
  }
  try {
    return Run(argv[1], argv[2], argv[3], argv[4]);
  } catch (const Pelmar::Exception& error) {
    std::cerr << error.what() << "\n";
    return 1;
  }
}
