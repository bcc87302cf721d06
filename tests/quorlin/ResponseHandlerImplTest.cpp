// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

#include "quorlin/ResponseHandlerImpl.h"

#include <pelmar/StringUtil.h>
#include <pelmar/xml/Parser.h>
#include <quorlin/Exceptions.h>

#include <gtest/gtest.h>
#include <boost/algorithm/string/replace.hpp>
#include <boost/core/demangle.hpp>

#include <algorithm>
#include <filesystem>
#include <string>
#include <typeinfo>
#include <vector>

#include "quorlin/xmlReading.h"
#include "support/ServiceAnswers.h"
#include "support/VirtualSlot.h"

namespace Quorlin {
namespace {

using TestSupport::ReadExpectations;
using TestSupport::ReadResponseVector;

// What an operation came to, in the words of the expectation files.
using Outcome = std::vector<std::string>;

// Yields its text byte by byte.
class OneByteReader final : public Pelmar::Reader {
 public:
  explicit OneByteReader(const std::string& text) : _text(text), _position(0) {}

  std::size_t Read(char* buffer, std::size_t size) override {
    if (size == 0 || _position == _text.size()) {
      return 0;
    }
    *buffer = _text[_position++];
    return 1;
  }

 private:
  const std::string _text;
  std::size_t _position;
};

std::string Unqualified(const std::string& name) {
  return name.substr(name.find_last_of(':') + 1);
}

Outcome Failure(const Pelmar::Exception& error) {
  return {Unqualified(boost::core::demangle(typeid(error).name())), error.what()};
}

std::string ToHex(const Leg& leg) {
  static const char* const digits = "0123456789abcdef";
  std::string text;
  for (const unsigned char byte : leg) {
    text += digits[byte >> 4];
    text += digits[byte & 15];
  }
  return text;
}

// ---- The four operations. An output that an exception finds changed is reported in place of the exception.
// ----

const char* const kUntouched = "untouched";

template <typename Call>
Outcome RunTokenOperation(const Call& call) {
  std::string token = kUntouched;
  try {
    call(token);
    return {"token", token};
  } catch (const Pelmar::Exception& error) {
    return token == kUntouched ? Failure(error) : Outcome({"output changed", token});
  }
}

Outcome RunAcquire(Pelmar::Reader* response) {
  return RunTokenOperation(
      [=](std::string& token) { ResponseHandlerImpl().HandleAcquireTokenResponse(response, token); });
}

Outcome RunRenew(Pelmar::Reader* response) {
  return RunTokenOperation(
      [=](std::string& token) { ResponseHandlerImpl().HandleRenewTokenResponse(response, token); });
}

Outcome RunValidate(Pelmar::Reader* response) {
  try {
    return {"verdict", ResponseHandlerImpl().HandleValidateSubjectResponse(response) ? "true" : "false"};
  } catch (const Pelmar::Exception& error) {
    return Failure(error);
  }
}

Outcome RunNegotiate(Pelmar::Reader* response) {
  const Leg untouchedLeg = {1, 2, 3};
  SPNegoResponse round = {kUntouched, untouchedLeg, kUntouched};
  try {
    ResponseHandlerImpl().HandleSPNegoResponse(response, round);
    return {"round", round.contextId, ToHex(round.leg), round.token};
  } catch (const Pelmar::Exception& error) {
    const bool isUntouched =
        round.contextId == kUntouched && round.leg == untouchedLeg && round.token == kUntouched;
    return isUntouched ? Failure(error) : Outcome({"output changed"});
  }
}

using Operation = Outcome (*)(Pelmar::Reader*);

struct NamedOperation {
  const char* name;
  Operation run;
};

const NamedOperation kOperations[] = {
    {"acquire", &RunAcquire}, {"renew", &RunRenew}, {"validate", &RunValidate}, {"negotiate", &RunNegotiate}};

// ---- The data files ----

std::string ParserMessage(const std::string& text) {
  Pelmar::Ref<Pelmar::Xml::Document> document;
  try {
    ParseXML(text, document);
  } catch (const Pelmar::Xml::XMLParseException& error) {
    return error.what();
  }
  return "the parser has nothing against it";
}

Outcome Expected(const std::string& folder, std::vector<std::string> line, const std::string& text) {
  const std::string name = line.front();
  line.erase(line.begin());
  if (line == Outcome({"token"})) {
    return {"token", ReadResponseVector(folder + "/" + name + ".c14n")};
  }
  if (line.front() == "round") {
    line.back() = line.back() == "token" ? ReadResponseVector(folder + "/" + name + ".c14n") : "";
    return line;
  }
  boost::algorithm::replace_all(line.back(), "{parser}", ParserMessage(text));
  return line;
}

void CheckFolder(const std::string& folder, Operation run) {
  for (const std::vector<std::string>& line : ReadExpectations(folder + "/expected.txt")) {
    const std::string text = ReadResponseVector(folder + "/" + line.front() + ".xml");
    const Outcome expected = Expected(folder, line, text);
    EXPECT_EQ(expected, run(Pelmar::CreateStringReader(text).Get())) << line.front();
    EXPECT_EQ(expected, run(Pelmar::MakeRef<OneByteReader>(text).Get())) << line.front() << ", byte by byte";
  }
}

TEST(ResponseHandlerImpl, JudgesFaultsAndBrokenEnvelopesAlikeInAllOperations) {
  for (const NamedOperation& operation : kOperations) {
    SCOPED_TRACE(operation.name);
    CheckFolder("common", operation.run);
  }
}

TEST(ResponseHandlerImpl, ReadsIssuedTokensInACollectionOnly) {
  CheckFolder("acquire", &RunAcquire);
}

TEST(ResponseHandlerImpl, ReadsRenewedTokensOutsideACollectionOnly) {
  CheckFolder("renew", &RunRenew);
}

TEST(ResponseHandlerImpl, ReadsVerdictsExactly) {
  CheckFolder("validate", &RunValidate);
}

TEST(ResponseHandlerImpl, ReadsChallengesAndLastRounds) {
  CheckFolder("negotiate", &RunNegotiate);
}

// A file that no line names would be a case that nobody checks.
TEST(ResponseHandlerImpl, HasAnExpectationForEveryDataFile) {
  for (const char* folder : {"common", "acquire", "renew", "validate", "negotiate"}) {
    std::vector<std::string> expected;
    for (const std::vector<std::string>& line : ReadExpectations(std::string(folder) + "/expected.txt")) {
      expected.push_back(line.front());
    }
    std::vector<std::string> present;
    const std::filesystem::path path = std::filesystem::path(QUORLIN_TEST_VECTORS_DIR) / "responses" / folder;
    for (const std::filesystem::directory_entry& entry : std::filesystem::directory_iterator(path)) {
      if (entry.path().extension() == ".xml") {
        present.push_back(entry.path().stem().string());
      }
    }
    std::sort(expected.begin(), expected.end());
    std::sort(present.begin(), present.end());
    EXPECT_EQ(expected, present) << folder;
  }
}

// ---- Beyond the data files ----

TEST(ResponseHandler, HasItsOperationsInTheAgreedSlots) {
  EXPECT_EQ(0, TestSupport::SlotOf(&ResponseHandler::HandleAcquireTokenResponse));
  EXPECT_EQ(1, TestSupport::SlotOf(&ResponseHandler::HandleValidateSubjectResponse));
  EXPECT_EQ(2, TestSupport::SlotOf(&ResponseHandler::HandleRenewTokenResponse));
  EXPECT_EQ(3, TestSupport::SlotOf(&ResponseHandler::HandleSPNegoResponse));
}

TEST(ResponseHandlerImpl, TokenTextIsItsOwnCanonicalForm) {
  const std::string token = TestSupport::SignedToken("valid");
  const Outcome first = RunAcquire(Pelmar::CreateStringReader(TestSupport::IssueAnswer(token)).Get());
  ASSERT_EQ("token", first.front());
  const Outcome second = RunAcquire(Pelmar::CreateStringReader(TestSupport::IssueAnswer(first.back())).Get());
  EXPECT_EQ(first, second);
}

TEST(ResponseHandlerImpl, TokenSignedInsideAnEnvelopeStillVerifiesOnItsOwn) {
  const std::string answer = TestSupport::IssueAnswer(TestSupport::SignedToken("valid"));
  const Outcome outcome = RunAcquire(Pelmar::CreateStringReader(answer).Get());
  ASSERT_EQ("token", outcome.front());
  EXPECT_EQ("_7f5a64e2", CreateSamlToken(outcome.back(), TestSupport::TrustedSigner())->GetId());
}

TEST(ResponseHandlerImpl, ReplacesEverythingOfAnEarlierRound) {
  SPNegoResponse round = {"old", {1, 2, 3}, "<old/>"};
  ResponseHandlerImpl().HandleSPNegoResponse(
      Pelmar::CreateStringReader(TestSupport::ChallengeAnswer("new", "leg")).Get(), round);
  EXPECT_EQ("new", round.contextId);
  EXPECT_EQ(Leg({'l', 'e', 'g'}), round.leg);
  EXPECT_EQ("", round.token);
}

TEST(ResponseHandlerImpl, PassesReaderExceptionsUnchanged) {
  class BrokenReader final : public Pelmar::Reader {
   public:
    std::size_t Read(char*, std::size_t) override { throw Pelmar::InvalidStateException("broken reader"); }
  };
  for (const NamedOperation& operation : kOperations) {
    EXPECT_EQ(Outcome({"InvalidStateException", "broken reader"}),
              operation.run(Pelmar::MakeRef<BrokenReader>().Get()))
        << operation.name;
  }
}

TEST(ResponseHandlerImplDeathTest, AbortsForAMissingRoot) {
  EXPECT_DEATH(CheckForFault(nullptr),
               "^Verify failed: rootNode != __null \\(lib/quorlin/ResponseHandlerImpl\\)\n$");
}

}  // namespace
}  // namespace Quorlin
