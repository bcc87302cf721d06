// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

#include "quorlin-provider/TokenCache.h"

#include "provider/ScriptedService.h"

#include <boost/make_shared.hpp>
#include <boost/weak_ptr.hpp>

#include <gtest/gtest.h>

#include <memory>
#include <thread>
#include <vector>

namespace {

using Token = boost::shared_ptr<const Quorlin::SamlToken>;

Token MakeToken() {
  return boost::make_shared<TestSupport::TimedToken>(TestSupport::TokenTraits());
}

// As it is within a provider: not on the stack, where g++ 12's address sanitizer aligns nothing to a line of
// the cache.
std::unique_ptr<Quorlin::TokenCache> MakeCache() {
  return std::make_unique<Quorlin::TokenCache>();
}

TEST(TokenCache, IsEmptyAtFirst) {
  EXPECT_EQ(MakeCache()->Find(0), nullptr);
}

TEST(TokenCache, FindsTheTokenUpToTheInstantAndNotBeyond) {
  const std::unique_ptr<Quorlin::TokenCache> cache = MakeCache();
  const Token token = MakeToken();
  cache->Store(token, 5);
  EXPECT_EQ(cache->Find(5), token);
  EXPECT_EQ(cache->Find(6), nullptr);
}

TEST(TokenCache, FindsTheTokenOnManyThreads) {
  const std::unique_ptr<Quorlin::TokenCache> cache = MakeCache();
  const Token token = MakeToken();
  cache->Store(token, 5);
  std::vector<std::thread> threads;
  for (int i = 0; i < 40; ++i) {
    threads.emplace_back([&] { EXPECT_EQ(cache->Find(5), token); });
  }
  for (std::thread& thread : threads) {
    thread.join();
  }
}

TEST(TokenCache, WhatItGaveOutLivesOn) {
  const std::unique_ptr<Quorlin::TokenCache> cache = MakeCache();
  Token token = MakeToken();
  const boost::weak_ptr<const Quorlin::SamlToken> watched(token);
  cache->Store(token, 5);
  token.reset();
  Token found = cache->Find(0);
  cache->Clear();
  EXPECT_EQ(cache->Find(0), nullptr);
  EXPECT_FALSE(watched.expired());
  found.reset();
  EXPECT_TRUE(watched.expired());
}

}  // namespace
