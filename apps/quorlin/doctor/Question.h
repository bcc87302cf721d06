// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

// What the doctor asks the service.

#ifndef QUORLIN_CLI_DOCTOR_QUESTION_H
#define QUORLIN_CLI_DOCTOR_QUESTION_H

#include <pelmar/system/DateTime.h>

#include <string>

namespace Cli {
namespace Doctor {

/// SOAP 1.1, section 3.
constexpr const char* kSoapNs = "http://schemas.xmlsoap.org/soap/envelope/";
/// SOAP 1.2, section 5.1.
constexpr const char* kSoap12Ns = "http://www.w3.org/2003/05/soap-envelope";
/// WS-Security 1.0, section 2.
constexpr const char* kUtilityNs =
    "http://docs.oasis-open.org/wss/2004/01/oasis-200401-wss-wssecurity-utility-1.0.xsd";

/// The SOAP action of the question: WS-Trust 1.3, section 4.1.
constexpr const char* kQuestionAction = "http://docs.oasis-open.org/ws-sx/ws-trust/200512/RST/Issue";

/// A request for a token, well-formed but without any credentials: a service that is in order refuses it by a
/// SOAP fault. It holds a Timestamp, so that a service with another clock may say so.
std::string MakeQuestion(const Pelmar::System::DateTime& now);

}  // namespace Doctor
}  // namespace Cli

#endif  // QUORLIN_CLI_DOCTOR_QUESTION_H
