// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

// quorlin_bench_memory (TOKEN CERTIFICATE)...: for the token in each file the length of its text, the most
// memory that was held at once while it was validated, what is held for the token afterwards, and how often
// memory was asked for: one line each, in bytes. A token of the same signer has been validated before, so
// what is remembered for good does not count.

#include "bench/ReadFile.h"
#include "extremes/AllocationCount.h"

#include <pelmar/crypto/Certificate.h>
#include <quorlin/SamlToken.h>

#include <cstdio>
#include <cstdlib>
#include <exception>
#include <string>

namespace {

using Bench::ReadFile;

void Print(const char* tokenPath, const char* certificatePath) {
  const std::string token = ReadFile(tokenPath);
  const auto trusted = Pelmar::Crypto::CreateCertificatesFromPem(ReadFile(certificatePath));
  Quorlin::CreateSamlToken(token, trusted);
  boost::shared_ptr<Quorlin::SamlToken> kept;
  const Extremes::Cost cost = Extremes::MeasureCost([&] { kept = Quorlin::CreateSamlToken(token, trusted); });
  std::printf("%zu %zu %zu %zu\n", token.size(), cost.peakBytes, cost.keptBytes, cost.allocations);
}

}  // namespace

int main(int count, char** arguments) {
  if (count < 3 || count % 2 != 1) {
    std::fprintf(stderr, "usage: quorlin_bench_memory (TOKEN CERTIFICATE)...\n");
    return 2;
  }
  try {
    for (int i = 1; i < count; i += 2) {
      Print(arguments[i], arguments[i + 1]);
    }
    return EXIT_SUCCESS;
  } catch (const std::exception& e) {
    std::fprintf(stderr, "quorlin_bench_memory: %s\n", e.what());
    return EXIT_FAILURE;
  }
}
