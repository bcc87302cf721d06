// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

#include "pelmar/core/Demangle.h"

#include <cxxabi.h>

#include <cstdlib>
#include <memory>

namespace Pelmar {

namespace {

struct FreeDeleter {
  void operator()(char* text) const noexcept { std::free(text); }
};

}  // namespace

std::string Demangle(const char* mangledName) {
  int status = 0;
  const std::unique_ptr<char, FreeDeleter> readable(
      abi::__cxa_demangle(mangledName, nullptr, nullptr, &status));
  return status == 0 && readable != nullptr ? readable.get() : mangledName;
}

}  // namespace Pelmar
