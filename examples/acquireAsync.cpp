// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors
//
// Asks for the tokens of many users at the same time, without a thread of one's own for each.
//
//   acquireAsync URL CA.pem STS.pem < users
//
// Each line of standard input is a user name, a blank and the password.

#include <quorlin/quorlin.h>

#include <exception>
#include <fstream>
#include <future>
#include <iostream>
#include <iterator>
#include <memory>
#include <stdexcept>
#include <string>
#include <vector>

namespace {

typedef boost::shared_ptr<const Quorlin::SamlToken> Token;
typedef std::promise<Token> TokenPromise;

std::string ReadFile(const char* path) {
  std::ifstream file(path, std::ios::binary);
  if (!file) {
    throw std::runtime_error(std::string("cannot read ") + path);
  }
  return std::string(std::istreambuf_iterator<char>(file), std::istreambuf_iterator<char>());
}

/// Called on a platform thread. The error lives during the call only: what is kept is a copy.
void Finish(TokenPromise& promise, const Token& token, const Pelmar::Exception* error) {
  if (error == nullptr) {
    promise.set_value(token);
    return;
  }
  try {
    error->Throw();
  } catch (...) {
    promise.set_exception(std::current_exception());
  }
}

std::future<Token> Acquire(const Quorlin::SecurityTokenService& service, const std::string& user,
                           const std::string& password, const Quorlin::TokenSpec& spec) {
  // The completion alone owns the promise. Should it be dropped without being called, the future says so.
  const std::shared_ptr<TokenPromise> promise = std::make_shared<TokenPromise>();
  std::future<Token> future = promise->get_future();
  service.AcquireTokenAsync(
      user, password, spec,
      [promise](const Token& token, const Pelmar::Exception* error) { Finish(*promise, token, error); });
  return future;
}

struct Pending {
  std::string user;
  std::future<Token> token;
};

std::vector<Pending> AcquireAll(const Quorlin::SecurityTokenService& service) {
  Quorlin::TokenSpec spec;
  spec.tokenLifetimeSec = 600;
  std::vector<Pending> all;
  std::string user;
  std::string password;
  while (std::cin >> user && std::getline(std::cin >> std::ws, password)) {
    Pending pending;
    pending.user = user;
    pending.token = Acquire(service, user, password, spec);
    all.push_back(std::move(pending));
  }
  return all;
}

/// Whether all users got their tokens.
bool PrintAll(std::vector<Pending>& all) {
  bool isComplete = true;
  for (Pending& pending : all) {
    try {
      const Token token = pending.token.get();
      std::cout << pending.user << ": " << token->GetSubject().ToString() << "\n";
    } catch (const std::exception& error) {
      std::cout << pending.user << ": no token: " << error.what() << "\n";
      isComplete = false;
    }
  }
  return isComplete;
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

}  // namespace

int main(int argc, char** argv) {
  if (argc != 4) {
    std::cerr << "usage: acquireAsync URL CA.pem STS.pem < users\n";
    return 2;
  }
  try {
    std::vector<Pending> all = AcquireAll(*MakeService(argv));
    return PrintAll(all) ? 0 : 1;
  } catch (const std::exception& error) {
    std::cerr << error.what() << "\n";
    return 1;
  }
}
