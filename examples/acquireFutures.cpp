// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors
//
// Asks for the tokens of several users at the same time, and then whether the service still knows them, with
// futures.
//
//   acquireFutures URL CA.pem STS.pem < users
//
// Each line of standard input is a user name, a blank and the password.

#include <quorlin/Future.h>
#include <quorlin/quorlin.h>

#include <exception>
#include <fstream>
#include <future>
#include <iostream>
#include <iterator>
#include <stdexcept>
#include <string>
#include <vector>

namespace {

typedef boost::shared_ptr<const Quorlin::SamlToken> Token;

std::string ReadFile(const char* path) {
  std::ifstream file(path, std::ios::binary);
  if (!file) {
    throw std::runtime_error(std::string("cannot read ") + path);
  }
  return std::string(std::istreambuf_iterator<char>(file), std::istreambuf_iterator<char>());
}

boost::shared_ptr<Quorlin::SecurityTokenService> MakeService(char** arguments) {
  Pelmar::Ssl::SSLContextOptions tls;
  tls.caFile = arguments[2];
  Quorlin::SecurityTokenServiceConfig config;
  config.stsUrl = arguments[1];
  config.sslContext = Pelmar::Ssl::CreateSSLContext(tls);
  config.trustedStsCertificates = Pelmar::Crypto::CreateCertificatesFromPem(ReadFile(arguments[3]));
  return Quorlin::CreateSecurityTokenService(config);
}

std::vector<std::future<Token>> StartAll(const Quorlin::SecurityTokenService& service) {
  Quorlin::TokenSpec spec;
  spec.tokenLifetimeSec = 600;
  std::vector<std::future<Token>> all;
  std::string user;
  std::string password;
  while (std::cin >> user && std::getline(std::cin >> std::ws, password)) {
    // Returns at once; the token comes later.
    all.push_back(Quorlin::Future::AcquireToken(service, user, password, spec));
  }
  return all;
}

/// Whether there was a token, of a subject that is known.
bool Print(const Quorlin::SecurityTokenService& service, std::future<Token>& pending) {
  try {
    const Token token = pending.get();
    const bool isKnown = Quorlin::Future::ValidateSubject(service, token).get();
    std::cout << token->GetSubject().ToString() << (isKnown ? " is known\n" : " is not known any more\n");
    return isKnown;
  } catch (const Quorlin::InvalidCredentialsException& error) {
    std::cout << "wrong password: " << error.what() << "\n";
  } catch (const Quorlin::CommunicationException& error) {
    std::cout << "no answer: " << error.what() << "\n";
  }
  return false;
}

}  // namespace

int main(int argc, char** argv) {
  if (argc != 4) {
    std::cerr << "usage: acquireFutures URL CA.pem STS.pem < users\n";
    return 2;
  }
  try {
    const boost::shared_ptr<Quorlin::SecurityTokenService> service = MakeService(argv);
    std::vector<std::future<Token>> all = StartAll(*service);
    int failures = 0;
    for (std::future<Token>& pending : all) {
      failures += Print(*service, pending) ? 0 : 1;
    }
    return failures == 0 ? 0 : 1;
  } catch (const std::exception& error) {
    std::cerr << error.what() << "\n";
    return 1;
  }
}
