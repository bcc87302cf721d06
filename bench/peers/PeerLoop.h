// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

// What the peers written in C++ have in common: the conversation with the benchmark (bench/peers/README.md).

#ifndef QUORLIN_BENCH_PEERS_PEERLOOP_H
#define QUORLIN_BENCH_PEERS_PEERLOOP_H

#include "bench/ReadFile.h"

#include <cstddef>
#include <exception>
#include <iostream>
#include <stdexcept>
#include <string>
#include <vector>

namespace Peers {

using Bench::ReadFile;

/// What a peer read out of a token that it accepted.
struct Findings {
  std::string subject;
  std::vector<std::string> groups;
};

inline void Require(bool holds, const char* what) {
  if (!holds) {
    throw std::runtime_error(what);
  }
}

inline std::string Check(const std::exception* error, const Findings& findings) {
  if (error != nullptr) {
    std::string reason = error->what();
    return "refused " + reason.substr(0, reason.find('\n'));
  }
  return "accepted " + findings.subject + " " + std::to_string(findings.groups.size());
}

/// `Validator` is made of the name of the groups' attribute and the files of the trusted certificates, one
/// for each token; its `Validate(text, which)` gives Findings, or throws std::exception for a token it
/// refuses.
template <typename Validator>
int Converse(const std::string& name, int count, char** arguments) {
  std::vector<std::string> tokens;
  std::vector<std::string> trusted;
  for (int i = 2; i + 1 < count; i += 2) {
    tokens.push_back(ReadFile(arguments[i]));
    trusted.push_back(arguments[i + 1]);
  }
  Require(!tokens.empty(), "usage: PEER GROUP-ATTRIBUTE (TOKEN TRUSTED-CERTIFICATE)...");
  Validator validator(arguments[1], trusted);
  std::cout << "ready " << name << std::endl;

  std::string order;
  while (std::cin >> order) {
    std::size_t which = 0;
    if (order == "check") {
      std::string path;
      std::cin >> which >> path;
      try {
        const Findings findings = validator.Validate(ReadFile(path), which);
        std::cout << Check(nullptr, findings) << std::endl;
      } catch (const std::exception& e) {
        std::cout << Check(&e, {}) << std::endl;
      }
    } else if (order == "run") {
      std::size_t calls = 0;
      std::cin >> which >> calls;
      for (std::size_t i = 0; i < calls; ++i) {
        validator.Validate(tokens.at(which), which);
      }
      std::cout << "done" << std::endl;
    } else {
      throw std::runtime_error("unknown order: " + order);
    }
  }
  return 0;
}

/// The same as the whole of main().
template <typename Validator>
int RunPeer(const std::string& name, int count, char** arguments) {
  try {
    return Converse<Validator>(name, count, arguments);
  } catch (const std::exception& e) {
    std::cerr << name << ": " << e.what() << "\n";
    return 1;
  }
}

}  // namespace Peers

#endif  // QUORLIN_BENCH_PEERS_PEERLOOP_H
