// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

#include "quorlin-provider/TokenCache.h"

#include <atomic>

namespace Quorlin {

namespace {

using Token = boost::shared_ptr<const SamlToken>;

/// Threads are numbered in the order in which they first ask.
std::size_t GetThreadNumber() {
  static std::atomic<std::size_t> count(0);
  thread_local const std::size_t number = count.fetch_add(1, std::memory_order_relaxed);
  return number;
}

/// The same token with a reference count of its own.
Token CountApart(const Token& token) {
  return token ? Token(token.get(), [token](const SamlToken*) {}) : token;
}

}  // namespace

Token TokenCache::Find(long long now) const {
  const Copy& copy = _copies[GetThreadNumber() % kCopies];
  const std::lock_guard<std::mutex> lock(copy.mutex);
  return now <= copy.freshThrough ? copy.token : Token();
}

void TokenCache::Store(const Token& token, long long freshThrough) {
  for (Copy& copy : _copies) {
    Token old = CountApart(token);
    const std::lock_guard<std::mutex> lock(copy.mutex);
    copy.token.swap(old);
    copy.freshThrough = freshThrough;
  }
}

}  // namespace Quorlin
