// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

// Credential caches whose tickets have expired, without waiting for it.

#ifndef QUORLIN_TESTS_INTEROP_KERBEROS_EXPIREDCACHE_H
#define QUORLIN_TESTS_INTEROP_KERBEROS_EXPIREDCACHE_H

#include <string>

namespace KerberosTests {

/// Copies the cache `from` to the new cache `to`, with all the times that the tickets' owner goes by moved so
/// far into the past that the tickets expired an hour ago. Throws std::runtime_error.
void CopyExpired(const std::string& from, const std::string& to);

}  // namespace KerberosTests

#endif  // QUORLIN_TESTS_INTEROP_KERBEROS_EXPIREDCACHE_H
