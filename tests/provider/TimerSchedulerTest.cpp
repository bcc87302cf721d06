// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

// The scheduler with real time. Nothing here asserts how long anything takes.

#include "quorlin-provider/TimerScheduler.h"

#include <gtest/gtest.h>

#include <future>
#include <memory>
#include <stdexcept>
#include <thread>

namespace {

using Quorlin::TimerScheduler;
using Work = TimerScheduler::Work;

constexpr long long kHour = 3600LL * 1000000;

void RunHere(const Work& work) {
  work();
}

TEST(TimerScheduler, HandsOverAtOnceWhatIsDueAtOnce) {
  bool isRun = false;
  TimerScheduler scheduler(RunHere, std::chrono::seconds(1));
  scheduler.Schedule(0, [&isRun] { isRun = true; });
  EXPECT_TRUE(isRun);
}

TEST(TimerScheduler, RunsWorkWhenItIsDueOnAThreadOfItsOwn) {
  TimerScheduler scheduler(RunHere, std::chrono::seconds(1));
  std::promise<std::thread::id> thread;
  scheduler.Schedule(1000, [&thread] { thread.set_value(std::this_thread::get_id()); });
  EXPECT_NE(thread.get_future().get(), std::this_thread::get_id());
}

TEST(TimerScheduler, RunsWhatIsDueFirstThoughItCameLast) {
  TimerScheduler scheduler(RunHere, std::chrono::seconds(1));
  std::promise<void> done;
  bool isLateRun = false;
  scheduler.Schedule(kHour, [&isLateRun] { isLateRun = true; });
  scheduler.Schedule(1000, [&done] { done.set_value(); });
  done.get_future().wait();
  scheduler.Stop();
  EXPECT_FALSE(isLateRun);
}

TEST(TimerScheduler, ForgetsWorkThatIsCancelled) {
  TimerScheduler scheduler(RunHere, std::chrono::seconds(1));
  auto owned = std::make_shared<int>(0);
  const std::weak_ptr<int> watched(owned);
  const unsigned long long number = scheduler.Schedule(kHour, [owned] { ADD_FAILURE() << *owned; });
  owned.reset();
  EXPECT_FALSE(watched.expired());
  scheduler.Cancel(number);
  EXPECT_TRUE(watched.expired());
  scheduler.Cancel(number);
  scheduler.Cancel(number + 1);
}

TEST(TimerScheduler, WorkMayScheduleAndCancel) {
  TimerScheduler scheduler(RunHere, std::chrono::seconds(1));
  std::promise<void> done;
  scheduler.Schedule(1, [&] {
    scheduler.Cancel(scheduler.Schedule(kHour, [] {}));
    scheduler.Schedule(1, [&done] { done.set_value(); });
  });
  done.get_future().wait();
}

TEST(TimerScheduler, OffersWorkAgainThatNobodyTook) {
  int offers = 0;
  std::promise<void> done;
  TimerScheduler scheduler(
      [&offers](const Work& work) {
        if (++offers < 3) {
          throw std::runtime_error("no thread to be had");
        }
        work();
      },
      std::chrono::microseconds(1));
  scheduler.Schedule(1, [&done] { done.set_value(); });
  done.get_future().wait();
  scheduler.Stop();
  EXPECT_EQ(offers, 3);
}

TEST(TimerScheduler, TellsOfWorkDueAtOnceThatNobodyTook) {
  TimerScheduler scheduler([](const Work&) { throw std::runtime_error("no thread to be had"); },
                           std::chrono::seconds(1));
  EXPECT_THROW(scheduler.Schedule(0, [] {}), std::runtime_error);
}

TEST(TimerScheduler, ForgetsEverythingWhenItStops) {
  TimerScheduler scheduler(RunHere, std::chrono::seconds(1));
  auto owned = std::make_shared<int>(0);
  const std::weak_ptr<int> watched(owned);
  scheduler.Schedule(kHour, [owned] { ADD_FAILURE() << *owned; });
  owned.reset();
  scheduler.Stop();
  EXPECT_TRUE(watched.expired());
  scheduler.Schedule(1, [] { ADD_FAILURE(); });
  scheduler.Stop();
}

TEST(TimerScheduler, TheProcessHasOne) {
  const auto scheduler = Quorlin::GetProcessScheduler();
  EXPECT_EQ(scheduler, Quorlin::GetProcessScheduler());
  std::promise<std::thread::id> thread;
  scheduler->Schedule(1, [&thread] { thread.set_value(std::this_thread::get_id()); });
  EXPECT_NE(thread.get_future().get(), std::this_thread::get_id());
}

}  // namespace
