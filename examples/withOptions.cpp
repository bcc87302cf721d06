// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors
//
// Like acquireByPassword, for a program that must not hang: the call has ten seconds in all, is tried again
// if the service is just starting, goes through a proxy if one is named, and ends at Ctrl-C.
//
//   withOptions URL CA.pem STS.pem USER [PROXY] < password

#include <quorlin/quorlin.h>

#include <csignal>
#include <fstream>
#include <iostream>
#include <iterator>
#include <string>
#include <thread>

namespace {

using Handle = Pelmar::Ref<Pelmar::System::CancellationHandle>;

std::string ReadFile(const char* path) {
  std::ifstream file(path, std::ios::binary);
  return std::string(std::istreambuf_iterator<char>(file), std::istreambuf_iterator<char>());
}

/// Cancels when Ctrl-C is pressed. A handle locks, so a signal handler may not use it; a thread that waits
/// for the signal may. To be called before anything that starts threads, so that none of them gets the
/// signal.
void CancelAtInterrupt(const Handle& handle) {
  sigset_t interrupt;
  sigemptyset(&interrupt);
  sigaddset(&interrupt, SIGINT);
  pthread_sigmask(SIG_BLOCK, &interrupt, nullptr);
  std::thread([handle, interrupt] {
    int signal = 0;
    sigwait(&interrupt, &signal);
    handle->Cancel();
  }).detach();
}

Quorlin::SecurityTokenServiceConfig MakeConfig(const std::string& url, const char* caFile,
                                               const char* stsFile) {
  Pelmar::Ssl::SSLContextOptions tls;
  tls.caFile = caFile;
  Quorlin::SecurityTokenServiceConfig config;
  config.stsUrl = url;
  config.sslContext = Pelmar::Ssl::CreateSSLContext(tls);
  config.trustedStsCertificates = Pelmar::Crypto::CreateCertificatesFromPem(ReadFile(stsFile));
  return config;
}

int Run(const Quorlin::SecurityTokenServiceConfig& config, const std::string& user,
        const std::string& proxy) {
  std::string password;
  std::getline(std::cin, password);
  const Handle cancellation = Pelmar::System::CreateCancellationHandle();
  CancelAtInterrupt(cancellation);

  Quorlin::ServiceOptions options;
  options.timeoutMicroseconds = 10000000;
  options.connectTimeoutMicroseconds = 2000000;
  options.maxRetries = 3;
  options.cancellation = cancellation;
  options.proxyUrl = proxy;
  options.userAgent = "Example/1.0";
  auto service = Quorlin::CreateSecurityTokenService(config, options);

  Quorlin::TokenSpec spec;
  spec.tokenLifetimeSec = 600;
  auto token = service->AcquireToken(user, password, spec);
  std::cout << token->GetSubject().ToString() << " until " << token->GetEndDate().ToString() << "\n";
  return 0;
}

}  // namespace

int main(int argc, char** argv) {
  if (argc != 5 && argc != 6) {
    std::cerr << "usage: withOptions URL CA.pem STS.pem USER [PROXY] < password\n";
    return 2;
  }
  try {
    return Run(MakeConfig(argv[1], argv[2], argv[3]), argv[4], argc == 6 ? argv[5] : "");
  } catch (const Pelmar::Exception& error) {
    std::cerr << error.what() << "\n";
    return 1;
  }
}
