// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

// The content of a file, for the small programs.

#ifndef QUORLIN_BENCH_READFILE_H
#define QUORLIN_BENCH_READFILE_H

#include <fstream>
#include <iterator>
#include <stdexcept>
#include <string>

namespace Bench {

/// Throws std::runtime_error when it cannot be read.
inline std::string ReadFile(const std::string& path) {
  std::ifstream file(path, std::ios::binary);
  if (!file) {
    throw std::runtime_error("cannot read " + path);
  }
  return {std::istreambuf_iterator<char>(file), std::istreambuf_iterator<char>()};
}

}  // namespace Bench

#endif  // QUORLIN_BENCH_READFILE_H
