// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

#include "pelmar/http/CurlMemory.h"

#include <pelmar/SecretText.h>

#include <curl/curl.h>
#include <malloc.h>

#include <cstdlib>
#include <cstring>

namespace Pelmar {
namespace Http {

namespace {

char* Duplicate(const char* text) {
  const std::size_t size = std::strlen(text) + 1;
  void* const copy = std::malloc(size);
  return copy == nullptr ? nullptr : static_cast<char*>(std::memcpy(copy, text, size));
}

}  // namespace

void WipeAndFree(void* block) noexcept {
  Wipe(block, malloc_usable_size(block));
  std::free(block);
}

void* WipeAndReallocate(void* block, std::size_t size) noexcept {
  const std::size_t room = malloc_usable_size(block);
  if (block != nullptr && size <= room) {
    return block;
  }
  void* const larger = std::malloc(size);
  if (larger == nullptr || block == nullptr) {
    return larger;
  }
  std::memcpy(larger, block, room);
  WipeAndFree(block);
  return larger;
}

bool InitializeCurl() {
  return curl_global_init_mem(CURL_GLOBAL_DEFAULT, &std::malloc, &WipeAndFree, &WipeAndReallocate, &Duplicate,
                              &std::calloc) == CURLE_OK;
}

}  // namespace Http
}  // namespace Pelmar
