// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

#include <pelmar/Exception.h>
#include <pelmar/StringUtil.h>
#include <pelmar/service/Logger.h>
#include <pelmar/system/ThreadPool.h>

#include "pelmar/system/ThreadPoolImpl.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <atomic>
#include <cstdio>
#include <cstdlib>
#include <future>
#include <memory>
#include <mutex>
#include <stdexcept>
#include <string>
#include <system_error>
#include <thread>
#include <vector>

namespace Pelmar {
namespace System {
namespace {

using testing::ElementsAre;
using testing::Eq;
using testing::ExitedWithCode;

constexpr std::chrono::hours kNeverIdle(1);

/// Opened once; everybody who waits goes on.
class Gate {
 public:
  Gate() : _opened(_promise.get_future().share()) {}
  void Open() { _promise.set_value(); }
  void Wait() const { std::shared_future<void>(_opened).wait(); }

 private:
  std::promise<void> _promise;
  const std::shared_future<void> _opened;
};

/// Something whose last copy opens the gate when it is destroyed.
std::shared_ptr<Gate> OpenWhenDestroyed(Gate& gate) {
  return std::shared_ptr<Gate>(&gate, [](Gate* g) { g->Open(); });
}

/// Opens the gate when the thread that made it ends.
class OpenWhenThreadEnds {
 public:
  explicit OpenWhenThreadEnds(Gate& gate) : _gate(gate) {}
  OpenWhenThreadEnds(const OpenWhenThreadEnds&) = delete;
  OpenWhenThreadEnds& operator=(const OpenWhenThreadEnds&) = delete;
  ~OpenWhenThreadEnds() { _gate.Open(); }

 private:
  Gate& _gate;
};

class Lines {
 public:
  void Add(const std::string& line) {
    const std::lock_guard<std::mutex> lock(_mutex);
    _lines.push_back(line);
  }
  std::vector<std::string> Get() const {
    const std::lock_guard<std::mutex> lock(_mutex);
    return _lines;
  }

 private:
  mutable std::mutex _mutex;
  std::vector<std::string> _lines;
};

void FailOnEscape(const std::string& description) {
  ADD_FAILURE() << description;
}

ThreadPoolSettings MakeSettings(std::size_t maxThreads, std::chrono::microseconds idleTime = kNeverIdle) {
  return {maxThreads, idleTime, FailOnEscape, StartThread};
}

void AwaitIdle(const ThreadPoolImpl& pool) {
  while (pool.CountBusyThreads() != 0) {
    std::this_thread::yield();
  }
}

TEST(ThreadPool, StartsNoThreadWithoutWork) {
  const ThreadPoolImpl pool(MakeSettings(4));
  EXPECT_EQ(pool.CountThreads(), 0u);
}

TEST(ThreadPool, RunsItemsInTheOrderQueued) {
  Lines lines;
  Gate started;
  Gate release;
  Gate done;
  ThreadPoolImpl pool(MakeSettings(1));
  pool.Queue([&] {
    started.Open();
    release.Wait();
  });
  started.Wait();
  for (int i = 0; i < 5; ++i) {
    pool.Queue([&lines, i] { lines.Add(std::to_string(i)); });
  }
  pool.Queue([&] { done.Open(); });
  release.Open();
  done.Wait();
  EXPECT_THAT(lines.Get(), ElementsAre("0", "1", "2", "3", "4"));
}

TEST(ThreadPool, RunsOneItemPerThreadUpToItsBound) {
  constexpr std::size_t kBound = 3;
  Gate started[kBound];
  Gate release;
  Gate afterwards;
  ThreadPoolImpl pool(MakeSettings(kBound));
  for (std::size_t i = 0; i < kBound; ++i) {
    pool.Queue([&, i] {
      started[i].Open();
      release.Wait();
    });
    EXPECT_EQ(pool.CountThreads(), i + 1);
  }
  // All three wait at once, each on a thread of its own.
  for (const Gate& gate : started) {
    gate.Wait();
  }
  EXPECT_EQ(pool.CountBusyThreads(), kBound);
  pool.Queue([&] { afterwards.Open(); });
  EXPECT_EQ(pool.CountThreads(), kBound);
  release.Open();
  afterwards.Wait();
}

TEST(ThreadPool, StartsAThreadForEachOfABurstOfItems) {
  // None of the items may have been taken when the next is queued; each must still find a thread.
  constexpr int kItems = 8;
  std::atomic<int> arrived(0);
  Gate all;
  Gate done[kItems];
  ThreadPoolImpl pool(MakeSettings(kItems));
  for (Gate& gate : done) {
    pool.Queue([&] {
      if (++arrived == kItems) {
        all.Open();
      }
      all.Wait();
      gate.Open();
    });
  }
  for (const Gate& gate : done) {
    gate.Wait();
  }
  EXPECT_EQ(arrived, kItems);
}

TEST(ThreadPool, ReusesAnIdleThread) {
  ThreadPoolImpl pool(MakeSettings(4));
  for (int i = 0; i < 10; ++i) {
    Gate done;
    pool.Queue([&] { done.Open(); });
    done.Wait();
    AwaitIdle(pool);
    EXPECT_EQ(pool.CountThreads(), 1u);
  }
}

TEST(ThreadPool, EndsIdleThreadsAndStartsAnew) {
  ThreadPoolImpl pool(MakeSettings(4, std::chrono::microseconds(0)));
  for (int generation = 0; generation < 20; ++generation) {
    Gate ended;
    pool.Queue([&] { thread_local const OpenWhenThreadEnds guard(ended); });
    ended.Wait();
    EXPECT_EQ(pool.CountThreads(), 0u);
  }
}

TEST(ThreadPool, DestroysAnItemAsSoonAsItHasRun) {
  Gate ran;
  Gate destroyed;
  ThreadPoolImpl pool(MakeSettings(1));
  pool.Queue([&ran, held = OpenWhenDestroyed(destroyed)] { ran.Open(); });
  ran.Wait();
  destroyed.Wait();
  EXPECT_EQ(pool.CountThreads(), 1u);
}

TEST(ThreadPool, RefusesAnEmptyItem) {
  ThreadPoolImpl pool(MakeSettings(1));
  try {
    pool.Queue(boost::function<void()>());
    FAIL() << "no exception";
  } catch (const InvalidArgumentException& e) {
    EXPECT_STREQ(e.what(), "Invalid argument : the work item is empty");
  }
  EXPECT_EQ(pool.CountThreads(), 0u);
}

TEST(ThreadPool, TakesItemsFromItems) {
  Gate done;
  ThreadPoolImpl pool(MakeSettings(1));
  pool.Queue([&] { pool.Queue([&] { pool.Queue([&] { done.Open(); }); }); });
  done.Wait();
  EXPECT_EQ(pool.CountThreads(), 1u);
}

/// A work item whose every copy and destruction asks the pool, which would hang if the pool held its lock
/// meanwhile.
class CuriousItem {
 public:
  CuriousItem(const ThreadPoolImpl& pool, Gate& done) : _pool(pool), _done(done) {}
  CuriousItem(const CuriousItem& other) : _pool(other._pool), _done(other._done) { _pool.CountThreads(); }
  CuriousItem& operator=(const CuriousItem&) = delete;
  ~CuriousItem() { _pool.CountThreads(); }
  void operator()() const { _done.Open(); }

 private:
  const ThreadPoolImpl& _pool;
  Gate& _done;
};

TEST(ThreadPool, HoldsNoLockWhileItCopiesOrDestroysItems) {
  Gate done;
  ThreadPoolImpl pool(MakeSettings(1));
  pool.Queue(CuriousItem(pool, done));
  done.Wait();
  AwaitIdle(pool);
  EXPECT_EQ(pool.CountThreads(), 1u);
}

TEST(ThreadPool, RunsEveryItemOfManyCallersOnce) {
  constexpr int kCallers = 4;
  constexpr int kItems = 250;
  std::atomic<int> runs(0);
  Gate done;
  ThreadPoolImpl pool(MakeSettings(3, std::chrono::microseconds(0)));
  std::vector<std::thread> callers;
  for (int caller = 0; caller < kCallers; ++caller) {
    callers.emplace_back([&] {
      for (int i = 0; i < kItems; ++i) {
        pool.Queue([&] {
          if (++runs == kCallers * kItems) {
            done.Open();
          }
        });
      }
    });
  }
  for (std::thread& caller : callers) {
    caller.join();
  }
  done.Wait();
  pool.Shutdown();
  EXPECT_EQ(runs, kCallers * kItems);
}

struct EscapeCase {
  boost::function<void()> work;
  const char* description;
};

[[noreturn]] void ThrowBehindABasePointer() {
  static const InvalidStateException exception("no key");
  throw static_cast<const std::exception*>(&exception);
}

[[noreturn]] void ThrowMutablePointer() {
  static std::runtime_error exception("broken");
  throw &exception;
}

const std::vector<EscapeCase>& GetEscapeCases() {
  struct Unknown {};
  static const std::vector<EscapeCase> cases = {
      {[] { throw InvalidStateException("no key"); }, "Pelmar::InvalidStateException: no key"},
      {[] { Exception("plain").Throw(); }, "Pelmar::Exception: plain"},
      {[] { throw std::runtime_error("broken"); }, "std::runtime_error: broken"},
      {ThrowBehindABasePointer, "Pelmar::InvalidStateException*: no key"},
      {ThrowMutablePointer, "std::runtime_error*: broken"},
      {[] { throw static_cast<std::runtime_error*>(nullptr); }, "std::runtime_error*: null"},
      {[] { throw 42; }, "int"},
      {[] { throw "text"; }, "char const*"},
      {[] { throw Unknown(); }, "Pelmar::System::(anonymous namespace)::GetEscapeCases()::Unknown"},
  };
  return cases;
}

TEST(ThreadPool, ReportsWhatEscapesAnItemAndLivesOn) {
  for (const EscapeCase& c : GetEscapeCases()) {
    Lines reported;
    Gate done;
    ThreadPoolSettings settings = MakeSettings(1);
    settings.reportEscaped = [&](const std::string& description) {
      reported.Add(description);
    };
    ThreadPoolImpl pool(settings);
    pool.Queue(c.work);
    pool.Queue([&] { done.Open(); });
    done.Wait();
    EXPECT_THAT(reported.Get(), ElementsAre(c.description));
    EXPECT_EQ(pool.CountThreads(), 1u);
  }
}

TEST(ThreadPool, LivesOnWhenTheReportFails) {
  Gate done;
  ThreadPoolSettings settings = MakeSettings(1);
  settings.reportEscaped = [](const std::string&) {
    throw std::runtime_error("disk full");
  };
  ThreadPoolImpl pool(settings);
  pool.Queue([] { throw 42; });
  pool.Queue([&] { done.Open(); });
  done.Wait();
  EXPECT_EQ(pool.CountThreads(), 1u);
}

[[noreturn]] void RefuseThread() {
  throw std::system_error(std::make_error_code(std::errc::resource_unavailable_try_again));
}

TEST(ThreadPool, ThrowsWhenNoThreadCanBeStarted) {
  bool available = false;
  Gate done;
  Gate destroyed;
  ThreadPoolSettings settings = MakeSettings(2);
  settings.startThread = [&](std::function<void()> run) {
    return available ? StartThread(std::move(run)) : (RefuseThread(), std::thread());
  };
  ThreadPoolImpl pool(settings);
  try {
    pool.Queue([held = OpenWhenDestroyed(destroyed)] { ADD_FAILURE() << "a refused item has run"; });
    FAIL() << "no exception";
  } catch (const Exception& e) {
    EXPECT_STREQ(e.what(), "Unable to start a thread: Resource temporarily unavailable");
  }
  destroyed.Wait();
  EXPECT_EQ(pool.CountThreads(), 0u);
  available = true;
  pool.Queue([&] { done.Open(); });
  done.Wait();
}

TEST(ThreadPool, KeepsAnItemForTheThreadsItHasWhenNoMoreCanBeStarted) {
  int starts = 0;
  Gate release;
  Gate done;
  ThreadPoolSettings settings = MakeSettings(2);
  settings.startThread = [&](std::function<void()> run) {
    return ++starts == 1 ? StartThread(std::move(run)) : (RefuseThread(), std::thread());
  };
  ThreadPoolImpl pool(settings);
  pool.Queue([&] { release.Wait(); });
  pool.Queue([&] { done.Open(); });
  EXPECT_EQ(starts, 2);
  EXPECT_EQ(pool.CountThreads(), 1u);
  release.Open();
  done.Wait();
}

TEST(ThreadPool, ShutdownDropsWhatIsQueuedAndWaitsForWhatRuns) {
  Gate started;
  Gate dropped;
  bool ended = false;
  ThreadPoolImpl pool(MakeSettings(1));
  pool.Queue([&] {
    started.Open();
    dropped.Wait();
    ended = true;
  });
  pool.Queue([held = OpenWhenDestroyed(dropped)] { ADD_FAILURE() << "a dropped item has run"; });
  started.Wait();
  pool.Shutdown();
  EXPECT_TRUE(ended);
  EXPECT_EQ(pool.CountThreads(), 0u);
}

TEST(ThreadPool, ShutdownEndsIdleThreads) {
  Gate done;
  ThreadPoolImpl pool(MakeSettings(1));
  pool.Queue([&] { done.Open(); });
  done.Wait();
  AwaitIdle(pool);
  pool.Shutdown();
  EXPECT_EQ(pool.CountThreads(), 0u);
}

TEST(ThreadPool, DropsItemsQueuedAfterShutdown) {
  Gate destroyed;
  ThreadPoolImpl pool(MakeSettings(1));
  pool.Shutdown();
  pool.Shutdown();
  pool.Queue([held = OpenWhenDestroyed(destroyed)] { ADD_FAILURE() << "a dropped item has run"; });
  destroyed.Wait();
  EXPECT_EQ(pool.CountThreads(), 0u);
}

TEST(ThreadPool, DropsItemsThatRunningItemsQueueDuringShutdown) {
  Gate started;
  Gate stopping;
  Gate destroyed;
  ThreadPoolImpl pool(MakeSettings(1));
  pool.Queue([&] {
    started.Open();
    stopping.Wait();
    pool.Queue([held = OpenWhenDestroyed(destroyed)] { ADD_FAILURE() << "a dropped item has run"; });
  });
  started.Wait();
  pool.Queue([held = OpenWhenDestroyed(stopping)] {});
  pool.Shutdown();
  destroyed.Wait();
}

TEST(ThreadPool, LetsADroppedItemQueueWhileItIsDestroyed) {
  Gate started;
  Gate stopping;
  Gate destroyed;
  ThreadPoolImpl pool(MakeSettings(1));
  pool.Queue([&] {
    started.Open();
    stopping.Wait();
  });
  started.Wait();
  const auto queueAgain = [&](Gate* gate) {
    pool.Queue([held = OpenWhenDestroyed(destroyed)] { ADD_FAILURE() << "a dropped item has run"; });
    gate->Open();
  };
  pool.Queue([held = std::shared_ptr<Gate>(&stopping, queueAgain)] {});
  pool.Shutdown();
  destroyed.Wait();
}

TEST(ProcessThreadPool, IsOne) {
  EXPECT_NE(GetThreadPool(), nullptr);
  EXPECT_EQ(GetThreadPool(), GetThreadPool());
}

class CollectingSink final : public Service::LogSink {
 public:
  void Write(const Service::LogRecord& record) override {
    lines.Add(record.logger + " " + std::to_string(record.level) + " " + record.text);
    written.Open();
  }

  Lines lines;
  Gate written;
};

TEST(ProcessThreadPool, LogsWhatEscapesAnItem) {
  const Ref<CollectingSink> sink = MakeRef<CollectingSink>();
  Service::LogManager* const manager = Service::GetApp()->GetLogManager();
  manager->SetSink(sink);
  GetThreadPool()->Queue([] { throw InvalidStateException("no key"); });
  sink->written.Wait();
  manager->SetSink(nullptr);
  EXPECT_THAT(
      sink->lines.Get(),
      ElementsAre("Pelmar 4 An exception escaped a work item: Pelmar::InvalidStateException: no key"));
}

class ProcessThreadPoolDeathTest : public testing::Test {
 protected:
  void SetUp() override { GTEST_FLAG_SET(death_test_style, "threadsafe"); }
};

Gate& GetExitGate() {
  static Gate* const gate = new Gate;
  return *gate;
}

void Say(const char* line) {
  std::fprintf(stderr, "%s\n", line);
}

// Functions given to atexit run in reverse order, so "exit begins" comes before the pool's shutdown and "exit
// ends" after.
[[noreturn]] void ExitWhileAnItemRuns() {
  std::atexit([] {
    GetThreadPool()->Queue([] { Say("a dropped item has run"); });
    Say("exit ends");
  });
  Gate started;
  GetThreadPool()->Queue([&started] {
    started.Open();
    GetExitGate().Wait();
    // OpenSSL, first used after the pool was made, must still be usable.
    Say(StringUtil::GenerateUuid().size() == 36 ? "item ends" : "item fails");
  });
  std::atexit([] {
    Say("exit begins");
    GetExitGate().Open();
  });
  started.Wait();
  std::exit(0);
}

TEST_F(ProcessThreadPoolDeathTest, ExitWaitsForRunningItems) {
  EXPECT_EXIT(ExitWhileAnItemRuns(), ExitedWithCode(0), Eq("exit begins\nitem ends\nexit ends\n"));
}

[[noreturn]] void ExitWithIdleThreads() {
  Gate done;
  GetThreadPool()->Queue([&done] { done.Open(); });
  done.Wait();
  std::exit(0);
}

TEST_F(ProcessThreadPoolDeathTest, ExitEndsIdleThreads) {
  EXPECT_EXIT(ExitWithIdleThreads(), ExitedWithCode(0), Eq(""));
}

[[noreturn]] void ExitFromAnItem() {
  GetThreadPool()->Queue([] { std::exit(7); });
  GetExitGate().Wait();
  std::abort();
}

TEST_F(ProcessThreadPoolDeathTest, AnItemMayEndTheProcess) {
  EXPECT_EXIT(ExitFromAnItem(), ExitedWithCode(7), Eq(""));
}

}  // namespace
}  // namespace System
}  // namespace Pelmar
