// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

// Goes through a token's checks with the library's own functions, in the library's order.

#include "quorlin/AssertionParser.h"
#include "quorlin/Terminal.h"
#include "quorlin/TokenValidation.h"
#include "quorlin/explain/ElementTrail.h"
#include "quorlin/explain/Explanation.h"
#include "quorlin/explain/SignatureChecks.h"
#include "quorlin/xmlReading.h"

#include <pelmar/xml/Parser.h>

#include <boost/make_shared.hpp>

namespace Cli {

using Pelmar::Ref;
using Pelmar::Xml::ElementNode;
using Quorlin::SamlAssertionType;

namespace {

constexpr std::size_t kMaxSteps = 1000;
constexpr const char* kUncovered = "Token's signature must cover the entire token";

/// What the checks hand on to each other.
struct Subject {
  Ref<Pelmar::Xml::Document> document;
  ElementNode* assertion = nullptr;
  SamlAssertionType content;
};

Check MakeCheck(const char* name, const char* advice) {
  Check check;
  check.name = name;
  check.advice = advice;
  return check;
}

void Fail(Check& check, const std::string& finding) {
  check.state = CheckState::FAILED;
  check.finding = finding;
}

bool ExplainForm(const ExplainRequest& request, Subject& subject, Check& check) {
  try {
    Quorlin::ParseXML(request.xml, subject.document);
  } catch (const Pelmar::Xml::XMLParseException& e) {
    Fail(check, e.what());
    check.place = Place{"", e.GetLine(), e.GetColumn()};
    return false;
  }
  ElementNode* const root = subject.document->GetDocumentElement();
  subject.assertion = request.embedded ? FindAssertion(root) : root;
  if (subject.assertion == nullptr) {
    Fail(check, "the document has no SAML 2.0 assertion");
    return false;
  }
  check.state = CheckState::PASSED;
  check.finding = std::to_string(request.xml.size()) + " bytes";
  return true;
}

/// Lists where the reader went. Of a long way the middle is left out: numbering each of a hundred thousand
/// siblings would take minutes.
void DescribeTrail(const std::vector<const ElementNode*>& visited, const ElementNode* root, bool complete,
                   Check& check) {
  const std::size_t omitted = visited.size() > kMaxSteps ? visited.size() - kMaxSteps : 0;
  check.data["steps"] = Json::array();
  check.data["stepsLeftOut"] = omitted;
  for (std::size_t i = 0; i < visited.size(); ++i) {
    if (i >= kMaxSteps / 2 && i < kMaxSteps / 2 + omitted) {
      continue;
    }
    const Place place = FindPlace(visited[i], root);
    const bool isFailure = !complete && i + 1 == visited.size();
    check.data["steps"].push_back({{"path", place.path},
                                   {"line", place.line},
                                   {"column", place.column},
                                   {"state", isFailure ? "failed" : "passed"}});
  }
}

/// Reads the assertion. The signature's coverage is judged on the way, where the signature stands.
bool ExplainStructure(Subject& subject, Check& structure, Check& coverage) {
  std::vector<const ElementNode*> visited = {subject.assertion};
  const Quorlin::NodeFilterIterator it(subject.assertion, boost::make_shared<ElementTrail>(visited));
  try {
    Quorlin::ParseSamlAssertionElement(it, subject.content);
  } catch (const Pelmar::Exception& e) {
    const std::string message = e.what();
    const bool isUncovered = message == kUncovered;
    Check& failed = isUncovered ? coverage : structure;
    Fail(failed, message);
    failed.place = FindPlace(visited.back(), subject.assertion);
    DescribeTrail(visited, subject.assertion, isUncovered, structure);
    if (isUncovered) {
      structure.finding = "read up to " + failed.place->path;
    }
    return false;
  }
  DescribeTrail(visited, subject.assertion, true, structure);
  structure.state = CheckState::PASSED;
  structure.finding = std::to_string(visited.size()) + " elements, each in its place";
  coverage.state = CheckState::PASSED;
  return true;
}

std::string DescribeDistance(const char* past, const char* future, long long now, long long then) {
  return then > now ? std::string(future) + " in " + DescribeSpan(then - now)
                    : std::string(past) + " " + DescribeSpan(now - then) + " ago";
}

bool ExplainProperties(const ExplainRequest& request, Subject& subject, Check& check) {
  const Quorlin::ConditionsType& conditions = subject.content.Conditions;
  const Pelmar::System::DateTime now = Pelmar::System::GetUtcDateTime();
  const long long nowTime = now.GetUtcTime();
  check.details = {
      "version " + subject.content.Version + ", ID " + subject.content.ID,
      "valid from " + conditions.NotBefore.ToString() + " to " + conditions.NotOnOrAfter.ToString(),
      "now " + now.ToString() + ", clock tolerance " + std::to_string(request.clockToleranceSec) +
          " s: " + DescribeDistance("started", "starts", nowTime, conditions.NotBefore.GetUtcTime()) + ", " +
          DescribeDistance("ended", "ends", nowTime, conditions.NotOnOrAfter.GetUtcTime())};
  check.data = {{"version", subject.content.Version},
                {"id", subject.content.ID},
                {"notBefore", conditions.NotBefore.ToString()},
                {"notOnOrAfter", conditions.NotOnOrAfter.ToString()},
                {"now", now.ToString()},
                {"clockToleranceSec", request.clockToleranceSec}};
  try {
    Quorlin::CheckTokenProperties(subject.content, request.clockToleranceSec);
  } catch (const Pelmar::Exception& e) {
    Fail(check, e.what());
    check.place = FindPlace(subject.assertion, subject.assertion);
    return false;
  }
  check.state = CheckState::PASSED;
  return true;
}

void AppendSignatureChecks(const ExplainRequest& request, const Subject& subject, bool reached,
                           std::vector<Check>& checks, bool& holds) {
  SignatureChecks found;
  found.algorithms.name = "signature algorithms";
  found.signer.name = "signer's certificate chain";
  found.references.name = "signed content";
  found.value.name = "signature value";
  holds = reached && ExplainSignature(subject.assertion, *subject.content.Signature, request.trust, found);
  for (Check* const check : {&found.algorithms, &found.signer, &found.references, &found.value}) {
    checks.push_back(std::move(*check));
  }
}

boost::shared_ptr<const Quorlin::SamlToken> Judge(const ExplainRequest& request, const Subject& subject) {
  if (!request.embedded) {
    return Quorlin::CreateSamlToken(request.xml, request.trust, request.clockToleranceSec);
  }
  if (subject.assertion == nullptr) {
    throw Quorlin::ParseException("Expected element 'Assertion' not found.");
  }
  return Quorlin::CreateSamlTokenFromDom(subject.assertion, request.trust, request.clockToleranceSec);
}

}  // namespace

Explanation Explain(const ExplainRequest& request) {
  Subject subject;
  Check form =
      MakeCheck("well-formed XML", "Look at that place in the file: it is no XML that this library reads.");
  Check structure = MakeCheck("structure",
                              "The token service has to leave out, add or move what the message names; no "
                              "setting of this library accepts it.");
  Check coverage =
      MakeCheck("signature coverage", "The signature has to sign the assertion by its ID or as a whole.");
  Check properties = MakeCheck("properties",
                               "Get a new token; if it has just been issued, compare the clocks (quorlin "
                               "verify --clock-tolerance SEC).");
  Check interpretation = MakeCheck("interpretation",
                                   "The token service has to issue the value in the form that the "
                                   "message asks for.");
  bool holds = ExplainForm(request, subject, form) && ExplainStructure(subject, structure, coverage) &&
               ExplainProperties(request, subject, properties);
  Explanation explanation;
  explanation.checks = {std::move(form), std::move(structure), std::move(coverage), std::move(properties)};
  AppendSignatureChecks(request, subject, holds, explanation.checks, holds);
  try {
    explanation.token = Judge(request, subject);
    interpretation.state = CheckState::PASSED;
  } catch (...) {
    explanation.failure = DescribeCurrentException(EXIT_REFUSED);
    if (holds) {
      Fail(interpretation, explanation.failure->message);
      interpretation.place = FindPlace(subject.assertion, subject.assertion);
    }
  }
  explanation.checks.push_back(std::move(interpretation));
  return explanation;
}

}  // namespace Cli
