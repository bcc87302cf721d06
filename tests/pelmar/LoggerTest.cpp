// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

#include <pelmar/service/Logger.h>

#include "pelmar/service/LogEscape.h"
#include "pelmar/service/LogManagerImpl.h"
#include "pelmar/service/StandardErrorSink.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <csignal>
#include <cstdlib>
#include <mutex>
#include <stdexcept>
#include <string>
#include <thread>
#include <vector>

namespace Pelmar {
namespace Service {
namespace {

using testing::ElementsAre;
using testing::ExitedWithCode;
using testing::IsEmpty;
using testing::MatchesRegex;

/// Keeps "<logger> <level> <text>" of every record.
class CollectingSink final : public LogSink {
 public:
  void Write(const LogRecord& record) override {
    const std::lock_guard<std::mutex> lock(_mutex);
    _lines.push_back(record.logger + " " + std::to_string(record.level) + " " + record.text);
    _times.push_back(record.time);
  }

  std::vector<std::string> GetLines() const {
    const std::lock_guard<std::mutex> lock(_mutex);
    return _lines;
  }

  std::vector<System::DateTime> GetTimes() const {
    const std::lock_guard<std::mutex> lock(_mutex);
    return _times;
  }

 private:
  mutable std::mutex _mutex;
  std::vector<std::string> _lines;
  std::vector<System::DateTime> _times;
};

/// A formatter that tells whether it was asked.
class WatchedFormatter final : public PrintFormatter {
 public:
  std::string Print() const override {
    asked = true;
    return "value";
  }

  mutable bool asked = false;
};

class LoggerTest : public testing::Test {
 protected:
  LoggerTest() : sink(MakeRef<CollectingSink>()) { manager.SetSink(sink); }

  Ref<Logger> Get(const std::string& name, int levels = kAllLogLevels) {
    Ref<Logger> logger;
    manager.GetLogger(name, levels, logger);
    return logger;
  }

  LogManagerImpl manager;
  const Ref<CollectingSink> sink;
};

TEST_F(LoggerTest, IsTheSameForTheSameName) {
  const Ref<Logger> first = Get("Quorlin");
  EXPECT_EQ(first->GetName(), "Quorlin");
  EXPECT_EQ(Get("Quorlin"), first);
  EXPECT_NE(Get("Pelmar"), first);
}

TEST_F(LoggerTest, ReplacesWhatTheSlotHeld) {
  Ref<Logger> slot = Get("first");
  manager.GetLogger("second", kAllLogLevels, slot);
  EXPECT_EQ(slot->GetName(), "second");
}

TEST_F(LoggerTest, EnablesWarningsAndWorseUntilToldOtherwise) {
  const Ref<Logger> logger = Get("Quorlin");
  EXPECT_EQ(manager.GetEnabledLevels(), LOG_PANIC | LOG_CRITICAL | LOG_ERROR | LOG_WARNING);
  for (const int level : {LOG_PANIC, LOG_CRITICAL, LOG_ERROR, LOG_WARNING}) {
    EXPECT_TRUE(logger->IsEnabled(level)) << level;
  }
  for (const int level : {LOG_NOTICE, LOG_STATUS, LOG_INFO}) {
    EXPECT_FALSE(logger->IsEnabled(level)) << level;
  }
}

TEST_F(LoggerTest, FollowsTheEnabledLevelsAtOnce) {
  const Ref<Logger> logger = Get("Quorlin");
  for (int level = LOG_PANIC; level <= LOG_INFO; level *= 2) {
    manager.SetEnabledLevels(level);
    for (int other = LOG_PANIC; other <= LOG_INFO; other *= 2) {
      EXPECT_EQ(logger->IsEnabled(other), other == level) << other;
    }
  }
  manager.SetEnabledLevels(0);
  EXPECT_FALSE(logger->IsEnabled(LOG_PANIC));
  manager.SetEnabledLevels(kAllLogLevels);
  EXPECT_TRUE(logger->IsEnabled(LOG_INFO));
  EXPECT_FALSE(logger->IsEnabled(0));
  EXPECT_FALSE(logger->IsEnabled(128));
}

TEST_F(LoggerTest, NeverWritesBeyondTheLevelsOfItsFirstLookUp) {
  manager.SetEnabledLevels(kAllLogLevels);
  const Ref<Logger> logger = Get("narrow", LOG_ERROR);
  EXPECT_EQ(Get("narrow", kAllLogLevels), logger);
  EXPECT_TRUE(logger->IsEnabled(LOG_ERROR));
  EXPECT_FALSE(logger->IsEnabled(LOG_WARNING));
  logger->Write(LOG_WARNING, "dropped");
  logger->Write(LOG_ERROR, "kept");
  EXPECT_THAT(sink->GetLines(), ElementsAre("narrow 4 kept"));
}

TEST_F(LoggerTest, HandsEnabledLinesToTheSink) {
  const Ref<Logger> logger = Get("Quorlin");
  const System::DateTime before = System::GetUtcDateTime();
  logger->Write(LOG_WARNING, "as it is: %1 \r\n\x1B[31m");
  logger->Write(LOG_INFO, "dropped");
  const System::DateTime after = System::GetUtcDateTime();
  EXPECT_THAT(sink->GetLines(), ElementsAre("Quorlin 8 as it is: %1 \r\n\x1B[31m"));
  EXPECT_FALSE(sink->GetTimes().at(0) < before);
  EXPECT_FALSE(after < sink->GetTimes().at(0));
}

TEST_F(LoggerTest, FillsTheFormatOfAnEnabledLine) {
  const Ref<Logger> logger = Get("Quorlin");
  LogInternal(logger.Get(), LOG_WARNING, "opId=%1");
  LogInternal(logger.Get(), LOG_WARNING, "opId=%1 %2", StringFormatter("a%2"));
  LogInternal(logger.Get(), LOG_WARNING, "opId=%1 %2", StringFormatter("a"), IntegerFormatter(7));
  EXPECT_THAT(sink->GetLines(),
              ElementsAre("Quorlin 8 opId=%1", "Quorlin 8 opId=a%2 %2", "Quorlin 8 opId=a 7"));
}

TEST_F(LoggerTest, FormatsNothingBelowTheThreshold) {
  const Ref<Logger> logger = Get("Quorlin");
  const WatchedFormatter watched;
  LogInternal(logger.Get(), LOG_INFO, "text");
  LogInternal(logger.Get(), LOG_INFO, "%1", watched);
  LogInternal(logger.Get(), LOG_INFO, "%1 %2", watched, watched);
  EXPECT_FALSE(watched.asked);
  EXPECT_THAT(sink->GetLines(), IsEmpty());
  LogInternal(logger.Get(), LOG_ERROR, "%1", watched);
  EXPECT_TRUE(watched.asked);
}

TEST_F(LoggerTest, WritesToTheSinkInPlace) {
  const Ref<Logger> logger = Get("Quorlin");
  const Ref<CollectingSink> other = MakeRef<CollectingSink>();
  logger->Write(LOG_ERROR, "first");
  manager.SetSink(other);
  logger->Write(LOG_ERROR, "second");
  EXPECT_THAT(sink->GetLines(), ElementsAre("Quorlin 4 first"));
  EXPECT_THAT(other->GetLines(), ElementsAre("Quorlin 4 second"));
}

class ThrowingSink final : public LogSink {
 public:
  void Write(const LogRecord&) override { throw std::runtime_error("disk full"); }
};

TEST_F(LoggerTest, LosesTheLineOfASinkThatThrows) {
  const Ref<Logger> logger = Get("Quorlin");
  manager.SetSink(MakeRef<ThrowingSink>());
  EXPECT_NO_THROW(logger->Write(LOG_ERROR, "lost"));
  manager.SetSink(sink);
  logger->Write(LOG_ERROR, "kept");
  EXPECT_THAT(sink->GetLines(), ElementsAre("Quorlin 4 kept"));
}

/// A host's sink whose end is logged, to the sink that took its place.
class LastWordsSink final : public LogSink {
 public:
  explicit LastWordsSink(const Ref<Logger>& logger) : _logger(logger) {}
  ~LastWordsSink() override { _logger->Write(LOG_ERROR, "last words"); }
  void Write(const LogRecord&) override {}

 private:
  const Ref<Logger> _logger;
};

TEST_F(LoggerTest, LetsAReplacedSinkLogWhileItIsDestroyed) {
  manager.SetSink(MakeRef<LastWordsSink>(Get("Quorlin")));
  manager.SetSink(sink);
  EXPECT_THAT(sink->GetLines(), ElementsAre("Quorlin 4 last words"));
}

TEST_F(LoggerTest, OutlivesItsManager) {
  Ref<Logger> logger;
  {
    LogManagerImpl shortLived;
    shortLived.SetSink(sink);
    shortLived.GetLogger("Quorlin", kAllLogLevels, logger);
  }
  logger->Write(LOG_ERROR, "still here");
  EXPECT_THAT(sink->GetLines(), ElementsAre("Quorlin 4 still here"));
}

TEST_F(LoggerTest, ServesManyThreadsAtOnce) {
  constexpr int kThreads = 4;
  constexpr int kRounds = 200;
  const Ref<CollectingSink> other = MakeRef<CollectingSink>();
  std::vector<std::thread> threads;
  for (int i = 0; i < kThreads; ++i) {
    threads.emplace_back([&, i] {
      for (int round = 0; round < kRounds; ++round) {
        manager.SetSink((round + i) % 2 == 0 ? sink : other);
        manager.SetEnabledLevels(round % 2 == 0 ? kAllLogLevels : kDefaultLogLevels);
        Get("logger" + std::to_string(round % 8))->Write(LOG_ERROR, "line");
      }
    });
  }
  for (std::thread& thread : threads) {
    thread.join();
  }
  EXPECT_EQ(sink->GetLines().size() + other->GetLines().size(), std::size_t{kThreads * kRounds});
}

TEST(Application, IsOneWithOneLogManager) {
  EXPECT_EQ(GetApp(), GetApp());
  EXPECT_EQ(GetApp()->GetLogManager(), GetApp()->GetLogManager());
}

struct EscapeCase {
  std::string text;
  std::string escaped;
};

TEST(EscapeForLog, EscapesWhatCouldForgeALine) {
  const EscapeCase cases[] = {
      {"", ""},
      {"plain text, 'quotes' \"and\" DOMAIN\\user", "plain text, 'quotes' \"and\" DOMAIN\\user"},
      {"user\r\n2012-03-05T07:04:09Z ERROR Quorlin: forged",
       "user\\x0d\\x0a2012-03-05T07:04:09Z ERROR Quorlin: forged"},
      {std::string("\0\t\x08\x1B\x1F", 5), "\\x00\\x09\\x08\\x1b\\x1f"},
      {" ~\x7F", " ~\\x7f"},
      // Readable beyond ASCII.
      {"J\xC3\xBCrgen \xE6\x9D\xB1 \xF0\x9F\x98\x80 \xC2\xA0",
       "J\xC3\xBCrgen \xE6\x9D\xB1 \xF0\x9F\x98\x80 \xC2\xA0"},
      // C1 controls: next line, control sequence introducer.
      {"\xC2\x80\xC2\x85\xC2\x9B\xC2\x9F", "\\xc2\\x80\\xc2\\x85\\xc2\\x9b\\xc2\\x9f"},
      // Line and paragraph separators, and their neighbours.
      {"\xE2\x80\xA7\xE2\x80\xA8\xE2\x80\xA9\xE2\x80\xAA",
       "\xE2\x80\xA7\\xe2\\x80\\xa8\\xe2\\x80\\xa9\xE2\x80\xAA"},
      // Not UTF-8: a lone C1 byte, an overlong line feed, a truncated end.
      {"\x9B"
       "31m",
       "\\x9b31m"},
      {"\xC0\x8A", "\\xc0\\x8a"},
      {"\xE2\x82", "\\xe2\\x82"},
      {"\xC3\n", "\\xc3\\x0a"},
  };
  for (const EscapeCase& c : cases) {
    EXPECT_EQ(EscapeForLog(c.text), c.escaped);
  }
}

TEST(StandardErrorSink, FormatsOneLine) {
  const System::DateTime time("2012-03-05T07:04:09.045Z");
  const struct {
    LogRecord record;
    const char* line;
  } cases[] = {
      {{"Quorlin", LOG_PANIC, time, "text"}, "2012-03-05T07:04:09.045Z PANIC Quorlin: text\n"},
      {{"Quorlin", LOG_CRITICAL, time, "text"}, "2012-03-05T07:04:09.045Z CRITICAL Quorlin: text\n"},
      {{"Quorlin", LOG_ERROR, time, "text"}, "2012-03-05T07:04:09.045Z ERROR Quorlin: text\n"},
      {{"Quorlin", LOG_WARNING, time, "text"}, "2012-03-05T07:04:09.045Z WARNING Quorlin: text\n"},
      {{"Quorlin", LOG_NOTICE, time, "text"}, "2012-03-05T07:04:09.045Z NOTICE Quorlin: text\n"},
      {{"Quorlin", LOG_STATUS, time, "text"}, "2012-03-05T07:04:09.045Z STATUS Quorlin: text\n"},
      {{"Quorlin", LOG_INFO, time, "text"}, "2012-03-05T07:04:09.045Z INFO Quorlin: text\n"},
      {{"Quorlin", 12, time, "text"}, "2012-03-05T07:04:09.045Z LEVEL12 Quorlin: text\n"},
      {{"Quo\nrlin", LOG_ERROR, time, "te\nxt"}, "2012-03-05T07:04:09.045Z ERROR Quo\\x0arlin: te\\x0axt\n"},
      {{"", LOG_ERROR, time, ""}, "2012-03-05T07:04:09.045Z ERROR : \n"},
  };
  for (const auto& c : cases) {
    EXPECT_EQ(FormatLogLine(c.record), c.line);
  }
}

class LoggerDeathTest : public testing::Test {
 protected:
  void SetUp() override { GTEST_FLAG_SET(death_test_style, "threadsafe"); }
};

[[noreturn]] void LogAndExit() {
  Ref<Logger> logger;
  LogManager* const manager = GetApp()->GetLogManager();
  manager->GetLogger("Quorlin", kAllLogLevels, logger);
  manager->SetSink(MakeRef<CollectingSink>());
  LogInternal(logger.Get(), LOG_WARNING, "to the host");
  manager->SetSink(nullptr);
  LogInternal(logger.Get(), LOG_INFO, "not enabled");
  LogInternal(logger.Get(), LOG_WARNING, "user '%1'", StringFormatter("a\nb"));
  std::exit(0);
}

TEST_F(LoggerDeathTest, WritesToStandardErrorByDefault) {
  EXPECT_EXIT(LogAndExit(), ExitedWithCode(0),
              MatchesRegex("[0-9]{4}-[0-9]{2}-[0-9]{2}T[0-9]{2}:[0-9]{2}:[0-9]{2}(\\.[0-9]{1,6})?Z"
                           " WARNING Quorlin: user 'a\\\\x0ab'\n"));
}

TEST_F(LoggerDeathTest, RefusesToLogWithoutALogger) {
  EXPECT_EXIT(LogInternal(nullptr, LOG_ERROR, "text"), testing::KilledBySignal(SIGABRT),
              testing::Eq("Verify failed: logger != nullptr (lib/pelmar/service/Logger)\n"));
}

}  // namespace
}  // namespace Service
}  // namespace Pelmar
