// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors
//
// Works with a holder-of-key token for as long as there is work, and renews it before it ends.
//
//   renewHolderOfKey URL CA.pem STS.pem CERT.pem KEY.pem LIFETIME < work
//
// CERT.pem and KEY.pem are the client's own certificate and its unencrypted private key; the service has to
// know whose certificate it is. LIFETIME is the lifetime to ask for, in seconds. Each line of standard input
// is a piece of work.

#include <quorlin/quorlin.h>

#include <cstdlib>
#include <fstream>
#include <iostream>
#include <iterator>
#include <stdexcept>
#include <string>

namespace {

typedef boost::shared_ptr<const Quorlin::SamlToken> Token;

const long long kMicrosecondsPerSecond = 1000000;
/// A token with less time left than this is renewed: time enough for the work, and for a second try.
const long long kRenewWhenLeftSec = 60;

std::string ReadFile(const char* path) {
  std::ifstream file(path, std::ios::binary);
  if (!file) {
    throw std::runtime_error(std::string("cannot read ") + path);
  }
  return std::string(std::istreambuf_iterator<char>(file), std::istreambuf_iterator<char>());
}

/// Hands out a token that holds for a while yet. For one thread.
class TokenHolder {
 public:
  TokenHolder(const boost::shared_ptr<Quorlin::SecurityTokenService>& service, long long lifetimeSec)
      : _service(service), _lifetimeSec(lifetimeSec) {}

  const Quorlin::SamlToken& Get() {
    if (!_token || GetSecondsLeft() <= 0) {
      Acquire();
    } else if (GetSecondsLeft() < kRenewWhenLeftSec) {
      Renew();
    }
    return *_token;
  }

 private:
  long long GetSecondsLeft() const {
    const long long now = Pelmar::System::GetUtcDateTime().GetUtcTime();
    return (_token->GetEndDate().GetUtcTime() - now) / kMicrosecondsPerSecond;
  }

  void Acquire() {
    Quorlin::TokenSpec spec;
    spec.tokenLifetimeSec = _lifetimeSec;
    spec.renewable = true;
    _token = _service->AcquireTokenByCertificate(spec);
    std::cout << "acquired " << _token->GetId() << "\n";
  }

  void Renew() {
    try {
      _token = _service->RenewToken(*_token, _lifetimeSec);
      std::cout << "renewed " << _token->GetId() << "\n";
    } catch (const Quorlin::SsoException& error) {
      // The old token still holds, so a service that is away for a moment stops nothing.
      std::cerr << "not renewed: " << error.what() << "\n";
    }
  }

  boost::shared_ptr<Quorlin::SecurityTokenService> _service;
  long long _lifetimeSec;
  Token _token;
};

boost::shared_ptr<Quorlin::SecurityTokenService> MakeService(char** arguments) {
  Pelmar::Ssl::SSLContextOptions tls;
  tls.caFile = arguments[2];
  Quorlin::HolderOfKeyConfig identity;
  identity.certificate = Pelmar::Crypto::CreateCertificateFromPem(ReadFile(arguments[4]));
  identity.privateKey = Pelmar::Crypto::CreatePrivateKeyFromPem(ReadFile(arguments[5]));

  Quorlin::SecurityTokenServiceConfig config;
  config.holderOfKeyConfig = identity;
  config.stsUrl = arguments[1];
  config.sslContext = Pelmar::Ssl::CreateSSLContext(tls);
  config.trustedStsCertificates = Pelmar::Crypto::CreateCertificatesFromPem(ReadFile(arguments[3]));
  return Quorlin::CreateSecurityTokenService(config);
}

void Work(TokenHolder& holder) {
  std::string work;
  while (std::getline(std::cin, work)) {
    const Quorlin::SamlToken& token = holder.Get();
    std::cout << work << " as " << token.GetSubject().ToString() << "\n";
  }
}

}  // namespace

int main(int argc, char** argv) {
  if (argc != 7) {
    std::cerr << "usage: renewHolderOfKey URL CA.pem STS.pem CERT.pem KEY.pem LIFETIME < work\n";
    return 2;
  }
  try {
    TokenHolder holder(MakeService(argv), std::atoll(argv[6]));
    Work(holder);
    return 0;
  } catch (const std::exception& error) {
    std::cerr << error.what() << "\n";
    return 1;
  }
}
