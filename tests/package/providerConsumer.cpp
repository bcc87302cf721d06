// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors
//
// A host application with a token provider: makes one, and catches what it throws when it cannot ask.

#include <quorlin/TokenProvider.h>
#include <quorlin/quorlin.h>

#include <iostream>

int main() {
  Quorlin::SecurityTokenServiceConfig config;
  config.stsUrl = "http://127.0.0.1/sts";
  Quorlin::TokenProviderOptions options;
  options.spec.tokenLifetimeSec = 600;
  const boost::shared_ptr<Quorlin::TokenProvider> provider = Quorlin::CreateTokenProvider(
      Quorlin::CreateSecurityTokenService(config), Quorlin::RequestByCertificate(), options);
  try {
    provider->GetToken();
  } catch (const Pelmar::InvalidStateException& failure) {
    std::cout << "failed: " << failure.what() << '\n';
    return 0;
  } catch (const std::exception& error) {
    std::cerr << "an exception of another class: " << error.what() << '\n';
    return 1;
  }
  std::cerr << "got a token without a key\n";
  return 1;
}
