// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

#include "quorlin/ConnectionAdvice.h"
#include "quorlin/doctor/Question.h"
#include "quorlin/doctor/Steps.h"

#include <pelmar/http/HttpException.h>
#include <pelmar/system/DateTime.h>

#include <array>

namespace Cli {
namespace Doctor {

namespace {

namespace Http = Pelmar::Http;

constexpr int kStatusServerError = 500;

void IgnoreCompletion(const Pelmar::Exception*, Http::ClientResponse*, Http::PendingRequestItem*) {}

long long GetNow() {
  return Pelmar::System::GetUtcDateTime().GetUtcTime();
}

Pelmar::Ref<Http::ClientRequest> MakeRequest(const Patient& patient) {
  const std::string body = MakeQuestion(Pelmar::System::GetUtcDateTime());
  const Pelmar::Ref<Http::ClientRequest> request =
      Http::CreateHttpRequest(Http::METHOD_POST, patient.parts.path);
  request->SetHeader("Content-Type", "text/xml");
  request->SetHeader("SOAPAction", std::string("\"") + kQuestionAction + "\"");
  request->GetBodyWriter()->Write(body.data(), body.size());
  return request;
}

/// Throws HttpException.
void Ask(const Patient& patient, Findings& findings) {
  const Pelmar::Ref<Http::UserAgent> agent =
      Http::CreateHttpUserAgent(patient.connection, Http::CreateCookieStore(""), nullptr);
  Pelmar::Ref<Http::PendingRequestItem> item;
  findings.askedAt = GetNow();
  agent->SendAsync(MakeRequest(patient), IgnoreCompletion, item);
  agent->WaitFor(item, std::chrono::microseconds(patient.timeout).count(), findings.response);
  findings.answeredAt = GetNow();
}

std::string ReadBody(Http::ClientResponse& response) {
  std::string body;
  std::array<char, 16384> buffer;
  while (const std::size_t size = response.Read(buffer.data(), buffer.size())) {
    body.append(buffer.data(), size);
  }
  return body;
}

std::string GetHeader(const Findings& findings, const std::string& name) {
  std::string value;
  findings.response->GetHeader(name, value);
  return value;
}

/// SOAP answers come with 2xx, faults with 500 (SOAP 1.1, section 6.2).
bool CarriesSoap(int status) {
  return status / 100 == 2 || status == kStatusServerError;
}

Outcome Judge(const Findings& findings) {
  const int status = findings.response->GetStatusCode();
  const std::string reason = findings.response->GetReason();
  const std::string line = std::to_string(status) + (reason.empty() ? "" : " ") + reason;
  const std::string type = GetHeader(findings, "Content-Type");
  const std::string location = GetHeader(findings, "Location");
  Outcome outcome = Pass("the answer is " + line + (type.empty() ? "" : ", " + type));
  if (!CarriesSoap(status)) {
    const std::string message = "Server returned error: " + line;
    outcome = Fail(EXIT_UNREACHABLE, message, AdviseOnConnection(message));
  }
  if (status / 100 == 3 && !location.empty()) {
    outcome.details.push_back("it leads to " + location);
    outcome.data["location"] = location;
  }
  outcome.data["status"] = status;
  outcome.data["reason"] = reason;
  outcome.data["contentType"] = type;
  return outcome;
}

}  // namespace

Outcome CheckHttp(const Patient& patient, Findings& findings) {
  try {
    Ask(patient, findings);
  } catch (const Http::HttpTimeoutException&) {
    const std::string message =
        "No answer from " + GetEndpoint(patient) + " within " + DescribeTimeout(patient);
    return Fail(EXIT_UNREACHABLE, message, AdviseOnConnection(message));
  } catch (const Http::HttpException& e) {
    return Fail(EXIT_UNREACHABLE, e.what(), AdviseOnConnection(e.what()));
  }
  findings.body = ReadBody(*findings.response);
  return Judge(findings);
}

}  // namespace Doctor
}  // namespace Cli
