// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

#include <pelmar/service/LogFields.h>
#include <quorlin/OperationMetrics.h>

#include <gtest/gtest.h>

#include <chrono>
#include <functional>
#include <memory>
#include <mutex>
#include <stdexcept>
#include <string>
#include <thread>
#include <vector>

#include "quorlin/OperationFrame.h"
#include "support/CompletionProbe.h"
#include "support/FakeService.h"
#include "support/RecordingLogSink.h"
#include "support/RecordingMetrics.h"
#include "support/ServiceAnswers.h"

namespace Quorlin {
namespace {

using TestSupport::AllOperations;
using TestSupport::FakeService;
using TestSupport::IssueAnswer;
using TestSupport::MetricsRecording;
using TestSupport::OperationCase;
using TestSupport::SignedToken;

using Clock = std::chrono::steady_clock;
using Lines = std::vector<std::string>;

class FieldSink final : public Pelmar::Service::FieldLogSink {
 public:
  void WriteWithFields(const Pelmar::Service::LogRecord& record,
                       const Pelmar::Service::LogFields& fields) override {
    const std::lock_guard<std::mutex> lock(_mutex);
    _records.push_back(record);
    _fields.push_back(fields);
  }

  std::vector<Pelmar::Service::LogFields> GetFields() const {
    const std::lock_guard<std::mutex> lock(_mutex);
    return _fields;
  }

  Lines GetTexts() const {
    const std::lock_guard<std::mutex> lock(_mutex);
    Lines texts;
    std::vector<std::string> known;
    for (const Pelmar::Service::LogRecord& record : _records) {
      texts.push_back(std::to_string(record.level) + " " + TestSupport::MaskUuids(record.text, known));
    }
    return texts;
  }

 private:
  mutable std::mutex _mutex;
  std::vector<Pelmar::Service::LogRecord> _records;
  std::vector<Pelmar::Service::LogFields> _fields;
};

std::string Find(const Pelmar::Service::LogFields& fields, const std::string& name) {
  for (const Pelmar::Service::LogField& field : fields) {
    if (field.name == name) {
      return field.value;
    }
  }
  return "no " + name;
}

/// "<name>=<value> ..." of each line, with the UUIDs numbered, and durations as "N".
Lines Print(const std::vector<Pelmar::Service::LogFields>& all) {
  Lines lines;
  std::vector<std::string> known;
  for (const Pelmar::Service::LogFields& fields : all) {
    std::string line;
    for (const Pelmar::Service::LogField& field : fields) {
      line += (line.empty() ? "" : " ") + field.name + "=" +
              (field.name == "duration_us" ? "N" : TestSupport::MaskUuids(field.value, known));
    }
    lines.push_back(line);
  }
  return lines;
}

/// The fields' sink is installed, at all levels, as long as it lives.
class FieldRecording {
 public:
  FieldRecording() : sink(Pelmar::MakeRef<FieldSink>()), _levelsBefore(Manager()->GetEnabledLevels()) {
    Manager()->SetSink(sink);
    Manager()->SetEnabledLevels(Pelmar::Service::kAllLogLevels);
  }
  ~FieldRecording() {
    Manager()->SetEnabledLevels(_levelsBefore);
    Manager()->SetSink(nullptr);
  }
  FieldRecording(const FieldRecording&) = delete;
  FieldRecording& operator=(const FieldRecording&) = delete;

  const Pelmar::Ref<FieldSink> sink;

 private:
  static Pelmar::Service::LogManager* Manager() { return Pelmar::Service::GetApp()->GetLogManager(); }

  const int _levelsBefore;
};

/// How an operation can be made to end, and what that is called.
struct Ending {
  std::string outcome;
  std::function<void(const FakeService&, const OperationCase&)> arrange;
};

std::vector<Ending> Endings() {
  return {
      {"success",
       [](const FakeService& f, const OperationCase& o) {
         f.transport->Answer(o.answer);
       }},
      {"invalid_argument",
       [](const FakeService& f, const OperationCase&) {
         f.builder->Fail(Pelmar::InvalidArgumentException("bad"));
       }},
      {"invalid_argument",
       [](const FakeService& f, const OperationCase&) {
         f.builder->Fail(Pelmar::InvalidStateException("bad"));
       }},
      {"communication",
       [](const FakeService& f, const OperationCase&) {
         f.transport->Fail(CommunicationException("Server returned error: 404 Not Found"));
       }},
      {"cancelled",
       [](const FakeService& f, const OperationCase&) {
         f.transport->Fail(CommunicationException("The operation was cancelled."));
       }},
      {"invalid_credentials",
       [](const FakeService& f, const OperationCase&) {
         f.transport->Answer(TestSupport::FaultAnswer("wst:FailedAuthentication", "No"));
       }},
      {"invalid_token",
       [](const FakeService& f, const OperationCase&) {
         f.transport->Fail(InvalidSignatureException("tampered"));
       }},
      {"service_error",
       [](const FakeService& f, const OperationCase&) {
         f.transport->Answer(TestSupport::FaultAnswer("soapenv:Server", "No"));
       }},
      {"other",
       [](const FakeService& f, const OperationCase&) {
         f.transport->Fail(Pelmar::Exception("odd"));
       }},
      {"other",
       [](const FakeService& f, const OperationCase&) {
         f.transport->SetBeforeAnswer([] { throw std::range_error("foreign"); });
       }},
  };
}

/// Calls an operation, whatever comes of it.
void CallToTheEnd(const FakeService& fake, const OperationCase& operation) {
  try {
    operation.call(fake);
  } catch (const std::exception&) {
    // The outcome is looked at elsewhere.
  }
}

// ---- Outcomes ----

TEST(OperationMetrics, AreToldOfEachOperationAndItsOutcomeOnce) {
  for (const OperationCase& operation : AllOperations()) {
    for (const Ending& ending : Endings()) {
      const FakeService fake;
      ending.arrange(fake, operation);
      const MetricsRecording recording;
      CallToTheEnd(fake, operation);
      EXPECT_EQ(Lines({std::string(operation.name) + " " + ending.outcome + " 1"}),
                recording.metrics->GetLines());
    }
  }
}

TEST(OperationMetrics, CallATokenWithABadSignatureAnInvalidToken) {
  const FakeService fake;
  fake.transport->Answer(IssueAnswer(SignedToken("tampered")));
  const MetricsRecording recording;
  EXPECT_THROW(fake.service->AcquireToken("alice", "pass-word", fake.spec), InvalidSignatureException);
  EXPECT_EQ(Lines({"AcquireToken invalid_token 1"}), recording.metrics->GetLines());
}

TEST(OperationMetrics, CallATokenThatHasEndedAServiceError) {
  const FakeService fake;
  fake.transport->Answer(IssueAnswer(SignedToken("expired")));
  const MetricsRecording recording;
  EXPECT_THROW(fake.service->AcquireToken("alice", "pass-word", fake.spec), SsoException);
  EXPECT_EQ(Lines({"AcquireToken service_error 1"}), recording.metrics->GetLines());
}

// One kind of token is refused by a pointer to the exception.
TEST(OperationMetrics, CallATokenThatIsRefusedByPointerAnInvalidToken) {
  const FakeService fake;
  fake.transport->SetBeforeAnswer([] { throw new ParseException("by pointer"); });
  const MetricsRecording recording;
  try {
    fake.service->AcquireToken("alice", "pass-word", fake.spec);
    ADD_FAILURE() << "nothing was thrown";
  } catch (const ParseException* error) {
    const std::unique_ptr<const ParseException> owned(error);
    EXPECT_STREQ("by pointer", error->what());
  }
  EXPECT_EQ(Lines({"AcquireToken invalid_token 1"}), recording.metrics->GetLines());
}

TEST(OperationMetrics, CallASubjectThatIsNotValidASuccess) {
  const FakeService fake;
  fake.transport->Answer(TestSupport::ValidateAnswer(false));
  const MetricsRecording recording;
  EXPECT_FALSE(fake.service->ValidateSubject(*fake.token));
  EXPECT_EQ(Lines({"ValidateSubject success 1"}), recording.metrics->GetLines());
}

TEST(OperationMetrics, NameEveryOutcome) {
  EXPECT_STREQ("success", GetOutcomeName(OperationOutcome::SUCCESS));
  EXPECT_STREQ("invalid_argument", GetOutcomeName(OperationOutcome::INVALID_ARGUMENT));
  EXPECT_STREQ("communication", GetOutcomeName(OperationOutcome::COMMUNICATION));
  EXPECT_STREQ("cancelled", GetOutcomeName(OperationOutcome::CANCELLED));
  EXPECT_STREQ("invalid_credentials", GetOutcomeName(OperationOutcome::INVALID_CREDENTIALS));
  EXPECT_STREQ("invalid_token", GetOutcomeName(OperationOutcome::INVALID_TOKEN));
  EXPECT_STREQ("service_error", GetOutcomeName(OperationOutcome::SERVICE_ERROR));
  EXPECT_STREQ("other", GetOutcomeName(OperationOutcome::OTHER));
  EXPECT_STREQ("other", GetOutcomeName(static_cast<OperationOutcome>(99)));
}

// ---- Duration and attempts ----

// The bounds are measured inside and around the operation: nanoseconds would break the one, milliseconds the
// other.
TEST(OperationMetrics, TellTheDurationInMicroseconds) {
  constexpr long long kEnoughToTell = 2000;
  const auto since = [](Clock::time_point start) {
    return std::chrono::duration_cast<std::chrono::microseconds>(Clock::now() - start).count();
  };
  const MetricsRecording recording;
  const Clock::time_point before = Clock::now();
  const long long atLeast = RunOperation("Counted", [&] {
    const Clock::time_point start = Clock::now();
    long long passed = 0;
    while (passed < kEnoughToTell) {
      passed = since(start);
    }
    return passed;
  });
  const long long atMost = since(before);
  const std::vector<OperationReport> reports = recording.metrics->GetReports();
  ASSERT_EQ(1u, reports.size());
  EXPECT_GE(reports[0].durationMicroseconds, atLeast);
  EXPECT_LE(reports[0].durationMicroseconds, atMost);
}

TEST(OperationMetrics, CountTheAttemptsOfTheOperationThatIsRetried) {
  const FakeService fake;
  fake.transport->SetBeforeAnswer([] {
    OperationFrame::CountRetry();
    OperationFrame::CountRetry();
  });
  fake.transport->Answer(IssueAnswer(SignedToken("valid")));
  const MetricsRecording recording;
  fake.service->AcquireToken("alice", "pass-word", fake.spec);
  OperationFrame::CountRetry();  // Outside every operation: of no effect.
  EXPECT_EQ(Lines({"AcquireToken success 3"}), recording.metrics->GetLines());
}

// A negotiation handler may ask for a token itself.
TEST(OperationMetrics, CountNestedOperationsEachForItself) {
  const FakeService fake;
  const MetricsRecording recording;
  RunOperation("Outer", [] {
    RunOperation("Inner", [] {
      OperationFrame::CountRetry();
      return true;
    });
    OperationFrame::CountRetry();
    OperationFrame::CountRetry();
    return true;
  });
  EXPECT_EQ(Lines({"Inner success 2", "Outer success 3"}), recording.metrics->GetLines());
}

// ---- Installing ----

TEST(OperationMetrics, AreToldNothingAfterOthersWereInstalled) {
  const MetricsRecording first;
  const MetricsRecording second;
  RunOperation("Counted", [] { return true; });
  EXPECT_EQ(Lines(), first.metrics->GetLines());
  EXPECT_EQ(Lines({"Counted success 1"}), second.metrics->GetLines());
}

TEST(OperationMetrics, AreToldNothingAfterTheyWereTakenAway) {
  boost::shared_ptr<TestSupport::RecordingMetrics> metrics;
  {
    const MetricsRecording recording;
    metrics = recording.metrics;
  }
  RunOperation("Counted", [] { return true; });
  EXPECT_EQ(Lines(), metrics->GetLines());
}

TEST(OperationMetrics, ThatThrowTakeNoResultAway) {
  class Throwing final : public OperationMetrics {
   public:
    void OperationEnded(const OperationReport&) override { throw std::runtime_error("cannot count"); }
  };
  const FakeService fake;
  fake.transport->Answer(IssueAnswer(SignedToken("valid")));
  InstallOperationMetrics(boost::make_shared<Throwing>());
  const boost::shared_ptr<const SamlToken> token =
      fake.service->AcquireToken("alice", "pass-word", fake.spec);
  InstallOperationMetrics(boost::shared_ptr<OperationMetrics>());
  ASSERT_TRUE(token);
  EXPECT_EQ("_7f5a64e2", token->GetId());
}

TEST(OperationMetrics, AreToldOfAsynchronousOperationsBeforeTheyComplete) {
  const FakeService fake;
  fake.transport->Answer(TestSupport::ValidateAnswer(true));
  const MetricsRecording recording;
  TestSupport::CompletionProbe<boost::optional<bool>> probe;
  Lines whenCompleted;
  fake.service->ValidateSubjectAsync(
      fake.token, probe.GetFunction([&] { whenCompleted = recording.metrics->GetLines(); }));
  probe.Wait();
  EXPECT_EQ(Lines({"ValidateSubject success 1"}), whenCompleted);
}

TEST(OperationMetrics, MayBeInstalledWhileOperationsEnd) {
  constexpr int kThreads = 4;
  constexpr int kOperations = 200;
  const boost::shared_ptr<TestSupport::RecordingMetrics> first =
      boost::make_shared<TestSupport::RecordingMetrics>();
  const boost::shared_ptr<TestSupport::RecordingMetrics> second =
      boost::make_shared<TestSupport::RecordingMetrics>();
  InstallOperationMetrics(first);
  std::vector<std::thread> threads;
  for (int i = 0; i < kThreads; ++i) {
    threads.emplace_back([] {
      for (int n = 0; n < kOperations; ++n) {
        RunOperation("Counted", [] { return true; });
      }
    });
  }
  for (int n = 0; n < kOperations; ++n) {
    InstallOperationMetrics(n % 2 == 0 ? second : first);
  }
  for (std::thread& thread : threads) {
    thread.join();
  }
  InstallOperationMetrics(boost::shared_ptr<OperationMetrics>());
  EXPECT_EQ(static_cast<std::size_t>(kThreads * kOperations),
            first->GetReports().size() + second->GetReports().size());
}

// ---- The fields of the lines ----

TEST(OperationFields, StandBesideEveryLineOfEveryOperation) {
  for (const OperationCase& operation : AllOperations()) {
    for (const Ending& ending : Endings()) {
      const FakeService fake;
      ending.arrange(fake, operation);
      const FieldRecording recording;
      CallToTheEnd(fake, operation);
      const std::string each =
          std::string("operation=") + operation.name + " operation_id=<id 1> attempt=1 duration_us=N";
      Lines expected(recording.sink->GetTexts().size(), each);
      ASSERT_LE(3u, expected.size());
      expected.back() += " outcome=" + ending.outcome;
      EXPECT_EQ(expected, Print(recording.sink->GetFields()));
    }
  }
}

TEST(OperationFields, LeaveTheTextsAsTheyAre) {
  for (const OperationCase& operation : AllOperations()) {
    const FakeService fake;
    fake.transport->Answer(operation.answer);
    Lines plain;
    {
      const TestSupport::LogRecording recording;
      operation.call(fake);
      plain = recording.GetLines();
    }
    const FakeService again;
    again.transport->Answer(operation.answer);
    const FieldRecording recording;
    operation.call(again);
    EXPECT_EQ(plain, recording.sink->GetTexts());
  }
}

TEST(OperationFields, HoldTheIdThatTheTextHolds) {
  const FakeService fake;
  fake.transport->Answer(TestSupport::ValidateAnswer(true));
  const FieldRecording recording;
  const TestSupport::MetricsRecording metrics;
  fake.service->ValidateSubject(*fake.token);
  RunOperation("Other", [] { return true; });
  const std::vector<Pelmar::Service::LogFields> fields = recording.sink->GetFields();
  ASSERT_EQ(6u, fields.size());
  EXPECT_EQ(
      Lines({"64 opId=<id 1> START operation SecurityTokenServiceImpl::ValidateSubject",
             "64 Validating subject of token " + std::string(TestSupport::kFakeTokenText), "64 Result: true",
             "64 opId=<id 1> END operation SecurityTokenServiceImpl::ValidateSubject",
             "64 opId=<id 2> START operation SecurityTokenServiceImpl::Other",
             "64 opId=<id 2> END operation SecurityTokenServiceImpl::Other"}),
      recording.sink->GetTexts());
  EXPECT_NE(Find(fields[0], "operation_id"), Find(fields[4], "operation_id"));
}

TEST(OperationFields, TellInTheLastLineTheDurationThatTheMetricsAreTold) {
  const FakeService fake;
  fake.transport->Answer(TestSupport::ValidateAnswer(true));
  const FieldRecording recording;
  const MetricsRecording metrics;
  fake.service->ValidateSubject(*fake.token);
  EXPECT_EQ(std::to_string(metrics.metrics->GetReports().at(0).durationMicroseconds),
            Find(recording.sink->GetFields().back(), "duration_us"));
}

TEST(OperationFields, TellADurationThatGrows) {
  const FakeService fake;
  fake.transport->Answer(TestSupport::ValidateAnswer(true));
  const FieldRecording recording;
  fake.service->ValidateSubject(*fake.token);
  long long before = 0;
  for (const Pelmar::Service::LogFields& fields : recording.sink->GetFields()) {
    const long long now = std::stoll(Find(fields, "duration_us"));
    EXPECT_LE(before, now);
    before = now;
  }
}

TEST(OperationFields, TellTheAttempt) {
  const FakeService fake;
  fake.transport->SetBeforeAnswer([] { OperationFrame::CountRetry(); });
  fake.transport->Answer(TestSupport::ValidateAnswer(true));
  const FieldRecording recording;
  fake.service->ValidateSubject(*fake.token);
  Lines attempts;
  for (const Pelmar::Service::LogFields& fields : recording.sink->GetFields()) {
    attempts.push_back(Find(fields, "attempt"));
  }
  EXPECT_EQ(Lines({"1", "1", "2", "2"}), attempts);
}

// Neither user nor password, nor anything of a token.
TEST(OperationFields, HoldNothingButTheFiveNames) {
  const FieldRecording recording;
  for (const OperationCase& operation : AllOperations()) {
    const FakeService fake;
    fake.transport->Answer(operation.answer);
    operation.call(fake);
  }
  std::string all;
  for (const Pelmar::Service::LogFields& fields : recording.sink->GetFields()) {
    for (const Pelmar::Service::LogField& field : fields) {
      all += field.name + "=" + field.value + "\n";
    }
  }
  for (const char* const secret :
       {"alice", "pass-word", "example.com", "not-for-logs", "_7f5a64e2", "urn:a"}) {
    EXPECT_EQ(std::string::npos, all.find(secret)) << secret;
  }
}

}  // namespace
}  // namespace Quorlin
