// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

// Credential caches that are no good: without tickets, or with expired ones, which nobody had to wait for.

#ifndef QUORLIN_TESTS_INTEROP_KERBEROS_CACHECOPIES_H
#define QUORLIN_TESTS_INTEROP_KERBEROS_CACHECOPIES_H

#include <string>

namespace KerberosTests {

/// Copies the cache `from` to the new cache `to`, with all the times that the tickets' owner goes by moved so
/// far into the past that the tickets expired an hour ago. Throws std::runtime_error.
void CopyExpired(const std::string& from, const std::string& to);

/// Makes the new cache `to` with the owner of the cache `from` and no ticket. Throws std::runtime_error.
void CopyOwner(const std::string& from, const std::string& to);

}  // namespace KerberosTests

#endif  // QUORLIN_TESTS_INTEROP_KERBEROS_CACHECOPIES_H
