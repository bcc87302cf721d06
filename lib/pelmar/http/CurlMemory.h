// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

// Memory of the HTTP engine that is wiped before it is given back.

#ifndef PELMAR_HTTP_CURLMEMORY_H
#define PELMAR_HTTP_CURLMEMORY_H

#include <cstddef>

namespace Pelmar {
namespace Http {

/// Initialises libcurl so that it wipes all memory which it gives back: requests and answers pass through its
/// own buffers. Where the host has initialised libcurl before, the host's choice stands, and nothing but the
/// count of users changes. False when libcurl cannot be initialised; else to be undone by
/// curl_global_cleanup.
bool InitializeCurl();

/// What libcurl is given as malloc's companions. Blocks are those of malloc and may also be given to free.
void WipeAndFree(void* block) noexcept;
/// Like realloc, but wipes what it moves away from.
void* WipeAndReallocate(void* block, std::size_t size) noexcept;

}  // namespace Http
}  // namespace Pelmar

#endif  // PELMAR_HTTP_CURLMEMORY_H
