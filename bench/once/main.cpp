// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

// quorlin_bench_once TOKEN CERTIFICATE COUNT: validates the token in a file COUNT times against the trusted
// certificate of another, and ends. It is a host like any other, over the shared libraries; bench/report.py
// times its start and counts its instructions.

#include "bench/ReadFile.h"

#include <pelmar/crypto/Certificate.h>
#include <quorlin/SamlToken.h>

#include <cstdio>
#include <cstdlib>
#include <exception>
#include <string>

namespace {

using Bench::ReadFile;

void Validate(const std::string& token, const std::string& certificate, unsigned long count) {
  const auto trusted = Pelmar::Crypto::CreateCertificatesFromPem(certificate);
  for (unsigned long i = 0; i < count; ++i) {
    Quorlin::CreateSamlToken(token, trusted);
  }
}

}  // namespace

int main(int count, char** arguments) {
  if (count != 4) {
    std::fprintf(stderr, "usage: quorlin_bench_once TOKEN CERTIFICATE COUNT\n");
    return 2;
  }
  try {
    Validate(ReadFile(arguments[1]), ReadFile(arguments[2]), std::strtoul(arguments[3], nullptr, 10));
    return EXIT_SUCCESS;
  } catch (const std::exception& e) {
    std::fprintf(stderr, "quorlin_bench_once: %s\n", e.what());
    return EXIT_FAILURE;
  }
}
