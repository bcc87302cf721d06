// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

#include <pelmar/service/LogFields.h>

#include "pelmar/service/LogManagerImpl.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <mutex>
#include <stdexcept>
#include <string>
#include <thread>
#include <vector>

namespace Pelmar {
namespace Service {
namespace {

using testing::ElementsAre;
using testing::IsEmpty;

/// Keeps "<text>| name=value ..." of every record.
class FieldSink final : public FieldLogSink {
 public:
  void WriteWithFields(const LogRecord& record, const LogFields& fields) override {
    std::string line = record.text + "|";
    for (const LogField& field : fields) {
      line += " " + field.name + "=" + field.value;
    }
    const std::lock_guard<std::mutex> lock(_mutex);
    _lines.push_back(line);
  }

  std::vector<std::string> GetLines() const {
    const std::lock_guard<std::mutex> lock(_mutex);
    return _lines;
  }

 private:
  mutable std::mutex _mutex;
  std::vector<std::string> _lines;
};

class TextSink final : public LogSink {
 public:
  void Write(const LogRecord& record) override { lines.push_back(record.text); }

  std::vector<std::string> lines;
};

/// One field, and how often it was asked for.
class Source final : public LogFieldSource {
 public:
  explicit Source(const std::string& value) : _value(value) {}
  void AddFields(LogFields& fields) const override {
    ++asked;
    fields.push_back({"name", _value});
  }

  mutable int asked = 0;

 private:
  const std::string _value;
};

class LogFieldsTest : public testing::Test {
 protected:
  LogFieldsTest() : sink(MakeRef<FieldSink>()) {
    manager.SetSink(sink);
    manager.GetLogger("Quorlin", kAllLogLevels, logger);
  }

  void Write(const std::string& text) { logger->Write(LOG_WARNING, text); }

  LogManagerImpl manager;
  const Ref<FieldSink> sink;
  Ref<Logger> logger;
};

TEST_F(LogFieldsTest, AreNoneOutsideEveryContext) {
  Write("line");
  EXPECT_THAT(sink->GetLines(), ElementsAre("line|"));
}

TEST_F(LogFieldsTest, AreThoseOfTheContextAsLongAsItLives) {
  const Source source("value");
  {
    const LogContext context(source);
    Write("first");
    Write("second");
  }
  Write("third");
  EXPECT_THAT(sink->GetLines(), ElementsAre("first| name=value", "second| name=value", "third|"));
}

TEST_F(LogFieldsTest, AreThoseOfTheInnermostContextAlone) {
  const Source outer("outer");
  const Source inner("inner");
  const LogContext outerContext(outer);
  {
    const LogContext innerContext(inner);
    Write("first");
  }
  Write("second");
  EXPECT_THAT(sink->GetLines(), ElementsAre("first| name=inner", "second| name=outer"));
}

TEST_F(LogFieldsTest, AreThoseOfEveryLoggerOfTheThread) {
  Ref<Logger> other;
  manager.GetLogger("host", kAllLogLevels, other);
  const Source source("value");
  const LogContext context(source);
  other->Write(LOG_WARNING, "line");
  EXPECT_THAT(sink->GetLines(), ElementsAre("line| name=value"));
}

TEST_F(LogFieldsTest, BelongToOneThread) {
  const Source source("value");
  const LogContext context(source);
  std::thread([this] { Write("elsewhere"); }).join();
  Write("here");
  EXPECT_THAT(sink->GetLines(), ElementsAre("elsewhere|", "here| name=value"));
}

TEST_F(LogFieldsTest, AreNotAskedForWhenTheLevelIsNotEnabled) {
  const Source source("value");
  const LogContext context(source);
  logger->Write(LOG_INFO, "line");
  EXPECT_EQ(source.asked, 0);
  EXPECT_THAT(sink->GetLines(), IsEmpty());
}

TEST_F(LogFieldsTest, AreNotAskedForByASinkOfTheFirstForm) {
  const Ref<TextSink> text = MakeRef<TextSink>();
  manager.SetSink(text);
  const Source source("value");
  const LogContext context(source);
  Write("line");
  EXPECT_EQ(source.asked, 0);
  EXPECT_THAT(text->lines, ElementsAre("line"));
}

TEST_F(LogFieldsTest, LoseTheLineAndNothingElseWhenTheirSourceThrows) {
  class Throwing final : public LogFieldSource {
   public:
    void AddFields(LogFields&) const override { throw std::runtime_error("no fields"); }
  };
  const Throwing source;
  {
    const LogContext context(source);
    Write("lost");
  }
  Write("kept");
  EXPECT_THAT(sink->GetLines(), ElementsAre("kept|"));
}

}  // namespace
}  // namespace Service
}  // namespace Pelmar
