// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

// From OpenSSL's error queue to our exceptions.

#ifndef PELMAR_CRYPTO_OPENSSLERROR_H
#define PELMAR_CRYPTO_OPENSSLERROR_H

#include <string>

namespace Pelmar {
namespace Crypto {

/// Empties this thread's error queue, so that an old error is not taken for that of the next call (TLS reads
/// the queue too).
void ClearOpenSslErrors() noexcept;

/// Throws CryptoException: `what`, and the reason that OpenSSL gives for the root of the failure, when it has
/// one. The queue is empty afterwards. OpenSSL's reasons are fixed texts; none holds data of ours.
[[noreturn]] void ThrowOpenSslError(const std::string& what);

/// Throws CryptoException ("`what`: malloc failure") when one of OpenSSL's errors on this thread is a lack of
/// memory. Clears them either way.
void ThrowIfMemoryRanOut(const std::string& what);

}  // namespace Crypto
}  // namespace Pelmar

#endif  // PELMAR_CRYPTO_OPENSSLERROR_H
