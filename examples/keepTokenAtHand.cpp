// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors
//
// Does work on several threads, each with a token that is good for a while yet, from one token provider.
//
//   keepTokenAtHand URL CA.pem STS.pem USER PASSWORD-FILE < work
//
// CA.pem holds the authority of the server's TLS certificate, STS.pem the certificate that signs tokens. Each
// line of standard input is a piece of work.

#include <quorlin/TokenProvider.h>
#include <quorlin/quorlin.h>

#include <boost/make_shared.hpp>

#include <fstream>
#include <iostream>
#include <iterator>
#include <mutex>
#include <stdexcept>
#include <string>
#include <thread>
#include <vector>

namespace {

const int kThreads = 4;

std::string ReadFile(const std::string& path) {
  std::ifstream file(path.c_str(), std::ios::binary);
  if (!file) {
    throw std::runtime_error("cannot read " + path);
  }
  return std::string(std::istreambuf_iterator<char>(file), std::istreambuf_iterator<char>());
}

/// The first line of a file.
std::string ReadPassword(const std::string& path) {
  std::ifstream file(path.c_str());
  std::string password;
  if (!std::getline(file, password)) {
    throw std::runtime_error("cannot read " + path);
  }
  return password;
}

/// Says what the provider does by itself.
class Reporter final : public Quorlin::TokenProviderObserver {
 public:
  void OnRefreshed(const boost::shared_ptr<const Quorlin::SamlToken>& token, bool) override {
    std::cerr << "a new token, good until " << token->GetEndDate().ToString() << "\n";
  }
  void OnFailed(const Pelmar::Exception& error, long long) override {
    std::cerr << "no new token: " << error.what() << "\n";
  }
};

boost::shared_ptr<Quorlin::TokenProvider> MakeProvider(char** arguments) {
  Pelmar::Ssl::SSLContextOptions tls;
  tls.caFile = arguments[2];
  Quorlin::SecurityTokenServiceConfig config;
  config.stsUrl = arguments[1];
  config.sslContext = Pelmar::Ssl::CreateSSLContext(tls);
  config.trustedStsCertificates = Pelmar::Crypto::CreateCertificatesFromPem(ReadFile(arguments[3]));
  boost::shared_ptr<Quorlin::SecurityTokenService> service = Quorlin::CreateSecurityTokenService(config);
  const std::string userName = arguments[4];
  const std::string passwordFile = arguments[5];

  // DOCS-BEGIN
  Quorlin::TokenProviderOptions options;
  options.spec.tokenLifetimeSec = 600;
  options.minimumLifeSec = 60;  // What GetToken() gives is good for a minute yet.
  options.observer = boost::make_shared<Reporter>();
  auto request = Quorlin::RequestByPassword(userName, [passwordFile] { return ReadPassword(passwordFile); });
  auto provider = Quorlin::CreateTokenProvider(service, request, options);
  // DOCS-END
  return provider;
}

/// Pieces of work, for many threads.
class WorkList {
 public:
  bool Take(std::string& work) {
    const std::lock_guard<std::mutex> lock(_mutex);
    return !_isSpoilt && std::getline(std::cin, work);
  }

  void Report(const std::string& text) {
    const std::lock_guard<std::mutex> lock(_mutex);
    std::cout << text << "\n";
  }

  /// Nobody takes any more.
  void Fail(const std::string& text) {
    const std::lock_guard<std::mutex> lock(_mutex);
    if (!_isSpoilt) {
      std::cerr << text << "\n";
    }
    _isSpoilt = true;
  }

  bool IsSpoilt() const { return _isSpoilt; }

 private:
  std::mutex _mutex;
  bool _isSpoilt = false;
};

void WorkOn(WorkList& list, Quorlin::TokenProvider& provider) {
  try {
    for (std::string work; list.Take(work);) {
      auto token = provider.GetToken();
      list.Report(work + " as " + token->GetSubject().ToString());
    }
  } catch (const std::exception& error) {
    list.Fail(error.what());
  }
}

int Run(char** arguments) {
  auto provider = MakeProvider(arguments);
  WorkList list;
  std::vector<std::thread> threads;
  for (int i = 0; i < kThreads; ++i) {
    threads.emplace_back([&] { WorkOn(list, *provider); });
  }
  for (std::thread& thread : threads) {
    thread.join();
  }
  return list.IsSpoilt() ? 1 : 0;
}

}  // namespace

int main(int argc, char** argv) {
  if (argc != 6) {
    std::cerr << "usage: keepTokenAtHand URL CA.pem STS.pem USER PASSWORD-FILE < work\n";
    return 2;
  }
  try {
    return Run(argv);
  } catch (const std::exception& error) {
    std::cerr << error.what() << "\n";
    return 1;
  }
}
