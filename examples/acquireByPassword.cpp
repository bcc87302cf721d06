// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors
//
// Asks a token service for a token by user name and password, and prints whom the token is for.
//
//   acquireByPassword URL CA.pem STS.pem USER < password
//
// CA.pem holds the authority of the server's TLS certificate, STS.pem the certificate that signs tokens.

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

int Run(const std::string& url, const char* caFile, const char* stsFile, const std::string& user) {
  std::string password;
  std::getline(std::cin, password);

  // README-BEGIN
  Pelmar::Ssl::SSLContextOptions tls;
  tls.caFile = caFile;
  Quorlin::SecurityTokenServiceConfig config;
  config.stsUrl = url;
  config.sslContext = Pelmar::Ssl::CreateSSLContext(tls);
  config.trustedStsCertificates = Pelmar::Crypto::CreateCertificatesFromPem(ReadFile(stsFile));

  Quorlin::TokenSpec spec;
  spec.tokenLifetimeSec = 600;
  auto service = Quorlin::CreateSecurityTokenService(config);
  PrintToken(*service->AcquireToken(user, password, spec));
  // README-END
  return 0;
}

}  // namespace

int main(int argc, char** argv) {
  if (argc != 5) {
    std::cerr << "usage: acquireByPassword URL CA.pem STS.pem USER < password\n";
    return 2;
  }
  try {
    return Run(argv[1], argv[2], argv[3], argv[4]);
  } catch (const Pelmar::Exception& error) {
    std::cerr << error.what() << "\n";
    return 1;
  }
}
