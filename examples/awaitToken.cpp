// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors
//
// Awaits a token, and then the service's word on its subject, in a C++20 coroutine that can be cancelled.
//
//   awaitToken URL CA.pem STS.pem USER
//
// The first line of standard input is the password; a later line "stop" cancels.

#include <quorlin/Coroutine.h>
#include <quorlin/quorlin.h>

#include <coroutine>
#include <exception>
#include <fstream>
#include <future>
#include <iostream>
#include <iterator>
#include <stdexcept>
#include <stop_token>
#include <string>
#include <thread>
#include <utility>

namespace {

/// The least that a coroutine can return: it runs at once, and tells a future how it ended. Any other type of
/// coroutine, of a library of yours, does as well.
struct Task {
  struct promise_type {
    Task get_return_object() { return {end.get_future()}; }
    std::suspend_never initial_suspend() noexcept { return {}; }
    std::suspend_never final_suspend() noexcept { return {}; }
    void return_void() { end.set_value(); }
    void unhandled_exception() { end.set_exception(std::current_exception()); }
    std::promise<void> end;
  };

  std::future<void> end;
};

// Arguments by value: a reference may not live as long as the coroutine waits.
Task Run(Quorlin::Coroutine::Service service, std::string user, std::string password, std::stop_token stop) {
  Quorlin::TokenSpec spec;
  spec.tokenLifetimeSec = 600;
  const auto token =
      co_await Quorlin::Coroutine::AcquireToken(service, user, std::move(password), spec, stop);
  // From here on we are on a thread of the platform.
  const bool isKnown = co_await Quorlin::Coroutine::ValidateSubject(service, token, stop);
  std::cout << token->GetSubject().ToString() << (isKnown ? " is known\n" : " is not known any more\n");
}

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

}  // namespace

int main(int argc, char** argv) {
  if (argc != 5) {
    std::cerr << "usage: awaitToken URL CA.pem STS.pem USER < password\n";
    return 2;
  }
  try {
    std::string line;
    std::getline(std::cin, line);
    std::stop_source stop;
    Task task = Run(MakeService(argv), argv[4], std::move(line), stop.get_token());
    while (std::getline(std::cin, line)) {
      if (line == "stop") {
        stop.request_stop();
      }
    }
    task.end.get();
    return 0;
  } catch (const std::exception& error) {
    std::cerr << error.what() << "\n";
    return 1;
  }
}
