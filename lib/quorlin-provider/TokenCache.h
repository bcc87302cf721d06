// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

// Where callers find the token while it is fresh.

#ifndef QUORLIN_PROVIDER_TOKENCACHE_H
#define QUORLIN_PROVIDER_TOKENCACHE_H

#include <quorlin/SamlToken.h>

#include <boost/shared_ptr.hpp>

#include <array>
#include <cstddef>
#include <mutex>

namespace Quorlin {

/// One token with the instant up to which it may be handed out. Safe to use from any thread.
///
/// The token lies here several times, each copy with a lock and a reference count of its own, and each thread
/// keeps to one copy: two threads that ask all the time then do not take turns at one count.
class TokenCache final {
 public:
  /// The token if it may still be handed out at `now`, or null.
  boost::shared_ptr<const SamlToken> Find(long long now) const;
  /// From now on this token, up to and with `freshThrough`.
  void Store(const boost::shared_ptr<const SamlToken>& token, long long freshThrough);
  void Clear() { Store(boost::shared_ptr<const SamlToken>(), 0); }

 private:
  static constexpr std::size_t kCopies = 16;
  static constexpr std::size_t kCacheLineBytes = 64;

  struct alignas(kCacheLineBytes) Copy {
    mutable std::mutex mutex;
    boost::shared_ptr<const SamlToken> token;
    long long freshThrough = 0;
  };

  std::array<Copy, kCopies> _copies;
};

}  // namespace Quorlin

#endif  // QUORLIN_PROVIDER_TOKENCACHE_H
