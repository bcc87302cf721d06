// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

#include <pelmar/Exception.h>
#include <pelmar/system/CancellationHandle.h>

#include <gtest/gtest.h>

#include <atomic>
#include <future>
#include <limits>
#include <thread>
#include <vector>

namespace Pelmar {
namespace System {
namespace {

/// Counts how often it is cancelled, and tells when it goes.
class CountingItem final : public ScheduledItem {
 public:
  explicit CountingItem(bool* isGone = nullptr) : _isGone(isGone) {}

  bool Wait(long long) override { return cancellations > 0; }
  void Cancel() override { ++cancellations; }

  std::atomic<int> cancellations{0};

 private:
  ~CountingItem() override {
    if (_isGone != nullptr) {
      *_isGone = true;
    }
  }

  bool* const _isGone;
};

TEST(CancellationHandle, IsNotCancelledUntilItIs) {
  const Ref<CancellationHandle> handle = CreateCancellationHandle();
  EXPECT_FALSE(handle->IsCancelled());
  EXPECT_FALSE(handle->Wait(0));
  EXPECT_FALSE(handle->Wait(1));
  handle->Cancel();
  EXPECT_TRUE(handle->IsCancelled());
  EXPECT_TRUE(handle->Wait(0));
  EXPECT_TRUE(handle->Wait(-1));
}

TEST(CancellationHandle, WakesWhoeverWaits) {
  const Ref<CancellationHandle> handle = CreateCancellationHandle();
  const auto wait = [&handle](long long timeout) {
    return std::async(std::launch::async, [&handle, timeout] { return handle->Wait(timeout); });
  };
  std::future<bool> withoutEnd = wait(-1);
  // More than the clock can hold.
  std::future<bool> forLong = wait(std::numeric_limits<long long>::max());
  handle->Cancel();
  EXPECT_TRUE(withoutEnd.get());
  EXPECT_TRUE(forLong.get());
}

TEST(CancellationHandle, CancelsAllThatIsAttachedOnce) {
  const Ref<CancellationHandle> handle = CreateCancellationHandle();
  const Ref<CountingItem> first = MakeRef<CountingItem>();
  const Ref<CountingItem> second = MakeRef<CountingItem>();
  handle->Attach(first);
  handle->Attach(first);
  handle->Attach(second);
  EXPECT_EQ(0, first->cancellations);
  handle->Cancel();
  handle->Cancel();
  EXPECT_EQ(1, first->cancellations);
  EXPECT_EQ(1, second->cancellations);
}

TEST(CancellationHandle, CancelsAtOnceWhatComesLater) {
  const Ref<CancellationHandle> handle = CreateCancellationHandle();
  handle->Cancel();
  bool isGone = false;
  Ref<CountingItem> item = MakeRef<CountingItem>(&isGone);
  handle->Attach(item);
  EXPECT_EQ(1, item->cancellations);
  item = nullptr;
  EXPECT_TRUE(isGone);
}

TEST(CancellationHandle, LeavesWhatIsDetached) {
  const Ref<CancellationHandle> handle = CreateCancellationHandle();
  const Ref<CountingItem> item = MakeRef<CountingItem>();
  handle->Attach(item);
  handle->Detach(item);
  handle->Detach(item);
  handle->Detach(nullptr);
  handle->Cancel();
  EXPECT_EQ(0, item->cancellations);
}

TEST(CancellationHandle, KeepsItemsUntilTheyAreDetachedOrCancelled) {
  const Ref<CancellationHandle> handle = CreateCancellationHandle();
  bool isFirstGone = false;
  bool isSecondGone = false;
  Ref<CountingItem> first = MakeRef<CountingItem>(&isFirstGone);
  Ref<CountingItem> second = MakeRef<CountingItem>(&isSecondGone);
  handle->Attach(first);
  handle->Attach(second);
  handle->Detach(first);
  first = nullptr;
  second = nullptr;
  EXPECT_TRUE(isFirstGone);
  EXPECT_FALSE(isSecondGone);
  handle->Cancel();
  EXPECT_TRUE(isSecondGone);
}

TEST(CancellationHandle, RefusesToAttachNothing) {
  const Ref<CancellationHandle> handle = CreateCancellationHandle();
  try {
    handle->Attach(nullptr);
    FAIL() << "nothing was attached";
  } catch (const InvalidArgumentException& error) {
    EXPECT_STREQ("Invalid argument : there is no item to attach", error.what());
  }
}

TEST(CancellationHandle, CancelsAttachedHandlesButNotTheirOwners) {
  const Ref<CancellationHandle> outer = CreateCancellationHandle();
  const Ref<CancellationHandle> inner = CreateCancellationHandle();
  const Ref<CancellationHandle> other = CreateCancellationHandle();
  outer->Attach(inner);
  outer->Attach(other);
  other->Cancel();
  EXPECT_FALSE(outer->IsCancelled());
  EXPECT_FALSE(inner->IsCancelled());
  outer->Cancel();
  EXPECT_TRUE(inner->IsCancelled());
}

/// Uses the handle that cancels it.
class ReentrantItem final : public ScheduledItem {
 public:
  explicit ReentrantItem(CancellationHandle& handle) : _handle(handle) {}

  bool Wait(long long) override { return true; }
  void Cancel() override {
    sawItself = _handle.IsCancelled();
    _handle.Detach(this);
    _handle.Cancel();
  }

  bool sawItself = false;

 private:
  ~ReentrantItem() override = default;

  CancellationHandle& _handle;
};

TEST(CancellationHandle, MayBeUsedByWhatItCancels) {
  const Ref<CancellationHandle> handle = CreateCancellationHandle();
  const Ref<ReentrantItem> item = MakeRef<ReentrantItem>(*handle);
  handle->Attach(item);
  handle->Cancel();
  EXPECT_TRUE(item->sawItself);
}

TEST(CancellationHandle, MissesNothingWhenThreadsRace) {
  constexpr int kThreads = 8;
  constexpr int kItems = 200;
  const Ref<CancellationHandle> handle = CreateCancellationHandle();
  std::vector<std::vector<Ref<CountingItem>>> items(kThreads);
  std::vector<std::thread> threads;
  for (std::vector<Ref<CountingItem>>& own : items) {
    threads.emplace_back([&own, &handle] {
      for (int i = 0; i < kItems; ++i) {
        own.push_back(MakeRef<CountingItem>());
        handle->Attach(own.back());
        const Ref<CountingItem> passing = MakeRef<CountingItem>();
        handle->Attach(passing);
        handle->Detach(passing);
      }
    });
  }
  handle->Cancel();
  for (std::thread& thread : threads) {
    thread.join();
  }
  for (const std::vector<Ref<CountingItem>>& own : items) {
    for (const Ref<CountingItem>& item : own) {
      EXPECT_EQ(1, item->cancellations);
    }
  }
}

}  // namespace
}  // namespace System
}  // namespace Pelmar
